#include "tavro_report_delete.h"

#include <Ecore.h>
#include <notification.h>

#include <algorithm>
#include <string>
#include <utility>

#include "tavro-common.h"
#include "tavro-main.h"
#include "tavro_compose.h"
#include "tavro_dbmgr.h"
#include "tavro_deleted_files.h"
#include "tavro_handles.h"
#include "tavro_log.h"
#include "tavro_memory.h"
#include "tavro_notifications.h"
#include "tavro_preferences.h"
#include "tavro_screens.h"
#include "tavro_undo_bar.h"

namespace {

// What the popup asks about.
struct question {
  std::vector<int> voc_ids;
  void (*confirmed)(appdata *ad);
} _asked;

std::vector<int> _waiting;
Ecore_Timer *_timer = nullptr;  // while something waits
void (*_screen_changed)(appdata *ad) = nullptr;

// "1 …" has a text of its own.
std::string _counted(const char *one, const char *several, size_t count) {
  if (count == 1) return tavro_text(one);
  const TavroGText text(g_strdup_printf(tavro_text(several), static_cast<int>(count)));
  return text.get();
}

void _redraw(appdata *ad) {
  if (_screen_changed) _screen_changed(ad);
}

std::vector<int> _stop_waiting() {
  if (_timer) ecore_timer_del(std::exchange(_timer, nullptr));
  tavro_undo_bar_hide();
  return std::exchange(_waiting, {});
}

void _undo(appdata *ad) {
  const std::vector<int> kept = _stop_waiting();
  TAVRO_LOGD("deletion of %zu reports taken back", kept.size());
  _redraw(ad);
}

Eina_Bool _time_is_up_cb(void *data) {
  _timer = nullptr;
  tavro_delete_finish(static_cast<appdata *>(data));
  return ECORE_CALLBACK_CANCEL;
}

// The screen on which a draft that is to go is being written goes as well. One that holds more than the draft
// asks the person itself, and the draft stays meanwhile.
void _leave_drafts_screen(appdata *ad, std::vector<int> &voc_ids) {
  const auto draft = std::find(voc_ids.begin(), voc_ids.end(), ad->id_to_delete);
  if (draft == voc_ids.end() || !tavro_compose_view(ad)) return;
  if (!tavro_leave_compose_page(ad)) voc_ids.erase(draft);
}

void _confirmed(appdata *ad) {
  tavro_delete_finish(ad);
  question asked = std::exchange(_asked, {});
  _leave_drafts_screen(ad, asked.voc_ids);
  if (asked.voc_ids.empty()) return;
  _waiting = asked.voc_ids;
  _timer = ecore_timer_add(TAVRO_UNDO_SECONDS, _time_is_up_cb, ad);
  if (asked.confirmed) asked.confirmed(ad);
  _redraw(ad);
  const std::string text =
      _counted("IDS_OB_BODY_1_REPORT_DELETED", "IDS_OB_BODY_PD_REPORTS_DELETED", _waiting.size());
  tavro_undo_bar_show(ad, text.c_str(), _undo);
}

// Rows first, files after. False when the store refused: then nothing has gone.
bool _delete(const std::vector<int> &voc_ids, std::vector<int> *deleted) {
  if (!tavro_deleted_files_note(voc_ids)) return false;
  const bool is_done = tavro_dbmgr_destroy_vocs_by_ids(voc_ids, deleted) == 0;
  // Also when nothing has gone: what a report still names stays, and the note is done with.
  tavro_deleted_files_remove();
  return is_done;
}

void _refresh(appdata *ad, const std::vector<int> &deleted) {
  const TavroText user_name = tavro_get_username_from_preference();
  tavro_refresh_unread_count(ad, user_name.get());
  tavro_update_landing_page_history_badge(ad);
  for (const int voc_id : deleted) {
    tavro_remove_reply_notification(voc_id);
    tavro_update_history_details_page(ad, voc_id);
  }
  _redraw(ad);
}

}  // namespace

void tavro_delete_reports(appdata *ad, const std::vector<int> &voc_ids, void (*confirmed)(appdata *ad)) {
  if (voc_ids.empty()) return;
  _asked = {voc_ids, confirmed};
  const size_t count = voc_ids.size();
  tavro_popup_show(
      ad, &ad->delete_popup,
      _counted("IDS_OB_HEADER_DELETE_REPORT", "IDS_OB_HEADER_DELETE_PD_REPORTS", count).c_str(),
      tavro_text(count == 1 ? "IDS_OB_BODY_DELETE_REPORT" : "IDS_OB_BODY_DELETE_REPORTS"),
      {{tavro_text("IDS_OB_BUTTON_CANCEL"), nullptr}, {tavro_text("IDS_OB_BUTTON_DELETE_ABB5"), _confirmed}});
}

bool tavro_delete_is_waiting(int voc_id) {
  return std::find(_waiting.begin(), _waiting.end(), voc_id) != _waiting.end();
}

void tavro_delete_finish(appdata *ad) {
  const std::vector<int> voc_ids = _stop_waiting();
  if (voc_ids.empty()) return;
  std::vector<int> deleted;
  if (!_delete(voc_ids, &deleted)) {
    TAVRO_LOGE("%zu reports not deleted", voc_ids.size());
    notification_status_message_post(tavro_text("IDS_OB_TPOP_NOT_DELETED"));
  } else if (deleted.size() < voc_ids.size()) {
    notification_status_message_post(tavro_text("IDS_OB_TPOP_NOT_DELETED_BEING_SENT"));
  }
  _refresh(ad, deleted);
}

void tavro_delete_register_screen(void (*changed)(appdata *ad)) {
  _screen_changed = changed;
}
