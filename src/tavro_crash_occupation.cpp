#include "tavro_crash_occupation.h"

#include <cstring>
#include <utility>

#include "tavro-common.h"
#include "tavro-main.h"
#include "tavro_compose.h"

namespace {

struct awaited_end {
  Evas_Object *widget;  // null: nothing is waited for
  appdata *ad;
  void (*ended)(appdata *ad);
};
awaited_end _awaited = {};

bool _is_entry(const Evas_Object *widget) {
  const char *type = widget ? elm_object_widget_type_get(widget) : nullptr;
  return type && (std::strstr(type, "Entry") || std::strstr(type, "entry"));
}

void _unfocused_cb(void *, Evas_Object *, void *);

// With the widget itself, what was added to it goes.
void _deleted_cb(void *, Evas *, Evas_Object *, void *) {
  const awaited_end over = std::exchange(_awaited, {});
  over.ended(over.ad);
}

awaited_end _stop_waiting() {
  const awaited_end before = std::exchange(_awaited, {});
  if (!before.widget) return before;
  evas_object_event_callback_del(before.widget, EVAS_CALLBACK_DEL, _deleted_cb);
  if (_is_entry(before.widget)) evas_object_smart_callback_del(before.widget, "unfocused", _unfocused_cb);
  return before;
}

void _unfocused_cb(void *, Evas_Object *, void *) {
  const awaited_end over = _stop_waiting();
  over.ended(over.ad);
}

}  // namespace

Evas_Object *tavro_crash_occupation(appdata *ad) {
  if (!ad->win) return nullptr;
  if (const compose_view_win *view = tavro_compose_view(ad)) return view->layout;
  if (Evas_Object *popup = tavro_popup_shown(ad)) return popup;
  Evas_Object *focused = elm_object_focused_object_get(ad->win);
  return _is_entry(focused) ? focused : nullptr;
}

bool tavro_crash_wait_for(appdata *ad, Evas_Object *occupation, void (*ended)(appdata *ad)) {
  if (_awaited.widget == occupation) return false;
  _stop_waiting();
  _awaited = {occupation, ad, ended};
  evas_object_event_callback_add(occupation, EVAS_CALLBACK_DEL, _deleted_cb, nullptr);
  if (_is_entry(occupation)) evas_object_smart_callback_add(occupation, "unfocused", _unfocused_cb, nullptr);
  return true;
}
