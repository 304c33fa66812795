#include <notification.h>
#include <sys/stat.h>

#include <algorithm>
#include <cstdio>
#include <string>

#include "tavro-common.h"
#include "tavro-main.h"
#include "tavro_appdata.h"
#include "tavro_autosave.h"
#include "tavro_compose_keeper.h"
#include "tavro_crash_archive.h"
#include "tavro_dbmgr.h"
#include "tavro_deleted_files.h"
#include "tavro_drafts.h"
#include "tavro_drafts_save.h"
#include "tavro_memory.h"
#include "tavro_preferences.h"
#include "tavro_report_files.h"
#include "tavro_system_log.h"

namespace {

constexpr gint64 kBytesPerKilobyte = 1024;
constexpr gint64 kDefaultSizeLimitBytes = 31457280;
constexpr gint64 kLargestSizeLimitBytes = 1073741824;  // more than any desk takes
constexpr int kRefused = -1;

gint64 _file_size(const char *path) {
  struct stat info = {};
  return path && stat(path, &info) == 0 ? static_cast<gint64>(info.st_size) : 0;
}

bool _exceeds_size_limit(problem_view_win *view) {
  view->server_size_error = view->buffer + _file_size(view->syslog_filepath) > tavro_attachment_size_limit();
  return view->server_size_error;
}

void _post_size_message() {
  char message[128] = {};
  // Kept: the figure is fixed, whatever the limit is.
  std::snprintf(message, sizeof message, "Cannot send. Feedback message exceeded max limit of %s MB", "30.0");
  notification_status_message_post(message);
}

void _free_image_list(appdata *ad) {
  for (GSList *node = ad->image_list; node; node = node->next) {
    char *path = static_cast<char *>(node->data);
    TAVRO_FREE(path);
  }
  g_slist_free(ad->image_list);
  ad->image_list = nullptr;
  tavro_select_boxes_free(ad);
}

int _save_by_kind(appdata *ad, int status) {
  return ad->type == IDEA ? tavro_drafts_save_idea(ad, status, on_failed_store::keep_screen)
                          : tavro_drafts_save_problem(ad, status, on_failed_store::keep_screen);
}

// A draft goes with its log, unless the record that replaces it has the same one, and with its dump, unless
// any record has that.
void _destroy_replaced_draft(int draft, const std::string &kept_log) {
  const TavroText log(tavro_dbmgr_get_voc_syslog_file_by_id(draft));
  if (log && log.get() != kept_log) tavro_delete_syslog_file(draft);
  const TavroText dump(tavro_dbmgr_get_dump_file_by_id(draft));
  tavro_dbmgr_destroy_vocs_by_id(draft);
  if (dump && *dump) tavro_crash_archive_delete_unneeded(dump.get());
}

// The draft that the screen came from and its automatic copy go when the new record is stored: a store that
// refuses the record, or an end of the process in between, then loses neither.
int _end_compose_screen(appdata *ad, int status) {
  if (ad->problem_view) ad->problem_view->server_size_error = false;  // of an earlier try
  const int opened_from = ad->id_to_delete;
  const int auto_saved = ad->auto_saved_id;
  tavro_compose_keeper_flush();  // so that it is known for the same report if the process ends in between
  ad->auto_saved_id = 0;
  const char *log_path = ad->problem_view ? ad->problem_view->syslog_filepath : nullptr;
  const std::string log = log_path ? log_path : "";  // the record ends with the save
  const int id = _save_by_kind(ad, status);
  if (id < 1) {
    ad->auto_saved_id = auto_saved;
    return id;
  }
  tavro_deleted_files_note_copies({opened_from, auto_saved}, {});  // some were taken off the screen since
  if (opened_from >= 1) _destroy_replaced_draft(opened_from, log);
  if (auto_saved >= 1 && auto_saved != opened_from) tavro_dbmgr_destroy_vocs_by_id(auto_saved);
  tavro_compose_keeper_forget();
  tavro_deleted_files_remove();
  tavro_system_log_end(ad);
  tavro_pop_naviframe_middle_items(ad);
  _free_image_list(ad);
  ad->id_to_delete = 0;
  tavro_autosave_stop();
  return id;
}

}  // namespace

gint64 tavro_attachment_size_limit() {
  const gint64 kilobytes = tavro_preference_int(TAVRO_PREF_MAX_SIZE_ATTACHMENT, 0);
  if (kilobytes <= 0) return kDefaultSizeLimitBytes;
  return std::min(kilobytes * kBytesPerKilobyte, kLargestSizeLimitBytes);
}

int tavro_send_compose_data(appdata *ad) {
  if (ad->type != IDEA && ad->problem_view && _exceeds_size_limit(ad->problem_view)) {
    _post_size_message();
    return kRefused;
  }
  return _end_compose_screen(ad, TAVRO_STATUS_SENDING);
}

int tavro_save_compose_draft(appdata *ad) {
  return _end_compose_screen(ad, TAVRO_STATUS_DRAFT_SAVED);
}
