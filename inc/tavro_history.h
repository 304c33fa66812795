// State of the history pages, shared by the list and the details page only. The list owns the record; it
// lives from the first time a history page opens until the list page is gone. Main loop only.
#pragma once

#include <Elementary.h>
#include <glib.h>

struct appdata;
struct svc_voc_data;

struct history_app_data_s {
  bool delete_status;  // selection mode
  bool win_back_status;
  int history_details_index;  // row whose details are open
  int checked_item_count;
  Evas_Object *history_genlist;
  Evas_Object *history_details_layout;
  Elm_Object_Item *history_nf_it;
  GSList *history_genlist_items;  // of svc_voc_data, owned
  Elm_Object_Item *select_item;
  Evas_Object *select_check;
  GSList *contents_pool;
  int *history_item_status_array;
  Elm_Genlist_Item_Class *_itc;
  Evas_Object *comments_box;
  Evas_Object *comments_layout;
  Evas_Object *description_layout;
  Evas_Object *page;  // the list's page
};

// One row of the list.
struct genlist_item {
  int index;          // position in history_genlist_items; -1: the "select all" row
  svc_voc_data *voc;  // the list's
  Elm_Object_Item *item;
  Evas_Object *content;
};

// Set the list to the user's reports and, when there are any, the count to their number.
void get_voc_list_from_db(int *count, GSList **vocs, const char *user_name);

// Free the records and the list, and set the list to null.
void tavro_free_voc_list(GSList **vocs);

// Open a stored draft in its compose screen.
void tavro_edit_cb(appdata *ad, const svc_voc_data *draft);
