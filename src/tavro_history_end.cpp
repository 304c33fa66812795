// What stands below the last report of "My Reports" when older ones are stored that the list does not take.
#include <elm_atspi.h>

#include <cstring>

#include "tavro-common.h"
#include "tavro-main.h"
#include "tavro_history_parts.h"
#include "tavro_memory.h"

namespace {

constexpr int kIndex = -2;

// A search that finds so many may have found more.
const char *_line(const history_app_data_s *history) {
  return tavro_text(history->view->choice.text.empty() ? "IDS_OB_BODY_OLDER_REPORTS"
                                                       : "IDS_OB_BODY_OLDER_REPORTS_FOUND");
}

char *_line_text(void *, Evas_Object *list, const char *) {
  return strdup(_line(static_cast<appdata *>(evas_object_data_get(list, "app_data"))->history_ad));
}

void _line_deleted(void *data, Evas_Object *) {
  genlist_item *row = static_cast<genlist_item *>(data);
  TAVRO_FREE(row);
}

// Keys lead to it, so that it is read; there is nothing to do with it.
void _touched_cb(void *, Evas_Object *, void *event_info) {
  elm_genlist_item_selected_set(static_cast<Elm_Object_Item *>(event_info), EINA_FALSE);
}

const Elm_Genlist_Item_Class *_line_class() {
  static Elm_Genlist_Item_Class line_class = {};
  line_class.version = ELM_GENLIST_ITEM_CLASS_VERSION;
  line_class.item_style = "tavro_older";
  line_class.func.text_get = _line_text;
  line_class.func.del = _line_deleted;
  return &line_class;
}

void _add_line(history_app_data_s *history) {
  genlist_item *row = TAVRO_ZALLOC(genlist_item);
  row->index = kIndex;
  row->item = elm_genlist_item_append(history->history_genlist, _line_class(), row, nullptr,
                                      ELM_GENLIST_ITEM_NONE, _touched_cb, nullptr);
  history->view->older_item = row->item;
}

}  // namespace

void tavro_history_dress_end(appdata *ad) {
  history_app_data_s *history = ad->history_ad;
  tavro_history_view *view = history->view;
  if (view->has_older && !view->older_item) {
    _add_line(history);
  } else if (!view->has_older && view->older_item) {
    elm_object_item_del(view->older_item);
    view->older_item = nullptr;
  }
  if (!view->older_item) return;
  elm_atspi_accessible_name_set(view->older_item, _line(history));
  tavro_history_row_redraw(tavro_history_row_of(view->older_item));
}
