// One picture, to be looked at from near; or a video, which another application plays.
#include <app_control.h>
#include <elm_atspi.h>

#include <algorithm>
#include <cstring>
#include <string>
#include <utility>

#include "tavro-common.h"
#include "tavro-main.h"
#include "tavro_compose.h"
#include "tavro_gallery.h"
#include "tavro_handles.h"
#include "tavro_memory.h"
#include "tavro_picture_info.h"
#include "tavro_save_copy.h"
#include "tavro_screens.h"
#include "tavro_video_info.h"
#include "tavro_widgets.h"

namespace {

constexpr int kMostZoom = 8;
constexpr int kDecodedSide = 4096;  // pixels; what is larger is decoded smaller where its format can
constexpr gint64 kMostPixels = 50'000'000;
constexpr gint64 kMostPixelsOfAScalable = 200'000'000;

// Belongs to its page.
struct viewer {
  appdata *ad;
  Evas_Object *page;
  Evas_Object *scroller;  // this and the picture are null for a video
  Evas_Object *picture;
  char *path;
  int zoom;  // 1: the whole picture fits
  bool is_alone;
  unsigned last_touch_ms;  // the canvas's clock
};

void _page_deleted_cb(void *data, Evas *, Evas_Object *, void *) {
  viewer *state = static_cast<viewer *>(data);
  TAVRO_FREE(state->path);
  TAVRO_FREE(state);
}

void _back_clicked_cb(void *data, Evas_Object *, void *) {
  elm_naviframe_item_pop(static_cast<Evas_Object *>(data));
}

void _show_message(viewer *state, const char *id) {
  tavro_layout_text_set(state->page, nullptr, tavro_text(id));
  elm_object_signal_emit(state->page, "tavro,message", "tavro");
  elm_atspi_accessible_description_set(state->page, tavro_text(id));
}

// ---- Picture ----

void _fit(viewer *state) {
  int width = 0, height = 0;
  evas_object_geometry_get(state->scroller, nullptr, nullptr, &width, &height);
  evas_object_size_hint_min_set(state->picture, width * state->zoom, height * state->zoom);
}

// What is at this point of the picture (each 0 to 1) comes to the middle of the page.
void _zoom_at(viewer *state, int zoom, double x, double y) {
  state->zoom = std::clamp(zoom, 1, kMostZoom);
  _fit(state);
  evas_smart_objects_calculate(evas_object_evas_get(state->page));
  int width = 0, height = 0;
  evas_object_geometry_get(state->scroller, nullptr, nullptr, &width, &height);
  const auto start = [&](double point, int length) {
    return static_cast<int>(point * length * state->zoom) - length / 2;
  };
  elm_scroller_region_show(state->scroller, start(x, width), start(y, height), width, height);
}

void _zoom(viewer *state, int zoom) {
  int x = 0, y = 0, width = 0, height = 0;
  elm_scroller_region_get(state->scroller, &x, &y, &width, &height);
  const auto middle = [state](int start, int length) {
    return length > 0 ? (start + length / 2.0) / (length * state->zoom) : 0.5;
  };
  _zoom_at(state, zoom, middle(x, width), middle(y, height));
}

void _zoom_in_cb(void *data, Evas_Object *, void *) {
  viewer *state = static_cast<viewer *>(data);
  _zoom(state, state->zoom * 2);
}

void _zoom_out_cb(void *data, Evas_Object *, void *) {
  viewer *state = static_cast<viewer *>(data);
  _zoom(state, state->zoom / 2);
}

void _show_alone(viewer *state, bool is_alone) {
  state->is_alone = is_alone;
  elm_object_signal_emit(state->page, is_alone ? "tavro,alone" : "tavro,barred", "tavro");
}

// A touch leaves the picture alone on the screen; a second one right behind it looks at the place from near.
void _touched_cb(void *data, Evas *, Evas_Object *picture, void *event_info) {
  viewer *state = static_cast<viewer *>(data);
  const auto *touch = static_cast<Evas_Event_Mouse_Up *>(event_info);
  if (touch->button != 1 || (touch->event_flags & EVAS_EVENT_FLAG_ON_HOLD)) return;
  // The canvas tells a touch again when the picture under it changes its size, which it does below.
  if (std::exchange(state->last_touch_ms, touch->timestamp) == touch->timestamp) return;
  _show_alone(state, !state->is_alone);
  if (!(touch->flags & EVAS_BUTTON_DOUBLE_CLICK)) return;
  int x = 0, y = 0, width = 1, height = 1;
  evas_object_geometry_get(picture, &x, &y, &width, &height);
  _zoom_at(state, state->zoom > 1 ? 1 : 2, static_cast<double>(touch->canvas.x - x) / std::max(width, 1),
           static_cast<double>(touch->canvas.y - y) / std::max(height, 1));
}

Eina_Bool _key_cb(void *data, Evas_Object *, Evas_Object *, Evas_Callback_Type type, void *event_info) {
  if (type != EVAS_CALLBACK_KEY_DOWN) return EINA_FALSE;
  viewer *state = static_cast<viewer *>(data);
  const char *key = static_cast<Evas_Event_Key_Down *>(event_info)->key;
  const struct {
    const char *key;
    int zoom;
  } kZooms[] = {{"plus", state->zoom * 2},
                {"equal", state->zoom * 2},
                {"KP_Add", state->zoom * 2},
                {"minus", state->zoom / 2},
                {"0", 1},
                {"KP_0", 1},
                {"KP_Subtract", state->zoom / 2}};
  for (const auto &entry : kZooms) {
    if (std::strcmp(key, entry.key) != 0) continue;
    _zoom(state, entry.zoom);
    return EINA_TRUE;
  }
  return EINA_FALSE;
}

void _resized_cb(void *data, Evas *, Evas_Object *, void *) {
  _fit(static_cast<viewer *>(data));
}

void _decoded_cb(void *data, Evas *, Evas_Object *image, void *) {
  viewer *state = static_cast<viewer *>(data);
  if (evas_object_image_load_error_get(image) == EVAS_LOAD_ERROR_NONE) return;
  evas_object_hide(state->picture);
  _show_message(state, "IDS_OB_BODY_PICTURE_NOT_READABLE");
}

// Why the picture cannot be shown, as a string id; null when it can.
const char *_obstacle(const char *path) {
  tavro_picture_info info{};
  if (!tavro_picture_info_read(path, &info)) return "IDS_OB_BODY_PICTURE_NOT_READABLE";
  const bool is_scalable = info.format == TAVRO_PICTURE_JPEG && !info.is_progressive;
  const gint64 pixels = static_cast<gint64>(info.width) * info.height;
  return pixels > (is_scalable ? kMostPixelsOfAScalable : kMostPixels) ? "IDS_OB_BODY_PICTURE_TOO_LARGE"
                                                                       : nullptr;
}

bool _load_picture(viewer *state) {
  state->picture = elm_image_add(state->scroller);
  Evas_Object *image = elm_image_object_get(state->picture);
  elm_image_prescale_set(state->picture, kDecodedSide);
  elm_image_preload_disabled_set(state->picture, EINA_FALSE);
  elm_image_aspect_fixed_set(state->picture, EINA_TRUE);
  elm_image_fill_outside_set(state->picture, EINA_FALSE);
  evas_object_image_load_orientation_set(image, EINA_TRUE);
  evas_object_event_callback_add(image, EVAS_CALLBACK_IMAGE_PRELOADED, _decoded_cb, state);
  evas_object_show(state->picture);
  return elm_image_file_set(state->picture, state->path, nullptr);
}

void _build_picture(viewer *state, const char *name) {
  if (const char *obstacle = _obstacle(state->path)) return _show_message(state, obstacle);
  state->scroller = elm_scroller_add(state->page);
  elm_object_style_set(state->scroller, "tavro");
  elm_scroller_policy_set(state->scroller, ELM_SCROLLER_POLICY_OFF, ELM_SCROLLER_POLICY_OFF);
  evas_object_event_callback_add(state->scroller, EVAS_CALLBACK_RESIZE, _resized_cb, state);
  elm_object_content_set(state->page, state->scroller);
  if (!_load_picture(state)) return _show_message(state, "IDS_OB_BODY_PICTURE_NOT_READABLE");
  evas_object_event_callback_add(state->picture, EVAS_CALLBACK_MOUSE_UP, _touched_cb, state);
  elm_atspi_accessible_name_set(state->picture, name);
  elm_object_content_set(state->scroller, state->picture);
  tavro_page_action_add(state->page, "minus", tavro_text("IDS_OB_BUTTON_ZOOM_OUT"), _zoom_out_cb, state);
  tavro_page_action_add(state->page, "plus", tavro_text("IDS_OB_BUTTON_ZOOM_IN"), _zoom_in_cb, state);
  elm_object_event_callback_add(state->page, _key_cb, state);
}

// ---- Video ----

void _open_video_cb(void *data, Evas_Object *, void *) {
  const viewer *state = static_cast<viewer *>(data);
  const TavroGText uri(g_filename_to_uri(state->path, nullptr, nullptr));
  app_control_h handle = nullptr;
  if (!uri || app_control_create(&handle) != APP_CONTROL_ERROR_NONE) return;
  const TavroAppControl request(handle);
  app_control_set_operation(handle, APP_CONTROL_OPERATION_VIEW);
  app_control_set_uri(handle, uri.get());
  app_control_set_mime(handle, "video/mp4");
  if (app_control_send_launch_request(handle, nullptr, nullptr) == APP_CONTROL_ERROR_NONE) return;
  tavro_popup_show(state->ad, &state->ad->history_file_popup, tavro_text("IDS_OB_HEADER_CANNOT_BE_OPENED"),
                   tavro_text("IDS_OB_BODY_NO_VIDEO_PLAYER"), {{tavro_text("IDS_OB_BUTTON_OK"), nullptr}});
}

void _build_video(viewer *state, const char *name) {
  const gint64 size = tavro_attachment_size(state->path);
  if (size < 0) return _show_message(state, "IDS_OB_BODY_FILE_NOT_READABLE");
  Evas_Object *tile = tavro_layout_add(state->page, "tavro/viewer/video");
  elm_object_part_content_set(tile, "tavro.swallow.icon", tavro_icon_add(tile, "video/large"));
  const std::string length = tavro_video_length_text(tavro_video_seconds(state->path));
  const std::string facts = (length.empty() ? "" : length + " · ") + tavro_size_text(size);
  tavro_layout_text_set(tile, nullptr, (std::string(name) + "\n" + facts).c_str());
  elm_object_content_set(tile, tavro_button_add(tile, "tavro_primary", tavro_text("IDS_OB_BUTTON_OPEN"),
                                                nullptr, nullptr, _open_video_cb, state));
  elm_object_content_set(state->page, tile);
}

void _save_clicked_cb(void *data, Evas_Object *, void *) {
  tavro_save_copy(static_cast<const viewer *>(data)->path);
}

void _build_bar(viewer *state, const char *name) {
  elm_object_part_text_set(state->page, "elm.text.title", name);
  Evas_Object *back =
      tavro_button_add(state->page, "tavro_icon", nullptr, tavro_icon_add(state->page, "back/on"),
                       tavro_text("IDS_OB_BUTTON_BACK"), _back_clicked_cb, state->ad->nf);
  elm_object_part_content_set(state->page, "tavro.swallow.start", back);
}

}  // namespace

void tavro_create_picture_page(appdata *ad, const char *path, bool can_save) {
  if (!ad->nf) return;
  const char *slash = std::strrchr(path, '/');
  const char *name = slash ? slash + 1 : path;
  viewer *state = TAVRO_ZALLOC(viewer);
  state->ad = ad;
  state->path = TAVRO_STRDUP(path);
  state->zoom = 1;
  state->page = tavro_layout_add(ad->nf, "tavro/viewer");
  evas_object_event_callback_add(state->page, EVAS_CALLBACK_FREE, _page_deleted_cb, state);
  _build_bar(state, name);
  if (tavro_gallery_is_video(path))
    _build_video(state, name);
  else
    _build_picture(state, name);
  if (can_save) {
    const char *label = tavro_text("IDS_OB_BUTTON_SAVE_COPY");
    tavro_page_action_add(state->page, "save", label, _save_clicked_cb, state);
  }
  tavro_page_push(ad, state->page, name);
}
