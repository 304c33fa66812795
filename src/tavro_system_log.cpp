#include "tavro_system_log.h"

#include <Ecore.h>
#include <gio/gio.h>
#include <unistd.h>

#include <cstring>
#include <ctime>
#include <deque>
#include <string>

#include "tavro-main.h"
#include "tavro_crash_service.h"
#include "tavro_dbmgr.h"
#include "tavro_drafts.h"
#include "tavro_handles.h"
#include "tavro_log.h"
#include "tavro_log_folder.h"
#include "tavro_memory.h"
#include "tavro_preferences.h"
#include "tavro_request.h"
#include "tavro_service_bridge.h"

namespace {

constexpr double kTimeLimitSeconds = 30.0;

struct log_call {
  double asked_at;  // loop time
  time_t clock;
};

struct log_request {
  tavro_system_log_state progress;  // OFF, COLLECTING or FAILED
  log_call call;                    // the last one
  // Calls whose answers are still to come and that nobody wants any more. The service answers in order, so
  // these come before the one that is waited for.
  std::deque<log_call> unwanted_answers;
  guint watch;  // on the service, while any answer is to come
  Ecore_Timer *time_limit;
};
log_request _request = {};
tavro_system_log_changed _changed = nullptr;

void _notify(appdata *ad) {
  if (_changed) _changed(ad);
}

// An answer that has not come within the time limit is lost: it must not be waited for in later ones.
void _forget_lost_answers() {
  auto &unwanted = _request.unwanted_answers;
  while (!unwanted.empty() && ecore_loop_time_get() - unwanted.front().asked_at >= kTimeLimitSeconds)
    unwanted.pop_front();
}

void _unwatch_when_answered() {
  _forget_lost_answers();
  if (!_request.watch || _request.progress == TAVRO_SYSTEM_LOG_COLLECTING ||
      !_request.unwanted_answers.empty())
    return;
  g_bus_unwatch_name(_request.watch);
  _request.watch = 0;
}

// The request for the open screen is over; an answer that is still to come to it is counted before.
void _finish(tavro_system_log_state progress) {
  const bool was_collecting = _request.progress == TAVRO_SYSTEM_LOG_COLLECTING;
  _request.progress = progress;
  if (_request.time_limit) ecore_timer_del(_request.time_limit);
  _request.time_limit = nullptr;
  if (was_collecting) preference_set_boolean(TAVRO_PREF_SYSLOGS, false);
  _unwatch_when_answered();
}

void _stop_waiting(tavro_system_log_state progress) {
  if (_request.progress == TAVRO_SYSTEM_LOG_COLLECTING) _request.unwanted_answers.push_back(_request.call);
  _finish(progress);
}

Eina_Bool _time_limit_cb(void *data) {
  TAVRO_LOGE("the crash service gave no system log in time");
  _request.time_limit = nullptr;
  _stop_waiting(TAVRO_SYSTEM_LOG_FAILED);
  _notify(static_cast<appdata *>(data));
  return ECORE_CALLBACK_CANCEL;
}

// The service cannot be started or has died: no answer will come, not even one to an earlier request.
void _service_vanished_cb(GDBusConnection *, const char *, gpointer data) {
  const bool was_collecting = _request.progress == TAVRO_SYSTEM_LOG_COLLECTING;
  _request.unwanted_answers.clear();
  _finish(was_collecting ? TAVRO_SYSTEM_LOG_FAILED : _request.progress);
  if (!was_collecting) return;
  TAVRO_LOGE("there is no crash service to give the system log");
  _notify(static_cast<appdata *>(data));
}

// A one-way call reports neither a missing nor a dying service, so its name is watched.
void _watch_service(appdata *ad) {
  if (_request.watch) return;
  const TavroObject<GDBusConnection> bus(g_bus_get_sync(G_BUS_TYPE_SYSTEM, nullptr, nullptr));
  if (!bus) return;  // the call itself fails too
  g_dbus_connection_set_exit_on_close(bus.get(), FALSE);
  _request.watch =
      g_bus_watch_name_on_connection(bus.get(), TAVRO_CRASH_SERVICE, G_BUS_NAME_WATCHER_FLAGS_AUTO_START,
                                     nullptr, _service_vanished_cb, ad, nullptr);
}

bool _call_service() {
  static constexpr const char *kParameters[] = {"2", "none", "none"};
  return _tavro_dbus_method_sync(TAVRO_CRASH_SERVICE, TAVRO_CRASH_SERVICE_PATH, TAVRO_CRASH_SERVICE_INTERFACE,
                                 "dump_log", "(iss)", kParameters) == 0;
}

void _forget_file(problem_view_win *view) {
  TAVRO_FREE(view->syslog_filepath);
  TAVRO_FREE(view->syslog_filename);
}

// The file that an answer names, empty when it names none that is a log.
std::string _file_of(app_control_h answer) {
  const TavroText name = tavro_request_text(answer, TAVRO_DUMP_LOG_FILE);
  const std::string path = name ? std::string(TAVRO_LOG_DUMP_FOLDER) + name.get() : "";
  return tavro_log_folder_has(path) ? path : "";
}

// A stored draft's log goes when the new record is stored, not before.
bool _is_of_stored_draft(const appdata *ad, const char *path) {
  if (ad->id_to_delete < 1) return false;
  const TavroText stored(tavro_dbmgr_get_voc_syslog_file_by_id(ad->id_to_delete));
  return stored && std::strcmp(stored.get(), path) == 0;
}

}  // namespace

void tavro_system_log_watch(tavro_system_log_changed changed) {
  _changed = changed;
}

tavro_system_log_state tavro_system_log_current(const appdata *ad) {
  const problem_view_win *view = ad->problem_view;
  if (!view) return TAVRO_SYSTEM_LOG_OFF;
  if (view->syslog_filepath && access(view->syslog_filepath, R_OK) == 0) return TAVRO_SYSTEM_LOG_READY;
  return _request.progress;
}

void tavro_system_log_collect(appdata *ad) {
  const tavro_system_log_state current = tavro_system_log_current(ad);
  if (!ad->problem_view || current == TAVRO_SYSTEM_LOG_READY || current == TAVRO_SYSTEM_LOG_COLLECTING)
    return;
  _forget_file(ad->problem_view);  // of a draft whose log is gone
  _forget_lost_answers();
  tavro_log_folder_prune();
  preference_set_boolean(TAVRO_PREF_SYSLOGS, true);
  _request.progress = TAVRO_SYSTEM_LOG_COLLECTING;
  _request.call = {ecore_loop_time_get(), std::time(nullptr)};
  _request.time_limit = ecore_timer_add(kTimeLimitSeconds, _time_limit_cb, ad);
  _watch_service(ad);
  if (!_call_service()) _finish(TAVRO_SYSTEM_LOG_FAILED);
  _notify(ad);
}

void tavro_system_log_drop(appdata *ad) {
  _stop_waiting(TAVRO_SYSTEM_LOG_OFF);
  problem_view_win *view = ad->problem_view;
  if (view && view->syslog_filepath) {
    if (!_is_of_stored_draft(ad, view->syslog_filepath)) tavro_log_folder_delete(view->syslog_filepath);
    _forget_file(view);
  }
  _notify(ad);
}

void tavro_system_log_end(appdata *) {
  _stop_waiting(TAVRO_SYSTEM_LOG_OFF);
}

void tavro_take_dump_log(app_control_h request, appdata *ad) {
  const std::string path = _file_of(request);
  _unwatch_when_answered();
  if (!_request.unwanted_answers.empty()) {
    tavro_log_folder_delete_unwanted(path, _request.unwanted_answers.front().clock);
    _request.unwanted_answers.pop_front();
    return _unwatch_when_answered();
  }
  if (_request.progress != TAVRO_SYSTEM_LOG_COLLECTING || !ad->problem_view) {
    // Perhaps not the crash service's: what it names stays.
    TAVRO_LOGD("a system log that nobody asked for");
    return;
  }
  if (path.empty()) {
    TAVRO_LOGE("the crash service could not give a system log");
    _finish(TAVRO_SYSTEM_LOG_FAILED);
  } else {
    _forget_file(ad->problem_view);
    ad->problem_view->syslog_filepath = TAVRO_STRDUP(path.c_str());
    ad->problem_view->syslog_filename = TAVRO_STRDUP(path.c_str() + sizeof TAVRO_LOG_DUMP_FOLDER - 1);
    _finish(TAVRO_SYSTEM_LOG_OFF);
  }
  _notify(ad);
}
