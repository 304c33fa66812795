// Where the keyboard is: the ring around the focus, and the focus given back when what lay above goes. Main
// loop only.
#pragma once

#include <Elementary.h>

#include <vector>

// The widget that had the focus of a window, as long as it lives. Stays at its address while it remembers.
struct tavro_focus_memory {
  Evas_Object *widget;  // null: none had it, or it has gone
};
void tavro_focus_remember(tavro_focus_memory *memory, const Evas_Object *win);
void tavro_focus_forget(tavro_focus_memory *memory);

// Every page of the naviframe that comes up again gets back the focus that it had when another was put above
// it. Once, when the naviframe is made.
void tavro_focus_follow_pages(Evas_Object *naviframe);
// Before a page is pushed.
void tavro_focus_leave_page(Evas_Object *naviframe);

// Let the focus go round among widgets, of which there is at least one, and never leave them.
void tavro_focus_keep_among(const std::vector<Evas_Object *> &widgets);

// Let the up and down keys lead through all items of a list. Of itself the toolkit stops at what is on the
// screen.
void tavro_focus_walk_list(Evas_Object *list);

// Show or hide the ring in the window of `widget`. The toolkit shows it by itself at the keys that it moves
// the focus with, and hides it at a touch; who moves the focus at a key of a widget's own shows it too.
void tavro_focus_show(Evas_Object *widget);
// A touch hides the ring that was shown so. Once for each window.
void tavro_focus_hide_at_touch(Evas_Object *win);
