// Functions of screens and services that are not built yet. Each says so in one log line and does nothing
// else; the issue that builds one takes it out of here and declares it in its own header.
#pragma once

#include <Elementary.h>
#include <app_control.h>
#include <glib.h>

#include "tavro-main.h"

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
