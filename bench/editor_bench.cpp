// How long a frame takes while a finger drags in the image editor: a handle of the crop box, and an area that
// blurs a large part of the picture, over a photo as a phone's camera makes it. Touches are fed to the
// canvas; a frame ends when the canvas has painted it. Runs inside a phone whose client does not run.
//
//   bench.editor FRAMES
#include <Elementary.h>
#include <image_util.h>

#include <cstdio>
#include <cstdlib>
#include <filesystem>
#include <random>
#include <string>
#include <vector>

#include "ie_selectbox.h"
#include "tavro-common.h"
#include "tavro-main.h"
#include "tavro_appdata.h"
#include "tavro_compose.h"
#include "tavro_dbmgr.h"
#include "tavro_image_editor.h"
#include "tavro_screens.h"
#include "tavro_widgets.h"
#include "watched_loop.h"

namespace {

using watched::median;
using watched::next_frame;
using watched::print;
using watched::run_until_calm;

constexpr char kPhoto[] = "/opt/usr/media/Images/photo.jpg";

void _write_photo() {
  constexpr int kWidth = 3000, kHeight = 4000;
  std::filesystem::create_directories("/opt/usr/media/Images");
  std::minstd_rand random(1);
  std::vector<unsigned char> pixels(static_cast<size_t>(kWidth) * kHeight * 4);
  for (size_t i = 0; i < pixels.size(); ++i)
    pixels[i] = static_cast<unsigned char>((i / 4 % kWidth) / 20 + random() % 10);
  if (image_util_encode_jpeg(pixels.data(), kWidth, kHeight, IMAGE_UTIL_COLORSPACE_BGRA8888, 85, kPhoto) !=
      IMAGE_UTIL_ERROR_NONE)
    std::abort();
}

// The middle frame of a drag from here to and fro.
double _drag(Evas *canvas, int x, int y, int frames) {
  unsigned time = 1;
  std::vector<double> taken;
  evas_event_feed_mouse_move(canvas, x, y, ++time, nullptr);
  evas_event_feed_mouse_down(canvas, 1, EVAS_BUTTON_NONE, ++time, nullptr);
  for (int i = 1; i <= frames; ++i) {
    const int away = i % 40 < 20 ? i % 20 : 20 - i % 20;
    taken.push_back(next_frame([=] {
      evas_event_feed_mouse_move(canvas, x - 100 - away * 5, y - 100 - away * 5, time + 1, nullptr);
    }));
  }
  evas_event_feed_mouse_up(canvas, 1, EVAS_BUTTON_NONE, ++time, nullptr);
  run_until_calm();
  return median(taken);
}

Evas_Object *_button(Evas_Object *page, const char *text) {
  Evas_Object *row = elm_object_part_content_get(page, "tavro.swallow.tools");
  Eina_List *buttons = elm_box_children_get(row);
  void *found = nullptr, *button = nullptr;
  EINA_LIST_FREE(buttons, button)
  if (std::string(elm_object_text_get(static_cast<Evas_Object *>(button))) == text) found = button;
  return static_cast<Evas_Object *>(found);
}

void _measure(appdata *ad, int frames) {
  Evas *canvas = evas_object_evas_get(ad->win);
  int x = 0, y = 0, width = 0, height = 0;
  evas_object_geometry_get(ad->main_image, &x, &y, &width, &height);
  print("editor_box_frame_ms", _drag(canvas, x + width, y + height, frames));
  evas_object_smart_callback_call(_button(ad->crop_layout, tavro_text("IDS_OB_BUTTON_BLUR")), "clicked",
                                  nullptr);
  run_until_calm();
  evas_event_feed_mouse_move(canvas, x + 10, y + 10, 1, nullptr);
  print("editor_area_frame_ms", _drag(canvas, x + width - 10, y + height - 10, frames));
}

}  // namespace

int main(int argc, char **argv) {
  const int frames = argc == 2 ? std::atoi(argv[1]) : 0;
  if (frames < 1) {
    std::fprintf(stderr, "usage: bench.editor FRAMES\n");
    return 2;
  }
  _write_photo();
  if (!elm_init(argc, argv)) return 1;
  watched::watch_loop();
  tavro_bind_locale();
  tavro_dbmgr_init_semaphore();
  tavro_dbmgr_ensure_schema();
  appdata ad{};
  tavro_initialize_application_data(&ad);
  if (!tavro_create_base_window(&ad)) return 1;
  watched::watch_window(ad.win);
  tavro_create_landing_page(&ad);
  tavro_create_problem_page(&ad, nullptr);
  run_until_calm(std::chrono::milliseconds(1000));
  tavro_edit_attachment(kPhoto, &ad);
  run_until_calm(std::chrono::milliseconds(3000));
  if (!ad.main_image) return 1;
  _measure(&ad, frames);
  evas_object_del(ad.win);
  tavro_dealloc_memory(&ad);
  elm_shutdown();
  return 0;
}
