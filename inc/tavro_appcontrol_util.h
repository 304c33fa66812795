// Launch dispatch: every launch request that reaches the client is recognised by its operation and handed to
// the handlers of its row, the first matching row in a fixed order. Main loop only.
#pragma once

#include <app_control.h>

// The platform's callback; `user_data` is the appdata. The request belongs to the platform.
void app_control(app_control_h request, void *user_data);
