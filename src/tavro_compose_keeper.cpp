#include "tavro_compose_keeper.h"

#include <Elementary.h>
#include <notification.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <cstring>
#include <ctime>
#include <set>
#include <string>

#include "tavro-common.h"
#include "tavro-main.h"
#include "tavro_autosave.h"
#include "tavro_compose.h"
#include "tavro_compose_kept.h"
#include "tavro_drafts.h"
#include "tavro_log.h"
#include "tavro_memory.h"
#include "tavro_note_file.h"
#include "tavro_preferences.h"

namespace {

constexpr double kWriteSeconds = 2.0;

// The open screen.
struct kept_screen {
  appdata *ad;  // null: none is open
  Evas_Object *page;
  gint64 begun;
  std::string opened;   // what the person had said when it opened: all of that is stored
  std::string path;     // empty until there is something to keep
  std::string written;  // what the file holds
  Ecore_Timer *timer;   // null: nothing has changed since
  bool is_synced;       // the file's name is safe on the disk too
  bool has_failed;      // the last write did, and was logged
} _screen;

const compose_view_win *_open_view() {
  return _screen.ad ? tavro_compose_view(_screen.ad) : nullptr;
}

char *_plain(const Evas_Object *entry) {
  return entry ? TAVRO_ADOPT(elm_entry_markup_to_utf8(elm_entry_entry_get(entry))) : nullptr;
}

kept_writing _content(const compose_view_win *view) {
  const appdata *ad = _screen.ad;
  kept_writing kept;
  kept.type = ad->idea_view ? IDEA : ad->type == CRASH ? CRASH : PROBLEM;
  kept.begun = _screen.begun;
  kept.auto_saved_id = std::max(ad->auto_saved_id, 0);
  svc_voc_data *content = TAVRO_ZALLOC(svc_voc_data);
  kept.content.reset(content);
  content->id = std::max(ad->id_to_delete, 0);
  content->title_description = _plain(view->title_entry);
  content->description = _plain(view->entry);
  content->app_name = TAVRO_STRDUP(view->app_name);
  content->app_icon = TAVRO_STRDUP(view->app_icon);
  content->attachments = tavro_populate_attachment_info(view->attachments);
  content->user_name = tavro_get_username_from_preference().release();
  if (const problem_view_win *problem = ad->problem_view) {
    content->dump_file = TAVRO_STRDUP(problem->dump_filepath);
    content->dump_name = TAVRO_STRDUP(problem->dump_filename);
    content->syslog_file = TAVRO_STRDUP(problem->syslog_filepath);
    kept.is_device_status_removed = problem->is_device_status_removed;
  }
  return kept;
}

// The person's own part, to tell whether anything would be lost.
std::string _said(const kept_writing &kept) {
  const svc_voc_data &content = *kept.content;
  std::string said;
  for (const char *text :
       {content.title_description, content.description, content.app_name, content.dump_file})
    said += (text ? text : "") + std::string(1, '\0');
  for (const GSList *link = content.attachments; link; link = link->next)
    said += static_cast<const tavro_dbmgr_attachment_info *>(link->data)->file_path + std::string(1, '\0');
  return said;
}

void _add_file(const char *path, std::set<std::string> *paths) {
  if (path && *path) paths->insert(path);
}

void _add_files_of(const svc_voc_data &content, std::set<std::string> *paths) {
  for (const GSList *link = content.attachments; link; link = link->next)
    _add_file(static_cast<const tavro_dbmgr_attachment_info *>(link->data)->file_path, paths);
  for (const char *path : {content.dump_file, content.syslog_file}) _add_file(path, paths);
}

void _add_files_on_screen(std::set<std::string> *paths) {
  const compose_view_win *view = _open_view();
  for (const GSList *link = view ? view->attachments : nullptr; link; link = link->next)
    _add_file(static_cast<const char *>(link->data), paths);
  if (view) _add_file(tavro_autosave_screenshot().c_str(), paths);
  const problem_view_win *problem = view ? _screen.ad->problem_view : nullptr;
  if (!problem) return;
  for (const char *path : {problem->dump_filepath, problem->syslog_filepath}) _add_file(path, paths);
}

void _remove_file() {
  if (!_screen.path.empty()) tavro_kept_remove(_screen.path);
  _screen.path.clear();
  _screen.written.clear();
}

// A disk that stays full says so once.
void _report(bool is_written, const char *reason) {
  if (!is_written && !_screen.has_failed) TAVRO_LOGE("what is being written cannot be kept: %s", reason);
  _screen.has_failed = !is_written;
}

void _report_full() {
  if (!_screen.has_failed) notification_status_message_post(tavro_text("IDS_OB_TPOP_TOO_MUCH_IS_KEPT"));
  _report(false, "too much is kept already");
}

void _write_file(std::string data) {
  if (data == _screen.written) return;
  if (_screen.path.empty()) _screen.path = tavro_kept_unused_path();
  if (_screen.path.empty()) return _report_full();
  if (tavro_note_replace(_screen.path.c_str(), data.data(), data.size()) != 0)
    return _report(false, std::strerror(errno));
  _report(true, nullptr);
  _screen.is_synced = false;
  _screen.written = std::move(data);
}

void _write() {
  const compose_view_win *view = _open_view();
  if (!view) return;
  const kept_writing kept = _content(view);
  if (tavro_kept_says_something(kept) && _said(kept) != _screen.opened)
    _write_file(tavro_kept_data(kept));
  else
    _remove_file();
}

Eina_Bool _write_cb(void *) {
  _screen.timer = nullptr;
  _write();
  return ECORE_CALLBACK_CANCEL;
}

void _stop() {
  if (_screen.timer) ecore_timer_del(_screen.timer);
  _screen = {};
}

// The window goes with the screen in it: what is kept stays for the next start.
void _page_deleted_cb(void *, Evas *, Evas_Object *page, void *) {
  if (_screen.page == page) _stop();
}

}  // namespace

void tavro_compose_keeper_start(appdata *ad) {
  _stop();
  _screen.ad = ad;
  const compose_view_win *view = _open_view();
  if (!view) return _stop();
  // A question that is still up is about something else, and its answer would meet this screen.
  if (ad->cancel_popup) evas_object_del(ad->cancel_popup);
  _screen.begun = std::time(nullptr);
  _screen.opened = _said(_content(view));
  _screen.page = view->layout;
  if (view->layout)
    evas_object_event_callback_add(view->layout, EVAS_CALLBACK_DEL, _page_deleted_cb, nullptr);
}

std::optional<std::set<std::string>> tavro_kept_attached_files() {
  std::set<std::string> paths;
  _add_files_on_screen(&paths);
  for (const std::string &path : tavro_kept_paths()) {
    const std::optional<kept_writing> kept = tavro_kept_load(path);
    if (kept)
      _add_files_of(*kept->content, &paths);
    else if (access(path.c_str(), F_OK) == 0)  // else it was set aside
      return std::nullopt;
  }
  return paths;
}

void tavro_compose_keeper_take_over(const std::string &path) {
  if (!_screen.ad) return;
  _screen.path = path;
  _screen.opened.clear();
}

void tavro_compose_keeper_keep_all() {
  _screen.opened.clear();
  tavro_compose_keeper_note();
}

void tavro_compose_keeper_note() {
  if (_screen.ad && !_screen.timer) _screen.timer = ecore_timer_add(kWriteSeconds, _write_cb, nullptr);
}

void tavro_compose_keeper_flush() {
  if (_screen.timer) {
    ecore_timer_del(_screen.timer);
    _write_cb(nullptr);
  }
  if (_screen.written.empty() || _screen.is_synced) return;
  _screen.is_synced = tavro_note_sync_folder(_screen.path.c_str()) == 0;
  if (!_screen.is_synced) _report(false, std::strerror(errno));
}

void tavro_compose_keeper_forget() {
  _remove_file();
  _stop();
}
