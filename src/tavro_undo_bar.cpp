#include "tavro_undo_bar.h"

#include <elm_atspi.h>

#include <algorithm>

#include "tavro-common.h"
#include "tavro-main.h"
#include "tavro_focus.h"
#include "tavro_widgets.h"

namespace {

constexpr char kPart[] = "tavro.swallow.undo";
constexpr char kRoomPart[] = "tavro.swallow.undo_room";
constexpr int kTitleBarUnits = 56;

// The one bar that can be shown; `bar` null: none.
struct undo_bar {
  appdata *ad;
  Evas_Object *bar;
  Evas_Object *button;
  Evas_Object *room;  // between the bar and the foot of the window
  void (*undo)(appdata *ad);
  tavro_focus_memory focus;  // where the keyboard was, when the button took it
} _shown;

struct area {
  int x, y, width, height;
};

area _area_of(const Evas_Object *object) {
  area area = {};
  evas_object_geometry_get(object, &area.x, &area.y, &area.width, &area.height);
  return area;
}

// The height of the bar that the page on top has at its bottom.
int _page_bottom_height(const appdata *ad) {
  Elm_Object_Item *top = elm_naviframe_top_item_get(ad->nf);
  const Evas_Object *page = top ? elm_object_item_content_get(top) : nullptr;
  const Evas_Object *bottom = page ? elm_object_part_content_get(page, "tavro.swallow.bottom") : nullptr;
  return bottom ? _area_of(bottom).height : 0;
}

bool _is_entry(const Evas_Object *widget) {
  return widget && elm_object_widget_check(widget) &&
         g_strcmp0(elm_object_widget_type_get(widget), "Elm_Entry") == 0;
}

bool _covers_focused_entry(const area &base, int room, int height) {
  const Evas_Object *focused = elm_object_focused_object_get(_shown.ad->win);
  if (!_is_entry(focused)) return false;
  const area entry = _area_of(focused);
  const int foot = base.y + base.height - room;
  return entry.y < foot && entry.y + entry.height > foot - height;
}

// The page on top, its size or the focus changed.
void _place() {
  if (!_shown.bar) return;
  const area base = _area_of(_shown.ad->layout);
  int height = 0;
  edje_object_size_min_calc(elm_layout_edje_get(_shown.bar), nullptr, &height);
  int room = _page_bottom_height(_shown.ad);
  if (_covers_focused_entry(base, room, height)) {
    const int title_bar = static_cast<int>(kTitleBarUnits * elm_config_scale_get());
    room = std::max(room, base.height - title_bar - height);
  }
  evas_object_size_hint_min_set(_shown.room, 0, room);
}

void _focus_moved_cb(void *, Evas *, void *) {
  _place();
}

void _page_changed_cb(void *, Evas_Object *, void *) {
  _place();
}

void _resized_cb(void *, Evas *, Evas_Object *, void *) {
  _place();
}

void _follow_window(appdata *ad) {
  evas_event_callback_add(evas_object_evas_get(ad->win), EVAS_CALLBACK_CANVAS_OBJECT_FOCUS_IN,
                          _focus_moved_cb, nullptr);
  evas_object_smart_callback_add(ad->nf, "transition,finished", _page_changed_cb, nullptr);
  evas_object_event_callback_add(ad->nf, EVAS_CALLBACK_RESIZE, _resized_cb, nullptr);
}

void _leave_window(appdata *ad) {
  if (!ad->win || !ad->nf) return;
  evas_event_callback_del(evas_object_evas_get(ad->win), EVAS_CALLBACK_CANVAS_OBJECT_FOCUS_IN,
                          _focus_moved_cb);
  evas_object_smart_callback_del(ad->nf, "transition,finished", _page_changed_cb);
  evas_object_event_callback_del(ad->nf, EVAS_CALLBACK_RESIZE, _resized_cb);
}

void _bar_deleted_cb(void *, Evas *, Evas_Object *bar, void *) {
  if (_shown.bar != bar) return;
  _leave_window(_shown.ad);
  // Whom the button took the focus from gets it back, unless the person has moved on.
  if (_shown.focus.widget && elm_object_focus_get(_shown.button))
    elm_object_focus_set(_shown.focus.widget, EINA_TRUE);
  tavro_focus_forget(&_shown.focus);
  _shown = {};
}

void _undo_clicked_cb(void *, Evas_Object *, void *) {
  appdata *ad = _shown.ad;
  void (*const undo)(appdata *) = _shown.undo;
  tavro_undo_bar_hide();
  undo(ad);
}

// By keyboard the way to the foot of a long list would take longer than there is time; a touch shows no
// focus. Who is writing goes on.
void _take_focus(appdata *ad) {
  if (_is_entry(elm_object_focused_object_get(ad->win))) return;
  tavro_focus_remember(&_shown.focus, ad->win);
  elm_object_focus_set(_shown.button, EINA_TRUE);
}

}  // namespace

void tavro_undo_bar_show(appdata *ad, const char *text, void (*undo)(appdata *ad)) {
  tavro_undo_bar_hide();
  if (!ad->win || !ad->layout || !ad->nf) return;
  _shown.ad = ad;
  _shown.undo = undo;
  _shown.bar = tavro_layout_add(ad->layout, "tavro/undo_bar");
  evas_object_event_callback_add(_shown.bar, EVAS_CALLBACK_DEL, _bar_deleted_cb, nullptr);
  tavro_layout_text_set(_shown.bar, "elm.text", text);
  elm_atspi_accessible_name_set(_shown.bar, text);
  elm_atspi_accessible_role_set(_shown.bar, ELM_ATSPI_ROLE_ALERT);  // what a screen reader reads at once
  elm_object_focus_allow_set(_shown.bar, EINA_FALSE);               // but its button
  _shown.button = tavro_button_add(_shown.bar, "tavro_undo", tavro_text("IDS_OB_BUTTON_UNDO"), nullptr,
                                   nullptr, _undo_clicked_cb, nullptr);
  elm_atspi_accessible_description_set(_shown.button, text);
  elm_object_part_content_set(_shown.bar, "tavro.swallow.button", _shown.button);
  _shown.room = evas_object_rectangle_add(evas_object_evas_get(ad->win));
  evas_object_color_set(_shown.room, 0, 0, 0, 0);
  elm_object_part_content_set(ad->layout, kRoomPart, _shown.room);
  elm_object_part_content_set(ad->layout, kPart, _shown.bar);
  elm_object_signal_emit(_shown.bar, "tavro,run", "tavro");
  _follow_window(ad);
  _place();
  _take_focus(ad);
}

void tavro_undo_bar_hide() {
  if (!_shown.bar) return;
  Evas_Object *room = _shown.room;
  evas_object_del(_shown.bar);
  evas_object_del(room);
}
