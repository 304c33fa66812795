#include "window_watch.h"

#include <Ecore.h>
#include <Ecore_Evas.h>
#include <Ecore_X.h>

#include <map>
#include <utility>

namespace {

constexpr double kSettleSeconds = 0.05;

struct WindowState {
  bool is_shown = false;
  bool is_covered = false;
};

struct Watch {
  std::function<void(bool)> changed;
  std::map<Ecore_X_Window, WindowState> windows;
  Ecore_Event_Handler *handlers[4] = {};
  Ecore_Timer *settling = nullptr;
  bool has_display = false;
  bool is_seen = false;
};

Watch &watch() {
  static Watch &instance = *new Watch;
  return instance;
}

// Ecore makes helper windows too; only the windows that hold a canvas count.
bool is_canvas_window(Ecore_X_Window window) {
  Eina_List *canvases = ecore_evas_ecore_evas_list_get();
  bool is_found = false;
  void *canvas;
  EINA_LIST_FREE(canvases, canvas) {
    is_found |= ecore_evas_window_get(static_cast<Ecore_Evas *>(canvas)) == window;
  }
  return is_found;
}

Eina_Bool settled_cb(void *) {
  Watch &self = watch();
  self.settling = nullptr;
  bool is_seen = false;
  for (const auto &[window, state] : self.windows) is_seen |= state.is_shown && !state.is_covered;
  if (std::exchange(self.is_seen, is_seen) != is_seen) self.changed(is_seen);
  return ECORE_CALLBACK_CANCEL;
}

void settle_later() {
  Watch &self = watch();
  if (self.settling) {
    ecore_timer_reset(self.settling);
  } else {
    self.settling = ecore_timer_add(kSettleSeconds, settled_cb, nullptr);
  }
}

Eina_Bool shown_cb(void *, int, void *event) {
  const Ecore_X_Window window = static_cast<Ecore_X_Event_Window_Show *>(event)->win;
  if (is_canvas_window(window)) {
    watch().windows[window] = {true, false};
    settle_later();
  }
  return ECORE_CALLBACK_PASS_ON;
}

void hide(Ecore_X_Window window) {
  if (watch().windows.erase(window) > 0) settle_later();
}

Eina_Bool hidden_cb(void *, int, void *event) {
  hide(static_cast<Ecore_X_Event_Window_Hide *>(event)->win);
  return ECORE_CALLBACK_PASS_ON;
}

Eina_Bool destroyed_cb(void *, int, void *event) {
  hide(static_cast<Ecore_X_Event_Window_Destroy *>(event)->win);
  return ECORE_CALLBACK_PASS_ON;
}

Eina_Bool visibility_cb(void *, int, void *event) {
  const auto *visibility = static_cast<Ecore_X_Event_Window_Visibility_Change *>(event);
  const auto known = watch().windows.find(visibility->win);
  if (known != watch().windows.end()) {
    known->second.is_covered = visibility->fully_obscured;
    settle_later();
  }
  return ECORE_CALLBACK_PASS_ON;
}

}  // namespace

namespace platform {

void watch_windows(std::function<void(bool)> changed) {
  // The toolkit would connect with its first window; the events have no types before that.
  Watch &self = watch();
  self.has_display = ecore_x_init(nullptr) > 0;
  if (!self.has_display) return;
  self.changed = std::move(changed);
  self.handlers[0] = ecore_event_handler_add(ECORE_X_EVENT_WINDOW_SHOW, shown_cb, nullptr);
  self.handlers[1] = ecore_event_handler_add(ECORE_X_EVENT_WINDOW_HIDE, hidden_cb, nullptr);
  self.handlers[2] = ecore_event_handler_add(ECORE_X_EVENT_WINDOW_DESTROY, destroyed_cb, nullptr);
  self.handlers[3] = ecore_event_handler_add(ECORE_X_EVENT_WINDOW_VISIBILITY_CHANGE, visibility_cb, nullptr);
}

void stop_watching_windows() {
  Watch &self = watch();
  for (Ecore_Event_Handler *&handler : self.handlers) {
    if (handler) ecore_event_handler_del(std::exchange(handler, nullptr));
  }
  if (self.settling) ecore_timer_del(std::exchange(self.settling, nullptr));
  self.windows.clear();
  if (std::exchange(self.has_display, false)) ecore_x_shutdown();
}

void raise_windows() {
  Eina_List *canvases = ecore_evas_ecore_evas_list_get();
  void *item;
  EINA_LIST_FREE(canvases, item) {
    auto *canvas = static_cast<Ecore_Evas *>(item);
    if (!ecore_evas_window_get(canvas) || ecore_evas_override_get(canvas)) continue;
    if (ecore_evas_iconified_get(canvas)) ecore_evas_iconified_set(canvas, EINA_FALSE);
    ecore_evas_activate(canvas);
  }
}

}  // namespace platform
