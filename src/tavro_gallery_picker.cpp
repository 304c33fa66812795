// Picker of pictures to attach: a grid of what the gallery has, any number can be chosen.
#include <elm_atspi.h>

#include <cstring>
#include <string>
#include <vector>

#include "tavro-common.h"
#include "tavro-main.h"
#include "tavro_gallery.h"
#include "tavro_memory.h"
#include "tavro_screens.h"
#include "tavro_widgets.h"

namespace {

bool _is_open = false;  // a second tap opens no second picker

constexpr int kColumnsUnits = 90;

struct gallery_picker {
  appdata *ad;
  tavro_pictures_chosen chosen;
  Evas_Object *page;
  Evas_Object *add_button;
  GSList *paths;  // chosen ones in the order of choosing, each the grid item's text
  Elm_Gengrid_Item_Class *item_class;
};

void _show_count(gallery_picker *picker) {
  const guint count = g_slist_length(picker->paths);
  elm_object_disabled_set(picker->add_button, count == 0);
  std::string text = tavro_text("IDS_OB_BUTTON_ATTACH");
  if (count > 0) text += " (" + std::to_string(count) + ")";
  elm_object_text_set(picker->add_button, text.c_str());
  elm_atspi_accessible_name_set(picker->add_button, text.c_str());
}

char *_item_text(void *data, Evas_Object *, const char *) {
  const char *path = static_cast<const char *>(data);
  const char *slash = strrchr(path, '/');
  return strdup(slash ? slash + 1 : path);
}

Evas_Object *_item_content(void *data, Evas_Object *grid, const char *) {
  return tavro_picture_add(grid, static_cast<const char *>(data), kColumnsUnits);
}

void _item_deleted(void *data, Evas_Object *) {
  char *path = static_cast<char *>(data);
  TAVRO_FREE(path);
}

void _item_selected_cb(void *data, Evas_Object *, void *event_info) {
  gallery_picker *picker = static_cast<gallery_picker *>(data);
  Elm_Object_Item *item = static_cast<Elm_Object_Item *>(event_info);
  picker->paths = g_slist_append(picker->paths, elm_object_item_data_get(item));
  _show_count(picker);
}

void _item_unselected_cb(void *data, Evas_Object *, void *event_info) {
  gallery_picker *picker = static_cast<gallery_picker *>(data);
  Elm_Object_Item *item = static_cast<Elm_Object_Item *>(event_info);
  picker->paths = g_slist_remove(picker->paths, elm_object_item_data_get(item));
  _show_count(picker);
}

void _add_clicked_cb(void *data, Evas_Object *, void *) {
  gallery_picker *picker = static_cast<gallery_picker *>(data);
  appdata *ad = picker->ad;
  picker->chosen(ad, picker->paths);
  elm_naviframe_item_pop(ad->nf);
}

void _page_deleted_cb(void *data, Evas *, Evas_Object *, void *) {
  gallery_picker *picker = static_cast<gallery_picker *>(data);
  _is_open = false;
  elm_gengrid_item_class_free(picker->item_class);
  g_slist_free(picker->paths);
  TAVRO_FREE(picker);
}

Elm_Gengrid_Item_Class *_item_class_new() {
  Elm_Gengrid_Item_Class *item_class = elm_gengrid_item_class_new();
  item_class->item_style = "tavro_picture";
  item_class->func.text_get = _item_text;
  item_class->func.content_get = _item_content;
  item_class->func.del = _item_deleted;
  return item_class;
}

Evas_Object *_build_grid(gallery_picker *picker, const std::vector<std::string> &paths) {
  Evas_Object *grid = elm_gengrid_add(picker->page);
  const int side = static_cast<int>(kColumnsUnits * elm_config_scale_get());
  elm_gengrid_item_size_set(grid, side, side);
  elm_gengrid_multi_select_set(grid, EINA_TRUE);
  elm_gengrid_align_set(grid, 0.0, 0.0);
  elm_scroller_policy_set(grid, ELM_SCROLLER_POLICY_OFF, ELM_SCROLLER_POLICY_OFF);
  evas_object_smart_callback_add(grid, "selected", _item_selected_cb, picker);
  evas_object_smart_callback_add(grid, "unselected", _item_unselected_cb, picker);
  for (const std::string &path : paths)
    elm_gengrid_item_append(grid, picker->item_class, TAVRO_STRDUP(path.c_str()), nullptr, nullptr);
  evas_object_show(grid);
  return grid;
}

Evas_Object *_build_empty(Evas_Object *page) {
  Evas_Object *empty = tavro_layout_add(page, "tavro/empty");
  elm_object_part_content_set(empty, "icon_area", tavro_tile_add(empty, "image"));
  elm_object_text_set(empty, tavro_text("IDS_OB_BODY_NO_PICTURES"));
  elm_object_signal_emit(empty, "tavro,headed", "tavro");
  elm_object_part_text_set(empty, "elm.text.sub", tavro_text("IDS_OB_BODY_NO_PICTURES_HINT"));
  return empty;
}

void _build_bottom(gallery_picker *picker) {
  Evas_Object *bottom = tavro_layout_add(picker->page, "tavro/bottom");
  picker->add_button = tavro_button_add(bottom, "tavro_primary", "", nullptr,
                                        tavro_text("IDS_OB_BUTTON_ATTACH"), _add_clicked_cb, picker);
  elm_object_content_set(bottom, picker->add_button);
  elm_object_part_content_set(picker->page, "tavro.swallow.bottom", bottom);
  elm_object_signal_emit(picker->page, "tavro,bottom", "tavro");
  _show_count(picker);
}

}  // namespace

void tavro_create_gallery_picker(appdata *ad, tavro_pictures_chosen chosen) {
  if (_is_open) return;
  _is_open = true;
  const char *title = tavro_text("IDS_OB_HEADER_CHOOSE_PICTURES");
  gallery_picker *picker = TAVRO_ZALLOC(gallery_picker);
  picker->ad = ad;
  picker->chosen = chosen;
  picker->item_class = _item_class_new();
  picker->page = tavro_page_add(ad, title, "back");
  evas_object_event_callback_add(picker->page, EVAS_CALLBACK_FREE, _page_deleted_cb, picker);
  const std::vector<std::string> paths = tavro_gallery_pictures();
  if (paths.empty()) {
    elm_object_content_set(picker->page, _build_empty(picker->page));
  } else {
    elm_object_content_set(picker->page, _build_grid(picker, paths));
    _build_bottom(picker);
  }
  tavro_page_push(ad, picker->page, title);
}
