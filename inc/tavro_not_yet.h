// Functions of screens and services that are not built yet. Each says so in one log line and does nothing
// else; the issue that builds one takes it out of here and declares it in its own header.
#pragma once

#include <Elementary.h>
#include <app_control.h>
#include <glib.h>

#include "tavro-main.h"

// Capture manager and floating capture control. A capture that was started attaches what it takes to the open
// compose screen; false when it cannot start.
bool tavro_capture_start(appdata *ad, captureType type);
void send_cpmgr_shutdown(appdata *ad);
void record_btn_clicked_cb(void *data, Evas_Object *obj, void *event_info);
void tavro_cpmgr_on_get_error_cb(app_control_h service, appdata *ad);

// Web engine and community pages. `in_background`: 1 when the address is loaded without showing the page.
void ewk_shutdown();
void tavro_load_url(appdata *ad, int in_background);

// Account pages of the maker's account.
void tavro_create_account_page_ui(appdata *ad, GSList *accounts);
int tavro_add_account_result(appdata *ad);

// Beta centre and banners.
Evas_Object *tavro_beta_details_optin_button(appdata *ad);  // null when the details page is not shown
void tavro_refresh_beta_pages(appdata *ad, const char *what);
void tavro_refresh_banners(appdata *ad);
