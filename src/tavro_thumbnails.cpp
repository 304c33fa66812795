#include "tavro_thumbnails.h"

#include <sys/stat.h>

#include <algorithm>
#include <memory>

#include "tavro-common.h"
#include "tavro_gallery.h"
#include "tavro_thumbnail_maker.h"
#include "tavro_video_info.h"
#include "tavro_widgets.h"

namespace {

constexpr int kMostWorkers = 2;

// One miniature to be made. The main loop owns it but for `pixels`, which is the worker's until it has ended.
struct thumbnail_request {
  Evas_Object *widget;  // null once it is deleted
  std::string path;     // of the picture
  bool is_video;        // whose picture it is
  int side;             // pixels
  double asked_time;    // of the main loop's turn
  tavro_thumbnail_pixels pixels;
};

// What waits. What came into view last is served first, and of what came together the first.
std::vector<std::unique_ptr<thumbnail_request>> _waiting;
int _workers = 0;

void _serve_waiting();

void _show_pixels(Evas_Object *widget, const thumbnail_request &request) {
  Evas_Object *image = evas_object_image_filled_add(evas_object_evas_get(widget));
  evas_object_image_alpha_set(image, EINA_FALSE);
  evas_object_image_size_set(image, request.side, request.side);
  // Copies; the canvas must not keep what the request owns.
  void *canvas_pixels = evas_object_image_data_get(image, EINA_TRUE);
  if (canvas_pixels)
    std::copy(request.pixels.begin(), request.pixels.end(), static_cast<uint32_t *>(canvas_pixels));
  evas_object_image_data_set(image, canvas_pixels);
  evas_object_image_data_update_add(image, 0, 0, request.side, request.side);
  evas_object_show(image);
  elm_object_content_set(widget, image);
}

// The widget of a request that waits or is worked on.
void _widget_deleted_cb(void *data, Evas *, Evas_Object *, void *) {
  auto *request = static_cast<thumbnail_request *>(data);
  request->widget = nullptr;
  const auto place = std::find_if(_waiting.begin(), _waiting.end(),
                                  [request](const auto &waiting) { return waiting.get() == request; });
  if (place != _waiting.end()) _waiting.erase(place);
}

void _work(void *data, Ecore_Thread *) {
  auto *request = static_cast<thumbnail_request *>(data);
  request->pixels = tavro_thumbnail_make(request->path, request->side);
}

void _work_ended_cb(void *data, Ecore_Thread *) {
  const std::unique_ptr<thumbnail_request> request(static_cast<thumbnail_request *>(data));
  --_workers;
  if (request->widget) {
    evas_object_event_callback_del_full(request->widget, EVAS_CALLBACK_DEL, _widget_deleted_cb,
                                        request.get());
    if (!request->pixels.empty())
      _show_pixels(request->widget, *request);
    else if (!request->is_video)
      elm_object_signal_emit(request->widget, "tavro,unreadable", "tavro");
  }
  _serve_waiting();
}

void _serve_waiting() {
  while (_workers < kMostWorkers && !_waiting.empty()) {
    const double latest = _waiting.back()->asked_time;
    const auto next = std::find_if(_waiting.begin(), _waiting.end(),
                                   [latest](const auto &waiting) { return waiting->asked_time >= latest; });
    thumbnail_request *request = next->release();
    _waiting.erase(next);
    ++_workers;
    ecore_thread_run(_work, _work_ended_cb, _work_ended_cb, request);
  }
}

void _request(Evas_Object *widget, const std::string &path, bool is_video, int units) {
  static const bool has_folder = tavro_create_dir(TAVRO_THUMBNAIL_FOLDER) == 0;
  (void)has_folder;  // without it nothing is cached
  const int side = static_cast<int>(units * elm_config_scale_get());
  auto request = std::make_unique<thumbnail_request>(
      thumbnail_request{widget, path, is_video, side, ecore_loop_time_get(), {}});
  evas_object_event_callback_add(widget, EVAS_CALLBACK_DEL, _widget_deleted_cb, request.get());
  _waiting.push_back(std::move(request));
  _serve_waiting();
}

// What is no recording of the screen has no picture, and keeps the plain tile.
void _show_video(Evas_Object *widget, const char *path, int units) {
  elm_object_signal_emit(widget, "tavro,video", "tavro");
  const std::string length = tavro_video_length_text(tavro_video_seconds(path));
  if (!length.empty()) elm_object_signal_emit(widget, "tavro,length", "tavro");
  tavro_layout_text_set(widget, nullptr, length.c_str());
  const std::string picture = tavro_video_picture_path(path);
  struct stat info {};
  if (lstat(picture.c_str(), &info) == 0 && S_ISREG(info.st_mode)) _request(widget, picture, true, units);
}

}  // namespace

Evas_Object *tavro_thumbnail_add(Evas_Object *parent, const char *path, int units) {
  Evas_Object *widget = tavro_layout_add(parent, "tavro/thumbnail");
  if (!path) return widget;
  if (tavro_gallery_is_video(path))
    _show_video(widget, path, units);
  else
    _request(widget, path, false, units);
  return widget;
}
