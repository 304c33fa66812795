// The application record from its start values to its release, and the one way to end the application.
// Main loop only.
#pragma once

struct appdata;

// Set the start values; the record was zeroed before.
void tavro_initialize_application_data(appdata *ad);

// Release every text and list that the record holds, and its mutex. Harmless when repeated; the fields are
// null afterwards. Widgets are not touched: they belong to the window.
void tavro_dealloc_memory(appdata *ad);

// The mutex over the report lists: made by the history page, destroyed with it or with the record. Each is
// harmless when repeated.
void tavro_voc_list_lock_create(appdata *ad);
void tavro_voc_list_lock_destroy(appdata *ad);

// Ask the platform to end the application; what is being handled goes on. A client without a window releases
// its record at once, one with a window when its widgets are gone. No window is built from then on.
void tavro_request_exit(appdata *ad);
bool tavro_is_ending();

// Add to ie_select_box_list the box of an attached screenshot, in pixels of the attached file; all -1 for a
// video. Free all of them.
void tavro_select_box_add(appdata *ad, int x, int y, int width, int height);
void tavro_select_boxes_free(appdata *ad);
