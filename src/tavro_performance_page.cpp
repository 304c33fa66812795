#include "tavro_performance_page.h"

#include <memory>

#include "tavro-common.h"
#include "tavro-main.h"
#include "tavro_target_rows.h"
#include "tavro_targets.h"
#include "tavro_widgets.h"

// The page's own record, null in appdata while it is closed.
struct performance_category_view_win {
  appdata *ad = nullptr;
  tavro_target_chosen chosen = nullptr;
  Elm_Object_Item *below = nullptr;
  Elm_Genlist_Item_Class *row_class = nullptr;
  std::vector<tavro_target_row> rows;
};

namespace {

void _row_selected_cb(void *data, Evas_Object *, void *item) {
  auto *view = static_cast<performance_category_view_win *>(data);
  const auto *row =
      static_cast<tavro_target_row *>(elm_object_item_data_get(static_cast<Elm_Object_Item *>(item)));
  view->chosen(view->ad, row->name.c_str(), nullptr);
  elm_naviframe_item_pop_to(view->below);
}

void _page_deleted_cb(void *data, Evas *, Evas_Object *, void *) {
  const std::unique_ptr<performance_category_view_win> view(
      static_cast<performance_category_view_win *>(data));
  elm_genlist_item_class_free(view->row_class);
  if (view->ad->performance_category_view == view.get()) view->ad->performance_category_view = nullptr;
}

}  // namespace

void tavro_create_performance_page(appdata *ad, tavro_target_chosen chosen, Elm_Object_Item *below) {
  if (ad->performance_category_view) return;
  auto *view = ad->performance_category_view = new performance_category_view_win;
  view->ad = ad;
  view->chosen = chosen;
  view->below = below;
  view->row_class = tavro_target_row_class_new();
  for (size_t i = 0; i < kPerformanceTargetCount; ++i)
    view->rows.push_back(tavro_target_row_of(kPerformanceTargets[i]));
  const char *title = tavro_text("IDS_OB_BODY_PERFORMANCE");
  Evas_Object *page = tavro_page_add(ad, title, "back");
  evas_object_event_callback_add(page, EVAS_CALLBACK_FREE, _page_deleted_cb, view);
  Evas_Object *list = tavro_target_list_add(page);
  for (const tavro_target_row &row : view->rows)
    elm_genlist_item_append(list, view->row_class, &row, nullptr, ELM_GENLIST_ITEM_NONE, _row_selected_cb,
                            view);
  elm_object_content_set(page, list);
  tavro_page_push(ad, page, title);
}
