// Builds or raises the window when a launch request wants to be seen. Main loop only.
#pragma once

struct appdata;

// Build the window with its first page when there is none: the account choice on the first run, else the
// landing page. Does nothing once the application is ending, or when no display can be had.
void tavro_handle_null_window(appdata *ad);

// An ordinary start: as above, and a window that was built already comes to the front.
void tavro_handle_welcome_page(appdata *ad);
