// Shell utilities: locale, base window and naviframe, popups, folders. Main loop only.
#pragma once

#include <Elementary.h>

#include <initializer_list>
#include <vector>

struct appdata;

// Re-read the platform's language for the text domain "tavro-lite". 0, or non-zero with errno set.
int tavro_bind_locale();

// The translation of a string id; the id itself where no catalogue has it. Not to be freed.
const char *tavro_text(const char *id);

// Build window, conformant, base layout and an empty naviframe where they do not exist yet. False when no
// window can be had (no display).
bool tavro_create_base_window(appdata *ad);

// What a page that holds unsaved work says: whether the window may be closed now (if not, it has asked the
// person), and which page must stay when pages are popped (null: none).
struct tavro_page_guard {
  bool (*may_close)(appdata *ad);
  Elm_Object_Item *(*kept_page)(appdata *ad);
};
void tavro_set_page_guard(const tavro_page_guard &guard);

// One button of a popup. `clicked` may be null: the popup then only closes.
struct tavro_popup_button {
  const char *text;  // already translated
  void (*clicked)(appdata *ad);
};

// Show a popup over the base window, builds that window first where it does not exist. `slot` is the popup's
// field in appdata; it is set here, cleared when the popup closes, and an older popup in it is closed first.
// Texts are plain UTF-8, never markup. Without a display: null, and a log line.
Evas_Object *tavro_popup_show(appdata *ad, Evas_Object **slot, const char *title, const char *body,
                              std::initializer_list<tavro_popup_button> buttons);

// A question that wants more weight: a picture file or (`picture` null) a tile beside its title and the line
// under that, and a main button as wide as the card over the others (`main.text` null: none). Otherwise as a
// popup.
struct tavro_card {
  const char *tile;
  const char *picture;
  const char *title, *subtitle, *body;
  tavro_popup_button main;
};
Evas_Object *tavro_card_show(appdata *ad, Evas_Object **slot, const tavro_card &card,
                             const std::vector<tavro_popup_button> &others);
void tavro_card_subtitle_set(Evas_Object *popup, const char *subtitle);

// A menu below the end of the title bar; a touch beside it closes it. Otherwise as a popup.
Evas_Object *tavro_menu_show(appdata *ad, Evas_Object **slot,
                             std::initializer_list<tavro_popup_button> entries);

// The same at the foot of the window, under a title.
Evas_Object *tavro_sheet_show(appdata *ad, Evas_Object **slot, const char *title,
                              const std::vector<tavro_popup_button> &entries);

// A popup that is shown, other than those about a crash; null when there is none.
Evas_Object *tavro_popup_shown(const appdata *ad);

// Close every popup that is shown.
void tavro_delete_all_popup(appdata *ad);

// Make a folder and its parents, readable by the owner alone. 0, or -1 with a log line.
int tavro_create_dir(const char *path);

// Pop every page above the landing page, or above the page that the guard keeps.
void tavro_pop_naviframe_middle_items(appdata *ad);
