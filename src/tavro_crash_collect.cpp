#include "tavro_crash_collect.h"

#include <fcntl.h>
#include <glib.h>
#include <sys/stat.h>

#include <algorithm>
#include <atomic>
#include <cerrno>
#include <cstring>
#include <ctime>
#include <utility>

#include "tavro_crash_archive.h"
#include "tavro_crash_rules.h"
#include "tavro_crash_service.h"
#include "tavro_handles.h"
#include "tavro_log.h"
#include "tavro_memory.h"

namespace {

// The collection under way.
struct collection {
  appdata *ad;
  tavro_crash_collected collected;  // null: none is
  tavro_dc_context *collector;
  std::string folder;
  timespec folder_time;  // as it was before
};
collection _current = {};
guint _number = 0;  // of the current or the last one: the results of earlier ones are unwanted

// Source id of the last handover, which may have been served meanwhile; written by workers.
std::atomic<guint> _last_handover = 0;

// What the worker hands over, by value.
struct handover {
  guint number;
  char *archive;  // null: none
  bool has_failed;
};

// An archive that nobody took goes, but not while another collection may have written the same one anew.
void _free_handover(gpointer data) {
  auto *result = static_cast<handover *>(data);
  if (result->archive && !_current.collected) tavro_crash_archive_delete_unneeded(result->archive);
  TAVRO_FREE(result->archive);
  TAVRO_FREE(result);
}

bool _set_time(const std::string &folder, timespec time) {
  const std::string path = TAVRO_CRASH_DUMP_FOLDER + folder;
  const timespec times[2] = {{0, UTIME_OMIT}, time};
  return utimensat(AT_FDCWD, path.c_str(), times, AT_SYMLINK_NOFOLLOW) == 0;
}

// The crash service removes folders by their age, so the time is put back.
collection _end_current() {
  const collection ended = std::exchange(_current, {});
  if (ended.folder_time.tv_sec) _set_time(ended.folder, ended.folder_time);
  return ended;
}

// The collector takes an older crash folder when the one that was meant holds nothing.
bool _is_of(const std::string &folder, const char *archive) {
  if (folder.empty() || archive == TAVRO_CRASH_ARCHIVE_FOLDER + tavro_crash_archive_name(folder)) return true;
  TAVRO_LOGD("%s is the dump of another crash", archive);
  return false;
}

gboolean __tavro_dc_on_done_cb(gpointer data) {
  auto *result = static_cast<handover *>(data);
  if (!_current.collected || result->number != _number) return G_SOURCE_REMOVE;
  const collection ended = _end_current();
  tavro_crash_result taken{{}, result->has_failed};
  if (result->archive && _is_of(ended.folder, result->archive)) {
    taken.archive = result->archive;
    TAVRO_FREE(result->archive);
  }
  ended.collected(ended.ad, taken);
  return G_SOURCE_REMOVE;
}

void _hand_over(const char *archive, bool has_failed, guint number) {
  handover *result = TAVRO_ZALLOC(handover);
  result->number = number;
  result->archive = TAVRO_STRDUP(archive);
  result->has_failed = has_failed;
  _last_handover = g_idle_add_full(G_PRIORITY_DEFAULT_IDLE, __tavro_dc_on_done_cb, result, _free_handover);
}

// No collector, no dump: as one that failed, and not from inside the call that asked for it.
void _fail() {
  TAVRO_LOGE("the crash dump cannot be collected");
  _current.collector = nullptr;
  _hand_over(nullptr, true, _number);
}

// A second after now, or after the newest other folder: times are compared in seconds, and may be of a clock
// that was set back since.
time_t _time_of_newest(const std::string &folder) {
  time_t newest = std::time(nullptr);
  const TavroDir folders(opendir(TAVRO_CRASH_DUMP_FOLDER));
  while (const dirent *entry = folders ? readdir(folders.get()) : nullptr) {
    struct stat info = {};
    if (entry->d_name[0] != '.' && folder != entry->d_name &&
        fstatat(dirfd(folders.get()), entry->d_name, &info, 0) == 0)
      newest = std::max(newest, info.st_mtime);
  }
  return newest + 1;
}

// The collector takes the newest crash folder: make it this one. False when there is no such folder.
bool _make_newest(const std::string &folder) {
  const std::string path = TAVRO_CRASH_DUMP_FOLDER + folder;
  struct stat info = {};
  int error = lstat(path.c_str(), &info) == 0 ? 0 : errno;
  if (!error && _set_time(folder, {_time_of_newest(folder), 0})) {
    _current.folder_time = info.st_mtim;
    return true;
  }
  if (!error) error = errno;
  TAVRO_LOGD("crash folder %s: %s", path.c_str(), std::strerror(error));
  return error != ENOENT;
}

}  // namespace

void tavro_crash_collect(appdata *ad, const std::string &folder, tavro_crash_collected collected) {
  tavro_crash_collect_cancel();
  _current = {ad, collected, nullptr, folder, {}};
  ++_number;
  if (!folder.empty() && !_make_newest(folder)) return _hand_over(nullptr, false, _number);
  tavro_dc_report_info info = {};
  info.listener = {tavro_dc_on_done_cb, tavro_dc_on_error_cb, tavro_dc_on_init_cb, tavro_dc_on_deinit_cb,
                   tavro_dc_on_cancel_cb};
  tavro_dc_init(&_current.collector, &info, GUINT_TO_POINTER(_number));
  if (!_current.collector || tavro_dc_start(_current.collector, &info) != 0) _fail();
}

void tavro_crash_collect_cancel() {
  const collection ended = _end_current();
  if (ended.collector) tavro_dc_cancel(ended.collector);
}

void tavro_crash_collect_at_end() {
  tavro_crash_collect_cancel();
  tavro_dc_end_all();
  // No loop runs any more that could serve it.
  const guint handover = _last_handover;
  GSource *source = handover ? g_main_context_find_source_by_id(nullptr, handover) : nullptr;
  if (source) g_source_destroy(source);
}

void tavro_dc_on_done_cb(tavro_dc_context *handle, tavro_dc_report_info *report_info, void *userdata) {
  TAVRO_LOGD("crash dump: %s", report_info->file_path ? report_info->file_path : "none");
  _hand_over(report_info->file_path, false, GPOINTER_TO_UINT(userdata));
  tavro_dc_deinit(handle);
}

void tavro_dc_on_error_cb(tavro_dc_context *handle, tavro_dc_report_info *, void *userdata) {
  TAVRO_LOGD("no crash dump could be collected");  // the collector has logged why
  _hand_over(nullptr, true, GPOINTER_TO_UINT(userdata));
  // Nobody else would: the collector serves one collection.
  tavro_dc_deinit(handle);
}

void tavro_dc_on_init_cb(tavro_dc_context *, tavro_dc_report_info *, void *) {
  TAVRO_LOGD("the collector is there");
}

void tavro_dc_on_deinit_cb(tavro_dc_context *, tavro_dc_report_info *, void *) {
  TAVRO_LOGD("the collector has ended");
}

void tavro_dc_on_cancel_cb(tavro_dc_context *, tavro_dc_report_info *, void *) {
  TAVRO_LOGD("the collection was cancelled");
}
