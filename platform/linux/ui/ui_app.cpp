// The life cycle of a window application on ecore's main loop.

#include <Ecore_X.h>
#include <Elementary.h>
#include <app.h>
#include <dlog.h>

#include <algorithm>
#include <string>
#include <utility>
#include <vector>

#include "app_control_internal.h"
#include "app_core.h"
#include "bus.h"
#include "display_state.h"
#include "first_frame.h"
#include "main_loop.h"
#include "notification_requests.h"
#include "screen_reader_keys.h"
#include "system_info_source.h"
#include "toast.h"
#include "window_watch.h"

struct app_event_handler {
  app_event_type_e type;
  app_event_cb callback;
  void *user_data;
};

namespace {

enum class Phase {
  kCreated,  // waits for the first launch request
  kResumed,
  kPaused,
};

struct WindowApplication {
  ui_app_lifecycle_callback_s callback = {};
  void *user_data = nullptr;
  Phase phase = Phase::kCreated;
  bool is_running = false;
  bool is_ending = false;
  bool is_looping = false;
};

WindowApplication app;
std::vector<app_event_handler *> event_handlers;

void resume() {
  if (app.phase == Phase::kResumed || app.is_ending) return;
  app.phase = Phase::kResumed;
  if (app.callback.resume) app.callback.resume(app.user_data);
}

void pause() {
  if (app.phase != Phase::kResumed || app.is_ending) return;
  app.phase = Phase::kPaused;
  if (app.callback.pause) app.callback.pause(app.user_data);
}

void windows_changed(bool is_seen) {
  if (!is_seen) return pause();
  // Before the first launch request there is nothing to resume.
  if (app.phase == Phase::kPaused) resume();
}

// The user asked for the application. Operations of other names are messages between applications.
bool asks_for_window(const app_control_s &request) {
  static const std::string kUserOperations = "http://tizen.org/appcontrol/operation/";
  return !request.operation || request.operation->compare(0, kUserOperations.size(), kUserOperations) == 0;
}

void handed_on_cb(app_control_h, app_control_h, app_control_result_e, void *) {
  platform::release_end();
}

// The user's request met an application on its way out, which opens no window any more. The name is free by
// now, or will be in a moment: sent anew, the request starts the application again. The end waits for the
// answer, since the bus drops what it queues for a starting program when the sender goes.
void hand_on(app_control_h request) {
  app_control_h again = nullptr;
  if (app_control_clone(&again, request) != APP_CONTROL_ERROR_NONE) return;
  app_control_set_app_id(again, platform::application_id().c_str());
  platform::hold_end();
  const int error = app_control_send_launch_request(again, handed_on_cb, nullptr);
  if (error != APP_CONTROL_ERROR_NONE) {
    platform::release_end();
    dlog_print(DLOG_ERROR, "PLATFORM", "a request that met the end was not handed on: %d", error);
  }
  app_control_destroy(again);
}

void launch(app_control_h request) {
  if (app.is_ending && asks_for_window(*request)) return hand_on(request);
  app.callback.app_control(request, app.user_data);
  platform::report_first_frame();
  if (app.phase == Phase::kCreated) {
    resume();
  } else if (asks_for_window(*request) && !app.is_ending) {
    platform::raise_windows();
  }
}

Eina_Bool end_signal_cb(void *, int, void *) {
  ui_app_exit();
  return ECORE_CALLBACK_PASS_ON;
}

gboolean first_launch_cb(gpointer) {
  platform::deliver_default_launch();
  return G_SOURCE_REMOVE;
}

bool screen_size(int *width, int *height) {
  if (!ecore_x_display_get()) return false;
  ecore_x_screen_size_get(ecore_x_default_screen_get(), width, height);
  return *width > 0 && *height > 0;
}

bool start_toolkit(int argc, char **argv) {
  if (!elm_init(argc, argv)) {
    dlog_print(DLOG_ERROR, "PLATFORM", "the toolkit cannot be started; is there a display?");
    return false;
  }
  platform::set_screen_size_source(screen_size);
  platform::merge_glib_into_ecore();
  platform::watch_windows(windows_changed);
  platform::serve_display_state();
  platform::share_keys_with_screen_reader();
  platform::set_toast_fallback(platform::show_toast_over_window);
  return true;
}

void run_loop() {
  Ecore_Event_Handler *signals = ecore_event_handler_add(ECORE_EVENT_SIGNAL_EXIT, end_signal_cb, nullptr);
  if (platform::is_started_by_hand()) g_idle_add_full(G_PRIORITY_DEFAULT, first_launch_cb, nullptr, nullptr);
  app.is_looping = true;
  // An application may ask for its end before its loop runs.
  if (!app.is_ending) elm_run();
  app.is_looping = false;
  app.is_ending = true;
  ecore_event_handler_del(signals);
}

int run_application(int argc, char **argv) {
  if (!start_toolkit(argc, argv)) {
    platform::leave_application(true);
    return APP_ERROR_NOT_SUPPORTED;
  }
  const bool is_created = app.callback.create(app.user_data);
  if (is_created) run_loop();
  platform::leave_application(!is_created);
  if (is_created && app.callback.terminate) app.callback.terminate(app.user_data);
  platform::set_toast_fallback(nullptr);
  platform::finish_outgoing();
  platform::stop_sharing_keys();
  platform::stop_serving_display_state();
  platform::stop_watching_windows();
  platform::set_screen_size_source(nullptr);
  platform::separate_glib_from_ecore();
  elm_shutdown();
  return is_created ? APP_ERROR_NONE : APP_ERROR_INVALID_CONTEXT;
}

}  // namespace

int ui_app_main(int argc, char **argv, ui_app_lifecycle_callback_s *callback, void *user_data) {
  using namespace platform;
  if (!argv || !callback || !callback->create || !callback->app_control) return APP_ERROR_INVALID_PARAMETER;
  if (app.is_running) return APP_ERROR_ALREADY_RUNNING;
  app = WindowApplication();
  app.callback = *callback;
  app.user_data = user_data;
  const Claim claim = claim_application(launch, ui_app_exit);
  if (claim == Claim::kForwarded) return APP_ERROR_NONE;
  if (claim == Claim::kFailed) return APP_ERROR_INVALID_CONTEXT;
  app.is_running = true;
  const int result = run_application(argc, argv);
  app.is_running = false;
  return result;
}

void ui_app_exit(void) {
  app.is_ending = true;
  if (app.is_looping) ecore_main_loop_quit();
}

int ui_app_add_event_handler(app_event_handler_h *handler, app_event_type_e event_type, app_event_cb callback,
                             void *user_data) {
  if (!handler || !callback || event_type < APP_EVENT_LOW_MEMORY ||
      event_type > APP_EVENT_REGION_FORMAT_CHANGED) {
    return APP_ERROR_INVALID_PARAMETER;
  }
  const bool is_known = std::any_of(event_handlers.begin(), event_handlers.end(), [&](const auto *known) {
    return known->type == event_type && known->callback == callback;
  });
  if (is_known) return APP_ERROR_INVALID_PARAMETER;
  *handler = new app_event_handler{event_type, callback, user_data};
  event_handlers.push_back(*handler);
  return APP_ERROR_NONE;
}

int ui_app_remove_event_handler(app_event_handler_h handler) {
  const auto known = std::find(event_handlers.begin(), event_handlers.end(), handler);
  if (known == event_handlers.end()) return APP_ERROR_INVALID_PARAMETER;
  event_handlers.erase(known);
  delete handler;
  return APP_ERROR_NONE;
}
