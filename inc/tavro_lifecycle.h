// The platform's life cycle callbacks of the client, from create to terminate; launch requests are handled in
// tavro_appcontrol_util.h. `user_data` is the appdata. Main loop only.
#pragma once

#include <app.h>

struct appdata;

// Prepare state, lock, store and preferences; no window is made. False: the application does not start.
bool app_create(void *user_data);
void app_pause(void *user_data);
void app_resume(void *user_data);
void app_terminate(void *user_data);

// Register the platform event handlers; the low-memory one is taken back at once.
void tavro_register_event_handlers(appdata *ad);
void ui_app_low_battery(app_event_info_h event_info, void *user_data);
void ui_app_low_memory(app_event_info_h event_info, void *user_data);
void ui_app_orient_changed(app_event_info_h event_info, void *user_data);
void ui_app_region_changed(app_event_info_h event_info, void *user_data);

// Ask the service for the forum's addresses when an account is signed in whose community cookie has expired.
void tavro_prepare_webview(appdata *ad);

// Whether the stored expiry time of the community cookie has passed; true when there is none.
bool tavro_check_cookie_expiry();
