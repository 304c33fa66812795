// The way from a crash to its report: the crash service tells which application crashed, the person is asked
// whether to report it, the dump is collected, and the problem screen opens with it. Main loop only.
#pragma once

#include <app_control.h>

struct appdata;

// "CRASH_PROCESS" of the crash service. A client that was started for a crash that it does not ask about ends
// itself.
void tavro_handle_crash_event(app_control_h service, appdata *ad);

// The application ends, its window has gone: whatever is being collected is given up, and a dump that no
// screen took goes.
void tavro_crash_report_at_end();
