// Mini-controls as windows above all others. They are override windows: no window manager decorates, covers
// or moves them, and none gives them the keyboard, which they therefore take themselves when they are shown.
#include <Ecore_Evas.h>
#include <Ecore_X.h>
#include <Elementary.h>
#include <minicontrol-provider.h>

#include <algorithm>
#include <memory>
#include <vector>

#include "scoped.h"

namespace {

// What lay below has been painted by then, with a compositor too.
constexpr double kRepaintSeconds = 0.12;
// By then the window is on the screen, and the window manager has given the keyboard on that the
// application's own window had, should that have stepped aside.
constexpr double kFocusSeconds = 0.25;

struct Control {
  Evas_Object *window;
  minicontrol_event_cb callback;
  Ecore_Timer *hiding;  // null unless the window is on its way out
  bool is_told;         // the callback knows
  Ecore_Timer *focusing;
};

std::vector<std::unique_ptr<Control>> &controls() {
  static std::vector<std::unique_ptr<Control>> &all = *new std::vector<std::unique_ptr<Control>>;
  return all;
}

auto find(const Evas_Object *window) {
  return std::find_if(controls().begin(), controls().end(),
                      [window](const auto &control) { return control->window == window; });
}

void tell_windows_that_panel_is_off() {
  Eina_List *canvases = ecore_evas_ecore_evas_list_get();
  void *canvas;
  EINA_LIST_FREE(canvases, canvas) {
    const auto window = static_cast<Ecore_X_Window>(ecore_evas_window_get(static_cast<Ecore_Evas *>(canvas)));
    if (!window) continue;
    ecore_x_client_message32_send(window, ECORE_X_ATOM_E_ILLUME_QUICKPANEL_STATE, ECORE_X_EVENT_MASK_NONE,
                                  static_cast<long>(ECORE_X_ATOM_E_ILLUME_QUICKPANEL_OFF), 0, 0, 0, 0);
  }
}

// First the callback, at once; then, when the screen is painted, the windows.
Eina_Bool hiding_cb(void *data) {
  auto *control = static_cast<Control *>(data);
  if (control->is_told) {
    control->hiding = nullptr;
    tell_windows_that_panel_is_off();
    return ECORE_CALLBACK_CANCEL;
  }
  control->is_told = true;
  ecore_x_sync();
  ecore_timer_interval_set(control->hiding, kRepaintSeconds);
  control->callback(control->window, MINICONTROL_VIEWER_EVENT_HIDDEN, nullptr);
  return ECORE_CALLBACK_RENEW;  // no matter when the callback has deleted the window, and with it the timer
}

void hide(Control *control) {
  evas_object_hide(control->window);
  control->is_told = false;
  if (control->hiding) ecore_timer_del(control->hiding);
  control->hiding = ecore_timer_add(0.0, hiding_cb, control);
}

void close_requested_cb(void *data, Evas_Object *, void *) {
  hide(static_cast<Control *>(data));
}

Eina_Bool focus_cb(void *data) {
  auto *control = static_cast<Control *>(data);
  control->focusing = nullptr;
  if (evas_object_visible_get(control->window))
    ecore_x_window_focus(static_cast<Ecore_X_Window>(elm_win_window_id_get(control->window)));
  return ECORE_CALLBACK_CANCEL;
}

void shown_cb(void *data, Evas *, Evas_Object *, void *) {
  auto *control = static_cast<Control *>(data);
  if (!control->focusing) control->focusing = ecore_timer_add(kFocusSeconds, focus_cb, control);
}

void deleted_cb(void *, Evas *, Evas_Object *window, void *) {
  const auto known = find(window);
  if (known == controls().end()) return;
  for (Ecore_Timer *timer : {(*known)->hiding, (*known)->focusing})
    if (timer) ecore_timer_del(timer);
  controls().erase(known);
}

}  // namespace

Evas_Object *minicontrol_create_window(const char *name, minicontrol_target_viewer_e target_viewer,
                                       minicontrol_event_cb callback) {
  const bool is_known_target = target_viewer == MINICONTROL_TARGET_VIEWER_QUICK_PANEL ||
                               target_viewer == MINICONTROL_TARGET_VIEWER_STOCK_TRAY;
  if (!name || !callback || !is_known_target) return nullptr;
  Evas_Object *window = elm_win_add(nullptr, name, ELM_WIN_UTILITY);
  if (!window) return nullptr;
  elm_win_title_set(window, name);
  elm_win_borderless_set(window, EINA_TRUE);
  elm_win_override_set(window, EINA_TRUE);
  controls().push_back(std::make_unique<Control>(Control{window, callback, nullptr, false, nullptr}));
  evas_object_smart_callback_add(window, "delete,request", close_requested_cb, controls().back().get());
  evas_object_event_callback_add(window, EVAS_CALLBACK_SHOW, shown_cb, controls().back().get());
  evas_object_event_callback_add(window, EVAS_CALLBACK_DEL, deleted_cb, nullptr);
  return window;
}

int minicontrol_send_event(Evas_Object *minicontrol, minicontrol_provider_event_e event, bundle *) {
  const auto known = find(minicontrol);
  if (known == controls().end() || event != MINICONTROL_PROVIDER_EVENT_REQUEST_HIDE)
    return MINICONTROL_ERROR_INVALID_PARAMETER;
  hide(known->get());
  return MINICONTROL_ERROR_NONE;
}
