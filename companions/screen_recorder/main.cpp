// corvane.tavro-screen-recorder: takes pictures and videos of the screen for other applications of the phone.
// A request starts it; when nobody has asked for anything for a while it ends.
#include <service_app.h>
#include <signal.h>
#include <sys/stat.h>

#include "recorder.h"
#include "recorder_log.h"

namespace {

constexpr guint kRestSeconds = 60;

gboolean rest_cb(gpointer data) {
  if (static_cast<Recorder *>(data)->is_idle()) service_app_exit();
  return G_SOURCE_CONTINUE;
}

// What libraries say of faults goes to the platform log; their debug messages go nowhere.
void log_cb(const char *, GLogLevelFlags level, const char *message, gpointer) {
  if (level & (G_LOG_LEVEL_ERROR | G_LOG_LEVEL_CRITICAL | G_LOG_LEVEL_WARNING)) RECORDER_LOGE("%s", message);
}

bool create_cb(void *data) {
  g_timeout_add_seconds(kRestSeconds, rest_cb, data);
  return true;
}

void terminate_cb(void *data) {
  static_cast<Recorder *>(data)->end();
}

void request_cb(app_control_h request, void *data) {
  static_cast<Recorder *>(data)->take(request);
}

}  // namespace

int main(int argc, char **argv) {
  umask(077);
  signal(SIGXFSZ, SIG_IGN);  // a file that may not grow is an error of its writer
  g_log_set_default_handler(log_cb, nullptr);
  Recorder recorder;
  service_app_lifecycle_callback_s callbacks = {create_cb, terminate_cb, request_cb};
  return service_app_main(argc, argv, &callbacks, &recorder);
}
