// The landing page: what a person can do here, and whether an answer has arrived.
#include <app.h>

#include <cstdio>
#include <string>

#include "tavro-common.h"
#include "tavro-main.h"
#include "tavro_app_list.h"
#include "tavro_dbmgr.h"
#include "tavro_memory.h"
#include "tavro_notifications.h"
#include "tavro_preferences.h"
#include "tavro_screens.h"
#include "tavro_widgets.h"

namespace {

// The "My reports" row, null while the landing page is not built.
Evas_Object *_history_row = nullptr;

void _problem_clicked_cb(void *data, Evas_Object *, void *) {
  appdata *ad = static_cast<appdata *>(data);
  ad->type = PROBLEM;
  tavro_create_problem_page(ad, nullptr);
}

void _idea_clicked_cb(void *data, Evas_Object *, void *) {
  tavro_create_idea_page(static_cast<appdata *>(data), nullptr);
}

void _history_clicked_cb(void *data, Evas_Object *, void *) {
  tavro_create_history_page(static_cast<appdata *>(data));
}

Eina_Bool _pop_cb(void *, Elm_Object_Item *) {
  ui_app_exit();
  return EINA_FALSE;
}

std::string _answers_text(int count) {
  if (count < 1) return tavro_text("IDS_OB_BODY_NO_NEW_ANSWERS");
  if (count == 1) return tavro_text("IDS_OB_BODY_1_NEW_ANSWER");
  char text[128];
  std::snprintf(text, sizeof text, tavro_text("IDS_OB_BODY_PD_NEW_ANSWERS"), count);
  return text;
}

void _add_gap(Evas_Object *box, int units) {
  Evas_Object *gap = evas_object_rectangle_add(evas_object_evas_get(box));
  evas_object_color_set(gap, 0, 0, 0, 0);
  evas_object_size_hint_min_set(gap, 1, static_cast<int>(units * elm_config_scale_get()));
  tavro_fill_width(gap);
  evas_object_show(gap);
  elm_box_pack_end(box, gap);
}

void _add_with_margins(Evas_Object *box, Evas_Object *content) {
  Evas_Object *frame = tavro_layout_add(box, "tavro/margins");
  tavro_fill_width(frame);
  elm_object_content_set(frame, content);
  elm_box_pack_end(box, frame);
}

Evas_Object *_build_hero(Evas_Object *box) {
  Evas_Object *hero = tavro_layout_add(box, "tavro/landing/hero");
  tavro_fill_width(hero);
  tavro_layout_text_set(hero, "elm.text", tavro_text("IDS_OB_BODY_HELLO"));
  tavro_layout_text_set(hero, "elm.text.sub", tavro_text("IDS_OB_BODY_WELCOME"));
  return hero;
}

Evas_Object *_build_card(Evas_Object *box, const char *tile, const char *text, Evas_Smart_Cb clicked,
                         appdata *ad) {
  Evas_Object *card =
      tavro_button_add(box, "tavro_card", text, tavro_tile_add(box, tile), nullptr, clicked, ad);
  evas_object_size_hint_weight_set(card, EVAS_HINT_EXPAND, 0.0);
  evas_object_size_hint_align_set(card, EVAS_HINT_FILL, EVAS_HINT_FILL);
  return card;
}

Evas_Object *_build_cards(appdata *ad, Evas_Object *box) {
  Evas_Object *cards = elm_box_add(box);
  elm_box_horizontal_set(cards, EINA_TRUE);
  elm_box_homogeneous_set(cards, EINA_TRUE);
  elm_box_padding_set(cards, static_cast<int>(12 * elm_config_scale_get()), 0);
  tavro_fill_width(cards);
  elm_box_pack_end(cards, _build_card(cards, "bug", tavro_text("IDS_OB_HEADER_REPORT_A_PROBLEM"),
                                      _problem_clicked_cb, ad));
  elm_box_pack_end(
      cards, _build_card(cards, "bulb", tavro_text("IDS_OB_HEADER_SHARE_AN_IDEA"), _idea_clicked_cb, ad));
  evas_object_show(cards);
  return cards;
}

void _build_history_row(appdata *ad, Evas_Object *box) {
  _history_row = tavro_row_add(box, "list", tavro_text("IDS_OB_HEADER_MY_REPORTS"), "", nullptr,
                               _history_clicked_cb, ad);
  evas_object_event_callback_add(
      _history_row, EVAS_CALLBACK_DEL, [](void *, Evas *, Evas_Object *, void *) { _history_row = nullptr; },
      nullptr);
  elm_box_pack_end(box, _history_row);
  tavro_update_landing_page_history_badge(ad);
}

}  // namespace

void tavro_update_landing_page_history_badge(appdata *ad) {
  if (!_history_row) return;
  tavro_row_subtitle_set(_history_row, _answers_text(ad->push_noti_count).c_str());
  Evas_Object *end = nullptr;
  if (ad->push_noti_count > 0) {
    end = tavro_layout_add(_history_row, "tavro/badge");
    elm_object_text_set(end, std::to_string(ad->push_noti_count).c_str());
  } else {
    end = tavro_icon_add(_history_row, "chevron");
  }
  elm_object_part_content_set(_history_row, "elm.swallow.end", end);
}

void tavro_create_landing_page(appdata *ad) {
  if (ad->landing_nf_it || !ad->nf) return;
  const int unread = tavro_dbmgr_get_unread_push_notification_count(nullptr);
  ad->push_noti_count = unread > 0 ? unread : 0;
  Evas_Object *page = tavro_page_add(ad, "Vantor Community", nullptr);
  Evas_Object *scroller = nullptr;
  Evas_Object *box = tavro_scrolled_box_add(page, &scroller);
  _add_with_margins(box, _build_hero(box));
  Evas_Object *cards = tavro_layout_add(box, "tavro/margins/sides");
  tavro_fill_width(cards);
  elm_object_content_set(cards, _build_cards(ad, cards));
  elm_box_pack_end(box, cards);
  _add_gap(box, 12);
  _build_history_row(ad, box);
  elm_object_content_set(page, scroller);
  ad->landing_nf_it = tavro_page_push(ad, page, "Vantor Community");
  elm_naviframe_item_pop_cb_set(ad->landing_nf_it, _pop_cb, ad);
  tavro_app_list_store_soon();
}
