#include "tavro_target_rows.h"

#include <cstring>

#include "tavro-common.h"
#include "tavro_focus.h"
#include "tavro_targets.h"
#include "tavro_widgets.h"

namespace {

constexpr int kIconUnits = 44;

char *_row_text(void *data, Evas_Object *, const char *) {
  return strdup(
      tavro_markup(static_cast<tavro_target_row *>(data)->text.c_str()).c_str());  // The toolkit frees it.
}

void _picture_failed_cb(void *data, Evas_Object *, void *) {
  elm_object_signal_emit(static_cast<Evas_Object *>(data), "tavro,unreadable", "tavro");
}

Evas_Object *_row_content(void *data, Evas_Object *list, const char *part) {
  const auto *row = static_cast<tavro_target_row *>(data);
  if (std::strcmp(part, "elm.swallow.end") == 0)
    return row->has_page ? tavro_icon_add(list, "chevron") : nullptr;
  return row->icon.empty() ? tavro_tile_add(list, row->tile)
                           : tavro_application_icon_add(list, row->icon.c_str());
}

}  // namespace

Evas_Object *tavro_application_icon_add(Evas_Object *parent, const char *path) {
  Evas_Object *frame = tavro_layout_add(parent, "tavro/app_icon");
  Evas_Object *picture = tavro_picture_add(frame, path, kIconUnits);
  evas_object_smart_callback_add(picture, "load,error", _picture_failed_cb, frame);
  elm_object_content_set(frame, picture);
  return frame;
}

tavro_target_row tavro_target_row_of(const tavro_target_category &category) {
  const char *text = tavro_text(category.text);
  return {category.name, text, tavro_search_key(text), "", category.tile, false};
}

std::vector<const tavro_target_row *> tavro_target_rows_matching(const std::vector<tavro_target_row> &rows,
                                                                 const std::string &key) {
  std::vector<const tavro_target_row *> matching;
  for (const tavro_target_row &row : rows)
    if (row.key.find(key) != std::string::npos) matching.push_back(&row);
  return matching;
}

Evas_Object *tavro_target_list_add(Evas_Object *parent) {
  Evas_Object *list = elm_genlist_add(parent);
  elm_genlist_homogeneous_set(list, EINA_TRUE);  // within a style; saves laying out every row
  elm_genlist_select_mode_set(list, ELM_OBJECT_SELECT_MODE_ALWAYS);
  elm_scroller_policy_set(list, ELM_SCROLLER_POLICY_OFF, ELM_SCROLLER_POLICY_OFF);
  tavro_focus_walk_list(list);
  evas_object_show(list);
  return list;
}

Elm_Genlist_Item_Class *tavro_target_row_class_new() {
  Elm_Genlist_Item_Class *row_class = elm_genlist_item_class_new();
  row_class->item_style = "tavro_target";
  row_class->func.text_get = _row_text;
  row_class->func.content_get = _row_content;
  return row_class;
}
