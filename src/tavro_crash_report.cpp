// One crash after another: asked about, collected, reported.
#include "tavro_crash_report.h"

#include <Elementary.h>

#include <deque>
#include <optional>
#include <string>
#include <utility>

#include "tavro-common.h"
#include "tavro-main.h"
#include "tavro_appdata.h"
#include "tavro_compose.h"
#include "tavro_crash_archive.h"
#include "tavro_crash_collect.h"
#include "tavro_crash_memory.h"
#include "tavro_crash_occupation.h"
#include "tavro_crash_popup.h"
#include "tavro_crash_service.h"
#include "tavro_log.h"
#include "tavro_memory.h"
#include "tavro_preferences.h"
#include "tavro_request.h"
#include "tavro_screens.h"
#include "tavro_start.h"

namespace {

constexpr size_t kMostWaiting = 20;

struct waiting_crash {
  tavro_crash crash;
  std::string icon;
  int count;
};

enum class stage {
  waiting,     // for the person to have time for a question
  asking,      // the question is up
  telling,     // what "never" means is up
  collecting,  // its dump is being collected, under a popup
  opening,     // the result is there, the problem screen may have to wait for another one to end
};

// The first crash is the one of the stage. From asking to collecting a popup is up; when it goes, so does the
// crash.
struct crash_flow {
  std::deque<waiting_crash> crashes;
  stage at;
  tavro_crash_result result;  // of collecting, ours until it is opened
  Ecore_Job *next;
};
crash_flow _flow = {};

void _schedule_next(appdata *ad);

bool _is_signed_in() {
  return tavro_get_username_from_preference() != nullptr;
}

// ---- From one crash to the next ----

void _remember_context(appdata *ad) {
  TAVRO_FREE(ad->crashed_appname);
  TAVRO_FREE(ad->crashed_appId);
  if (_flow.crashes.empty()) return;
  const tavro_crash &crash = _flow.crashes.front().crash;
  ad->crashed_appname = TAVRO_STRDUP(crash.app_name.c_str());
  ad->crashed_appId = TAVRO_STRDUP(crash.app_id.c_str());
}

// A client that was started for crashes alone has no page, and nothing to stay for.
void _end_if_idle(appdata *ad) {
  const bool has_page = ad->nf && elm_naviframe_top_item_get(ad->nf);
  if (!has_page && !tavro_popup_shown(ad)) tavro_request_exit(ad);
}

void _drop_dump() {
  if (!_flow.result.archive.empty()) tavro_crash_archive_delete_unneeded(_flow.result.archive);
  _flow.result = {};
}

void _finish(appdata *ad) {
  _drop_dump();
  _flow.crashes.pop_front();
  _flow.at = stage::waiting;
  _remember_context(ad);
  if (_flow.crashes.empty())
    _end_if_idle(ad);
  else
    _schedule_next(ad);
  if (!tavro_is_ending()) tavro_crash_ground_hide();  // a page may lie behind it
}

// Whatever closes the popup: a button, the back key, signing out, the end of the window.
void _popup_deleted_cb(void *data, Evas *, Evas_Object *, void *) {
  if (_flow.at == stage::collecting) tavro_crash_collect_cancel();
  _schedule_next(static_cast<appdata *>(data));
}

// False when there is no popup: no display.
bool _enter(appdata *ad, stage at, Evas_Object *popup) {
  if (!popup) return false;
  _flow.at = at;
  evas_object_event_callback_add(popup, EVAS_CALLBACK_DEL, _popup_deleted_cb, ad);
  return true;
}

// ---- The dump ----

void _collected(appdata *ad, const tavro_crash_result &result) {
  _flow.result = result;
  _flow.at = stage::opening;
  if (ad->crash_popup) evas_object_del(ad->crash_popup);
  _schedule_next(ad);
}

void _report(appdata *ad) {
  const tavro_crash &crash = _flow.crashes.front().crash;
  if (!_enter(ad, stage::collecting, tavro_crash_popup_progress(ad, crash.app_name))) return;
  tavro_crash_archive_prune();
  tavro_crash_collect(ad, crash.folder, _collected);
}

// ---- The question ----

void _undo_never(appdata *) {
  tavro_crash_set_never(_flow.crashes.front().crash.app_id, false);
}

void _never(appdata *ad) {
  const tavro_crash &crash = _flow.crashes.front().crash;
  tavro_crash_set_never(crash.app_id, true);
  _enter(ad, stage::telling, tavro_crash_popup_never(ad, crash.app_name, _undo_never));
}

// Before the person, but without taking the keys from another application.
void _raise(const appdata *ad) {
  elm_win_iconified_set(ad->win, EINA_FALSE);
  elm_win_raise(ad->win);
}

// Why there is no question about an application; null when there may be one.
const char *_silence(const std::string &app_id) {
  return _is_signed_in() ? tavro_crash_silence(app_id) : "nobody is signed in";
}

void _ask(appdata *ad) {
  const waiting_crash &first = _flow.crashes.front();
  if (const char *reason = _silence(first.crash.app_id)) {
    TAVRO_LOGD("no question about %s: %s", first.crash.app_id.c_str(), reason);
    return _finish(ad);
  }
  if (Evas_Object *occupation = tavro_crash_occupation(ad)) {
    tavro_crash_wait_for(ad, occupation, _schedule_next);
    return;
  }
  tavro_crash_ground_show(ad);
  Evas_Object *popup =
      tavro_crash_popup_ask(ad, {first.crash.app_name, first.icon, first.count}, _report, _never);
  if (!_enter(ad, stage::asking, popup)) return _finish(ad);
  tavro_crash_note_asked(first.crash.app_id);
  _raise(ad);
}

// ---- The problem screen ----

// An open problem screen is never written over: it is left first, which asks the person, once, before
// anything is lost. The crash report then waits for the end of that screen, however late.
bool _has_room(appdata *ad) {
  const compose_view_win *view = tavro_compose_view(ad);
  if (!view) return true;
  if (!tavro_crash_wait_for(ad, view->layout, _schedule_next)) return false;
  if (ad->problem_view) TAVRO_LOGD("problem_view malloc done already!");
  return tavro_leave_compose_page(ad);
}

void _open(appdata *ad) {
  if (!_is_signed_in()) {
    TAVRO_LOGD("nobody is signed in: the crash is not reported");
    return _finish(ad);
  }
  if (!_has_room(ad)) return;
  tavro_handle_null_window(ad);
  if (!ad->nf) return _finish(ad);
  const waiting_crash &first = _flow.crashes.front();
  const tavro_crash_result result = std::exchange(_flow.result, {});
  tavro_create_crash_page(ad,
                          {first.crash.app_name.c_str(), first.icon.empty() ? nullptr : first.icon.c_str(),
                           result.archive.empty() ? nullptr : result.archive.c_str(), result.has_failed});
  _raise(ad);
  _finish(ad);
}

void _next_cb(void *data) {
  _flow.next = nullptr;
  appdata *ad = static_cast<appdata *>(data);
  if (_flow.crashes.empty() || tavro_is_ending()) return;
  if (_flow.at == stage::waiting) return _ask(ad);
  if (_flow.at == stage::opening) return _open(ad);
  if (!ad->crash_popup) _finish(ad);
}

// Not from inside the callbacks of what is closing.
void _schedule_next(appdata *ad) {
  if (!_flow.next) _flow.next = ecore_job_add(_next_cb, ad);
}

// ---- What the crash service tells ----

// One that is asked about, or waits for that, stands for all of its application. What is reported is the last
// crash before the person chose to.
bool _merge(appdata *ad, const tavro_crash &crash, int count) {
  for (waiting_crash &known : _flow.crashes) {
    if (known.crash.app_id != crash.app_id) continue;
    known.count = count;
    if (!crash.folder.empty()) known.crash.folder = crash.folder;
    if (&known == &_flow.crashes.front() && _flow.at == stage::asking) tavro_crash_popup_count(ad, count);
    return true;
  }
  return false;
}

void _take(appdata *ad, tavro_crash crash) {
  const int count = tavro_crash_note(crash);
  if (_merge(ad, crash, count)) return;
  const char *reason = _silence(crash.app_id);
  if (!reason && _flow.crashes.size() >= kMostWaiting) reason = "too many others wait";
  if (reason) {
    TAVRO_LOGD("no question about %s: %s", crash.app_id.c_str(), reason);
    return;
  }
  std::string icon;
  tavro_crash_look_up(crash.app_id, &crash.app_name, &icon);
  _flow.crashes.push_back({std::move(crash), std::move(icon), count});
  if (_flow.crashes.size() > 1) return;
  _remember_context(ad);
  _schedule_next(ad);
}

std::optional<tavro_crash> _read(app_control_h service) {
  const TavroText app_id = tavro_request_text(service, TAVRO_CRASH_APP_ID);
  const TavroText app_name = tavro_request_text(service, TAVRO_CRASH_APP_NAME);
  const TavroText time = tavro_request_text(service, TAVRO_CRASH_TIME);
  const TavroText folder = tavro_request_text(service, TAVRO_CRASH_FOLDER);
  return tavro_crash_read(app_id.get(), app_name.get(), time.get(), folder.get(), tavro_crash_now());
}

}  // namespace

void tavro_handle_crash_event(app_control_h service, appdata *ad) {
  if (const std::optional<tavro_crash> crash = _read(service); !crash) {
    TAVRO_LOGD("a crash of nobody knows what");
  } else if (!_is_signed_in()) {
    TAVRO_LOGD("nobody is signed in: no question about %s", crash->app_id.c_str());
  } else {
    _take(ad, *crash);
  }
  if (!ad->win && !ad->crash_popup && _flow.crashes.empty()) tavro_request_exit(ad);
}

void tavro_crash_report_at_end() {
  tavro_crash_collect_at_end();
  _drop_dump();
}
