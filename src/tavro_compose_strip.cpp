#include "tavro_compose_strip.h"

#include <elm_atspi.h>

#include <algorithm>
#include <cstring>
#include <string>
#include <utility>
#include <vector>

#include "tavro-common.h"
#include "tavro-main.h"
#include "tavro_compose.h"
#include "tavro_compose_keeper.h"
#include "tavro_deleted_files.h"
#include "tavro_handles.h"
#include "tavro_memory.h"
#include "tavro_screens.h"
#include "tavro_thumbnails.h"
#include "tavro_widgets.h"

namespace {

constexpr int kThumbUnits = 80;
// How long a finger rests on a picture before its menu comes up.
constexpr double kLongPressSeconds = 0.5;

// The picture under the finger, until it is lifted or its menu has come up.
Ecore_Timer *_long_press = nullptr;
guint _place_to_focus = 0;  // in the strip that is rebuilt after a removal
std::vector<std::string> _removed;

const char *_path_of(const Evas_Object *widget) {
  return static_cast<const char *>(evas_object_data_get(widget, "path"));
}

void _path_deleted_cb(void *data, Evas *, Evas_Object *, void *) {
  char *path = static_cast<char *>(data);
  TAVRO_FREE(path);
}

void _name_path(Evas_Object *widget, const char *path) {
  char *own_path = TAVRO_STRDUP(path);
  evas_object_data_set(widget, "path", own_path);
  evas_object_event_callback_add(widget, EVAS_CALLBACK_FREE, _path_deleted_cb, own_path);
}

appdata *_ad_of(const Evas_Object *thumb) {
  return static_cast<appdata *>(evas_object_data_get(thumb, "app_data"));
}

// ---- What the person does with a picture ----

void _end_long_press() {
  if (_long_press) ecore_timer_del(_long_press);
  _long_press = nullptr;
}

void _show_menu(const Evas_Object *thumb) {
  tavro_compose_show_attachment_menu(_ad_of(thumb), _path_of(thumb));
}

// The release that follows is no tap: the picture lies under the menu by then.
Eina_Bool _long_pressed_cb(void *data) {
  _long_press = nullptr;
  Evas_Object *thumb = static_cast<Evas_Object *>(data);
  evas_object_data_set(thumb, "was_pressed_long", thumb);
  _show_menu(thumb);
  return ECORE_CALLBACK_CANCEL;
}

void _mouse_down_cb(void *, Evas *, Evas_Object *thumb, void *) {
  _end_long_press();
  evas_object_data_del(thumb, "was_pressed_long");
  _long_press = ecore_timer_add(kLongPressSeconds, _long_pressed_cb, thumb);
}

// Also when the strip is moved by the finger, or the picture goes.
void _mouse_up_cb(void *, Evas *, Evas_Object *, void *) {
  _end_long_press();
}

void _mouse_moved_cb(void *, Evas *, Evas_Object *, void *event_info) {
  const Evas_Event_Mouse_Move *move = static_cast<Evas_Event_Mouse_Move *>(event_info);
  if (move->event_flags & EVAS_EVENT_FLAG_ON_HOLD) _end_long_press();
}

void _key_down_cb(void *, Evas *, Evas_Object *thumb, void *event_info) {
  const Evas_Event_Key_Down *key = static_cast<Evas_Event_Key_Down *>(event_info);
  const bool is_menu_key = std::strcmp(key->key, "Menu") == 0;
  const bool is_shift_f10 =
      std::strcmp(key->key, "F10") == 0 && evas_key_modifier_is_set(key->modifiers, "Shift");
  if (is_menu_key || is_shift_f10) _show_menu(thumb);
}

void _thumb_clicked_cb(void *data, Evas_Object *thumb, void *) {
  if (!evas_object_data_del(thumb, "was_pressed_long"))
    tavro_create_picture_page(static_cast<appdata *>(data), _path_of(thumb));
}

void _remove_clicked_cb(void *data, Evas_Object *button, void *) {
  tavro_compose_strip_remove(static_cast<appdata *>(data), _path_of(button));
}

void _attach_clicked_cb(void *data, Evas_Object *, void *) {
  tavro_compose_show_sources(static_cast<appdata *>(data));
}

// ---- The strip ----

Evas_Object *_build_thumb(appdata *ad, Evas_Object *frame, const char *path, const std::string &name) {
  Evas_Object *thumb =
      tavro_button_add(frame, "tavro_thumb", nullptr, tavro_thumbnail_add(frame, path, kThumbUnits),
                       name.c_str(), _thumb_clicked_cb, ad);
  elm_atspi_accessible_description_set(thumb, tavro_text("IDS_OB_BODY_ATTACHMENT_KEYS"));
  _name_path(thumb, path);
  evas_object_data_set(thumb, "app_data", ad);
  evas_object_event_callback_add(thumb, EVAS_CALLBACK_MOUSE_DOWN, _mouse_down_cb, nullptr);
  evas_object_event_callback_add(thumb, EVAS_CALLBACK_MOUSE_UP, _mouse_up_cb, nullptr);
  evas_object_event_callback_add(thumb, EVAS_CALLBACK_MOUSE_MOVE, _mouse_moved_cb, nullptr);
  evas_object_event_callback_add(thumb, EVAS_CALLBACK_DEL, _mouse_up_cb, nullptr);
  evas_object_event_callback_add(thumb, EVAS_CALLBACK_KEY_DOWN, _key_down_cb, nullptr);
  return thumb;
}

Evas_Object *_build_attachment(appdata *ad, Evas_Object *strip, const char *path) {
  Evas_Object *frame = tavro_layout_add(strip, "tavro/compose/attachment");
  const std::string name = tavro_file_name(path);
  elm_object_content_set(frame, _build_thumb(ad, frame, path, name));
  const std::string remove_name = std::string(tavro_text("IDS_OB_BUTTON_REMOVE")) + " " + name;
  Evas_Object *remove = tavro_button_add(frame, "tavro_remove", nullptr, tavro_icon_add(frame, "close/small"),
                                         remove_name.c_str(), _remove_clicked_cb, ad);
  _name_path(remove, path);
  elm_object_part_content_set(frame, "tavro.swallow.remove", remove);
  return frame;
}

// What asked for the removal goes with the rebuilt strip, but not from inside its own callback.
void _removed_cb(void *data) {
  appdata *ad = static_cast<appdata *>(data);
  const compose_view_win *view = tavro_compose_view(ad);
  tavro_compose_strip_refresh(ad);
  for (const std::string &path : std::exchange(_removed, {})) tavro_compose_strip_dropped(path);
  if (!view) return;
  tavro_compose_strip_focus(ad,
                            static_cast<const char *>(g_slist_nth_data(view->attachments, _place_to_focus)));
}

}  // namespace

void tavro_compose_strip_build(appdata *, compose_view_win *view, Evas_Object *box) {
  Evas_Object *caption = tavro_layout_add(box, "tavro/caption");
  tavro_fill_width(caption);
  elm_object_text_set(caption, tavro_text("IDS_OB_HEADER_ATTACHMENTS"));
  Evas_Object *scroller = elm_scroller_add(box);
  elm_object_style_set(scroller, "tavro");
  elm_scroller_policy_set(scroller, ELM_SCROLLER_POLICY_OFF, ELM_SCROLLER_POLICY_OFF);
  elm_scroller_content_min_limit(scroller, EINA_FALSE, EINA_TRUE);
  tavro_fill_width(scroller);
  view->strip = elm_box_add(scroller);
  elm_box_horizontal_set(view->strip, EINA_TRUE);
  elm_box_align_set(view->strip, 0.0, 1.0);
  evas_object_show(view->strip);
  elm_object_content_set(scroller, view->strip);
  evas_object_show(scroller);
  // The attachments bring the room between them and the caption along.
  Evas_Object *group = elm_box_add(box);
  tavro_fill_width(group);
  elm_box_pack_end(group, caption);
  elm_box_pack_end(group, scroller);
  evas_object_show(group);
  elm_box_pack_end(box, group);
}

void tavro_compose_strip_refresh(appdata *ad) {
  compose_view_win *view = tavro_compose_view(ad);
  if (!view) return;
  elm_box_clear(view->strip);
  for (const GSList *link = view->attachments; link; link = link->next)
    elm_box_pack_end(view->strip, _build_attachment(ad, view->strip, static_cast<const char *>(link->data)));
  Evas_Object *frame = tavro_layout_add(view->strip, "tavro/compose/attachment");
  elm_object_content_set(
      frame, tavro_button_add(frame, "tavro_attach", nullptr, tavro_icon_add(frame, "plus"),
                              tavro_text("IDS_OB_BUTTON_ATTACH_PICTURES"), _attach_clicked_cb, ad));
  elm_box_pack_end(view->strip, frame);
  tavro_compose_size_refresh(ad);
  tavro_compose_keeper_note();
}

void tavro_compose_strip_focus(appdata *ad, const char *path) {
  const compose_view_win *view = tavro_compose_view(ad);
  if (!view) return;
  Eina_List *frames = elm_box_children_get(view->strip);
  const GSList *link = view->attachments;
  unsigned place = 0;
  for (; link && path && std::strcmp(static_cast<const char *>(link->data), path) != 0; link = link->next)
    ++place;
  void *frame = link && path ? eina_list_nth(frames, place) : eina_list_last_data_get(frames);
  eina_list_free(frames);
  if (frame) elm_object_focus_set(elm_object_content_get(static_cast<Evas_Object *>(frame)), EINA_TRUE);
}

void tavro_compose_strip_remove(appdata *ad, const char *path) {
  compose_view_win *view = tavro_compose_view(ad);
  if (!view) return;
  _place_to_focus = 0;
  for (const GSList *link = view->attachments;
       link && std::strcmp(static_cast<const char *>(link->data), path) != 0; link = link->next)
    ++_place_to_focus;
  _removed.emplace_back(path);
  tavro_compose_detach(view, path);
  ecore_job_add(_removed_cb, ad);
}

void tavro_compose_strip_dropped(const std::string &path) {
  tavro_compose_keeper_flush();  // what is kept of the screen must not name it any more
  tavro_deleted_files_note_copies({}, {path});
  tavro_deleted_files_remove();
}

void tavro_compose_size_refresh(appdata *ad) {
  const compose_view_win *view = tavro_compose_view(ad);
  if (!view || !view->bottom) return;
  const gint64 total = tavro_compose_total(ad), limit = tavro_attachment_size_limit();
  const TavroGText text(g_strdup_printf(tavro_text("IDS_OB_BODY_PS1_OF_PS2_MB"),
                                        tavro_megabytes(total).c_str(), tavro_megabytes(limit).c_str()));
  tavro_layout_text_set(view->bottom, "elm.text", text.get());
  const double used = static_cast<double>(total) / static_cast<double>(limit);
  edje_object_part_drag_value_set(elm_layout_edje_get(view->bottom), "tavro.drag.used", std::min(used, 1.0),
                                  0.0);
  elm_object_signal_emit(view->bottom, total > limit ? "tavro,over" : "tavro,within", "tavro");
  if (total == 0) elm_object_signal_emit(view->bottom, "tavro,none", "tavro");
}
