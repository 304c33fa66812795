#include "tavro_focus.h"

#include <cstring>
#include <map>
#include <utility>

namespace {

// By the page that was left.
std::map<const Evas_Object *, tavro_focus_memory> _left_pages;
Ecore_Event_Handler *_touches = nullptr;  // while there is a window

void _widget_deleted_cb(void *data, Evas *, Evas_Object *, void *) {
  static_cast<tavro_focus_memory *>(data)->widget = nullptr;
}

void _page_deleted_cb(void *, Evas *, Evas_Object *page, void *) {
  const auto left = _left_pages.find(page);
  if (left == _left_pages.end()) return;
  tavro_focus_forget(&left->second);
  _left_pages.erase(left);
}

Evas_Object *_top_page(const Evas_Object *naviframe) {
  Elm_Object_Item *top = elm_naviframe_top_item_get(naviframe);
  return top ? elm_object_item_content_get(top) : nullptr;
}

// The naviframe has given the focus to the page's first control by now.
void _page_shown_cb(void *, Evas_Object *naviframe, void *) {
  Evas_Object *page = _top_page(naviframe);
  const auto left = _left_pages.find(page);
  if (left == _left_pages.end()) return;
  if (left->second.widget) elm_object_focus_set(left->second.widget, EINA_TRUE);
  evas_object_event_callback_del(page, EVAS_CALLBACK_DEL, _page_deleted_cb);
  _page_deleted_cb(nullptr, nullptr, page, nullptr);
}

void _win_deleted_cb(void *, Evas *, Evas_Object *, void *) {
  ecore_event_handler_del(std::exchange(_touches, nullptr));
}

Eina_Bool _touched_cb(void *win, int, void *) {
  elm_win_focus_highlight_enabled_set(static_cast<Evas_Object *>(win), EINA_FALSE);
  return ECORE_CALLBACK_PASS_ON;
}

bool _can_have_focus(const Elm_Object_Item *item) {
  return !elm_object_item_disabled_get(item) &&
         elm_genlist_item_select_mode_get(item) != ELM_OBJECT_SELECT_MODE_DISPLAY_ONLY;
}

void _list_key_cb(void *, Evas *, Evas_Object *list, void *event_info) {
  auto *key = static_cast<Evas_Event_Key_Down *>(event_info);
  const bool is_down = std::strcmp(key->key, "Down") == 0;
  if (!is_down && std::strcmp(key->key, "Up") != 0) return;
  const auto step = is_down ? elm_genlist_item_next_get : elm_genlist_item_prev_get;
  Elm_Object_Item *item = elm_object_focused_item_get(list);
  if (item) item = step(item);
  while (item && !_can_have_focus(item)) item = step(item);
  if (!item) return;  // At its ends the toolkit leaves the list.
  key->event_flags = static_cast<Evas_Event_Flags>(key->event_flags | EVAS_EVENT_FLAG_ON_HOLD);
  tavro_focus_show(list);
  elm_genlist_item_show(item, ELM_GENLIST_ITEM_SCROLLTO_IN);
  elm_object_item_focus_set(item, EINA_TRUE);
}

}  // namespace

void tavro_focus_remember(tavro_focus_memory *memory, const Evas_Object *win) {
  memory->widget = elm_object_focused_object_get(win);
  if (memory->widget)
    evas_object_event_callback_add(memory->widget, EVAS_CALLBACK_DEL, _widget_deleted_cb, memory);
}

void tavro_focus_forget(tavro_focus_memory *memory) {
  Evas_Object *widget = std::exchange(memory->widget, nullptr);
  if (widget) evas_object_event_callback_del_full(widget, EVAS_CALLBACK_DEL, _widget_deleted_cb, memory);
}

void tavro_focus_follow_pages(Evas_Object *naviframe) {
  // Before the pages' own callbacks, which may know better.
  evas_object_smart_callback_priority_add(naviframe, "transition,finished", EVAS_CALLBACK_PRIORITY_BEFORE,
                                          _page_shown_cb, nullptr);
}

void tavro_focus_leave_page(Evas_Object *naviframe) {
  Evas_Object *page = _top_page(naviframe);
  if (!page || _left_pages.count(page)) return;
  evas_object_event_callback_add(page, EVAS_CALLBACK_DEL, _page_deleted_cb, nullptr);
  tavro_focus_remember(&_left_pages[page], elm_object_top_widget_get(naviframe));
}

void tavro_focus_keep_among(const std::vector<Evas_Object *> &widgets) {
  for (size_t i = 0; i < widgets.size(); ++i) {
    Evas_Object *next = widgets[(i + 1) % widgets.size()];
    for (const Elm_Focus_Direction onward : {ELM_FOCUS_NEXT, ELM_FOCUS_DOWN, ELM_FOCUS_RIGHT})
      elm_object_focus_next_object_set(widgets[i], next, onward);
    for (const Elm_Focus_Direction back : {ELM_FOCUS_PREVIOUS, ELM_FOCUS_UP, ELM_FOCUS_LEFT})
      elm_object_focus_next_object_set(next, widgets[i], back);
  }
}

void tavro_focus_show(Evas_Object *widget) {
  elm_win_focus_highlight_enabled_set(elm_object_top_widget_get(widget), EINA_TRUE);
}

void tavro_focus_walk_list(Evas_Object *list) {
  evas_object_event_callback_priority_add(list, EVAS_CALLBACK_KEY_DOWN, EVAS_CALLBACK_PRIORITY_BEFORE,
                                          _list_key_cb, nullptr);
}

void tavro_focus_hide_at_touch(Evas_Object *win) {
  _touches = ecore_event_handler_add(ECORE_EVENT_MOUSE_BUTTON_DOWN, _touched_cb, win);
  evas_object_event_callback_add(win, EVAS_CALLBACK_DEL, _win_deleted_cb, nullptr);
}
