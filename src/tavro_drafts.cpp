#include "tavro_drafts.h"

#include <notification.h>
#include <unistd.h>

#include <cerrno>
#include <cstring>
#include <memory>
#include <utility>

#include "tavro-common.h"
#include "tavro-main.h"
#include "tavro_compose.h"
#include "tavro_compose_keeper.h"
#include "tavro_dbmgr.h"
#include "tavro_drafts_save.h"
#include "tavro_handles.h"
#include "tavro_log.h"
#include "tavro_notifications.h"
#include "tavro_preferences.h"
#include "tavro_recovery.h"
#include "tavro_report_files.h"
#include "tavro_save_journal.h"
#include "tavro_service_bridge.h"

namespace {

using BugReport = TavroHandle<tavro_dbmgr_bug_report_info, tavro_free_bug_report>;
using Suggestion = TavroHandle<tavro_dbmgr_suggestion_info, tavro_free_suggestion_info>;

void _rebind_locale() {
  if (tavro_bind_locale() != 0) TAVRO_LOGD("tavro_bind_locale failed:%s", std::strerror(errno));
}

// Replace `text` by what the entry shows; an entry without text leaves it alone.
void _copy_entry(const Evas_Object *entry, char *&text) {
  char *plain = entry ? elm_entry_markup_to_utf8(elm_entry_entry_get(entry)) : nullptr;
  if (!plain) return;
  TAVRO_FREE(text);
  text = TAVRO_ADOPT(plain);
}

// The screen that is open has an automatic copy which could be noted only. The note protects it until the
// screen is saved again.
bool open_screen_is_noted = false;

void _give_up_note() {
  if (std::exchange(open_screen_is_noted, false)) tavro_journal_abandon();
}

// For another report, while the screen stays: its note becomes its automatic copy. While the store refuses
// that, no other report can be noted, and none is stored.
void _store_note(appdata *ad) {
  const int id = open_screen_is_noted ? tavro_finish_interrupted_save() : 0;
  if (id < 1) return;
  open_screen_is_noted = false;
  const int earlier_id = std::exchange(ad->auto_saved_id, id);
  if (earlier_id >= 1) tavro_dbmgr_destroy_vocs_by_id(earlier_id);
  tavro_compose_keeper_note();
}

void _begin_save(appdata *ad, compose_view_win *view, int status) {
  if (view->menu_popup) {
    evas_object_del(view->menu_popup);
    view->menu_popup = nullptr;
  }
  _copy_entry(view->entry, view->description);
  _copy_entry(view->title_entry, view->title_description);
  // Before the report is stored: storing may take a moment, and the person is told at once.
  if (status == TAVRO_STATUS_SENDING) {
    tavro_create_notification(tavro_text("IDS_OB_TPOP_SENDING_FEEDBACK_ING_ABB"), view->description, ad);
  }
  _give_up_note();
}

template <typename Record>
void _fill_common(Record *record, const compose_view_win *view, const char *severity, const char *user_name,
                  int status) {
  record->title_description = TAVRO_STRDUP(view->title_description);
  record->app_name = TAVRO_STRDUP(view->app_name);
  record->app_icon = TAVRO_STRDUP(view->app_icon);
  record->severity = TAVRO_STRDUP(severity);
  record->attachments = tavro_populate_attachment_info(view->attachments);
  record->user_name = TAVRO_STRDUP(user_name);
  record->submitted = status;
}

// A reopened draft whose log the person took off gives up that log's file too.
void _fill_system_log(tavro_dbmgr_bug_report_info *report, const appdata *ad, const problem_view_win *view) {
  if (view->syslog_filepath) {
    report->syslog_file = TAVRO_STRDUP(view->syslog_filepath);
    report->syslog_name = TAVRO_STRDUP(view->syslog_filename);
    return;
  }
  TAVRO_LOGD("null syslog");
  if (ad->id_to_delete >= 1 && view->collectBtn && evas_object_visible_get(view->collectBtn)) {
    tavro_delete_syslog_file(ad->id_to_delete);
    TAVRO_LOGD("deleted file");
  }
}

BugReport _make_report(const appdata *ad, const char *user_name, int status) {
  const problem_view_win *view = ad->problem_view;
  BugReport report(TAVRO_ZALLOC(tavro_dbmgr_bug_report_info));
  _fill_common(report.get(), view, "High", user_name, status);
  report->description = TAVRO_STRDUP(view->description);
  if (view->dump_filepath) {
    report->dump_file = TAVRO_STRDUP(view->dump_filepath);
    report->dump_name = TAVRO_STRDUP(view->dump_filename);
  }
  _fill_system_log(report.get(), ad, view);
  if (status == TAVRO_STATUS_SENDING && !view->is_device_status_removed)
    tavro_add_extra_data_file(report.get());
  return report;
}

Suggestion _make_suggestion(const appdata *ad, const char *user_name, int status) {
  Suggestion suggestion(TAVRO_ZALLOC(tavro_dbmgr_suggestion_info));
  _fill_common(suggestion.get(), ad->idea_view, "Medium", user_name, status);
  suggestion->suggestion = TAVRO_STRDUP(ad->idea_view->description);
  return suggestion;
}

// The device status file was made for this report alone.
void _discard_files(const tavro_dbmgr_bug_report_info *report) {
  const char *path = report->device_data_filepath;
  if (path && *path && unlink(path) == -1 && errno != ENOENT)
    TAVRO_LOGE("device status file %s: %s", path, std::strerror(errno));
}

void _discard_files(const tavro_dbmgr_suggestion_info *) {}

// The id of the report when all of it was stored, else below 1.
template <typename Report>
int _store(const appdata *ad, Report *report, int (*save)(Report *), on_failed_store failed) {
  tavro_finish_interrupted_save();
  if (tavro_journal_write(report) != 0) {
    _discard_files(report);
    return -1;
  }
  const int id = tavro_journal_clear(save(report));
  if (id >= 1) return id;
  if (failed == on_failed_store::keep_screen) {
    // A report that stays on the screen must not come back by itself when it is discarded there.
    tavro_journal_abandon();
    _discard_files(report);
  } else {
    open_screen_is_noted = ad->auto_saved_id != 0;
  }
  return id;
}

void _after_store(appdata *ad, int id, int status) {
  if (id < 1) {
    TAVRO_LOGE("the report could not be stored: %d", id);
    // Nothing is being sent, so nothing may say so.
    if (status == TAVRO_STATUS_SENDING) tavro_remove_sending_notification(ad);
  } else if (status == TAVRO_STATUS_SENDING) {
    TAVRO_LOGD("insertion_done");
    _tavro_launch_upload_mgr_svc(TAVRO_OPERATION_TYPE_UI, id);
  } else if (status == TAVRO_STATUS_DRAFT_SAVED && ad->auto_saved_id == 0) {
    notification_status_message_post(tavro_text("IDS_OB_TPOP_FEEDBACK_MESSAGE_SAVED_AS_DRAFT_IN_HISTORY"));
  }
}

// After an automatic save, or a failed one that is to be tried again, the screen goes on with its own
// entries.
bool _screen_stays(const appdata *ad, int id, on_failed_store failed) {
  return ad->auto_saved_id != 0 || (id < 1 && failed == on_failed_store::keep_screen);
}

void _forget_copies(compose_view_win *view) {
  TAVRO_FREE(view->description);
  TAVRO_FREE(view->title_description);
}

}  // namespace

int tavro_drafts_save_problem(appdata *ad, int status, on_failed_store failed) {
  _rebind_locale();
  const TavroText user_name = tavro_get_username_from_preference();
  if (!ad->problem_view) {
    TAVRO_LOGD("problem view is NULL");
    return 0;
  }
  _begin_save(ad, ad->problem_view, status);
  const BugReport report = _make_report(ad, user_name.get(), status);
  const int id = _store(ad, report.get(), tavro_dbmgr_update_bug_report, failed);
  _after_store(ad, id, status);
  if (_screen_stays(ad, id, failed)) {
    _forget_copies(ad->problem_view);
  } else {
    tavro_free_problem_view(ad->problem_view);
    TAVRO_FREE(ad->problem_view);
  }
  return id;
}

int tavro_drafts_save_idea(appdata *ad, int status, on_failed_store failed) {
  _rebind_locale();
  const TavroText user_name = tavro_get_username_from_preference();
  if (!ad->idea_view) {
    TAVRO_LOGD("idea view is NULL");
    return 0;
  }
  _begin_save(ad, ad->idea_view, status);
  const Suggestion suggestion = _make_suggestion(ad, user_name.get(), status);
  const int id = _store(ad, suggestion.get(), tavro_dbmgr_update_suggestion, failed);
  _after_store(ad, id, status);
  if (_screen_stays(ad, id, failed)) {
    _forget_copies(ad->idea_view);
  } else {
    tavro_free_idea_view(ad->idea_view);
    TAVRO_FREE(ad->idea_view);
  }
  return id;
}

int tavro_save_problem_compose_data(appdata *ad, int status) {
  return tavro_drafts_save_problem(ad, status, on_failed_store::end_screen);
}

int tavro_save_idea_compose_data(appdata *ad, int status) {
  return tavro_drafts_save_idea(ad, status, on_failed_store::end_screen);
}

int tavro_send_report(appdata *ad, tavro_dbmgr_bug_report_info *report) {
  report->submitted = TAVRO_STATUS_SENDING;
  tavro_create_notification(tavro_text("IDS_OB_TPOP_SENDING_FEEDBACK_ING_ABB"), report->description, ad);
  if (tavro_compose_view(ad))
    _store_note(ad);
  else
    _give_up_note();  // its screen has ended
  const int id = _store(ad, report, tavro_dbmgr_update_bug_report, on_failed_store::keep_screen);
  _after_store(ad, id, TAVRO_STATUS_SENDING);
  return id;
}
