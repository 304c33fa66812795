// org.tizen.system.crash: collects the phone's system log and deletes crash dumps when the client asks for
// it.
#include <service_app.h>
#include <sys/stat.h>

#include "crash_object.h"

int main(int argc, char **argv) {
  umask(077);
  CrashJobs jobs;
  if (!register_crash_object(&jobs)) return 1;
  service_app_lifecycle_callback_s callbacks = {
      [](void *) { return true; }, [](void *data) { static_cast<CrashJobs *>(data)->stop(); },
      [](app_control_h, void *) {}};  // a launch by hand only starts it
  return service_app_main(argc, argv, &callbacks, &jobs);
}
