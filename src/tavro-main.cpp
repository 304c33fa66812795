// The client's entry: an application of the phone's platform, which calls back for everything else.
#include "tavro-main.h"

#include <app.h>

#include "tavro_appcontrol_util.h"
#include "tavro_lifecycle.h"
#include "tavro_log.h"
#include "tavro_memcheck.h"

int main(int argc, char **argv) {
  tavro_mem_check_init();
  appdata ad = {};
  ui_app_lifecycle_callback_s callbacks = {};
  callbacks.create = app_create;
  callbacks.terminate = app_terminate;
  callbacks.pause = app_pause;
  callbacks.resume = app_resume;
  callbacks.app_control = app_control;
  tavro_register_event_handlers(&ad);
  const int ret = ui_app_main(argc, argv, &callbacks, &ad);
  if (ret != APP_ERROR_NONE) TAVRO_LOGD("ui_app_main() is failed. err = %d", ret);
  return ret;
}
