#include "display_state.h"

#include <Ecore.h>
#include <Ecore_X.h>

#include <utility>

#include "device_callback.h"

namespace platform {
namespace {

constexpr double kAskSeconds = 1.0;

struct DisplayWatch {
  Ecore_Event_Handler *saver = nullptr;
  Ecore_Timer *asking = nullptr;
  bool is_saver_on = false;
  bool has_no_power = false;
  bool is_off = false;  // as it was reported
};

DisplayWatch &watch() {
  static DisplayWatch &instance = *new DisplayWatch;
  return instance;
}

void report() {
  DisplayWatch &self = watch();
  const bool is_off = self.is_saver_on || self.has_no_power;
  if (std::exchange(self.is_off, is_off) == is_off) return;
  report_device_change(DEVICE_CALLBACK_DISPLAY_STATE,
                       is_off ? DISPLAY_STATE_SCREEN_OFF : DISPLAY_STATE_NORMAL);
}

Eina_Bool saver_cb(void *, int, void *event) {
  watch().is_saver_on = static_cast<Ecore_X_Event_Screensaver_Notify *>(event)->on;
  report();
  return ECORE_CALLBACK_PASS_ON;
}

Eina_Bool ask_cb(void *) {
  watch().has_no_power = ecore_x_dpms_enabled_get() && ecore_x_dpms_power_level_get() != ECORE_X_DPMS_MODE_ON;
  report();
  return ECORE_CALLBACK_RENEW;
}

void stop() {
  DisplayWatch &self = watch();
  if (self.saver) {
    ecore_event_handler_del(self.saver);
    ecore_x_screensaver_event_listen_set(EINA_FALSE);
  }
  if (self.asking) ecore_timer_del(self.asking);
  self = DisplayWatch();
}

void want(bool is_wanted) {
  if (!is_wanted) return stop();
  DisplayWatch &self = watch();
  if (self.saver || !ecore_x_display_get()) return;
  self.saver = ecore_event_handler_add(ECORE_X_EVENT_SCREENSAVER_NOTIFY, saver_cb, nullptr);
  ecore_x_screensaver_event_listen_set(EINA_TRUE);
  if (ecore_x_dpms_query() && ecore_x_dpms_capable_get())
    self.asking = ecore_timer_add(kAskSeconds, ask_cb, nullptr);
}

}  // namespace

void serve_display_state() {
  set_display_state_source(want);
}

void stop_serving_display_state() {
  set_display_state_source(nullptr);
  stop();
}

}  // namespace platform
