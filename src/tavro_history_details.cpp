// Details of one report: its way so far, what the person wrote and what the maker answered. This file is the
// page's life.
#include "tavro_history_details.h"

#include <algorithm>

#include "tavro-common.h"
#include "tavro-main.h"
#include "tavro_log.h"
#include "tavro_notifications.h"
#include "tavro_preferences.h"
#include "tavro_report_delete.h"
#include "tavro_screens.h"
#include "tavro_targets.h"
#include "tavro_widgets.h"

namespace {

details_page _details = {};
Ecore_Job *_refresh_job = nullptr;
Ecore_Job *_open_job = nullptr;
int _voc_to_open = 0;

void _page_deleted_cb(void *, Evas *, Evas_Object *page, void *) {
  if (_details.page == page) _details = {};
}

// Read the shown report anew, for other programs change it too. False when it is gone: then the page is, too,
// and the person knows why.
bool _reload(appdata *ad) {
  TavroVoc voc = tavro_details_stored(_details.voc->id);
  if (voc) {
    _details.voc = std::move(voc);
    _details.first = tavro_follow_up_first(_details.voc->id);
    _details.follow_ups = tavro_follow_ups_of(_details.voc.get());
    return true;
  }
  TAVRO_LOGD("report %d is gone", _details.voc->id);
  tavro_details_close(ad);
  tavro_details_say_gone(ad);
  return false;
}

// ---- Building ----

// The beginning of what support said last comes into view: it has just led the person here. Pages that were
// pushed in one turn come up before they have a size; then it waits for that.
void _show_answer() {
  int shown_height = 0, page_top = 0, top = 0, height = 0;
  elm_scroller_region_get(_details.scroller, nullptr, nullptr, nullptr, &shown_height);
  _details.shows_answer_later = shown_height == 0;
  if (_details.shows_answer_later) return;
  evas_smart_objects_calculate(evas_object_evas_get(_details.page));
  Eina_List *children = elm_box_children_get(_details.box);
  const auto *answer = static_cast<const Evas_Object *>(eina_list_last_data_get(children));
  eina_list_free(children);
  evas_object_geometry_get(elm_object_content_get(_details.scroller), nullptr, &page_top, nullptr, nullptr);
  evas_object_geometry_get(answer, nullptr, &top, nullptr, &height);
  const int gap = static_cast<int>(12 * elm_config_scale_get());
  elm_scroller_region_show(_details.scroller, 0, top - page_top - gap, 1,
                           std::min(height + 2 * gap, shown_height));
}

void _show_answer_cb(void *) {
  if (_details.page && _details.shows_answer_later) _show_answer();
}

// The page got another width: the texts wrap anew.
void _resized_cb(void *, Evas *, Evas_Object *scroller, void *) {
  Eina_List *children = elm_box_children_get(_details.box);
  void *child = nullptr;
  EINA_LIST_FREE(children, child) {
    Evas_Object *strut =
        elm_object_part_content_get(static_cast<Evas_Object *>(child), "tavro.swallow.strut");
    if (strut) evas_object_size_hint_min_set(strut, tavro_details_text_width(scroller), 0);
  }
  if (_details.shows_answer_later) ecore_job_add(_show_answer_cb, nullptr);
}

void _show_report() {
  elm_box_clear(_details.box);
  tavro_details_build(&_details);
  tavro_details_build_actions(&_details);
}

// The same place of the page stays before the person's eyes.
void _show_report_in_place() {
  int x = 0, y = 0, width = 0, height = 0;
  elm_scroller_region_get(_details.scroller, &x, &y, &width, &height);
  const bool had_focus = elm_object_focus_get(_details.box);
  _show_report();
  evas_smart_objects_calculate(evas_object_evas_get(_details.page));
  elm_scroller_region_show(_details.scroller, x, y, width, height);
  if (had_focus) elm_object_focus_set(_details.scroller, EINA_TRUE);
}

void _mark_as_read() {
  tavro_dbmgr_update_read_push_notifications(_details.voc->id, 1);
  for (const tavro_follow_up &follow_up : _details.follow_ups)
    if (follow_up.voc->push_comments && follow_up.voc->push_read == 0)
      tavro_dbmgr_update_read_push_notifications(follow_up.voc->id, 1);
  const TavroText user_name = tavro_get_username_from_preference();
  tavro_refresh_unread_count(_details.ad, user_name.get());
  tavro_update_landing_page_history_badge(_details.ad);
}

// They have led the person here, or have become needless. Those that come while the page is open stay: the
// window may be hidden.
void _remove_notifications() {
  tavro_remove_reply_notification(_details.voc->id);
  for (const tavro_follow_up &follow_up : _details.follow_ups)
    tavro_remove_reply_notification(follow_up.voc->id);
}

bool _has_unread_answer() {
  const auto is_unread = [](const svc_voc_data *voc) { return voc->push_comments && voc->push_read == 0; };
  return is_unread(_details.voc.get()) ||
         std::any_of(_details.follow_ups.begin(), _details.follow_ups.end(),
                     [&](const tavro_follow_up &follow_up) { return is_unread(follow_up.voc.get()); });
}

void _build_box() {
  _details.box = tavro_scrolled_box_add(_details.page, &_details.scroller);
  Evas_Object *scroller = _details.scroller;
  evas_object_event_callback_add(scroller, EVAS_CALLBACK_RESIZE, _resized_cb, nullptr);
  elm_box_padding_set(_details.box, 0, static_cast<int>(10 * elm_config_scale_get()));
  elm_object_content_unset(scroller);
  Evas_Object *margins = tavro_layout_add(scroller, "tavro/margins");
  tavro_fill_width(margins);
  elm_object_content_set(margins, _details.box);
  elm_object_content_set(scroller, margins);
  elm_object_content_set(_details.page, scroller);
}

// Cards and bubbles take the focus, so that the keys lead through the page; what has it comes into view.
void _focus_child(void *(*choose)(const Eina_List *children)) {
  Eina_List *children = elm_box_children_get(_details.box);
  elm_object_focus_set(static_cast<Evas_Object *>(choose(children)), EINA_TRUE);
  eina_list_free(children);
}

// The naviframe gives the focus of a page that comes up to its first button, where a blank would close it.
void _focus_start_cb(void *, Evas_Object *nf, void *) {
  evas_object_smart_callback_del(nf, "transition,finished", _focus_start_cb);
  if (_details.page && elm_naviframe_top_item_get(nf) == _details.nf_it) _focus_child(eina_list_data_get);
}

void _focus_end_cb(void *, Evas_Object *nf, void *) {
  evas_object_smart_callback_del(nf, "transition,finished", _focus_end_cb);
  if (!_details.page || elm_naviframe_top_item_get(nf) != _details.nf_it) return;
  _focus_child(eina_list_last_data_get);
  int content = 0;
  evas_smart_objects_calculate(evas_object_evas_get(_details.page));
  elm_scroller_child_size_get(_details.scroller, nullptr, &content);
  elm_scroller_region_show(_details.scroller, 0, std::max(0, content - 1), 1, 1);
}

void _focus_answer_cb(void *, Evas_Object *nf, void *) {
  evas_object_smart_callback_del(nf, "transition,finished", _focus_answer_cb);
  if (!_details.page || elm_naviframe_top_item_get(nf) != _details.nf_it) return;
  _focus_child(eina_list_last_data_get);
  _show_answer();
}

// As the report of the page, in its conversation, or as the one that it follows up.
bool _is_shown(int voc_id) {
  if (!_details.page) return false;
  if (_details.voc->id == voc_id || (_details.first && _details.first->id == voc_id)) return true;
  const int first = tavro_dbmgr_get_follow_up(voc_id, nullptr);
  return first > 0 && first == _details.voc->server_voc_id;
}

}  // namespace

TavroVoc tavro_details_stored(int voc_id) {
  TavroVoc voc(tavro_delete_is_waiting(voc_id) ? nullptr : tavro_dbmgr_get_voc_by_id(voc_id));
  if (voc && !tavro_is_for_signed_in_user(voc->user_name)) voc.reset();
  return voc;
}

void tavro_details_say_gone(appdata *ad) {
  tavro_popup_show(ad, &ad->history_file_popup, tavro_text("IDS_OB_HEADER_REPORT_GONE"),
                   tavro_text("IDS_OB_BODY_REPORT_GONE"), {{tavro_text("IDS_OB_BUTTON_OK"), nullptr}});
}

TavroVoc tavro_details_stored_now() {
  if (!_details.page) return TavroVoc();
  TavroVoc voc = tavro_details_stored(_details.voc->id);
  if (!voc || g_strcmp0(voc->submitted, _details.voc->submitted) != 0) tavro_details_refresh_later();
  return voc;
}

void tavro_details_close(appdata *) {
  if (_details.nf_it) elm_object_item_del(_details.nf_it);
}

void tavro_details_refresh_later() {
  if (_refresh_job) return;
  _refresh_job = ecore_job_add(
      [](void *) {
        _refresh_job = nullptr;
        if (_details.page) tavro_update_history_details_page(_details.ad, _details.voc->id);
      },
      nullptr);
}

void tavro_details_show_end() {
  if (_details.page)
    evas_object_smart_callback_add(_details.ad->nf, "transition,finished", _focus_end_cb, nullptr);
}

void tavro_details_open_later(int voc_id) {
  _voc_to_open = voc_id;
  if (_open_job) return;
  _open_job = ecore_job_add(
      [](void *) {
        _open_job = nullptr;
        if (_details.page) tavro_create_history_details_page(_details.ad, _voc_to_open);
      },
      nullptr);
}

void tavro_update_history_details_page(appdata *ad, int voc_id) {
  if (!_is_shown(voc_id) || !_reload(ad)) return;
  _show_report_in_place();
  // The answer is on the screen: it has been read.
  if (_has_unread_answer()) _mark_as_read();
}

void tavro_create_history_details_page(appdata *ad, int voc_id) {
  if (!ad->nf) return;
  TavroVoc voc = tavro_details_stored(voc_id);
  if (!voc) {
    TAVRO_LOGD("no report with id %d", voc_id);
    return tavro_details_say_gone(ad);
  }
  // Only a touched notification leads to the page that is open: its answer came while nobody was looking.
  const bool is_open = _details.page && _details.voc->id == voc_id;
  tavro_details_close(ad);
  const std::string title = tavro_details_text(tavro_target_text(voc->app_name));
  _details = {};
  _details.ad = ad;
  _details.voc = std::move(voc);
  _details.first = tavro_follow_up_first(voc_id);
  _details.follow_ups = tavro_follow_ups_of(_details.voc.get());
  _details.shown_states = kStatesAtFirst;
  _details.shown_messages = kMessagesAtFirst;
  _details.page = tavro_page_add(ad, title.c_str(), "back");
  evas_object_event_callback_add(_details.page, EVAS_CALLBACK_DEL, _page_deleted_cb, nullptr);
  _build_box();
  _show_report();
  const bool shows_answer =
      _details.messages.back().kind == TAVRO_MESSAGE_REPLY && (is_open || _has_unread_answer());
  evas_object_smart_callback_add(ad->nf, "transition,finished",
                                 shows_answer ? _focus_answer_cb : _focus_start_cb, nullptr);
  _details.nf_it = tavro_page_push(ad, _details.page, title.c_str());
  _mark_as_read();
  _remove_notifications();
}
