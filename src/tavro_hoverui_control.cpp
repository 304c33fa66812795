// The control itself, in the notification panel or at the top of the screen.
#include <Ecore_X.h>
#include <efl_extension.h>
#include <elm_atspi.h>
#include <minicontrol-provider.h>

#include <algorithm>
#include <iterator>

#include "tavro-common.h"
#include "tavro_capture.h"
#include "tavro_hoverui.h"
#include "tavro_log.h"
#include "tavro_widgets.h"

namespace {

constexpr int kWidthUnits = 332, kLandscapeWidthUnits = 304, kMarginUnits = 14, kGapUnits = 8;
Evas_Object *_main_button = nullptr;  // record, pause or go on; lives with the control
bool _is_own_request = false;         // the panel hides the control because it was asked to

int _units(int count) {
  return static_cast<int>(count * elm_config_scale_get());
}

bool _is_landscape(const appdata *ad) {
  return ad->device_orientation == 90 || ad->device_orientation == 270;
}

// As wide as the screen allows, as high as the content wants: that is told.
int _fit(Evas_Object *window, Evas_Object *layout, int width_units, int top) {
  int screen_width = 0, screen_height = 0, height = 0;
  tavro_hoverui_screen_size(&screen_width, &screen_height);
  const int width = std::min(_units(width_units), screen_width - 2 * _units(kMarginUnits));
  edje_object_message_signal_process(elm_layout_edje_get(layout));
  edje_object_size_min_restricted_calc(elm_layout_edje_get(layout), nullptr, &height, width, 0);
  tavro_hoverui_place(window, layout, (screen_width - width) / 2, top, width, height);
  return height;
}

// The hint at the top of the screen, the control below it.
void _fit_all(const appdata *ad) {
  const int width_units = _is_landscape(ad) ? kLandscapeWidthUnits : kWidthUnits;
  int top = _units(kMarginUnits);
  if (ad->minicontrol_indi_layout)
    top += _fit(ad->minicontrol_indi_win, ad->minicontrol_indi_layout, width_units, top) + _units(kGapUnits);
  if (ad->minicontrol_layout) _fit(ad->minicontrol_win, ad->minicontrol_layout, width_units, top);
}

// ---- Rotation ----

void _show_rotation(appdata *ad) {
  const bool is_landscape = _is_landscape(ad);
  TAVRO_LOGD("%s", is_landscape ? "Landscape mode" : "PORTRAIT mode");
  if (ad->minicontrol_layout)
    elm_object_signal_emit(ad->minicontrol_layout,
                           is_landscape ? "enable_landscape_mode" : "enable_portrait_mode", "tavro");
  if (ad->minicontrol_indi_layout)
    elm_object_signal_emit(ad->minicontrol_indi_layout, is_landscape ? "landscape" : "portrait", "tavro");
  _fit_all(ad);
  move_video_time_win(ad);
}

Eina_Bool _rotation_cb(void *data, int, void *event) {
  appdata *ad = static_cast<appdata *>(data);
  const auto *message = static_cast<Ecore_X_Event_Client_Message *>(event);
  if (message->message_type != ECORE_X_ATOM_E_WINDOW_ROTATION_CHANGE_REQUEST) return ECORE_CALLBACK_PASS_ON;
  ad->device_orientation = static_cast<int>(message->data.l[1]);
  _show_rotation(ad);
  return ECORE_CALLBACK_PASS_ON;
}

void _follow_rotation(appdata *ad) {
  constexpr int kRotations[] = {0, 90, 180, 270};
  ad->device_orientation = elm_win_rotation_get(ad->win);
  if (!elm_win_wm_rotation_supported_get(ad->minicontrol_win)) return;
  elm_win_wm_rotation_available_rotations_set(ad->minicontrol_win, kRotations, std::size(kRotations));
  ad->orientation_change_handler = ecore_event_handler_add(ECORE_X_EVENT_CLIENT_MESSAGE, _rotation_cb, ad);
}

void _stop_following_rotation(appdata *ad) {
  if (ad->orientation_change_handler) ecore_event_handler_del(ad->orientation_change_handler);
  ad->orientation_change_handler = nullptr;
}

// ---- The control ----

void tavro_minicontrol_event_cb(Evas_Object *minicontrol, minicontrol_viewer_event_e event_type, bundle *) {
  if (event_type != MINICONTROL_VIEWER_EVENT_HIDDEN) return;
  appdata *ad = static_cast<appdata *>(evas_object_data_get(minicontrol, "app_data"));
  delete_minicontrol_indicator_win(ad);
  if (_is_own_request)
    _is_own_request = false;
  else
    tavro_capture_control_hidden(ad);
}

Evas_Object *_add_button(appdata *ad, const char *part, const char *style, const char *icon, const char *id,
                         Evas_Smart_Cb clicked) {
  Evas_Object *layout = ad->minicontrol_layout;
  Evas_Object *button =
      tavro_button_add(layout, style, tavro_text(id), tavro_icon_add(layout, icon), nullptr, clicked, ad);
  elm_object_part_content_set(layout, part, button);
  return button;
}

void _add_cancel_button(appdata *ad) {
  Evas_Object *layout = ad->minicontrol_layout;
  Evas_Object *cancel = tavro_button_add(layout, "tavro_icon", nullptr, tavro_icon_add(layout, "close"),
                                         tavro_text("IDS_OB_BUTTON_CANCEL"), cancel_btn_clicked_cb, ad);
  elm_object_part_content_set(layout, "cancel_btn_swallow", cancel);
}

void _stop_clicked_cb(void *data, Evas_Object *, void *) {
  const appdata *ad = static_cast<appdata *>(data);
  edje_object_signal_emit(elm_layout_edje_get(ad->minicontrol_layout), "stop,press", "tavro");
}

void _camera_clicked_cb(void *data, Evas_Object *obj, void *event_info) {
  _stop_following_rotation(static_cast<appdata *>(data));
  camera_btn_clicked_cb(data, obj, event_info);
}

void _build_screenshot(appdata *ad) {
  tavro_layout_text_set(ad->minicontrol_layout, "screenshot_text",
                        tavro_text("IDS_OB_MBODY_CAPTURE_SCREENSHOT_ABB"));
  _add_button(ad, "capture_btn_swallow", "tavro_primary", "camera/on", "IDS_OB_BUTTON_CAPTURE",
              _camera_clicked_cb);
}

void _build_video(appdata *ad) {
  tavro_layout_text_set(ad->minicontrol_layout, "video_text", tavro_text("IDS_OB_MBODY_RECORD_VIDEO_ABB"));
  elm_object_part_text_set(ad->minicontrol_layout, "video_time", "01:00");
  _main_button = _add_button(ad, "record_btn_swallow", "tavro_primary", "record/on", "IDS_OB_BUTTON_RECORD",
                             video_btn_clicked_cb);
}

// ---- The panel ----

Eina_Bool _quickpanel_state_changed_cb(void *data, int, void *event) {
  appdata *ad = static_cast<appdata *>(data);
  const auto *message = static_cast<Ecore_X_Event_Client_Message *>(event);
  if (!message) return ECORE_CALLBACK_RENEW;
  if (message->message_type != ECORE_X_ATOM_E_ILLUME_QUICKPANEL_STATE ||
      static_cast<Ecore_X_Atom>(message->data.l[0]) != ECORE_X_ATOM_E_ILLUME_QUICKPANEL_OFF)
    return ECORE_CALLBACK_RENEW;
  tavro_capture_panel_is_off(ad);
  return ECORE_CALLBACK_RENEW;
}

}  // namespace

void name_minicontrol_button(Evas_Object *button, const char *id) {
  elm_object_text_set(button, tavro_text(id));
  elm_atspi_accessible_name_set(button, tavro_text(id));
}

void wait_for_quickpanel(appdata *ad, bool is_waiting) {
  if (ad->quickpanel_event_handler) ecore_event_handler_del(ad->quickpanel_event_handler);
  ad->quickpanel_event_handler =
      is_waiting ? ecore_event_handler_add(ECORE_X_EVENT_CLIENT_MESSAGE, _quickpanel_state_changed_cb, ad)
                 : nullptr;
}

void add_minicontrol_window(appdata *ad) {
  ad->minicontrol_win = minicontrol_create_window(
      "tavro-minicontrol.QUICKPANEL", MINICONTROL_TARGET_VIEWER_QUICK_PANEL, tavro_minicontrol_event_cb);
  if (!ad->minicontrol_win) return;
  _is_own_request = false;
  evas_object_data_set(ad->minicontrol_win, "app_data", ad);
  elm_win_conformant_set(ad->minicontrol_win, EINA_TRUE);
  tavro_hoverui_see_through(ad->minicontrol_win);
  add_minicontrol_layout(ad);
  if (!ad->minicontrol_layout) return delete_minicontrol_window(ad);
  add_minicontrol_indicator_win(ad);
  _follow_rotation(ad);
  if (_is_landscape(ad))
    _show_rotation(ad);
  else
    _fit_all(ad);
  if (ad->minicontrol_indi_win) evas_object_show(ad->minicontrol_indi_win);
  evas_object_show(ad->minicontrol_win);
  if (ad->cType == VIDEO) send_cpmgr_init(ad);
}

void add_minicontrol_layout(appdata *ad) {
  const bool is_video = ad->cType == VIDEO;
  ad->minicontrol_layout = tavro_hoverui_layout_add(
      ad->minicontrol_win, "minicontrol", is_video ? "minicontrol_video" : "minicontrol_screenshot");
  if (!ad->minicontrol_layout) return;
  (is_video ? _build_video : _build_screenshot)(ad);
  _add_cancel_button(ad);
  eext_object_event_callback_add(ad->minicontrol_layout, EEXT_CALLBACK_BACK, back_btn_clicked_cb, ad);
  tavro_hoverui_make_draggable(ad->minicontrol_win, ad->minicontrol_layout);
}

void delete_minicontrol_window(appdata *ad) {
  _stop_following_rotation(ad);
  forget_discard_button();
  if (!ad->minicontrol_win) return;
  elm_win_lower(ad->minicontrol_win);
  evas_object_del(ad->minicontrol_win);
  ad->minicontrol_win = ad->minicontrol_layout = _main_button = nullptr;
}

void show_minicontrol_window(appdata *ad) {
  if (!ad->minicontrol_win) return;
  evas_object_show(ad->minicontrol_win);
  elm_win_raise(ad->minicontrol_win);
}

bool hide_minicontrol_window(appdata *ad) {
  _is_own_request = true;
  const int ret =
      minicontrol_send_event(ad->minicontrol_win, MINICONTROL_PROVIDER_EVENT_REQUEST_HIDE, nullptr);
  if (ret == MINICONTROL_ERROR_NONE) return true;
  _is_own_request = false;
  TAVRO_LOGE("Unable to send close event to minicontrol %d", ret);
  return false;
}

void set_minicontrol_recording(appdata *ad, bool is_recording) {
  if (!_main_button) return;
  evas_object_smart_callback_del(_main_button, "clicked",
                                 is_recording ? video_btn_clicked_cb : pause_btn_clicked_cb);
  evas_object_smart_callback_add(_main_button, "clicked",
                                 is_recording ? pause_btn_clicked_cb : video_btn_clicked_cb, ad);
  elm_object_style_set(_main_button, "tavro_outline");
  name_minicontrol_button(_main_button, is_recording ? "IDS_OB_BUTTON_PAUSE" : "IDS_OB_BUTTON_RESUME");
  elm_object_content_set(_main_button,
                         tavro_icon_add(_main_button, is_recording ? "pause/accent" : "play/accent"));
  if (elm_object_part_content_get(ad->minicontrol_layout, "stop_btn_swallow")) return;
  _add_button(ad, "stop_btn_swallow", "tavro_stop", "stop/on", "IDS_OB_BUTTON_STOP", _stop_clicked_cb);
  add_discard_button(ad);
}
