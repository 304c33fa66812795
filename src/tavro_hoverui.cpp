#include "tavro_hoverui.h"

#include <Ecore_X.h>
#include <package_manager.h>

#include <cstring>
#include <utility>

#include "tavro-common.h"
#include "tavro_app_control_handle.h"
#include "tavro_appdata.h"
#include "tavro_capture.h"
#include "tavro_compose.h"
#include "tavro_compose_keeper.h"
#include "tavro_compose_strip.h"
#include "tavro_image_editor.h"
#include "tavro_log.h"
#include "tavro_memory.h"
#include "tavro_widgets.h"

namespace {

constexpr char kHomeScreenId[] = "org.tizen.homescreen";

bool _are_enabled = true;
// The client's window while it is aside; until it has left the screen, its focus means nothing.
bool _is_away = false;
Ecore_Event_Handler *_hidden = nullptr, *_shown = nullptr;

// ---- The client's own window ----

bool _is_client(const appdata *ad, Ecore_X_Window window) {
  return ad->win && elm_win_window_id_get(ad->win) == window;
}

Eina_Bool _hidden_cb(void *data, int, void *event) {
  _is_away |= _is_client(static_cast<appdata *>(data), static_cast<Ecore_X_Event_Window_Hide *>(event)->win);
  return ECORE_CALLBACK_PASS_ON;
}

Eina_Bool _shown_cb(void *data, int, void *event) {
  appdata *ad = static_cast<appdata *>(data);
  if (_is_away && _is_client(ad, static_cast<Ecore_X_Event_Window_Show *>(event)->win))
    tavro_capture_client_returned(ad);
  return ECORE_CALLBACK_PASS_ON;
}

void _focus_in_cb(void *data, Evas_Object *, void *) {
  if (_is_away) tavro_capture_client_returned(static_cast<appdata *>(data));
}

void _watch_window(appdata *ad) {
  _is_away = false;
  _hidden = ecore_event_handler_add(ECORE_X_EVENT_WINDOW_HIDE, _hidden_cb, ad);
  _shown = ecore_event_handler_add(ECORE_X_EVENT_WINDOW_SHOW, _shown_cb, ad);
  evas_object_smart_callback_add(ad->win, "focus,in", _focus_in_cb, ad);
}

void _stop_watching_window(appdata *ad) {
  for (Ecore_Event_Handler **handler : {&_hidden, &_shown})
    if (*handler) ecore_event_handler_del(std::exchange(*handler, nullptr));
  if (ad->win) evas_object_smart_callback_del(ad->win, "focus,in", _focus_in_cb);
}

void _step_aside(appdata *ad) {
  _watch_window(ad);
  elm_win_lower(ad->win);
  // A desktop has nothing of its own that would cover the window.
  elm_win_iconified_set(ad->win, EINA_TRUE);
}

void _raise(appdata *ad) {
  _stop_watching_window(ad);
  if (!ad->win) return;
  elm_win_iconified_set(ad->win, EINA_FALSE);
  elm_win_raise(ad->win);
  elm_win_activate(ad->win);
}

void _come_back(appdata *ad) {
  if (_are_enabled) return;
  delete_flash_wins(ad);
  _raise(ad);
  tavro_compose_rest(ad);
  enable_btns(ad);
}

// ---- What a capture asks of the windows ----

void _emit(appdata *ad, const char *signal) {
  if (ad->minicontrol_layout) elm_object_signal_emit(ad->minicontrol_layout, signal, "tavro");
}

void _say(appdata *ad, const char *id) {
  if (ad->minicontrol_layout) tavro_layout_text_set(ad->minicontrol_layout, "video_text", tavro_text(id));
}

void _show_recording(appdata *ad) {
  add_video_time_win(ad);
  set_minicontrol_recording(ad, true);
  _emit(ad, "recording_start");
  _say(ad, "IDS_OB_MBODY_RECORDING_ING_ABB");
  ad->video_timer = ecore_timer_add(kVideoTickSeconds, timer_func, ad);
}

// In a pause nothing is recorded: the control itself can be shown.
void _show_paused(appdata *ad) {
  if (ad->video_timer) ecore_timer_freeze(ad->video_timer);
  set_minicontrol_recording(ad, false);
  _emit(ad, "paused");
  _say(ad, "IDS_OB_MBODY_PAUSED_ABB");
  if (!ad->video_time_win) return;
  elm_object_signal_emit(ad->video_timer_layout, "paused", "tavro");
  elm_win_lower(ad->video_time_win);
  evas_object_hide(ad->video_time_win);
  show_minicontrol_window(ad);
}

void _show_resumed(appdata *ad) {
  if (ad->video_timer) ecore_timer_thaw(ad->video_timer);
  set_minicontrol_recording(ad, true);
  _emit(ad, "recording_resume");
  _say(ad, "IDS_OB_MBODY_RECORDING_ING_ABB");
  if (!ad->video_time_win) return;
  hide_minicontrol_window(ad);
  elm_object_signal_emit(ad->video_timer_layout, "recording_resume", "tavro");
  evas_object_show(ad->video_time_win);
  elm_win_raise(ad->video_time_win);
}

void _show_stopping(appdata *ad) {
  _emit(ad, "stop_btn_bg");
}

void _stop_signal_cb(void *data, Evas_Object *, const char *, const char *) {
  record_btn_clicked_cb(data, nullptr, nullptr);
}

void _allow_stopping(appdata *ad) {
  for (Evas_Object *layout : {ad->minicontrol_layout, ad->video_timer_layout}) {
    if (!layout) continue;
    elm_object_signal_emit(layout, "enable_buttons", "tavro");
    elm_object_signal_callback_add(layout, "stop_btn_clicked", "*", _stop_signal_cb, ad);
    elm_object_signal_callback_add(layout, "stop_btn_up_clicked", "*", _stop_signal_cb, ad);
    elm_object_signal_callback_add(layout, "stop_btn_bg, clicked", "*", _stop_signal_cb, ad);
  }
}

void _delete_time(appdata *ad) {
  if (ad->video_timer) ecore_timer_del(ad->video_timer);
  ad->video_timer = nullptr;
  delete_video_time_win(ad);
}

void _blink(appdata *ad, bool is_on) {
  if (!ad->video_timer_layout) return;
  elm_object_signal_emit(ad->video_timer_layout, is_on ? "show_recording_icon" : "hide_recording_icon",
                         "tavro");
}

const char *_time_text(appdata *ad) {
  return ad->video_timer_layout ? elm_object_part_text_get(ad->video_timer_layout, "time_label") : nullptr;
}

void _show_time(appdata *ad, const char *text) {
  set_video_time_text(ad, text);
  if (ad->minicontrol_layout) elm_object_part_text_set(ad->minicontrol_layout, "video_time", text);
}

void _add_picture(appdata *ad, const char *path) {
  tavro_launch_image_editor(path, ad);
}

bool _add_video(appdata *ad, const char *path) {
  if (ad->type == IDEA)
    tavro_show_idea_capture_data(ad, path);
  else
    tavro_show_problem_capture_data(ad, path);
  const compose_view_win *view = tavro_capture_view(ad);
  for (const GSList *link = view ? view->attachments : nullptr; link; link = link->next) {
    if (std::strcmp(static_cast<const char *>(link->data), path) != 0) continue;
    tavro_select_box_add(ad, -1, -1, -1, -1);
    return true;
  }
  return false;
}

// The border is no part of a picture.
bool _hide_control(appdata *ad) {
  if (ad->cType == IMAGE) hide_flash_wins(ad);
  return hide_minicontrol_window(ad);
}

void _delete_control(appdata *ad) {
  wait_for_quickpanel(ad, false);
  delete_minicontrol_indicator_win(ad);
  delete_minicontrol_window(ad);
}

constexpr tavro_capture_windows kWindows = {_hide_control,       delete_minicontrol_indicator_win,
                                            _delete_control,     _show_recording,
                                            _show_paused,        _show_resumed,
                                            _show_stopping,      _allow_stopping,
                                            _delete_time,        _blink,
                                            _time_text,          _show_time,
                                            wait_for_quickpanel, _come_back,
                                            launch_error_popup,  _add_picture,
                                            _add_video};

bool _is_capture_manager_there() {
  package_info_h info = nullptr;
  if (package_manager_get_package_info(TAVRO_CPMGR_ID, &info) != PACKAGE_MANAGER_ERROR_NONE) return false;
  package_info_destroy(info);
  return true;
}

}  // namespace

bool tavro_capture_start(appdata *ad, captureType type) {
  if (!_is_capture_manager_there()) return false;
  if (!_are_enabled || ad->minicontrol_win || ad->recording_status != 0) {
    TAVRO_LOGD("a capture is open");
    return true;
  }
  ad->cType = type;
  create_floating_ui(ad, kHomeScreenId);
  return ad->minicontrol_win || ad->cancel_video_recording == 1;
}

void create_floating_ui(appdata *ad, const char *home_app_id) {
  if (ad->cancel_video_recording == 1) {
    TAVRO_LOGD("Waiting for timer to stop");
    return;
  }
  tavro_capture_set_windows(&kWindows);
  tavro_compose_keeper_flush();
  tavro_launch_app_homescreen(home_app_id);
  add_flashing_wins(ad);
  add_minicontrol_window(ad);
  if (!ad->minicontrol_win) {
    TAVRO_LOGE("Null minicontrol window");
    delete_flash_wins(ad);
    return;
  }
  disable_btns(ad);
  _step_aside(ad);
}

void tavro_launch_app_homescreen(const char *app_id) {
  int error = APP_CONTROL_ERROR_NONE;
  const TavroRequest request = tavro_request_create(&error);
  if (!request) return;
  app_control_set_operation(request.get(), APP_CONTROL_OPERATION_DEFAULT);
  app_control_set_app_id(request.get(), app_id);
  error = app_control_send_launch_request(request.get(), nullptr, nullptr);
  if (error != APP_CONTROL_ERROR_NONE) TAVRO_LOGD("no home screen: %d, %s", error, get_error_message(error));
}

void enable_btns(appdata *) {
  _are_enabled = true;
}

void disable_btns(appdata *) {
  _are_enabled = false;
}

bool tavro_capture_btns_enabled() {
  return _are_enabled;
}

void launch_error_popup(appdata *ad) {
  // Kept: the text is known in this spelling.
  tavro_popup_show(ad, &ad->cpmgr_popup, "Failed to perform action", "An unknown issue has occured.",
                   {{tavro_text("IDS_OB_BUTTON_OK_ABB7"), nullptr}});
}
