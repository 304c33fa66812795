// What the buttons of the floating control, its timer and the display do to a capture.
#include <device/callback.h>

#include <algorithm>
#include <cstdint>
#include <cstdio>
#include <cstdlib>
#include <cstring>

#include "tavro_capture.h"
#include "tavro_handles.h"
#include "tavro_log.h"

namespace {

// An old capture manager needs as long to begin: 3.5 seconds.
constexpr int kTicksOfOldStart = 7;
constexpr char kFullTime[] = "01:00";
constexpr int kTicksOfCancelling = 20;  // ten seconds, for a handle that has not come

// When the last tick was due, on the loop's clock; what is paused is left out.
double _last_tick = 0;
double _paused_behind = 0;  // from that tick to the pause

bool _is_too_early(const appdata *ad) {
  return ad->screen_recorder_is_latest == 0 && ad->video_timer_count < kTicksOfOldStart;
}

void _remove_lock_cb() {
  const int ret = device_remove_callback(DEVICE_CALLBACK_DISPLAY_STATE, on_device_changed_cb);
  if (ret != DEVICE_ERROR_NONE)
    TAVRO_LOGD("device_remove_callback failed, return :%d, error:%s", ret, get_error_message(ret));
}

void _put_away(appdata *ad) {
  tavro_capture_get_windows().delete_time(ad);
  tavro_capture_get_windows().delete_control(ad);
  _remove_lock_cb();
}

// Whether the recording is over: asked to stop, or lost.
bool _stop(appdata *ad) {
  const tavro_capture_windows &windows = tavro_capture_get_windows();
  windows.show_stopping(ad);
  if (ad->cpmgr_handle == 0 || ad->recording_status == 0 || _is_too_early(ad)) return false;
  if (tavro_capture_has_died(ad)) return true;
  windows.wait_for_panel(ad, false);
  _put_away(ad);
  if (send_cpmgr_action(ad, "Video_Stop"))
    tavro_capture_wait(ad, TAVRO_CAPTURE_END);
  else
    tavro_cpmgr_on_get_error_cb(0, ad);
  ad->cpmgr_handle = 0;
  return true;
}

void _start(appdata *ad) {
  const tavro_capture_windows &windows = tavro_capture_get_windows();
  if (!send_cpmgr_start(ad)) return tavro_cpmgr_on_get_error_cb(0, ad);
  ad->video_timer_count = 0;
  ad->recording_status = 1;
  ad->add_video_to_tavro = 1;
  _last_tick = ecore_loop_time_get();
  windows.show_recording(ad);
  add_lock_cb(ad);
}

// What lay below the control has been painted when the panel is off: the first frame shows nothing of it.
void _hide_then_capture(appdata *ad) {
  const tavro_capture_windows &windows = tavro_capture_get_windows();
  windows.wait_for_panel(ad, true);
  if (windows.hide_control(ad)) {
    TAVRO_LOGD("Waiting for quickpanel event");
    return tavro_capture_wait(ad, TAVRO_CAPTURE_PANEL);
  }
  tavro_capture_panel_is_off(ad);
}

void _start_or_wait(appdata *ad) {
  if (ad->screen_recorder_is_latest != 0 && ad->cpmgr_handle == 0)
    return tavro_capture_wait(ad, TAVRO_CAPTURE_SESSION);
  tavro_capture_get_windows().delete_hint(ad);
  _hide_then_capture(ad);
}

void _resume(appdata *ad) {
  if (!ad->video_paused || tavro_capture_has_died(ad)) return;
  if (ad->cpmgr_handle != 0) send_cpmgr_action(ad, "Video_Resume");
  _last_tick = ecore_loop_time_get() - _paused_behind;
  tavro_capture_get_windows().show_resumed(ad);
  ad->recording_status = 1;
  ad->video_paused = ad->pause_on_lock = false;
}

// A recording ends with its session and is kept. One without sessions can only be stopped.
void _end_session(appdata *ad) {
  if (ad->cpmgr_handle == 0 || ad->screen_recorder_is_latest == 0) {
    _stop(ad);
    return;
  }
  _put_away(ad);
  send_cpmgr_shutdown(ad);
  if (ad->cpmgr_handle != 0) tavro_cpmgr_on_get_error_cb(0, ad);
}

// The control is gone and no reply will bring the client back.
void _end_without_reply(appdata *ad) {
  tavro_capture_stop_waiting();
  tavro_capture_forget_file(ad);
  tavro_capture_get_windows().come_back(ad);
}

// The next second of the countdown. False: the text cannot be read. `is_over` is set at its end.
bool _count_down(appdata *ad, bool *is_over) {
  const tavro_capture_windows &windows = tavro_capture_get_windows();
  const char *shown = windows.time_text(ad);
  const char *colon = shown ? std::strchr(shown, ':') : nullptr;
  if (!colon) return false;
  const int seconds = std::strcmp(shown, kFullTime) == 0 ? 60 : std::atoi(colon + 1);
  // The last second has been recorded when the display comes to "00:00".
  const int left = seconds < 1 ? 0 : seconds - 1;
  char text[16];
  std::snprintf(text, sizeof text, "00:%.2d", left);
  windows.show_time(ad, text);
  *is_over = left == 0;
  return true;
}

bool _is_cancelled(appdata *ad) {
  if (ad->cancel_video_recording != 1) return false;
  ad->add_video_to_tavro = 0;
  return true;
}

// One who cancels at once waits for what is to be stopped. A recording whose time is over never got its
// handle.
bool _is_handle_awaited(const appdata *ad) {
  return ad->cancel_video_recording == 1 && ad->video_timer_count < kTicksOfCancelling;
}

// The timer leaves out what it could not serve in time, and the recorder does not.
int _ticks_due() {
  const double behind = ecore_loop_time_get() - _last_tick;
  const int due = std::max(static_cast<int>(behind / kVideoTickSeconds + 0.5), 1);
  _last_tick += due * kVideoTickSeconds;
  return due;
}

// Whether the recording is to be stopped.
bool _tick(appdata *ad) {
  const tavro_capture_windows &windows = tavro_capture_get_windows();
  const int first_tick = ad->screen_recorder_is_latest == 0 ? kTicksOfOldStart : 1;
  if (++ad->video_timer_count < first_tick) return false;
  if (ad->video_timer_count == first_tick) windows.allow_stopping(ad);
  const bool is_even = ad->video_timer_count % 2 == 0;
  windows.blink(ad, is_even);
  bool is_over = _is_cancelled(ad);
  if (!is_over && is_even && !_count_down(ad, &is_over)) TAVRO_LOGD("Timer text NULL");
  return is_over;
}

}  // namespace

void record_btn_clicked_cb(void *data, Evas_Object *, void *) {
  _stop(static_cast<appdata *>(data));
}

void pause_btn_clicked_cb(void *data, Evas_Object *, void *) {
  appdata *ad = static_cast<appdata *>(data);
  if (_is_too_early(ad) || tavro_capture_has_died(ad)) return;
  if (ad->cpmgr_handle != 0) send_cpmgr_action(ad, "Video_Pause");
  if (!ad->video_paused) _paused_behind = ecore_loop_time_get() - _last_tick;
  tavro_capture_get_windows().show_paused(ad);
  ad->video_paused = true;
}

void video_btn_clicked_cb(void *data, Evas_Object *, void *) {
  appdata *ad = static_cast<appdata *>(data);
  if (ad->recording_status == 0)
    _start_or_wait(ad);
  else
    _resume(ad);
}

void camera_btn_clicked_cb(void *data, Evas_Object *, void *) {
  _hide_then_capture(static_cast<appdata *>(data));
}

void tavro_capture_panel_is_off(appdata *ad) {
  tavro_capture_stop_waiting();
  tavro_capture_get_windows().wait_for_panel(ad, false);
  if (ad->cType == IMAGE)
    take_snapshot(ad);
  else if (ad->recording_status == 0)
    _start(ad);
}

void back_btn_clicked_cb(void *data, Evas_Object *, void *) {
  appdata *ad = static_cast<appdata *>(data);
  if (ad->cType == VIDEO && ad->cpmgr_handle != 0 && _is_too_early(ad)) return;
  if (ad->recording_status != 0) return _end_session(ad);
  tavro_capture_get_windows().delete_control(ad);
  const int handle = ad->cpmgr_handle;
  send_cpmgr_shutdown(ad);
  const bool is_reply_awaited = handle != 0 && ad->cpmgr_handle == 0;
  if (!is_reply_awaited) _end_without_reply(ad);
}

void cancel_btn_clicked_cb(void *data, Evas_Object *obj, void *event_info) {
  appdata *ad = static_cast<appdata *>(data);
  if (ad->recording_status == 0) return back_btn_clicked_cb(data, obj, event_info);
  ad->cancel_video_recording = 1;
  if (ad->video_timer) ecore_timer_thaw(ad->video_timer);  // it does the rest, also in a pause
}

void tavro_capture_control_hidden(appdata *ad) {
  tavro_capture_get_windows().delete_hint(ad);
  if (ad->cType == VIDEO && ad->recording_status != 0) {
    TAVRO_LOGD("Calling video stop");
    record_btn_clicked_cb(ad, nullptr, nullptr);
    return;
  }
  if (ad->cType == VIDEO) TAVRO_LOGD("Video not started yet");
  back_btn_clicked_cb(ad, nullptr, nullptr);
}

void tavro_capture_client_returned(appdata *ad) {
  if (ad->recording_status == 0) {
    if (ad->minicontrol_win) back_btn_clicked_cb(ad, nullptr, nullptr);
    return;
  }
  if (ad->cpmgr_handle == 0 || ad->screen_recorder_is_latest == 0) return;
  _end_session(ad);
}

Eina_Bool timer_func(void *data) {
  appdata *ad = static_cast<appdata *>(data);
  bool is_over = false;
  for (int due = _ticks_due(); due > 0 && !is_over; --due) is_over = _tick(ad);
  if (!is_over) return ECORE_CALLBACK_RENEW;
  // Stopping deletes the timer of the record, and this one runs.
  Ecore_Timer *running = ad->video_timer;
  ad->video_timer = nullptr;
  if (_stop(ad)) return ECORE_CALLBACK_CANCEL;
  if (_is_handle_awaited(ad)) {
    ad->video_timer = running;
    return ECORE_CALLBACK_RENEW;
  }
  tavro_cpmgr_on_get_error_cb(0, ad);
  return ECORE_CALLBACK_CANCEL;
}

void add_lock_cb(appdata *ad) {
  const int ret = device_add_callback(DEVICE_CALLBACK_DISPLAY_STATE, on_device_changed_cb, ad);
  if (ret != DEVICE_ERROR_NONE)
    TAVRO_LOGD("device_add_callback failed, return :%d error:%s", ret, get_error_message(ret));
}

void on_device_changed_cb(device_callback_e type, void *value, void *user_data) {
  appdata *ad = static_cast<appdata *>(user_data);
  if (type != DEVICE_CALLBACK_DISPLAY_STATE) return;
  const auto state = static_cast<int>(reinterpret_cast<intptr_t>(value));
  if (state == DISPLAY_STATE_SCREEN_OFF) {
    if (ad->pause_on_lock || ad->cpmgr_handle == 0 || ad->recording_status == 0 || ad->video_paused) return;
    pause_btn_clicked_cb(ad, nullptr, nullptr);
    ad->pause_on_lock = ad->video_paused;  // the capture manager may refuse, or be gone
  } else if (state == DISPLAY_STATE_NORMAL && ad->pause_on_lock) {
    ad->pause_on_lock = false;
    if (ad->video_paused) video_btn_clicked_cb(ad, nullptr, nullptr);
  }
}
