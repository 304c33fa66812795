// Picker of what a report is about: the phone's fixed categories, then the installed applications. A search
// field narrows both.
#include <elm_atspi.h>

#include <memory>

#include "tavro-common.h"
#include "tavro-main.h"
#include "tavro_app_list.h"
#include "tavro_handles.h"
#include "tavro_memory.h"
#include "tavro_performance_page.h"
#include "tavro_screens.h"
#include "tavro_target_rows.h"
#include "tavro_targets.h"
#include "tavro_widgets.h"

// The picker's own record, null in appdata while it is closed.
struct category_view_win {
  appdata *ad = nullptr;
  tavro_target_chosen chosen = nullptr;
  Elm_Object_Item *below = nullptr;  // page that the picker was opened from
  Evas_Object *frame = nullptr;      // search field and list
  Evas_Object *list = nullptr;
  Evas_Object *search_button = nullptr;
  Evas_Object *search_entry = nullptr;  // null while the search is closed
  Elm_Genlist_Item_Class *row_class = nullptr;
  Elm_Genlist_Item_Class *section_class = nullptr;
  std::vector<tavro_target_row> categories, applications;
  tavro_app_list_reading *reading = nullptr;  // null once the applications are there
  bool is_done = false;
};

namespace {

constexpr char kSearchPart[] = "tavro.swallow.search";

// ---- Choosing ----

void _row_selected_cb(void *data, Evas_Object *, void *event_info) {
  auto *view = static_cast<category_view_win *>(data);
  auto *item = static_cast<Elm_Object_Item *>(event_info);
  const auto *row = static_cast<tavro_target_row *>(elm_object_item_data_get(item));
  if (row->has_page) {
    elm_genlist_item_selected_set(item, EINA_FALSE);
    tavro_create_performance_page(view->ad, view->chosen, view->below);
    return;
  }
  view->is_done = true;
  view->chosen(view->ad, row->name.c_str(), row->icon.empty() ? nullptr : row->icon.c_str());
  elm_naviframe_item_pop_to(view->below);
}

// ---- List ----

char *_section_text(void *data, Evas_Object *, const char *) {
  return strdup(tavro_text(static_cast<const char *>(data)));  // The toolkit frees it.
}

void _append_section(category_view_win *view, const char *title,
                     const std::vector<const tavro_target_row *> &rows) {
  if (rows.empty()) return;
  Elm_Object_Item *section = elm_genlist_item_append(view->list, view->section_class, title, nullptr,
                                                     ELM_GENLIST_ITEM_NONE, nullptr, nullptr);
  elm_genlist_item_select_mode_set(section, ELM_OBJECT_SELECT_MODE_DISPLAY_ONLY);
  for (const tavro_target_row *row : rows)
    elm_genlist_item_append(view->list, view->row_class, row, nullptr, ELM_GENLIST_ITEM_NONE,
                            _row_selected_cb, view);
}

std::string _sought(const category_view_win *view) {
  if (!view->search_entry) return "";
  const TavroText text(TAVRO_ADOPT(elm_entry_markup_to_utf8(elm_entry_entry_get(view->search_entry))));
  return text ? text.get() : "";
}

void _show_nothing_found(category_view_win *view, const std::string &sought) {
  const TavroGText text(g_strdup_printf(tavro_text("IDS_OB_BODY_NOTHING_CALLED_PS"), sought.c_str()));
  Evas_Object *empty = tavro_layout_add(view->frame, "tavro/empty");
  elm_object_part_content_set(empty, "icon_area", tavro_tile_add(empty, "search"));
  tavro_layout_text_set(empty, nullptr, text.get());
  elm_object_signal_emit(empty, "tavro,headed", "tavro");
  tavro_layout_text_set(empty, "elm.text.sub", tavro_text("IDS_OB_BODY_NOTHING_CALLED_HINT"));
  elm_object_part_content_set(view->frame, "tavro.swallow.nothing", empty);
}

void _fill_list(category_view_win *view) {
  const std::string sought = _sought(view), key = tavro_search_key(sought.c_str());
  elm_genlist_clear(view->list);
  elm_object_part_content_set(view->frame, "tavro.swallow.nothing", nullptr);
  _append_section(view, "IDS_OB_HEADER_PHONE", tavro_target_rows_matching(view->categories, key));
  _append_section(view, "IDS_OB_HEADER_APPLICATIONS", tavro_target_rows_matching(view->applications, key));
  if (elm_genlist_items_count(view->list) == 0 && !view->reading) _show_nothing_found(view, sought);
}

void _applications_read_cb(void *data, std::vector<tavro_application> applications) {
  auto *view = static_cast<category_view_win *>(data);
  view->reading = nullptr;
  for (const tavro_application &application : applications)
    view->applications.push_back({application.name, application.name,
                                  tavro_search_key(application.name.c_str()), application.icon, "app",
                                  false});
  if (view->search_entry)
    _fill_list(view);
  else  // what is there stays as it is, and so does the place to which it was scrolled
    _append_section(view, "IDS_OB_HEADER_APPLICATIONS", tavro_target_rows_matching(view->applications, ""));
  tavro_app_list_store(std::move(applications));
}

// ---- Search ----

void _show_search_button(category_view_win *view, const char *icon, const char *name) {
  elm_object_content_set(view->search_button, tavro_icon_add(view->search_button, icon));
  elm_atspi_accessible_name_set(view->search_button, tavro_text(name));
}

void _search_changed_cb(void *data, Evas_Object *, void *) {
  _fill_list(static_cast<category_view_win *>(data));
}

void _open_search(category_view_win *view) {
  Evas_Object *margins = tavro_layout_add(view->frame, "tavro/picker/search");
  Evas_Object *field = nullptr;
  view->search_entry = tavro_field_add(margins, tavro_text("IDS_OB_BODY_SEARCH_TARGETS"), true, &field);
  elm_object_content_set(margins, field);
  evas_object_smart_callback_add(view->search_entry, "changed", _search_changed_cb, view);
  elm_object_part_content_set(view->frame, kSearchPart, margins);
  _show_search_button(view, "close/on", "IDS_OB_BUTTON_CLOSE_SEARCH");
  elm_object_focus_set(view->search_entry, EINA_TRUE);
}

void _close_search(category_view_win *view) {
  view->search_entry = nullptr;
  elm_object_part_content_set(view->frame, kSearchPart, nullptr);
  _show_search_button(view, "search/on", "IDS_OB_BUTTON_SEARCH");
  elm_object_focus_set(view->search_button, EINA_TRUE);
  _fill_list(view);
}

void _search_clicked_cb(void *data, Evas_Object *, void *) {
  auto *view = static_cast<category_view_win *>(data);
  if (view->search_entry)
    _close_search(view);
  else
    _open_search(view);
}

// "Back" ends the search first.
Eina_Bool _pop_cb(void *data, Elm_Object_Item *) {
  auto *view = static_cast<category_view_win *>(data);
  if (view->is_done || !view->search_entry) return EINA_TRUE;
  _close_search(view);
  return EINA_FALSE;
}

// ---- Page ----

void _page_deleted_cb(void *data, Evas *, Evas_Object *, void *) {
  const std::unique_ptr<category_view_win> view(static_cast<category_view_win *>(data));
  tavro_app_list_give_up(view->reading);
  elm_genlist_item_class_free(view->row_class);
  elm_genlist_item_class_free(view->section_class);
  if (view->ad->category_view == view.get()) view->ad->category_view = nullptr;
}

Elm_Genlist_Item_Class *_section_class_new() {
  Elm_Genlist_Item_Class *section_class = elm_genlist_item_class_new();
  section_class->item_style = "tavro_section";
  section_class->func.text_get = _section_text;
  return section_class;
}

void _build_page(category_view_win *view, const char *title) {
  Evas_Object *page = tavro_page_add(view->ad, title, "back");
  evas_object_event_callback_add(page, EVAS_CALLBACK_FREE, _page_deleted_cb, view);
  view->search_button =
      tavro_page_action_add(page, "search", tavro_text("IDS_OB_BUTTON_SEARCH"), _search_clicked_cb, view);
  view->frame = tavro_layout_add(page, "tavro/picker");
  view->list = tavro_target_list_add(view->frame);
  elm_atspi_accessible_name_set(view->list, title);
  elm_object_content_set(view->frame, view->list);
  elm_object_content_set(page, view->frame);
  elm_naviframe_item_pop_cb_set(tavro_page_push(view->ad, page, title), _pop_cb, view);
}

}  // namespace

void tavro_create_target_picker(appdata *ad, tavro_target_chosen chosen) {
  if (ad->category_view) return;  // a second tap opens no second picker
  auto *view = ad->category_view = new category_view_win;
  view->ad = ad;
  view->chosen = chosen;
  view->below = elm_naviframe_top_item_get(ad->nf);
  view->row_class = tavro_target_row_class_new();
  view->section_class = _section_class_new();
  for (size_t i = 0; i < kTargetCategoryCount; ++i) {
    view->categories.push_back(tavro_target_row_of(kTargetCategories[i]));
    view->categories.back().has_page = view->categories.back().name == kPerformanceCategory;
  }
  view->reading = tavro_app_list_read_later(_applications_read_cb, view);
  _build_page(view, tavro_text("IDS_OB_HEADER_WHAT_IS_IT_ABOUT"));
  _fill_list(view);
}
