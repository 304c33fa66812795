// What the upload service reports about the person's reports: the result of an upload, the desk's answers, a
// newer client. Each kind has its key in the request; they are examined in a fixed order. A client without a
// window ends itself after an upload that went well and after a reply. Main loop only.
#pragma once

#include <app_control.h>

#include "tavro_service_keys.h"

struct appdata;

void tavro_handle_service_updates(app_control_h service, appdata *ad);
void tavro_handle_upload_status(app_control_h service, appdata *ad, const char *upload_status);
void tavro_handle_badge_notifications(app_control_h service, appdata *ad);
