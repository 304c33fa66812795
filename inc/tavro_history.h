// State of the history pages, shared by the list and the details page only. The list owns the record; it
// lives from the first time a history page opens until the list page is gone. Main loop only.
#pragma once

#include <Elementary.h>
#include <glib.h>

struct appdata;
struct svc_voc_data;
struct tavro_history_view;

struct history_app_data_s {
  bool delete_status;  // the list is in selection mode
  bool win_back_status;
  int history_details_index;  // row whose details are open
  int checked_item_count;     // rows ticked in selection mode
  Evas_Object *history_genlist;
  Evas_Object *history_details_layout;
  Elm_Object_Item *history_nf_it;
  GSList *history_genlist_items;  // of svc_voc_data, owned
  Elm_Object_Item *select_item;   // the "select all" row, null outside of selection mode
  Evas_Object *select_check;      // its check box, null while it is not on the screen
  GSList *contents_pool;
  int *history_item_status_array;  // in selection mode 1 for each ticked row, by index; owned
  Elm_Genlist_Item_Class *_itc;
  Evas_Object *comments_box;
  Evas_Object *comments_layout;
  Evas_Object *description_layout;
  Evas_Object *page;         // the list's page
  tavro_history_view *view;  // what else the list's page holds, owned
};

// One row of the list.
struct genlist_item {
  int index;  // position in history_genlist_items; -1: the "select all" row, -2: the line below the last
              // report
  svc_voc_data *voc;  // the list's
  Elm_Object_Item *item;
  Evas_Object *content;
};

// In selection mode, tick the row or take its tick back, and with it title, delete button and "select all". A
// report that is being sent stays as it is; so does everything for an index that no row has.
void tavro_history_checkbox_selected(appdata *ad, int index);

// Set the list to the user's reports and, when there are any, the count to their number.
void get_voc_list_from_db(int *count, GSList **vocs, const char *user_name);

// Free the records and the list, and set the list to null.
void tavro_free_voc_list(GSList **vocs);

// Open a stored draft in its compose screen.
void tavro_edit_cb(appdata *ad, const svc_voc_data *draft);
