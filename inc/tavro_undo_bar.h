// A bar at the foot of the window that says what was just done and offers to take it back, with a line that
// runs down for five seconds. It lies over the page, above the page's own bottom bar, and moves to the top of
// the page while it would cover the entry that has the focus. One at a time; it goes with the window. Main
// loop only.
//
// The bar keeps no time: who shows it hides it when what it says is past.
#pragma once

struct appdata;

// How long the bar's line runs; the layout file says the same.
constexpr double TAVRO_UNDO_SECONDS = 5.0;

// Show the bar over the base window; nothing where there is none. `text` is plain UTF-8; it is what a screen
// reader announces. `undo` is called once when the person takes it back; the bar is gone by then.
void tavro_undo_bar_show(appdata *ad, const char *text, void (*undo)(appdata *ad));

// Harmless when no bar is shown.
void tavro_undo_bar_hide();
