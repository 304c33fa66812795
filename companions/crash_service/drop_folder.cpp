#include "drop_folder.h"

#include <fcntl.h>
#include <sys/stat.h>

#include <set>

#include "crash_collector.h"
#include "crash_log.h"
#include "crash_summary.h"
#include "tavro_crash_service.h"

namespace {

constexpr guint kQuietMilliseconds = 1000;
constexpr size_t kMostWatched = 100;

bool is_crash_file(const std::string &name) {
  for (const char *part : {".coredump.gz", ".log.gz", ".cs"}) {
    if (name.find(part) != std::string::npos) return true;
  }
  return false;
}

// Names, sizes and times of what is in the folder; empty while there is no crash file.
std::string describe(const std::string &path) {
  std::set<std::string> lines;
  bool has_crash_file = false;
  const TavroDir dir(opendir(path.c_str()));
  while (const dirent *entry = dir ? readdir(dir.get()) : nullptr) {
    struct stat info;
    if (fstatat(dirfd(dir.get()), entry->d_name, &info, AT_SYMLINK_NOFOLLOW) != 0 || !S_ISREG(info.st_mode))
      continue;
    has_crash_file = has_crash_file || is_crash_file(entry->d_name);
    lines.insert(std::string(entry->d_name) + " " + std::to_string(info.st_size) + " " +
                 std::to_string(info.st_mtim.tv_sec) + "." + std::to_string(info.st_mtim.tv_nsec));
  }
  std::string text;
  if (has_crash_file) {
    for (const std::string &line : lines) text += line + "\n";
  }
  return text;
}

std::set<std::string> names_in_dump_folder() {
  std::set<std::string> names;
  const TavroDir dir(opendir(TAVRO_CRASH_DUMP_FOLDER));
  while (const dirent *entry = dir ? readdir(dir.get()) : nullptr) {
    const std::string name = entry->d_name;
    struct stat info;
    if (name != "." && name != ".." &&
        fstatat(dirfd(dir.get()), entry->d_name, &info, AT_SYMLINK_NOFOLLOW) == 0 && S_ISDIR(info.st_mode))
      names.insert(name);
  }
  return names;
}

}  // namespace

DropFolder::DropFolder(CrashBook &book, std::function<bool()> is_busy,
                       std::function<void(const CrashFolder &)> on_folder)
    : book_(book), is_busy_(std::move(is_busy)), on_folder_(std::move(on_folder)) {}

DropFolder::~DropFolder() {
  if (look_source_) g_source_remove(look_source_);
  for (const auto &[name, pending] : pending_) {
    if (pending.monitor) g_signal_handlers_disconnect_by_data(pending.monitor.get(), this);
  }
  if (monitor_) g_signal_handlers_disconnect_by_data(monitor_.get(), this);
}

void DropFolder::start() {
  monitor_ = watch(TAVRO_CRASH_DUMP_FOLDER);
  if (book_.is_new()) {
    for (const std::string &name : names_in_dump_folder()) book_.set_done(folder_id(name));
  }
  if (look()) look_later();
}

TavroObject<GFileMonitor> DropFolder::watch(const std::string &path) {
  const TavroObject<GFile> folder(g_file_new_for_path(path.c_str()));
  TavroObject<GFileMonitor> monitor(
      g_file_monitor_directory(folder.get(), G_FILE_MONITOR_WATCH_MOVES, nullptr, nullptr));
  if (monitor) g_signal_connect(monitor.get(), "changed", G_CALLBACK(changed_cb), this);
  return monitor;
}

void DropFolder::changed_cb(GFileMonitor *, GFile *, GFile *, GFileMonitorEvent, gpointer self) {
  static_cast<DropFolder *>(self)->look_later();
}

void DropFolder::look_later() {
  if (!look_source_) look_source_ = g_timeout_add(kQuietMilliseconds, look_cb, this);
}

gboolean DropFolder::look_cb(gpointer data) {
  auto *self = static_cast<DropFolder *>(data);
  if (self->is_busy_() || self->look()) return G_SOURCE_CONTINUE;
  self->look_source_ = 0;
  return G_SOURCE_REMOVE;
}

// Whether another look is needed.
bool DropFolder::look() {
  const std::set<std::string> names = names_in_dump_folder();
  for (auto pending = pending_.begin(); pending != pending_.end();) {
    const bool is_gone = names.count(pending->first) == 0;
    if (is_gone && pending->second.monitor)
      g_signal_handlers_disconnect_by_data(pending->second.monitor.get(), this);
    pending = is_gone ? pending_.erase(pending) : std::next(pending);
  }
  bool is_changing = false;
  for (const std::string &name : names) {
    if (!book_.is_done(folder_id(name))) is_changing |= look_at(name);
  }
  return is_changing;
}

// Whether it has crash files, but is not known to be whole.
bool DropFolder::look_at(const std::string &name) {
  if (!pending_.count(name) && pending_.size() < kMostWatched)
    pending_[name].monitor = watch(TAVRO_CRASH_DUMP_FOLDER + name);
  const std::string now = describe(TAVRO_CRASH_DUMP_FOLDER + name);
  if (now.empty()) return false;
  Pending &pending = pending_[name];
  if (std::exchange(pending.last_look, now) != now) return true;
  if (pending.monitor) g_signal_handlers_disconnect_by_data(pending.monitor.get(), this);
  pending_.erase(name);
  book_.set_done(folder_id(name));
  if (!g_utf8_validate(name.c_str(), -1, nullptr)) {
    CRASH_LOGE("a crash folder whose name is no text is not told of");
    return false;
  }
  on_folder_(read_folder(name));
  return false;
}
