#include "tavro_crash_popup.h"

#include <glib.h>

#include "tavro-common.h"
#include "tavro-main.h"
#include "tavro_crash_rules.h"
#include "tavro_handles.h"
#include "tavro_widgets.h"

namespace {

Evas_Object *_ground = nullptr;

std::string _text_with(const char *id, const std::string &app_name) {
  return TavroGText(g_strdup_printf(tavro_text(id), tavro_crash_short_name(app_name).c_str())).get();
}

std::string _count_text(int count) {
  if (count <= 1) return tavro_text("IDS_OB_BODY_CRASHED_FIRST");
  return TavroGText(g_strdup_printf(tavro_text("IDS_OB_BODY_CRASHED_PD_TIMES"), count)).get();
}

void _ground_deleted_cb(void *, Evas *, Evas_Object *ground, void *) {
  if (_ground == ground) _ground = nullptr;
}

}  // namespace

Evas_Object *tavro_crash_popup_ask(appdata *ad, const tavro_crash_question &question,
                                   tavro_crash_action report, tavro_crash_action never) {
  const std::string title = _text_with("IDS_OB_HEADER_PS_STOPPED", question.app_name);
  const std::string count = _count_text(question.count);
  tavro_card card = {};
  card.tile = "bug";
  card.picture = question.icon.empty() ? nullptr : question.icon.c_str();
  card.title = title.c_str();
  card.subtitle = count.c_str();
  card.body = tavro_text("IDS_OB_BODY_CRASH_QUESTION");
  card.main = {tavro_text("IDS_OB_BUTTON_REPORT"), report};
  return tavro_card_show(
      ad, &ad->crash_popup, card,
      {{tavro_text("IDS_OB_BUTTON_NEVER_FOR_THIS"), never}, {tavro_text("IDS_OB_BUTTON_NOT_NOW"), nullptr}});
}

void tavro_crash_popup_count(appdata *ad, int count) {
  if (ad->crash_popup) tavro_card_subtitle_set(ad->crash_popup, _count_text(count).c_str());
}

Evas_Object *tavro_crash_popup_progress(appdata *ad, const std::string &app_name) {
  const std::string name = tavro_crash_short_name(app_name);
  tavro_card card = {};
  card.tile = "spinner";
  card.title = tavro_text("IDS_OB_HEADER_CRASH_COLLECTING");
  card.subtitle = name.c_str();
  card.body = tavro_text("IDS_OB_BODY_CRASH_COLLECTING");
  return tavro_card_show(ad, &ad->crash_popup, card, {{tavro_text("IDS_OB_BUTTON_CANCEL"), nullptr}});
}

Evas_Object *tavro_crash_popup_never(appdata *ad, const std::string &app_name, tavro_crash_action undo) {
  const std::string body = _text_with("IDS_OB_BODY_CRASH_NEVER_PS", app_name);
  return tavro_popup_show(
      ad, &ad->crash_popup, tavro_text("IDS_OB_HEADER_CRASH_NEVER"), body.c_str(),
      {{tavro_text("IDS_OB_BUTTON_UNDO"), undo}, {tavro_text("IDS_OB_BUTTON_OK"), nullptr}});
}

void tavro_crash_ground_show(appdata *ad) {
  if (_ground || !tavro_create_base_window(ad) || elm_naviframe_top_item_get(ad->nf)) return;
  _ground = tavro_layout_add(ad->win, "tavro/crash/ground");
  elm_object_part_content_set(_ground, "elm.swallow.icon", tavro_icon_add(_ground, "chat/large"));
  elm_object_part_text_set(_ground, "elm.text", "Vantor Community");
  elm_win_resize_object_add(ad->win, _ground);
  evas_object_event_callback_add(_ground, EVAS_CALLBACK_DEL, _ground_deleted_cb, nullptr);
}

void tavro_crash_ground_hide() {
  if (_ground) evas_object_del(_ground);
}
