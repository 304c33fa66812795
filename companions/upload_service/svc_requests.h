// Launch requests that the service receives: what each operation asks, and what a bad request gets (one log
// line). Main loop only.
#pragma once

#include <app_control.h>

#include "svc_uploader.h"

void svc_handle_request(app_control_h request, SvcUploader &uploader);
