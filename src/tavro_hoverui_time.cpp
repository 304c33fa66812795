// The small window that is there while a video is recorded: the time that is left, and the stop button.
#include <elm_atspi.h>

#include "tavro-common.h"
#include "tavro_capture.h"
#include "tavro_hoverui.h"
#include "tavro_widgets.h"

namespace {

constexpr int kWidthUnits = 160, kHeightUnits = 48, kMarginUnits = 12;
constexpr char kFullTime[] = "01:00";

int _units(int count) {
  return static_cast<int>(count * elm_config_scale_get());
}

// The layout passes it on as "stop_btn_bg, clicked", once stopping is allowed.
void _stop_clicked_cb(void *data, Evas_Object *, void *) {
  edje_object_signal_emit(elm_layout_edje_get(static_cast<Evas_Object *>(data)), "stop,press", "tavro");
}

// As the notification panel is pulled down elsewhere.
void _open_clicked_cb(void *data, Evas_Object *, void *) {
  show_minicontrol_window(static_cast<appdata *>(data));
}

void _build(appdata *ad) {
  Evas_Object *layout = ad->video_timer_layout;
  Evas_Object *open = tavro_button_add(layout, "tavro_clear", nullptr, nullptr,
                                       tavro_text("IDS_OB_BUTTON_SHOW_CONTROL"), _open_clicked_cb, ad);
  elm_object_part_content_set(layout, "open_btn_swallow", open);
  Evas_Object *stop = tavro_button_add(layout, "tavro_clear", nullptr, nullptr,
                                       tavro_text("IDS_OB_BUTTON_STOP"), _stop_clicked_cb, layout);
  elm_object_part_content_set(layout, "stop_btn_swallow", stop);
  set_video_time_text(ad, kFullTime);
}

}  // namespace

void add_video_time_win(appdata *ad) {
  if (ad->video_time_win) return;
  ad->video_time_win = tavro_hoverui_window_add("Video_Time");
  if (!ad->video_time_win) return;
  ad->video_timer_layout = tavro_hoverui_layout_add(ad->video_time_win, "floating", "video_time");
  if (ad->video_timer_layout) _build(ad);
  if (ad->minicontrol_layout) elm_object_part_text_set(ad->minicontrol_layout, "video_time", kFullTime);
  tavro_hoverui_see_through(ad->video_time_win);
  move_video_time_win(ad);
  evas_object_show(ad->video_time_win);
}

void set_video_time_text(appdata *ad, const char *text) {
  if (!ad->video_timer_layout) return;
  elm_object_part_text_set(ad->video_timer_layout, "time_label", text);
  Evas_Object *open = elm_object_part_content_get(ad->video_timer_layout, "open_btn_swallow");
  elm_atspi_accessible_description_set(open, text);
}

// At the end of the screen's upper edge, as the person holds it.
void move_video_time_win(appdata *ad) {
  if (!ad->video_time_win) return;
  int width = 0, height = 0;
  tavro_hoverui_screen_size(&width, &height);
  const int along = _units(kWidthUnits), across = _units(kHeightUnits), margin = _units(kMarginUnits);
  const bool is_right = ad->device_orientation == 0 || ad->device_orientation == 90;
  const bool is_top = ad->device_orientation == 0 || ad->device_orientation == 270;
  tavro_hoverui_place(ad->video_time_win, ad->video_timer_layout, is_right ? width - along - margin : margin,
                      is_top ? margin : height - across - margin, along, across);
}

void delete_video_time_win(appdata *ad) {
  if (!ad->video_time_win) return;
  elm_win_lower(ad->video_time_win);
  evas_object_del(ad->video_time_win);
  ad->video_time_win = ad->video_timer_layout = nullptr;
}
