#include "tavro_compose_strip.h"

#include <algorithm>
#include <cstdio>
#include <cstring>
#include <string>

#include "tavro-common.h"
#include "tavro-main.h"
#include "tavro_compose.h"
#include "tavro_memory.h"
#include "tavro_screens.h"
#include "tavro_widgets.h"

namespace {

constexpr int kThumbUnits = 72;

void _pictures_chosen(appdata *ad, const GSList *paths) {
  compose_view_win *view = tavro_compose_view(ad);
  if (!view) return;
  std::string refused;
  for (const GSList *link = paths; link; link = link->next) {
    const char *path = static_cast<const char *>(link->data);
    if (!tavro_compose_attach(view, path)) refused += (refused.empty() ? "" : "\n") + std::string(path);
  }
  tavro_compose_strip_refresh(ad);
  if (!refused.empty())
    tavro_popup_show(ad, &ad->cancel_popup, tavro_text("IDS_OB_HEADER_NOT_ATTACHED"), refused.c_str(),
                     {{tavro_text("IDS_OB_BUTTON_OK"), nullptr}});
}

void _attach_clicked_cb(void *data, Evas_Object *, void *) {
  tavro_create_gallery_picker(static_cast<appdata *>(data), _pictures_chosen);
}

void _path_deleted_cb(void *data, Evas *, Evas_Object *, void *) {
  char *path = static_cast<char *>(data);
  TAVRO_FREE(path);
}

void _remove_clicked_cb(void *data, Evas_Object *button, void *) {
  appdata *ad = static_cast<appdata *>(data);
  compose_view_win *view = tavro_compose_view(ad);
  if (!view) return;
  tavro_compose_detach(view, static_cast<const char *>(evas_object_data_get(button, "path")));
  // The clicked button goes with the rebuilt strip, but not from inside its own callback.
  ecore_job_add([](void *job_data) { tavro_compose_strip_refresh(static_cast<appdata *>(job_data)); }, ad);
}

std::string _file_name(const char *path) {
  const char *slash = std::strrchr(path, '/');
  return slash ? slash + 1 : path;
}

Evas_Object *_build_thumb(appdata *ad, compose_view_win *view, const char *path) {
  Evas_Object *frame = tavro_layout_add(view->strip, "tavro/compose/attachment");
  const std::string name = _file_name(path);
  Evas_Object *thumb =
      tavro_button_add(frame, "tavro_thumb", nullptr, tavro_picture_add(frame, path, kThumbUnits),
                       name.c_str(), nullptr, nullptr);
  elm_object_content_set(frame, thumb);
  const std::string remove_name = std::string(tavro_text("IDS_OB_BUTTON_REMOVE")) + " " + name;
  Evas_Object *remove = tavro_button_add(frame, "tavro_remove", nullptr, tavro_icon_add(frame, "close/small"),
                                         remove_name.c_str(), _remove_clicked_cb, ad);
  char *own_path = TAVRO_STRDUP(path);
  evas_object_data_set(remove, "path", own_path);
  evas_object_event_callback_add(remove, EVAS_CALLBACK_FREE, _path_deleted_cb, own_path);
  elm_object_part_content_set(frame, "tavro.swallow.remove", remove);
  return frame;
}

void _show_size(compose_view_win *view) {
  const gint64 limit = tavro_attachment_size_limit();
  char text[128];
  std::snprintf(text, sizeof text, tavro_text("IDS_OB_BODY_PS1_OF_PS2_MB"),
                tavro_megabytes(view->buffer).c_str(), tavro_megabytes(limit).c_str());
  tavro_layout_text_set(view->bottom, "elm.text", text);
  const double used = limit > 0 ? static_cast<double>(view->buffer) / static_cast<double>(limit) : 1.0;
  edje_object_part_drag_value_set(elm_layout_edje_get(view->bottom), "tavro.drag.used", std::min(used, 1.0),
                                  0.0);
  elm_object_signal_emit(view->bottom, view->buffer > limit ? "tavro,over" : "tavro,within", "tavro");
  if (view->buffer == 0) elm_object_signal_emit(view->bottom, "tavro,none", "tavro");
}

}  // namespace

void tavro_compose_strip_build(appdata *, compose_view_win *view, Evas_Object *box) {
  Evas_Object *caption = tavro_layout_add(box, "tavro/caption");
  tavro_fill_width(caption);
  elm_object_text_set(caption, tavro_text("IDS_OB_HEADER_ATTACHMENTS"));
  elm_box_pack_end(box, caption);
  Evas_Object *scroller = elm_scroller_add(box);
  elm_object_style_set(scroller, "tavro");
  elm_scroller_policy_set(scroller, ELM_SCROLLER_POLICY_OFF, ELM_SCROLLER_POLICY_OFF);
  elm_scroller_content_min_limit(scroller, EINA_FALSE, EINA_TRUE);
  tavro_fill_width(scroller);
  view->strip = elm_box_add(scroller);
  elm_box_horizontal_set(view->strip, EINA_TRUE);
  elm_box_align_set(view->strip, 0.0, 0.5);
  const int gap = static_cast<int>(10 * elm_config_scale_get());
  elm_box_padding_set(view->strip, gap, 0);
  evas_object_show(view->strip);
  elm_object_content_set(scroller, view->strip);
  evas_object_show(scroller);
  elm_box_pack_end(box, scroller);
}

void tavro_compose_strip_refresh(appdata *ad) {
  compose_view_win *view = tavro_compose_view(ad);
  if (!view) return;
  elm_box_clear(view->strip);
  for (const GSList *link = view->attachments; link; link = link->next)
    elm_box_pack_end(view->strip, _build_thumb(ad, view, static_cast<const char *>(link->data)));
  Evas_Object *attach =
      tavro_button_add(view->strip, "tavro_attach", nullptr, tavro_icon_add(view->strip, "plus"),
                       tavro_text("IDS_OB_BUTTON_ATTACH_PICTURES"), _attach_clicked_cb, ad);
  elm_box_pack_end(view->strip, attach);
  _show_size(view);
}
