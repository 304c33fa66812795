// Builders of the client's own widgets: layouts, icons, tiles, buttons, rows, pages. Texts are plain UTF-8
// and become markup here, never at the caller. Every control gets an accessible name: its text, or the one
// given. Widgets belong to their parent. Main loop only.
#pragma once

#include <Elementary.h>

#include <string>

struct appdata;

// A group of the layout file.
Evas_Object *tavro_layout_add(Evas_Object *parent, const char *group);

// Set a text part of a layout; `text` is plain UTF-8 (null: empty) and is escaped for parts that show markup.
void tavro_layout_text_set(Evas_Object *layout, const char *part, const char *text);

// Plain text as markup, for parts that show markup.
std::string tavro_markup(const char *text);

// Icons of 24 units ("back", "chevron"; with "/on" for the title bar) and coloured tiles of 44 units ("bug").
Evas_Object *tavro_icon_add(Evas_Object *parent, const char *name);
Evas_Object *tavro_tile_add(Evas_Object *parent, const char *name);

// A picture file, decoded in the background at about `units` wide, filling its place or, where it cannot be
// read, left empty.
Evas_Object *tavro_picture_add(Evas_Object *parent, const char *path, int units);

// A button of one of the client's styles ("tavro_primary", "tavro_icon", …). `content` may be null.
// `accessible_name` null: the text serves.
Evas_Object *tavro_button_add(Evas_Object *parent, const char *style, const char *text, Evas_Object *content,
                              const char *accessible_name, Evas_Smart_Cb clicked, const void *data);

// An entry in a box with rounded corners that grows with its text (without line breaks, if it is to be one
// line of text), which shows `hint` while it is empty; the hint is its accessible name. Returns the entry,
// and the box through `field`. A touch anywhere on the box focuses the entry.
Evas_Object *tavro_field_add(Evas_Object *parent, const char *hint, bool is_single_line, Evas_Object **field);

// A list row with a tile, a title, a second line (may be null) and something at its end (may be null).
Evas_Object *tavro_row_add(Evas_Object *parent, const char *tile, const char *title, const char *subtitle,
                           Evas_Object *end, Evas_Smart_Cb clicked, const void *data);
// Change the second line of a row; null removes it.
void tavro_row_subtitle_set(Evas_Object *row, const char *subtitle);

// Fill the width, keep the natural height: what most things in a vertical box want.
void tavro_fill_width(Evas_Object *widget);

// A vertical box that scrolls; returns the box, the scroller through `scroller`.
Evas_Object *tavro_scrolled_box_add(Evas_Object *parent, Evas_Object **scroller);

// An empty page to be filled: title bar with `title` and, unless it is the first page, a button at the start
// with the icon `start_icon` ("back", "close") that does what the back key does.
Evas_Object *tavro_page_add(appdata *ad, const char *title, const char *start_icon);

// Add a button to the end of a page's title bar.
Evas_Object *tavro_page_action_add(Evas_Object *page, const char *icon, const char *name,
                                   Evas_Smart_Cb clicked, const void *data);

// Put the page on the naviframe, under its title.
Elm_Object_Item *tavro_page_push(appdata *ad, Evas_Object *page, const char *title);

// "3.4" for 3,400,000 bytes: megabytes with one decimal.
std::string tavro_megabytes(long long bytes);

// "184 kB" or "1.2 MB", in the person's language; what holds anything is at least 1 kB.
std::string tavro_size_text(long long bytes);
