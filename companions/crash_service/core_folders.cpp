#include "core_folders.h"

#include <sys/stat.h>

#include <algorithm>

#include "tavro_cores.h"

namespace {

constexpr guint kSettleMilliseconds = 50;              // several events of one file are one look
constexpr int64_t kClockSlackUs = 2 * G_USEC_PER_SEC;  // files' times are a little behind the clock

}  // namespace

CoreFolder::CoreFolder(std::string path, std::function<void(const Crash &)> on_crash)
    : path_(std::move(path)), on_crash_(std::move(on_crash)) {}

CoreFolder::~CoreFolder() {
  if (scan_source_) g_source_remove(scan_source_);
  if (monitor_) g_signal_handlers_disconnect_by_data(monitor_.get(), this);
}

void CoreFolder::start(int64_t since_us) {
  since_us_ = since_us;
  const TavroObject<GFile> folder(g_file_new_for_path(path_.c_str()));
  monitor_.reset(g_file_monitor_directory(folder.get(), G_FILE_MONITOR_WATCH_MOVES, nullptr, nullptr));
  if (monitor_) g_signal_connect(monitor_.get(), "changed", G_CALLBACK(changed_cb), this);
  scan();
}

void CoreFolder::changed_cb(GFileMonitor *, GFile *, GFile *, GFileMonitorEvent, gpointer data) {
  auto *self = static_cast<CoreFolder *>(data);
  if (!self->scan_source_) self->scan_source_ = g_timeout_add(kSettleMilliseconds, scan_cb, self);
}

gboolean CoreFolder::scan_cb(gpointer data) {
  auto *self = static_cast<CoreFolder *>(data);
  self->scan_source_ = 0;
  self->scan();
  return G_SOURCE_REMOVE;
}

void CoreFolder::scan() {
  std::set<std::string> seen;
  std::vector<Crash> fresh;
  const TavroDir dir(opendir(path_.c_str()));
  while (const dirent *entry = dir ? readdir(dir.get()) : nullptr) {
    const std::string name = entry->d_name;
    if (name[0] == '.') continue;
    struct stat info;
    const std::string path = path_ + "/" + name;
    bool is_known = known_.count(name) || lstat(path.c_str(), &info) != 0 || !S_ISREG(info.st_mode) ||
                    int64_t{info.st_ctim.tv_sec} * G_USEC_PER_SEC < since_us_ - kClockSlackUs;
    if (!is_known) {
      const auto crash = crash_of_core(path);
      if (crash) fresh.push_back(*crash);
      is_known = crash.has_value();
    }
    if (is_known) seen.insert(name);
  }
  known_ = std::move(seen);
  std::sort(fresh.begin(), fresh.end(),
            [](const Crash &left, const Crash &right) { return left.time_us < right.time_us; });
  for (const Crash &crash : fresh) on_crash_(crash);
}

std::vector<std::string> core_folder_paths() {
  const char *given = g_getenv("TAVRO_CORE_FOLDERS");
  if (!given || !*given) return {TAVRO_CORE_FOLDER, TAVRO_SYSTEM_CORE_FOLDER};
  const TavroStrv parts(g_strsplit(given, ":", -1));
  std::vector<std::string> paths;
  for (char **part = parts.get(); *part; ++part) {
    if (g_path_is_absolute(*part)) paths.emplace_back(*part);
  }
  return paths;
}
