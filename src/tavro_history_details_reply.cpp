// Where the person writes a follow-up: one optional text and "Send". What is typed is kept from the first
// second on, so neither leaving the page nor the end of the client loses it.
#include <algorithm>
#include <utility>

#include "tavro-common.h"
#include "tavro-main.h"
#include "tavro_history_details.h"
#include "tavro_memory.h"
#include "tavro_screens.h"
#include "tavro_widgets.h"

namespace {

constexpr double kKeepSeconds = 1.0;

// The one page that can be open; `page` null: none, or its text was sent and it is about to go.
struct follow_up_page {
  appdata *ad;
  Evas_Object *page, *entry;
  Elm_Object_Item *nf_it;
  int voc_id, server_id;  // of the report that is followed up
  std::string verdict;
  std::string text;    // what the entry shows
  Ecore_Timer *timer;  // until the text is kept; null: it is
} _reply = {};

Eina_Bool _keep_cb(void *) {
  _reply.timer = nullptr;
  tavro_follow_up_keep(_reply.server_id, _reply.text);
  return ECORE_CALLBACK_CANCEL;
}

// The page no longer counts as open. Returns what it was.
follow_up_page _leave() {
  if (_reply.timer) ecore_timer_del(_reply.timer);
  return std::exchange(_reply, {});
}

void _leave_and_keep() {
  const bool is_kept = !_reply.timer;
  const follow_up_page left = _leave();
  if (!is_kept) tavro_follow_up_keep(left.server_id, left.text);
}

void _page_deleted_cb(void *, Evas *, Evas_Object *page, void *) {
  if (_reply.page == page) _leave_and_keep();
}

void _typed_cb(void *, Evas_Object *entry, void *) {
  if (_reply.entry != entry) return;
  const TavroText plain(TAVRO_ADOPT(elm_entry_markup_to_utf8(elm_entry_entry_get(entry))));
  _reply.text = tavro_details_text(plain.get());
  if (!_reply.timer) _reply.timer = ecore_timer_add(kKeepSeconds, _keep_cb, nullptr);
}

void _say_not_stored(appdata *ad) {
  tavro_popup_show(ad, &ad->history_file_popup, tavro_text("IDS_OB_HEADER_NOT_STORED"),
                   tavro_text("IDS_OB_BODY_FOLLOW_UP_NOT_STORED"),
                   {{tavro_text("IDS_OB_BUTTON_OK"), nullptr}});
}

void _send_clicked_cb(void *, Evas_Object *, void *) {
  if (!_reply.page) return;  // touched again while the page goes
  appdata *ad = _reply.ad;
  const TavroVoc first = tavro_details_stored(_reply.voc_id);
  if (!first) return tavro_details_say_gone(ad);
  if (tavro_follow_up_send(ad, first.get(), _reply.verdict.c_str(), _reply.text) < 1)
    return _say_not_stored(ad);
  const follow_up_page sent = _leave();
  tavro_follow_up_keep(sent.server_id, "");
  tavro_update_history_page(nullptr, ad);
  tavro_update_history_details_page(ad, sent.voc_id);
  tavro_details_show_end();
  elm_naviframe_item_pop(ad->nf);
}

// Writing comes next.
void _focus_entry_cb(void *, Evas_Object *nf, void *) {
  evas_object_smart_callback_del(nf, "transition,finished", _focus_entry_cb);
  if (_reply.page && elm_naviframe_top_item_get(nf) == _reply.nf_it)
    elm_object_focus_set(_reply.entry, EINA_TRUE);
}

const char *_hint(bool is_idea) {
  if (_reply.verdict == TAVRO_DBMGR_WORKS_NOW) return tavro_text("IDS_OB_BODY_WORKS_NOW_HINT");
  return tavro_text(is_idea ? "IDS_OB_BODY_STILL_MISSING_HINT" : "IDS_OB_BODY_STILL_HAPPENS_HINT");
}

void _build_note(Evas_Object *box) {
  Evas_Object *note = elm_label_add(box);
  elm_object_style_set(note, "tavro_note");
  elm_label_line_wrap_set(note, ELM_WRAP_MIXED);
  tavro_layout_text_set(note, nullptr, tavro_text("IDS_OB_BODY_FOLLOW_UP_NOTE"));
  tavro_fill_width(note);
  evas_object_show(note);
  elm_box_pack_end(box, note);
}

Evas_Object *_build_content(bool is_idea) {
  Evas_Object *scroller = nullptr, *field = nullptr;
  Evas_Object *box = tavro_scrolled_box_add(_reply.page, &scroller);
  _build_note(box);
  Evas_Object *margins = tavro_layout_add(box, "tavro/margins/sides");
  tavro_fill_width(margins);
  _reply.entry = tavro_field_add(margins, _hint(is_idea), false, &field);
  elm_object_content_set(margins, field);
  elm_box_pack_end(box, margins);
  elm_entry_entry_set(_reply.entry, tavro_markup(_reply.text.c_str()).c_str());
  elm_entry_cursor_end_set(_reply.entry);
  evas_object_smart_callback_add(_reply.entry, "changed", _typed_cb, nullptr);
  return scroller;
}

void _build_bottom() {
  Evas_Object *bottom = tavro_layout_add(_reply.page, "tavro/bottom");
  elm_object_content_set(bottom, tavro_button_add(bottom, "tavro_primary", tavro_text("IDS_OB_BUTTON_SEND"),
                                                  nullptr, nullptr, _send_clicked_cb, nullptr));
  elm_object_part_content_set(_reply.page, "tavro.swallow.bottom", bottom);
  elm_object_signal_emit(_reply.page, "tavro,bottom", "tavro");
}

}  // namespace

void tavro_create_follow_up_page(appdata *ad, const svc_voc_data *first, const char *verdict) {
  Elm_Object_Item *open_already = _reply.nf_it;
  _leave_and_keep();
  if (open_already) elm_object_item_del(open_already);
  const bool is_idea = g_strcmp0(first->type, TAVRO_DBMGR_SUGGESTION) == 0;
  const char *title = tavro_details_verdict(verdict, is_idea);
  _reply.ad = ad;
  _reply.voc_id = first->id;
  _reply.server_id = first->server_voc_id;
  _reply.verdict = verdict;
  _reply.text = tavro_follow_up_kept(first);
  _reply.page = tavro_page_add(ad, title, "back");
  evas_object_event_callback_add(_reply.page, EVAS_CALLBACK_DEL, _page_deleted_cb, nullptr);
  elm_object_content_set(_reply.page, _build_content(is_idea));
  _build_bottom();
  evas_object_smart_callback_add(ad->nf, "transition,finished", _focus_entry_cb, nullptr);
  _reply.nf_it = tavro_page_push(ad, _reply.page, title);
}
