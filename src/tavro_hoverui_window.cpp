// What the control's windows have in common.
#include <Ecore_X.h>
#include <app.h>
#include <system_info.h>

#include <algorithm>
#include <string>

#include "tavro_handles.h"
#include "tavro_hoverui.h"
#include "tavro_log.h"
#include "tavro_memory.h"

namespace {

constexpr int kLayerAboveOthers = 8;  // the toolkit's mark for "always on top" begins at 6

constexpr char kStrut[] = "strut";

// What gives the window its size. The window puts what fills it a pixel above its upper edge: not the layout.
void _add_strut(Evas_Object *window, Evas_Object *layout) {
  Evas_Object *strut = evas_object_rectangle_add(evas_object_evas_get(window));
  evas_object_color_set(strut, 0, 0, 0, 0);
  evas_object_pass_events_set(strut, EINA_TRUE);
  elm_win_resize_object_add(window, strut);
  evas_object_show(strut);
  evas_object_data_set(layout, kStrut, strut);
}

void _drag_cb(void *data, Evas *, Evas_Object *, void *event_info) {
  Evas_Object *window = static_cast<Evas_Object *>(data);
  const auto *move = static_cast<Evas_Event_Mouse_Move *>(event_info);
  if (!(move->buttons & 1)) return;
  int x = 0, y = 0, width = 0, height = 0, screen_width = 0, screen_height = 0;
  elm_win_screen_position_get(window, &x, &y);
  evas_object_geometry_get(window, nullptr, nullptr, &width, &height);
  tavro_hoverui_screen_size(&screen_width, &screen_height);
  x += move->cur.canvas.x - move->prev.canvas.x;
  y += move->cur.canvas.y - move->prev.canvas.y;
  evas_object_move(window, std::clamp(x, 0, std::max(screen_width - width, 0)),
                   std::clamp(y, 0, std::max(screen_height - height, 0)));
}

}  // namespace

Evas_Object *tavro_hoverui_layout_add(Evas_Object *window, const char *file, const char *group) {
  const TavroText folder(TAVRO_ADOPT(app_get_resource_path()));
  const std::string path = std::string(folder ? folder.get() : "") + "edje/" + file + ".edj";
  Evas_Object *layout = elm_layout_add(window);
  if (!elm_layout_file_set(layout, path.c_str(), group)) {
    TAVRO_LOGE("Null layout");
    evas_object_del(layout);
    return nullptr;
  }
  _add_strut(window, layout);
  evas_object_show(layout);
  return layout;
}

Evas_Object *tavro_hoverui_window_add(const char *name) {
  Evas_Object *window = elm_win_add(nullptr, name, ELM_WIN_NOTIFICATION);
  if (!window) return nullptr;
  elm_win_title_set(window, name);
  elm_win_borderless_set(window, EINA_TRUE);
  elm_win_floating_mode_set(window, EINA_TRUE);
  elm_win_prop_focus_skip_set(window, EINA_TRUE);
  elm_win_layer_set(window, kLayerAboveOthers);
  return window;
}

// Without a compositor a pixel is seen through or not.
void tavro_hoverui_see_through(Evas_Object *window) {
  if (ecore_x_display_get() && ecore_x_screen_is_composited(0))
    elm_win_alpha_set(window, EINA_TRUE);
  else
    elm_win_shaped_set(window, EINA_TRUE);
}

void tavro_hoverui_place(Evas_Object *window, Evas_Object *layout, int x, int y, int width, int height) {
  if (layout) {
    evas_object_size_hint_min_set(static_cast<Evas_Object *>(evas_object_data_get(layout, kStrut)), width,
                                  height);
    evas_object_geometry_set(layout, 0, 0, width, height);
  }
  evas_object_resize(window, width, height);
  evas_object_move(window, x, y);
}

void tavro_hoverui_screen_size(int *width, int *height) {
  *width = *height = 0;
  system_info_get_platform_int(SYSTEM_INFO_KEY_SCREEN_WIDTH, width);
  system_info_get_platform_int(SYSTEM_INFO_KEY_SCREEN_HEIGHT, height);
}

void tavro_hoverui_make_draggable(Evas_Object *window, Evas_Object *layout) {
  auto *part = const_cast<Evas_Object *>(edje_object_part_object_get(elm_layout_edje_get(layout), "drag"));
  if (part) evas_object_event_callback_add(part, EVAS_CALLBACK_MOUSE_MOVE, _drag_cb, window);
}
