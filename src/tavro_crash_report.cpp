#include "tavro_crash_report.h"

#include "tavro-main.h"
#include "tavro_appdata.h"

void tavro_handle_crash_event(app_control_h, appdata *ad) {
  // Nothing is shown for the crash, so a client that was started for it alone does not stay.
  if (!ad->win && !ad->crash_popup) tavro_request_exit(ad);
}
