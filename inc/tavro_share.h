// What other applications share with the client: the problem screen opens with it. Main loop only.
#pragma once

#include <app_control.h>

struct appdata;

// Attach what the share request names (paths, one or several, and its URI) and add its text to the
// description; what cannot be attached is named in a popup. An open compose screen takes it all, otherwise a
// new problem screen is opened. Before an account is chosen it waits.
void tavro_attach_shared_files(app_control_h request, appdata *ad);

// An account is chosen now: what waited for that goes on.
void tavro_attach_waiting_files(appdata *ad);
