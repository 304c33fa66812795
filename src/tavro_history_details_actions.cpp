// What can be done with the report of the details page: sending it again, saying whether it is settled, and
// deleting it. The record may have changed since the page was built, so each reads it anew first.
#include <algorithm>

#include "tavro-common.h"
#include "tavro-main.h"
#include "tavro_history_details.h"
#include "tavro_history_text.h"
#include "tavro_report_delete.h"
#include "tavro_resend.h"
#include "tavro_widgets.h"

namespace {

// The page that is shown, for the callbacks of its buttons.
details_page *_page = nullptr;

// ---- Sending again ----

void _show_no_file_accessible(appdata *ad) {
  tavro_popup_show(ad, &ad->history_file_popup, tavro_text("IDS_OB_HEADER_NOT_YET"),
                   tavro_text("IDS_OB_BODY_FILES_GONE"), {{tavro_text("IDS_OB_BUTTON_OK"), nullptr}});
}

void _resend_clicked_cb(void *data, Evas_Object *button, void *event_info) {
  const TavroVoc voc = tavro_details_stored_now();
  if (!voc || !tavro_details_can_resend(voc->submitted)) return;
  evas_object_data_set(button, "app_data", data);
  tavro_resend_register_screen({_show_no_file_accessible, tavro_details_close});
  tavro_send_cb(voc.get(), button, event_info);
}

Evas_Object *_build_resend(details_page *page) {
  Evas_Object *bottom = tavro_layout_add(page->page, "tavro/bottom");
  elm_object_content_set(
      bottom, tavro_button_add(bottom, "tavro_primary", tavro_text("IDS_OB_BUTTON_SEND_AGAIN"), nullptr,
                               nullptr, _resend_clicked_cb, page->ad));
  return bottom;
}

// ---- Follow-up ----

bool _can_follow_up(const details_page *page, const svc_voc_data *voc) {
  if (tavro_is_follow_up(voc->id)) return false;
  unsigned long long last_ms = 0;
  for (const tavro_follow_up &follow_up : page->follow_ups)
    if (follow_up.voc->date_of_creation)
      last_ms = std::max(last_ms, tavro_details_time(follow_up.voc->date_of_creation));
  return tavro_details_can_follow_up(voc, last_ms);
}

void _follow_up_clicked_cb(void *data, Evas_Object *, void *) {
  const TavroVoc voc = tavro_details_stored_now();
  if (voc && _can_follow_up(_page, voc.get()))
    tavro_create_follow_up_page(_page->ad, voc.get(), static_cast<const char *>(data));
}

Evas_Object *_build_verdicts(details_page *page) {
  const bool is_idea = g_strcmp0(page->voc->type, TAVRO_DBMGR_SUGGESTION) == 0;
  Evas_Object *bottom = tavro_layout_add(page->page, "tavro/bottom/two");
  const auto add = [&](const char *style, const char *verdict) {
    return tavro_button_add(bottom, style, tavro_details_verdict(verdict, is_idea), nullptr, nullptr,
                            _follow_up_clicked_cb, verdict);
  };
  elm_object_content_set(bottom, add("tavro_outline", TAVRO_DBMGR_STILL_HAPPENS));
  elm_object_part_content_set(bottom, "tavro.swallow.second", add("tavro_primary", TAVRO_DBMGR_WORKS_NOW));
  return bottom;
}

// ---- Deleting ----

bool _can_delete(const svc_voc_data *voc) {
  return tavro_current_status(voc->submitted) != TAVRO_STATUS_SENDING;
}

// While the person was asked, a touched notification may have brought another report up.
void _close_deleted(appdata *ad) {
  if (_page->page && tavro_delete_is_waiting(_page->voc->id)) tavro_details_close(ad);
}

void _delete_clicked_cb(void *data, Evas_Object *, void *) {
  const TavroVoc voc = tavro_details_stored_now();
  if (voc && _can_delete(voc.get()))
    tavro_delete_reports(static_cast<appdata *>(data), {voc->id}, _close_deleted);
}

void _show_delete_button(details_page *page) {
  if (_can_delete(page->voc.get()) == (page->delete_button != nullptr)) return;
  if (page->delete_button) {
    evas_object_del(page->delete_button);
    page->delete_button = nullptr;
    return;
  }
  page->delete_button = tavro_page_action_add(page->page, "trash", tavro_text("IDS_OB_BUTTON_DELETE_REPORT"),
                                              _delete_clicked_cb, page->ad);
}

}  // namespace

void tavro_details_build_actions(details_page *page) {
  _page = page;
  Evas_Object *bottom = nullptr;
  if (tavro_details_can_resend(page->voc->submitted))
    bottom = _build_resend(page);
  else if (_can_follow_up(page, page->voc.get()))
    bottom = _build_verdicts(page);
  elm_object_part_content_set(page->page, "tavro.swallow.bottom", bottom);
  elm_object_signal_emit(page->page, bottom ? "tavro,bottom" : "tavro,bottomless", "tavro");
  _show_delete_button(page);
}
