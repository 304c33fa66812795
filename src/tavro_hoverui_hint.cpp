// The hint above the control, which says where to find it.
#include <Ecore_X.h>
#include <efl_extension.h>

#include <iterator>
#include <string>

#include "tavro-common.h"
#include "tavro_capture.h"
#include "tavro_handles.h"
#include "tavro_hoverui.h"
#include "tavro_log.h"

namespace {

constexpr double kAnimationSeconds = 0.015;

constexpr const char *kAnimation[] = {
    "tenth_to_first", "first_to_second",  "second_to_third",   "third_to_fourth", "fourth_to_fifth",
    "fifth_to_sixth", "sixth_to_seventh", "seventh_to_eighth", "eighth_to_ninth", "ninth_to_tenth",
};

Ecore_Timer *_animation = nullptr;
size_t _animation_step = 0;

Eina_Bool noti_anim(void *data) {
  const appdata *ad = static_cast<appdata *>(data);
  elm_object_signal_emit(ad->minicontrol_indi_layout, kAnimation[_animation_step++], "tavro");
  if (_animation_step < std::size(kAnimation)) return ECORE_CALLBACK_RENEW;
  _animation = nullptr;
  return ECORE_CALLBACK_CANCEL;
}

std::string _hint(captureType type) {
  const char *id = type == VIDEO
                       ? "IDS_OB_NPBODY_P1SSDRAG_STATUS_BAR_DOWNWARDSP2SS_TO_RECORD_VIDEO_OF_PROBLEM"
                       : "IDS_OB_NPBODY_P1SSDRAG_STATUS_BAR_DOWNWARDSP2SS_TO_CAPTURE_SCREENSHOT_OF_PROBLEM";
  const TavroGText text(g_strdup_printf(tavro_text(id), "<custom_tag font_size=40><b>",
                                        "</b></custom_tag><br>"
                                        "<br><custom_tag font_size=29>"));
  return std::string(text.get()) + "</custom_tag>";
}

void _hint_tapped_cb(void *data, Evas *, Evas_Object *, void *) {
  delete_minicontrol_indicator_win(static_cast<appdata *>(data));
}

void _options_key_cb(void *, Evas_Object *, void *) {
  TAVRO_LOGD("options key");
}

}  // namespace

void add_minicontrol_indicator_win(appdata *ad) {
  ad->minicontrol_indi_win = tavro_hoverui_window_add("Indicator_win");
  if (!ad->minicontrol_indi_win) return;
  tavro_hoverui_see_through(ad->minicontrol_indi_win);
  ad->minicontrol_indi_layout =
      tavro_hoverui_layout_add(ad->minicontrol_indi_win, "minicontrol_indicator", "minicontrol_indi");
  if (!ad->minicontrol_indi_layout) return delete_minicontrol_indicator_win(ad);
  elm_object_part_text_set(ad->minicontrol_indi_layout, "indi_text", _hint(ad->cType).c_str());
  evas_object_event_callback_add(ad->minicontrol_indi_layout, EVAS_CALLBACK_MOUSE_UP, _hint_tapped_cb, ad);
  eext_object_event_callback_add(ad->minicontrol_indi_layout, EEXT_CALLBACK_BACK, back_btn_clicked_cb, ad);
  eext_object_event_callback_add(ad->minicontrol_indi_layout, EEXT_CALLBACK_MORE, _options_key_cb, ad);
  _animation_step = 0;
  _animation = ecore_timer_add(kAnimationSeconds, noti_anim, ad);
}

void delete_minicontrol_indicator_win(appdata *ad) {
  if (_animation) ecore_timer_del(_animation);
  _animation = nullptr;
  if (!ad->minicontrol_indi_win) return;
  evas_object_hide(ad->minicontrol_indi_win);
  ecore_x_sync();  // the first frame of a video is its picture
  evas_object_del(ad->minicontrol_indi_win);
  ad->minicontrol_indi_win = ad->minicontrol_indi_layout = nullptr;
}
