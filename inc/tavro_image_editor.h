// The page on which a person marks what matters in a picture and hides what is private. "Done" writes a new
// file, which goes to the attachments of the open compose screen; leaving the page in any other way keeps
// nothing. One editor is open at a time, above the compose screen that it was opened for, and ends with that.
// Main loop only; pixels are worked on by a worker thread.
#pragma once

#include <Elementary.h>

struct appdata;

// Edit a screenshot that was just taken. What is attached is its part below the status bar at 720 x 1200
// pixels, with a record of the box in ie_select_box_list. The file at `path` is removed when the page goes,
// unless a stored report or what is kept of an unfinished one names it.
void tavro_launch_image_editor(const char *path, appdata *ad);

// The page of an open editor with something that would be lost with it: a screenshot, or changes. Null when
// there is none.
Elm_Object_Item *tavro_image_editor_kept_page();

// Leave an open editor without a question; nothing of it is kept.
void tavro_image_editor_close();

// Edit an attached picture: what the box leaves takes its place in the strip, the file at `path` stays.
void tavro_edit_attachment(const char *path, appdata *ad);
