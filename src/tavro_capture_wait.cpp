// What a capture waits for, none of it for ever, and whether the capture manager is still there.
#include <app_manager.h>
#include <notification.h>
#include <notification_status.h>

#include "tavro-common.h"
#include "tavro_capture.h"
#include "tavro_log.h"

namespace {

constexpr double kWatchSeconds = 1.0;
constexpr int kTicksUntilTold = 20;  // that the session is slow to come

// By tavro_capture_awaited.
constexpr struct {
  double tick_seconds;
  int ticks;
} kPatience[] = {{0.05, 200}, {10.0, 1}, {35.0, 1}, {3.0, 1}};

tavro_capture_awaited _awaited = TAVRO_CAPTURE_SESSION;
Ecore_Timer *_waiting = nullptr;
int _ticks = 0;
int _ending_handle = 0;
Ecore_Timer *_watch = nullptr;

bool _is_unwanted(const appdata *ad) {
  return _awaited == TAVRO_CAPTURE_SESSION && (!ad->minicontrol_win || ad->recording_status != 0);
}

bool _has_come(const appdata *ad) {
  return _awaited == TAVRO_CAPTURE_SESSION && ad->cpmgr_handle != 0;
}

}  // namespace

void tavro_capture_wait(appdata *ad, tavro_capture_awaited what) {
  if (_waiting && what == _awaited && what == TAVRO_CAPTURE_SESSION) return;
  tavro_capture_stop_waiting();
  _awaited = what;
  _ticks = 0;
  _ending_handle = what == TAVRO_CAPTURE_END ? ad->cpmgr_handle : 0;
  _waiting = ecore_timer_add(kPatience[what].tick_seconds, tavro_capture_waited_cb, ad);
}

void tavro_capture_stop_waiting() {
  if (_waiting) ecore_timer_del(_waiting);
  _waiting = nullptr;
  _ending_handle = 0;
}

int tavro_capture_ending_handle() {
  return _ending_handle;
}

// The session is asked for when the control comes up, and the first one after a start takes the capture
// manager a while.
Eina_Bool tavro_capture_waited_cb(void *data) {
  appdata *ad = static_cast<appdata *>(data);
  if (!_waiting) return ECORE_CALLBACK_CANCEL;
  const bool is_over = _is_unwanted(ad) || _has_come(ad);
  if (!is_over && ++_ticks < kPatience[_awaited].ticks) {
    if (_ticks == kTicksUntilTold)
      notification_status_message_post(tavro_text("IDS_OB_TPOP_RECORDER_STARTING"));
    return ECORE_CALLBACK_RENEW;
  }
  _waiting = nullptr;
  if (_awaited == TAVRO_CAPTURE_PANEL)
    tavro_capture_panel_is_off(ad);
  else if (!is_over)
    tavro_cpmgr_on_get_error_cb(0, ad);
  else if (!_is_unwanted(ad))
    video_btn_clicked_cb(ad, nullptr, nullptr);
  return ECORE_CALLBACK_CANCEL;
}

bool tavro_capture_manager_is_running() {
  bool is_running = false;
  // A bus that does not answer in time says nothing about it.
  return app_manager_is_running(TAVRO_CPMGR_ID, &is_running) != APP_MANAGER_ERROR_NONE || is_running;
}

bool tavro_capture_has_died(appdata *ad) {
  if (tavro_capture_manager_is_running()) return false;
  TAVRO_LOGE("Screen recorder has been killed");
  tavro_cpmgr_on_get_error_cb(0, ad);
  return true;
}

void tavro_capture_watch(appdata *ad) {
  if (!_watch) _watch = ecore_timer_add(kWatchSeconds, tavro_capture_watch_cb, ad);
}

Eina_Bool tavro_capture_watch_cb(void *data) {
  appdata *ad = static_cast<appdata *>(data);
  if (ad->cpmgr_handle != 0 && !tavro_capture_has_died(ad)) return ECORE_CALLBACK_RENEW;
  _watch = nullptr;
  return ECORE_CALLBACK_CANCEL;
}
