// Picker of what a report is about: the phone's fixed categories, then the installed applications.
#include <app_manager.h>

#include <cstring>

#include "tavro-common.h"
#include "tavro-main.h"
#include "tavro_memory.h"
#include "tavro_screens.h"
#include "tavro_targets.h"
#include "tavro_widgets.h"

// The picker's own record, null in appdata while it is closed.
struct category_view_win {
  appdata *ad;
  tavro_target_chosen chosen;
  Elm_Genlist_Item_Class *target_class;
  Elm_Genlist_Item_Class *section_class;
};

namespace {

// One row; sections have no tile.
struct target_row {
  char *name;  // as it is stored
  char *icon;  // path, may be null
  const char *tile;
};

target_row *_row_new(const char *name, const char *icon, const char *tile) {
  target_row *row = TAVRO_ZALLOC(target_row);
  row->name = TAVRO_STRDUP(name);
  row->icon = TAVRO_STRDUP(icon);
  row->tile = tile;
  return row;
}

void _row_deleted(void *data, Evas_Object *) {
  target_row *row = static_cast<target_row *>(data);
  TAVRO_FREE(row->name);
  TAVRO_FREE(row->icon);
  TAVRO_FREE(row);
}

char *_row_text(void *data, Evas_Object *, const char *) {
  return strdup(tavro_text(static_cast<target_row *>(data)->name));  // The toolkit frees it.
}

Evas_Object *_row_content(void *data, Evas_Object *list, const char *part) {
  const target_row *row = static_cast<target_row *>(data);
  if (!row->tile || std::strcmp(part, "elm.swallow.icon") != 0) return nullptr;
  return row->icon ? tavro_picture_add(list, row->icon, 44) : tavro_tile_add(list, row->tile);
}

void _row_selected_cb(void *data, Evas_Object *, void *event_info) {
  const category_view_win view = *static_cast<category_view_win *>(data);
  const target_row *row =
      static_cast<target_row *>(elm_object_item_data_get(static_cast<Elm_Object_Item *>(event_info)));
  view.chosen(view.ad, row->name, row->icon);
  elm_naviframe_item_pop(view.ad->nf);
}

void _page_deleted_cb(void *data, Evas *, Evas_Object *, void *) {
  category_view_win *view = static_cast<category_view_win *>(data);
  elm_genlist_item_class_free(view->target_class);
  elm_genlist_item_class_free(view->section_class);
  if (view->ad->category_view == view) view->ad->category_view = nullptr;
  TAVRO_FREE(view);
}

Elm_Genlist_Item_Class *_row_class_new(const char *style) {
  Elm_Genlist_Item_Class *row_class = elm_genlist_item_class_new();
  row_class->item_style = style;
  row_class->func.text_get = _row_text;
  row_class->func.content_get = _row_content;
  row_class->func.del = _row_deleted;
  return row_class;
}

void _append_section(category_view_win *view, Evas_Object *list, const char *title) {
  Elm_Object_Item *item =
      elm_genlist_item_append(list, view->section_class, _row_new(title, nullptr, nullptr), nullptr,
                              ELM_GENLIST_ITEM_NONE, nullptr, nullptr);
  elm_genlist_item_select_mode_set(item, ELM_OBJECT_SELECT_MODE_DISPLAY_ONLY);
}

void _append_target(category_view_win *view, Evas_Object *list, target_row *row) {
  elm_genlist_item_append(list, view->target_class, row, nullptr, ELM_GENLIST_ITEM_NONE, _row_selected_cb,
                          view);
}

struct list_filling {
  category_view_win *view;
  Evas_Object *list;
};

bool _append_application(app_info_h app, void *data) {
  const list_filling *filling = static_cast<list_filling *>(data);
  char *label = nullptr, *icon = nullptr;
  app_info_get_label(app, &label);
  app_info_get_icon(app, &icon);
  const TavroText owned_label(TAVRO_ADOPT(label)), owned_icon(TAVRO_ADOPT(icon));
  if (label) _append_target(filling->view, filling->list, _row_new(label, icon, "app"));
  return true;
}

Evas_Object *_build_list(category_view_win *view, Evas_Object *page) {
  Evas_Object *list = elm_genlist_add(page);
  elm_genlist_homogeneous_set(list, EINA_FALSE);
  elm_genlist_select_mode_set(list, ELM_OBJECT_SELECT_MODE_ALWAYS);
  elm_scroller_policy_set(list, ELM_SCROLLER_POLICY_OFF, ELM_SCROLLER_POLICY_OFF);
  _append_section(view, list, "IDS_OB_HEADER_PHONE");
  for (size_t i = 0; i < kTargetCategoryCount; ++i)
    _append_target(view, list, _row_new(kTargetCategories[i].name, nullptr, kTargetCategories[i].tile));
  _append_section(view, list, "IDS_OB_HEADER_APPLICATIONS");
  list_filling filling{view, list};
  app_manager_foreach_app_info(_append_application, &filling);
  evas_object_show(list);
  return list;
}

}  // namespace

void tavro_create_target_picker(appdata *ad, tavro_target_chosen chosen) {
  if (ad->category_view) return;  // a second tap opens no second picker
  const char *title = tavro_text("IDS_OB_HEADER_WHAT_IS_IT_ABOUT");
  category_view_win *view = ad->category_view = TAVRO_ZALLOC(category_view_win);
  view->ad = ad;
  view->chosen = chosen;
  view->target_class = _row_class_new("tavro_target");
  view->section_class = _row_class_new("tavro_section");
  Evas_Object *page = tavro_page_add(ad, title, "back");
  evas_object_event_callback_add(page, EVAS_CALLBACK_FREE, _page_deleted_cb, view);
  elm_object_content_set(page, _build_list(view, page));
  tavro_page_push(ad, page, title);
}
