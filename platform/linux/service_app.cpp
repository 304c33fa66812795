#include "service_app.h"

#include <dlog.h>
#include <glib-unix.h>

#include "app_core.h"
#include "bus.h"

namespace {

struct Service {
  GMainLoop *loop = nullptr;
  bool is_ending = false;
};
Service service;

gboolean end_signal_cb(gpointer) {
  service_app_exit();
  return G_SOURCE_CONTINUE;
}

gboolean first_launch_cb(gpointer) {
  platform::deliver_default_launch();
  return G_SOURCE_REMOVE;
}

void run_loop() {
  const guint signals[] = {g_unix_signal_add(SIGTERM, end_signal_cb, nullptr),
                           g_unix_signal_add(SIGINT, end_signal_cb, nullptr),
                           g_unix_signal_add(SIGHUP, end_signal_cb, nullptr)};
  if (platform::is_started_by_hand()) g_idle_add_full(G_PRIORITY_DEFAULT, first_launch_cb, nullptr, nullptr);
  // A service may ask for its end before its loop runs.
  if (!service.is_ending) g_main_loop_run(service.loop);
  for (const guint signal : signals) g_source_remove(signal);
}

}  // namespace

int service_app_main(int, char **, service_app_lifecycle_callback_s *callback, void *user_data) {
  using namespace platform;
  if (!callback || !callback->create || !callback->app_control) return APP_ERROR_INVALID_PARAMETER;
  if (service.loop) return APP_ERROR_ALREADY_RUNNING;
  const Claim claim = claim_application(
      [callback, user_data](app_control_h request) { callback->app_control(request, user_data); },
      service_app_exit);
  if (claim == Claim::kForwarded) return APP_ERROR_NONE;
  if (claim == Claim::kFailed) return APP_ERROR_INVALID_CONTEXT;

  service.loop = g_main_loop_new(nullptr, FALSE);
  const bool is_created = callback->create(user_data);
  if (is_created) run_loop();
  leave_application(!is_created);
  if (is_created && callback->terminate) callback->terminate(user_data);
  finish_outgoing();
  g_main_loop_unref(service.loop);
  service = Service();
  return is_created ? APP_ERROR_NONE : APP_ERROR_INVALID_CONTEXT;
}

void service_app_exit(void) {
  service.is_ending = true;
  if (service.loop) g_main_loop_quit(service.loop);
}
