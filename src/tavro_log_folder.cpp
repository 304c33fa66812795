#include "tavro_log_folder.h"

#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <cstring>
#include <vector>

#include "tavro_crash_service.h"
#include "tavro_dbmgr.h"
#include "tavro_handles.h"
#include "tavro_log.h"

namespace {

constexpr char kPrefix[] = "SystemLog_";
constexpr size_t kKeptLogs = 20;
constexpr time_t kKeptSeconds = 7 * 24 * 60 * 60;

bool _read_info(const std::string &path, struct stat *info) {
  const size_t folder = sizeof TAVRO_LOG_DUMP_FOLDER - 1;
  return path.compare(0, folder, TAVRO_LOG_DUMP_FOLDER) == 0 && path.size() > folder &&
         path.find('/', folder) == std::string::npos && lstat(path.c_str(), info) == 0 &&
         S_ISREG(info->st_mode);
}

// A store that cannot be read may need it.
bool _may_be_needed(const std::string &path) {
  return tavro_dbmgr_is_syslog_file_stored(path.c_str()) != 0;
}

// Newest first: their names are in the order of their times.
std::vector<std::string> _list() {
  std::vector<std::string> names;
  const TavroDir folder(opendir(TAVRO_LOG_DUMP_FOLDER));
  while (const dirent *entry = folder ? readdir(folder.get()) : nullptr) {
    if (std::strncmp(entry->d_name, kPrefix, sizeof kPrefix - 1) == 0) names.push_back(entry->d_name);
  }
  std::sort(names.rbegin(), names.rend());
  return names;
}

}  // namespace

bool tavro_log_folder_has(const std::string &path) {
  struct stat info = {};
  return _read_info(path, &info);
}

void tavro_log_folder_delete(const std::string &path) {
  if (!tavro_log_folder_has(path)) return;
  if (unlink(path.c_str()) != 0) TAVRO_LOGE("system log %s: %s", path.c_str(), std::strerror(errno));
}

void tavro_log_folder_delete_unwanted(const std::string &path, time_t since) {
  struct stat info = {};
  if (_read_info(path, &info) && info.st_mtime >= since && !_may_be_needed(path))
    tavro_log_folder_delete(path);
}

void tavro_log_folder_prune() {
  const std::vector<std::string> names = _list();
  for (size_t i = kKeptLogs; i < names.size(); ++i) {
    const std::string path = TAVRO_LOG_DUMP_FOLDER + names[i];
    struct stat info = {};
    if (_read_info(path, &info) && std::time(nullptr) - info.st_mtime > kKeptSeconds && !_may_be_needed(path))
      tavro_log_folder_delete(path);
  }
}
