// Deleting stored reports, with time to think again. A deletion waits for five seconds, during which the
// reports are hidden from the lists but stay in the store with all their files; "undo" shows them again. Then
// their rows, their attachments' rows and the files that the client itself made go; pictures of the gallery
// never do. A client that is killed while a deletion waits has deleted nothing.
//
// Main loop only.
#pragma once

#include <vector>

struct appdata;

// Ask once, and when the person confirms hide the reports, offer "undo" over the window, and start the five
// seconds. `confirmed` is called after the person said yes, may be null. A deletion that still waits is
// finished first.
void tavro_delete_reports(appdata *ad, const std::vector<int> &voc_ids, void (*confirmed)(appdata *ad));

// Whether the report is hidden because its deletion waits.
bool tavro_delete_is_waiting(int voc_id);

// Delete now what waits: the client pauses, ends, or its user signs out.
void tavro_delete_finish(appdata *ad);

// What draws the lists anew when reports were hidden, shown again or could not be deleted.
void tavro_delete_register_screen(void (*changed)(appdata *ad));
