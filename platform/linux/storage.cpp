#include "storage.h"

#include <dlog.h>
#include <glib.h>
#include <sys/statvfs.h>

#include <cerrno>
#include <cstring>
#include <string>

#include "places.h"
#include "scoped.h"

namespace {

constexpr int kInternalId = 0;

struct DirectoryNames {
  storage_directory_e type;
  GUserDirectory of_user;  // G_USER_N_DIRECTORIES: the machine has no such folder
  const char *of_phone;
};

constexpr DirectoryNames kDirectories[] = {
    {STORAGE_DIRECTORY_IMAGES, G_USER_DIRECTORY_PICTURES, "Images"},
    {STORAGE_DIRECTORY_SOUNDS, G_USER_N_DIRECTORIES, "Sounds"},
    {STORAGE_DIRECTORY_VIDEOS, G_USER_DIRECTORY_VIDEOS, "Videos"},
    {STORAGE_DIRECTORY_CAMERA, G_USER_N_DIRECTORIES, "DCIM"},
    {STORAGE_DIRECTORY_DOWNLOADS, G_USER_DIRECTORY_DOWNLOAD, "Downloads"},
    {STORAGE_DIRECTORY_MUSIC, G_USER_DIRECTORY_MUSIC, "Music"},
    {STORAGE_DIRECTORY_DOCUMENTS, G_USER_DIRECTORY_DOCUMENTS, "Documents"},
    {STORAGE_DIRECTORY_OTHERS, G_USER_N_DIRECTORIES, "Others"},
};

using FileSystem = struct statvfs;

// Sizes of the file system that holds the phone.
int measure(int storage_id, fsblkcnt_t FileSystem::*blocks, unsigned long long *bytes) {
  if (!bytes) return STORAGE_ERROR_INVALID_PARAMETER;
  if (storage_id != kInternalId) return STORAGE_ERROR_NOT_SUPPORTED;
  FileSystem space;
  if (statvfs(platform::kStorageRoot, &space) != 0) {
    dlog_print(DLOG_ERROR, "PLATFORM", "cannot measure %s: %s", platform::kStorageRoot, strerror(errno));
    return STORAGE_ERROR_OPERATION_FAILED;
  }
  *bytes = static_cast<unsigned long long>(space.*blocks) * space.f_frsize;
  return STORAGE_ERROR_NONE;
}

std::string user_folder(GUserDirectory directory) {
  if (directory == G_USER_N_DIRECTORIES) return "";
  const char *folder = g_get_user_special_dir(directory);
  return folder && g_file_test(folder, G_FILE_TEST_IS_DIR) ? folder : "";
}

}  // namespace

int storage_foreach_device_supported(storage_device_supported_cb callback, void *user_data) {
  if (!callback) return STORAGE_ERROR_INVALID_PARAMETER;
  FileSystem space;
  if (statvfs(platform::kStorageRoot, &space) != 0) return STORAGE_ERROR_OPERATION_FAILED;
  const bool is_read_only = space.f_flag & ST_RDONLY;
  callback(kInternalId, STORAGE_TYPE_INTERNAL,
           is_read_only ? STORAGE_STATE_MOUNTED_READ_ONLY : STORAGE_STATE_MOUNTED, platform::kStorageRoot,
           user_data);
  return STORAGE_ERROR_NONE;
}

int storage_get_total_space(int storage_id, unsigned long long *bytes) {
  return measure(storage_id, &FileSystem::f_blocks, bytes);
}

int storage_get_available_space(int storage_id, unsigned long long *bytes) {
  // f_bavail, not f_bfree: the rest is reserved for the administrator.
  return measure(storage_id, &FileSystem::f_bavail, bytes);
}

int storage_get_directory(int storage_id, storage_directory_e type, char **path) {
  if (!path) return STORAGE_ERROR_INVALID_PARAMETER;
  if (storage_id != kInternalId) return STORAGE_ERROR_NOT_SUPPORTED;
  for (const DirectoryNames &names : kDirectories) {
    if (names.type != type) continue;
    std::string folder = user_folder(names.of_user);
    if (folder.empty()) {
      folder = std::string(platform::kMediaFolder) + "/" + names.of_phone;
      if (!platform::make_folder(folder)) return STORAGE_ERROR_OPERATION_FAILED;
    }
    *path = platform::duplicate(folder.c_str());
    return *path ? STORAGE_ERROR_NONE : STORAGE_ERROR_OUT_OF_MEMORY;
  }
  return STORAGE_ERROR_INVALID_PARAMETER;
}
