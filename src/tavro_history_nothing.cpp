// What "My Reports" shows in the list's place when it has no rows: why that is so, and what to do next.
#include <elm_atspi.h>

#include "tavro-common.h"
#include "tavro-main.h"
#include "tavro_appdata.h"
#include "tavro_history_parts.h"
#include "tavro_screens.h"
#include "tavro_widgets.h"

namespace {

constexpr char kNothingPart[] = "tavro.swallow.nothing";

void _write_clicked_cb(void *data, Evas_Object *, void *) {
  appdata *ad = static_cast<appdata *>(data);
  if (!tavro_leave_compose_page(ad)) return;
  ad->type = PROBLEM;
  tavro_create_problem_page(ad, nullptr);
}

void _show_all_clicked_cb(void *data, Evas_Object *, void *) {
  tavro_history_clear_choice(static_cast<appdata *>(data));
}

void _try_again_clicked_cb(void *data, Evas_Object *, void *) {
  tavro_history_reload(static_cast<appdata *>(data), true);
}

// `head` may be null. What stands there already stays, with the focus that its button may have.
void _show_instead(appdata *ad, const char *tile, const char *head, const char *text, const char *button,
                   Evas_Smart_Cb clicked) {
  tavro_history_view *view = ad->history_ad->view;
  if (g_strcmp0(view->instead, text) == 0) return;
  view->instead = text;
  Evas_Object *frame = view->frame;
  Evas_Object *place = tavro_layout_add(frame, "tavro/history/nothing");
  elm_object_part_content_set(place, "icon_area", tavro_tile_add(place, tile));
  tavro_layout_text_set(place, "elm.text.sub", tavro_text(text));
  if (head) {
    tavro_layout_text_set(place, nullptr, tavro_text(head));
    elm_object_signal_emit(place, "tavro,headed", "tavro");
  }
  elm_atspi_accessible_name_set(place, tavro_text(head ? head : text));
  if (head) elm_atspi_accessible_description_set(place, tavro_text(text));
  Evas_Object *action =
      tavro_button_add(place, "tavro_outline", tavro_text(button), nullptr, nullptr, clicked, ad);
  elm_object_part_content_set(place, "tavro.swallow.action", action);
  elm_object_part_content_set(frame, kNothingPart, place);
  elm_object_signal_emit(frame, "tavro,nothing", "tavro");
  // Keys would not lead out of a list that is not shown.
  Evas_Object *list = ad->history_ad->history_genlist;
  if (elm_object_focus_get(list)) elm_object_focus_set(action, EINA_TRUE);
  elm_object_focus_allow_set(list, EINA_FALSE);
}

}  // namespace

void tavro_history_show_no_rows(appdata *ad) {
  const tavro_history_view *view = ad->history_ad->view;
  if (!view->choice.is_all())
    _show_instead(ad, "search", "IDS_OB_BODY_NO_REPORT_FOUND", "IDS_OB_BODY_NO_REPORT_FOUND_HINT",
                  "IDS_OB_BUTTON_SHOW_ALL_REPORTS", _show_all_clicked_cb);
  else
    _show_instead(ad, "list", view->had_reports ? "IDS_OB_NPBODY_NO_FEEDBACK" : nullptr,
                  "IDS_OB_BODY_AFTER_YOU_COMPOSE_FEEDBACK_MESSAGES_THEY_WILL_BE_SHOWN_HERE",
                  "IDS_OB_BUTTON_WRITE_REPORT", _write_clicked_cb);
}

void tavro_history_show_unreadable(appdata *ad) {
  _show_instead(ad, "list", "IDS_OB_BODY_REPORTS_UNREADABLE", "IDS_OB_BODY_REPORTS_UNREADABLE_HINT",
                "IDS_OB_BUTTON_TRY_AGAIN", _try_again_clicked_cb);
}

void tavro_history_show_list(const history_app_data_s *history) {
  tavro_history_view *view = history->view;
  if (!view->instead) return;
  view->instead = nullptr;
  const bool had_focus = elm_object_focus_get(elm_object_part_content_get(view->frame, kNothingPart));
  elm_object_signal_emit(view->frame, "tavro,list", "tavro");
  edje_object_message_signal_process(elm_layout_edje_get(view->frame));
  elm_object_focus_allow_set(history->history_genlist, EINA_TRUE);
  // Before its button goes: the toolkit would give the focus to the first chip and scroll there.
  if (had_focus) elm_object_focus_set(history->history_genlist, EINA_TRUE);
  elm_object_part_content_set(view->frame, kNothingPart, nullptr);
}
