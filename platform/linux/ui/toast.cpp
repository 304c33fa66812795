#include "toast.h"

#include <Ecore_Evas.h>
#include <Elementary.h>

#include <algorithm>
#include <cmath>
#include <cstdint>
#include <memory>
#include <utility>

#include "scoped.h"

namespace platform {
namespace {

constexpr double kShownSeconds = 2.5;  // two lines can be read
constexpr int kMarginUnits = 16;
constexpr int kPaddingUnits = 12;
constexpr int kTextUnits = 14;
constexpr int kCornerUnits = 14;

struct Toast {
  Evas_Object *window = nullptr;
  Evas_Object *back = nullptr;
  Evas_Object *label = nullptr;
  Ecore_Timer *timer = nullptr;
};

Toast &toast() {
  static Toast &instance = *new Toast;
  return instance;
}

int units(int count) {
  return static_cast<int>(count * elm_config_scale_get() + 0.5);
}

// The application's last shown window that is no override window.
Evas_Object *topmost_window() {
  Eina_List *canvases = ecore_evas_ecore_evas_list_get();
  Evas_Object *window = nullptr;
  void *item;
  EINA_LIST_FREE(canvases, item) {
    auto *canvas = static_cast<Ecore_Evas *>(item);
    auto *candidate = static_cast<Evas_Object *>(ecore_evas_data_get(canvas, "elm_win"));
    if (candidate && ecore_evas_visibility_get(canvas) && !ecore_evas_override_get(canvas))
      window = candidate;
  }
  return window;
}

// A white surface with round corners, to be coloured: a disc that is stretched in its middle.
Evas_Object *add_rounded_surface(Evas *canvas, int radius) {
  Evas_Object *surface = evas_object_image_filled_add(canvas);
  const int side = 2 * radius + 1;
  evas_object_image_alpha_set(surface, EINA_TRUE);
  evas_object_image_size_set(surface, side, side);
  void *pixels = evas_object_image_data_get(surface, EINA_TRUE);
  if (!pixels) return surface;
  const int stride = evas_object_image_stride_get(surface);
  for (int y = 0; y < side; y++) {
    auto *row = reinterpret_cast<uint32_t *>(static_cast<char *>(pixels) + y * stride);
    for (int x = 0; x < side; x++) {
      const double covered = std::clamp(radius + 0.5 - std::hypot(x - radius, y - radius), 0.0, 1.0);
      row[x] = 0x01010101u * static_cast<uint32_t>(std::lround(255 * covered));
    }
  }
  evas_object_image_data_set(surface, pixels);
  evas_object_image_data_update_add(surface, 0, 0, side, side);
  evas_object_image_border_set(surface, radius, radius, radius, radius);
  return surface;
}

void place_cb(void *, Evas *, Evas_Object *, void *);

void take_away() {
  Toast gone = std::exchange(toast(), {});
  if (gone.timer) ecore_timer_del(gone.timer);
  if (!gone.window) return;
  evas_object_event_callback_del(gone.window, EVAS_CALLBACK_RESIZE, place_cb);
  evas_object_del(gone.label);
  evas_object_del(gone.back);
}

// The label is the window's child and goes with it.
void label_gone_cb(void *, Evas *, Evas_Object *label, void *) {
  if (toast().label != label) return;
  toast().label = nullptr;
  take_away();
}

Eina_Bool timer_cb(void *) {
  toast().timer = nullptr;
  take_away();
  return ECORE_CALLBACK_CANCEL;
}

void place_cb(void *, Evas *, Evas_Object *, void *) {
  const Toast &self = toast();
  int width, height, text_height;
  evas_object_geometry_get(self.window, nullptr, nullptr, &width, &height);
  const int bar_width = width - 2 * units(kMarginUnits);
  const int inner = std::max(bar_width - 2 * units(kPaddingUnits), 1);
  elm_label_wrap_width_set(self.label, inner);
  edje_object_size_min_restricted_calc(elm_layout_edje_get(self.label), nullptr, &text_height, inner, 0);
  const int bar_height = text_height + 2 * units(kPaddingUnits);
  const int top = height - bar_height - units(kMarginUnits);
  evas_object_move(self.back, units(kMarginUnits), top);
  evas_object_resize(self.back, bar_width, bar_height);
  evas_object_move(self.label, units(kMarginUnits + kPaddingUnits), top + units(kPaddingUnits));
  evas_object_resize(self.label, inner, text_height);
}

std::string markup_of(const std::string &text) {
  const ScopedText plain(elm_entry_utf8_to_markup(text.c_str()));
  return "<color=#FFFFFF><font_size=" + std::to_string(kTextUnits) + ">" + plain.get() + "</></>";
}

}  // namespace

void show_toast_over_window(const std::string &text) {
  take_away();
  Toast &self = toast();
  self.window = topmost_window();
  if (!self.window) return;
  self.back = add_rounded_surface(evas_object_evas_get(self.window), units(kCornerUnits));
  self.label = elm_label_add(self.window);
  evas_object_color_set(self.back, 50, 59, 72, 255);  // stands out from a light and a dark page
  elm_label_line_wrap_set(self.label, ELM_WRAP_MIXED);
  elm_object_text_set(self.label, markup_of(text).c_str());
  for (Evas_Object *part : {self.back, self.label}) {
    evas_object_layer_set(part, EVAS_LAYER_MAX);
    evas_object_pass_events_set(part, EINA_TRUE);
    evas_object_show(part);
  }
  evas_object_raise(self.label);
  evas_object_event_callback_add(self.label, EVAS_CALLBACK_DEL, label_gone_cb, nullptr);
  evas_object_event_callback_add(self.window, EVAS_CALLBACK_RESIZE, place_cb, nullptr);
  place_cb(nullptr, nullptr, nullptr, nullptr);
  self.timer = ecore_timer_add(kShownSeconds, timer_cb, nullptr);
}

}  // namespace platform
