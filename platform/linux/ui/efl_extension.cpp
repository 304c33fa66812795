#include "efl_extension.h"

#include <Ecore.h>
#include <Ecore_Input.h>

#include <algorithm>
#include <string>
#include <vector>

#include "hardware_keys.h"

namespace {

constexpr unsigned int kMouseBackButton = 8;  // the thumb button, as X numbers it

struct Listener {
  Evas_Object *object;
  Eext_Callback_Type type;
  Eext_Event_Cb callback;
  void *data;
};

// Oldest first; a later one lies above an earlier one.
std::vector<Listener> &listeners() {
  static std::vector<Listener> &all = *new std::vector<Listener>;
  return all;
}

// An object is before the user when it and everything that holds it are shown: a page of a naviframe that
// another page covers is not.
bool is_before_user(const Evas_Object *object) {
  for (const Evas_Object *part = object; part; part = evas_object_smart_parent_get(part)) {
    if (!evas_object_visible_get(part)) return false;
  }
  return true;
}

auto topmost_listener(Eext_Callback_Type type) {
  auto &all = listeners();
  return std::find_if(all.rbegin(), all.rend(), [type](const Listener &listener) {
    return listener.type == type && is_before_user(listener.object);
  });
}

bool serve_key(Eext_Callback_Type type) {
  const auto topmost = topmost_listener(type);
  if (topmost == listeners().rend()) return false;
  // The callback may delete the object and with it the entry.
  const Listener chosen = *topmost;
  chosen.callback(chosen.data, chosen.object, nullptr);
  return true;
}

bool is_back_key(const std::string &key) {
  return key == "Escape" || key == "XF86Back";
}

Eina_Bool key_down_cb(void *, int, void *event) {
  const bool is_taken = platform::take_key_down(*static_cast<Ecore_Event_Key *>(event));
  return is_taken ? ECORE_CALLBACK_DONE : ECORE_CALLBACK_PASS_ON;
}

Eina_Bool key_up_cb(void *, int, void *event) {
  platform::serve_key_up(*static_cast<Ecore_Event_Key *>(event));
  return ECORE_CALLBACK_PASS_ON;
}

Eina_Bool button_up_cb(void *, int, void *event) {
  if (static_cast<Ecore_Event_Mouse_Button *>(event)->buttons == kMouseBackButton) {
    serve_key(EEXT_CALLBACK_BACK);
  }
  return ECORE_CALLBACK_PASS_ON;
}

void listen_to_keys() {
  static Ecore_Event_Handler *const presses =
      ecore_event_handler_prepend(ECORE_EVENT_KEY_DOWN, key_down_cb, nullptr);
  static Ecore_Event_Handler *const keys = ecore_event_handler_add(ECORE_EVENT_KEY_UP, key_up_cb, nullptr);
  static Ecore_Event_Handler *const buttons =
      ecore_event_handler_add(ECORE_EVENT_MOUSE_BUTTON_UP, button_up_cb, nullptr);
  static_cast<void>(presses);
  static_cast<void>(keys);
  static_cast<void>(buttons);
}

void object_deleted_cb(void *, Evas *, Evas_Object *object, void *) {
  auto &all = listeners();
  all.erase(std::remove_if(all.begin(), all.end(),
                           [object](const Listener &listener) { return listener.object == object; }),
            all.end());
}

bool has_listener(const Evas_Object *object) {
  const auto &all = listeners();
  return std::any_of(all.begin(), all.end(),
                     [object](const Listener &listener) { return listener.object == object; });
}

}  // namespace

// The desktop's toolkit pops a naviframe by itself when Escape goes down; a key that somebody asked for is
// kept from it, or one press would go back twice.
bool platform::take_key_down(const Ecore_Event_Key &key) {
  return is_back_key(key.keyname) && topmost_listener(EEXT_CALLBACK_BACK) != listeners().rend();
}

void platform::serve_key_up(const Ecore_Event_Key &key) {
  const std::string name = key.keyname;
  if (is_back_key(name)) serve_key(EEXT_CALLBACK_BACK);
  if (name == "Menu" || name == "XF86Menu" || name == "XF86Send") serve_key(EEXT_CALLBACK_MORE);
}

void eext_object_event_callback_add(Evas_Object *obj, Eext_Callback_Type type, Eext_Event_Cb func,
                                    void *data) {
  if (!obj || !func || type < EEXT_CALLBACK_BACK || type >= EEXT_CALLBACK_LAST) return;
  listen_to_keys();
  if (!has_listener(obj)) evas_object_event_callback_add(obj, EVAS_CALLBACK_DEL, object_deleted_cb, nullptr);
  listeners().push_back({obj, type, func, data});
}

void *eext_object_event_callback_del(Evas_Object *obj, Eext_Callback_Type type, Eext_Event_Cb func) {
  auto &all = listeners();
  const auto known = std::find_if(all.begin(), all.end(), [&](const Listener &listener) {
    return listener.object == obj && listener.type == type && listener.callback == func;
  });
  if (known == all.end()) return nullptr;
  void *data = known->data;
  all.erase(known);
  if (!has_listener(obj)) evas_object_event_callback_del(obj, EVAS_CALLBACK_DEL, object_deleted_cb);
  return data;
}

void eext_naviframe_back_cb(void *, Evas_Object *obj, void *) {
  elm_naviframe_item_pop(obj);
}

void eext_popup_back_cb(void *, Evas_Object *obj, void *) {
  evas_object_del(obj);
}

void eext_ctxpopup_back_cb(void *, Evas_Object *obj, void *) {
  elm_ctxpopup_dismiss(obj);
}
