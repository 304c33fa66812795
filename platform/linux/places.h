// Where the phone keeps its things. Folders that the platform makes are the user's alone.
#pragma once

#include <sys/stat.h>

#include <cerrno>
#include <string>

namespace platform {

constexpr const char *kStorageRoot = "/opt/usr";
constexpr const char *kDatabaseFolder = "/opt/usr/dbspace";
constexpr const char *kMediaFolder = "/opt/usr/media";
constexpr const char *kApplicationData = "/opt/usr/apps";
constexpr const char *kLogFolder = "/opt/usr/share/log";

constexpr mode_t kPrivateFolderMode = 0700;
constexpr mode_t kPrivateFileMode = 0600;

// Make `path` and its parents below the storage root, which itself must be there: a machine that has no phone
// gets no folders. False with errno set.
inline bool make_folder(const std::string &path) {
  const std::string root = std::string(kStorageRoot) + "/";
  if (path.compare(0, root.size(), root) != 0) {
    errno = EINVAL;
    return false;
  }
  for (size_t end = path.find('/', root.size());; end = path.find('/', end + 1)) {
    if (mkdir(path.substr(0, end).c_str(), kPrivateFolderMode) != 0 && errno != EEXIST) return false;
    if (end == std::string::npos) return true;
  }
}

}  // namespace platform
