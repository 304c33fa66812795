// org.tizen.system.crash: makes crash folders of the machine's crashes and tells the client of them; collects
// the phone's system log and deletes crash folders when the client asks for it.
#include <service_app.h>
#include <signal.h>
#include <sys/stat.h>

#include "crash_object.h"
#include "crash_watch.h"

namespace {

struct Service {
  CrashJobs jobs;
  CrashWatch watch;
};

// Logs are given also where crashes cannot be watched.
bool create_cb(void *data) {
  static_cast<Service *>(data)->watch.start();
  return true;
}

void terminate_cb(void *data) {
  auto *service = static_cast<Service *>(data);
  service->watch.stop();
  service->jobs.stop();
}

}  // namespace

int main(int argc, char **argv) {
  umask(077);
  signal(SIGXFSZ, SIG_IGN);  // a file that may not grow is an error of its writer
  Service service;
  if (!register_crash_object(&service.jobs)) return 1;
  service_app_lifecycle_callback_s callbacks = {
      create_cb, terminate_cb, [](app_control_h, void *) {}};  // a launch by hand only starts it
  return service_app_main(argc, argv, &callbacks, &service);
}
