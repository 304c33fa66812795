// The pieces of the list "My Reports" among themselves: the page (tavro_history.cpp), what stands in the
// list's place, its rows, their refresh in place, the search with its filters, and the selection mode. All of
// it is there from the page's making to its end, in which history_ad is not null. Main loop only.
#pragma once

#include <Elementary.h>

#include <string>
#include <vector>

#include "tavro_dbmgr.h"
#include "tavro_history.h"

struct appdata;

// What the person wants to see of the list. The text is plain UTF-8.
struct tavro_history_choice {
  std::string text;
  tavro_voc_stage stage = TAVRO_VOC_STAGE_ANY;
  tavro_voc_kind kind = TAVRO_VOC_KIND_ANY;
  bool is_unread = false;

  bool has_chips() const { return stage != TAVRO_VOC_STAGE_ANY || kind != TAVRO_VOC_KIND_ANY || is_unread; }
  bool is_all() const { return text.empty() && !has_chips(); }
};

struct tavro_history_view {
  Evas_Object *frame = nullptr;          // search field, chips, and the list or what is shown in its place
  Evas_Object *search_button = nullptr;  // null where the title bar has none
  Evas_Object *search_entry = nullptr;   // null while the search is closed
  Ecore_Timer *search_timer = nullptr;   // typed, not yet sought
  std::vector<Evas_Object *> chips;      // in the order of the table of filters
  Evas_Object *delete_button = nullptr;  // null outside of selection mode
  const char *instead = nullptr;         // string id of what stands in the list's place, null for the list
  tavro_history_choice choice;
  bool has_older = false;                 // more is stored than a list takes
  Elm_Object_Item *older_item = nullptr;  // the line below the last report that says so, null without it
  int day = -1;                           // of the year, on which the rows' times were written
  bool had_reports = false;               // the page has shown one: it is a deletion that left nothing
};

// ---- Page ----

// Show what is stored now, in place. `is_new_list`: it is another list than before and begins at its top.
void tavro_history_reload(appdata *ad, bool is_new_list);
// Title, buttons and what lies above the list, as they belong to the mode and to what is shown.
void tavro_history_dress_page(appdata *ad);

// ---- In the list's place ----

void tavro_history_show_list(const history_app_data_s *history);
// There are no reports, or none that the person chose to see.
void tavro_history_show_no_rows(appdata *ad);
// The store cannot be read just now.
void tavro_history_show_unreadable(appdata *ad);

// ---- Rows ----

Elm_Genlist_Item_Class *tavro_history_row_class_new();
// Add a row in front of `before`; null: at the end.
void tavro_history_row_add(appdata *ad, svc_voc_data *voc, int index, Elm_Object_Item *before);
// Draw the row anew, or all of them, where they are on the screen. The toolkit's own "update" builds a row
// from nothing, and the rows that are not on the screen as well.
void tavro_history_row_redraw(const genlist_item *row);
void tavro_history_redraw_all(const appdata *ad);
// The row of a list item; every item has one.
genlist_item *tavro_history_row_of(const Elm_Object_Item *item);

// Put the line "older reports" below the last report, or take it away, as has_older says.
void tavro_history_dress_end(appdata *ad);

// ---- Refresh ----

// Take the row "select all" away, under which the others stay where they are: the toolkit sees to that by
// itself only when a row is put in.
void tavro_history_drop_select_all(history_app_data_s *history);
// Make the rows show history_genlist_items: those that stay are kept, with scroll position, focus and ticks.
void tavro_history_refresh_rows(appdata *ad);

// ---- Search and filters ----

void tavro_history_build_filters(appdata *ad);
void tavro_history_toggle_search(appdata *ad);
// Close the search; false when it was not open.
bool tavro_history_close_search(appdata *ad);
// Show all reports again.
void tavro_history_clear_choice(appdata *ad);

// ---- Selection mode ----

// With the row at `index` ticked; -1: none.
void tavro_history_enter_selection(appdata *ad, int index);
void tavro_history_leave_selection(appdata *ad);
// Tick or untick every row that can be.
void tavro_history_select_all(appdata *ad);
bool tavro_history_can_tick(const svc_voc_data *voc);
bool tavro_history_is_ticked(const history_app_data_s *history, int index);
// Ids of the ticked reports, and their ticks given back after the list was loaded anew.
std::vector<int> tavro_history_ticked_ids(const history_app_data_s *history);
void tavro_history_restore_ticks(appdata *ad, const std::vector<int> &ids);
