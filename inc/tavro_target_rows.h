// Rows of the lists in which a person says what a report is about. Main loop only.
#pragma once

#include <Elementary.h>

#include <string>
#include <vector>

struct tavro_target_category;

struct tavro_target_row {
  std::string name;  // as it is stored
  std::string text;  // as it is shown
  std::string key;   // as it is sought, see tavro_search_key
  std::string icon;  // path of an application's picture; empty: none
  const char *tile;  // in place of a picture
  bool has_page;     // choosing it opens a further page
};

tavro_target_row tavro_target_row_of(const tavro_target_category &category);

// Those whose text contains what is sought, in their order; all for an empty key.
std::vector<const tavro_target_row *> tavro_target_rows_matching(const std::vector<tavro_target_row> &rows,
                                                                 const std::string &key);

// An application's picture; the tile of an application where it cannot be read, since it is another's file.
Evas_Object *tavro_application_icon_add(Evas_Object *parent, const char *path);

// An empty list, and the class of its rows: an item's data is a row, which must outlive the item. The caller
// frees the class.
Evas_Object *tavro_target_list_add(Evas_Object *parent);
Elm_Genlist_Item_Class *tavro_target_row_class_new();
