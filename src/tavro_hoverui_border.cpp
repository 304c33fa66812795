// Six thin windows along the edges of the screen: a capture is open.
#include <Ecore_X.h>

#include "tavro_hoverui.h"

namespace {

constexpr int kSide = 4, kTop = 3;  // pixels

struct border_piece {
  const char *name;
  const char *group;
  Evas_Object *appdata::*window;
  Evas_Object *appdata::*layout;
  int x, y, width, height;
};

// What lies in the right or lower half is given from there.
void _for_each_piece(void (*act)(appdata *ad, const border_piece &piece), appdata *ad) {
  int w = 0, h = 0;
  tavro_hoverui_screen_size(&w, &h);
  const char *upright = "flash_win_right", *flat = "flash_win_top";
  const border_piece pieces[] = {
      {"Flash_right_top", upright, &appdata::flash_win_1, &appdata::flash_layout_1, w - kSide, 1, kSide,
       h / 2},
      {"Flash_left_top", upright, &appdata::flash_win_2, &appdata::flash_layout_2, 1, 1, kSide, h / 2},
      {"Flash_top", flat, &appdata::flash_win_3, &appdata::flash_layout_3, 1, 1, w, kTop},
      {"Flash_bottom", flat, &appdata::flash_win_4, &appdata::flash_layout_4, 1, h - kSide, w, kSide},
      {"Flash_right_bottom", upright, &appdata::flash_win_5, &appdata::flash_layout_5, w - kSide, h / 2,
       kSide, h / 2},
      {"Flash_left_bottom", upright, &appdata::flash_win_6, &appdata::flash_layout_6, 1, h / 2, kSide, h / 2},
  };
  for (const border_piece &piece : pieces) act(ad, piece);
}

void _show(appdata *ad, const border_piece &piece) {
  Evas_Object *&window = ad->*piece.window;
  if (!window) {
    window = tavro_hoverui_window_add(piece.name);
    if (!window) return;
    ad->*piece.layout = tavro_hoverui_layout_add(window, "minicontrol_indicator", piece.group);
  }
  tavro_hoverui_place(window, ad->*piece.layout, piece.x, piece.y, piece.width, piece.height);
  evas_object_show(window);
}

void _hide(appdata *ad, const border_piece &piece) {
  if (ad->*piece.window) evas_object_hide(ad->*piece.window);
}

void _delete(appdata *ad, const border_piece &piece) {
  if (!(ad->*piece.window)) return;
  evas_object_hide(ad->*piece.window);
  evas_object_del(ad->*piece.window);
  ad->*piece.window = ad->*piece.layout = nullptr;
}

}  // namespace

void add_flashing_wins(appdata *ad) {
  _for_each_piece(_show, ad);
  ecore_x_sync();  // a recorder that knows them leaves them out
}

void hide_flash_wins(appdata *ad) {
  _for_each_piece(_hide, ad);
}

void delete_flash_wins(appdata *ad) {
  _for_each_piece(_delete, ad);
}
