// The system log's row of the problem screen: a switch with what has become of the log.
#include <elm_atspi.h>

#include <string>

#include "tavro-common.h"
#include "tavro-main.h"
#include "tavro_compose.h"
#include "tavro_compose_keeper.h"
#include "tavro_compose_parts.h"
#include "tavro_compose_strip.h"
#include "tavro_handles.h"
#include "tavro_preferences.h"
#include "tavro_system_log.h"
#include "tavro_widgets.h"

namespace {

// The phone is asked for a log only after the screen had time to be painted.
constexpr double kFirstUpdateSeconds = 0.2;

// Of the open screen.
bool _is_wanted = false;
bool _was_switched = false;
Ecore_Timer *_first_update = nullptr;

bool _is_mandatory(const appdata *ad) {
  return isLogMandatory(ad->problem_view->app_name);
}

// A log whose file has vanished is as good as none.
tavro_system_log_state _state(const appdata *ad) {
  const tavro_system_log_state state = tavro_system_log_current(ad);
  return state == TAVRO_SYSTEM_LOG_OFF && ad->problem_view->syslog_filepath ? TAVRO_SYSTEM_LOG_FAILED : state;
}

std::string _state_text(const appdata *ad) {
  std::string text;
  switch (_state(ad)) {
    case TAVRO_SYSTEM_LOG_FAILED:
      return tavro_text("IDS_OB_BODY_LOG_RETRY");
    case TAVRO_SYSTEM_LOG_OFF:
      return tavro_text(_is_mandatory(ad) ? "IDS_OB_BODY_LOG_MANDATORY" : "IDS_OB_BODY_LOG_OFF");
    case TAVRO_SYSTEM_LOG_COLLECTING:
      text = tavro_text("IDS_OB_BODY_LOG_COLLECTING");
      break;
    case TAVRO_SYSTEM_LOG_READY:
      text = tavro_size_text(tavro_attachment_size(ad->problem_view->syslog_filepath));
      break;
  }
  if (!_is_mandatory(ad)) return text;
  return TavroGText(g_strdup_printf(tavro_text("IDS_OB_BODY_LOG_PS_REQUIRED"), text.c_str())).get();
}

void _show(appdata *ad) {
  Evas_Object *row = ad->problem_view->log_row;
  if (!row) return;
  const tavro_system_log_state state = _state(ad);
  const bool is_on = state != TAVRO_SYSTEM_LOG_FAILED && (state != TAVRO_SYSTEM_LOG_OFF || _is_mandatory(ad));
  elm_check_state_set(row, is_on);
  // One that failed can always be tried again.
  elm_object_disabled_set(row, _is_mandatory(ad) && is_on);
  elm_object_signal_emit(row, state == TAVRO_SYSTEM_LOG_FAILED ? "tavro,failed" : "tavro,fine", "tavro");
  const std::string text = _state_text(ad);
  tavro_layout_text_set(row, "elm.text.sub", text.c_str());
  elm_atspi_accessible_description_set(row, text.c_str());
  tavro_compose_size_refresh(ad);
}

void _changed_cb(appdata *ad) {
  if (!ad->problem_view) return;
  if (_state(ad) == TAVRO_SYSTEM_LOG_OFF) _is_wanted = false;  // taken off in the list of what is sent
  _show(ad);
  tavro_compose_keeper_note();
  tavro_compose_send_log_changed(ad);
}

void _switched_cb(void *data, Evas_Object *row, void *) {
  appdata *ad = static_cast<appdata *>(data);
  if (!ad->problem_view) return;
  _was_switched = true;
  _is_wanted = elm_check_state_get(row);
  tavro_compose_log_update(ad);
}

Eina_Bool _first_update_cb(void *data) {
  _first_update = nullptr;
  tavro_compose_log_update(static_cast<appdata *>(data));
  return ECORE_CALLBACK_CANCEL;
}

// Also where the window ends with the screen in it. A newer screen's timer is left alone.
void _row_deleted_cb(void *timer, Evas *, Evas_Object *, void *) {
  if (timer != _first_update || !_first_update) return;
  ecore_timer_del(_first_update);
  _first_update = nullptr;
}

}  // namespace

void tavro_compose_log_build(appdata *ad, problem_view_win *view, Evas_Object *box) {
  _was_switched = false;
  _is_wanted = view->syslog_filepath || tavro_preference_flag(TAVRO_PREF_ATTACH_LOGS, false);
  Evas_Object *row = view->log_row = view->collectBtn = elm_check_add(box);
  elm_object_style_set(row, "tavro_switch");
  tavro_fill_width(row);
  elm_object_text_set(row, tavro_text("IDS_OB_BODY_SYSTEM_LOG"));
  elm_atspi_accessible_name_set(row, tavro_text("IDS_OB_BODY_SYSTEM_LOG"));
  elm_object_part_content_set(row, "elm.swallow.content", tavro_icon_add(row, "log"));
  evas_object_smart_callback_add(row, "changed", _switched_cb, ad);
  evas_object_show(row);
  elm_box_pack_end(box, row);
  _show(ad);
  tavro_system_log_watch(_changed_cb);
  if (_first_update) ecore_timer_del(_first_update);  // of a screen whose window is still on its way out
  _first_update = ecore_timer_add(kFirstUpdateSeconds, _first_update_cb, ad);
  evas_object_event_callback_add(row, EVAS_CALLBACK_DEL, _row_deleted_cb, _first_update);
}

void tavro_compose_log_want(appdata *ad) {
  if (ad->problem_view && ad->problem_view->log_row) _is_wanted = true;
}

void tavro_compose_log_update(appdata *ad) {
  if (!ad->problem_view || !ad->problem_view->log_row) return;
  const tavro_system_log_state state = _state(ad);
  const bool is_wanted = _is_wanted;
  if (is_wanted || _is_mandatory(ad)) {
    if (state == TAVRO_SYSTEM_LOG_FAILED) tavro_system_log_drop(ad);
    _is_wanted = is_wanted;
    if (state == TAVRO_SYSTEM_LOG_FAILED || state == TAVRO_SYSTEM_LOG_OFF) tavro_system_log_collect(ad);
  } else if (state != TAVRO_SYSTEM_LOG_OFF) {
    tavro_system_log_drop(ad);
  }
  _show(ad);
  tavro_compose_keeper_note();
}

void tavro_compose_log_hurry(appdata *ad) {
  if (!_first_update) return;
  ecore_timer_del(_first_update);
  _first_update = nullptr;
  tavro_compose_log_update(ad);
}

void tavro_compose_log_give_up(appdata *ad) {
  _is_wanted = false;
  // One that failed without leaving anything stays so, and can be tried again from its row.
  if (ad->problem_view->syslog_filepath || _state(ad) != TAVRO_SYSTEM_LOG_FAILED) tavro_system_log_drop(ad);
  _show(ad);
}

bool tavro_compose_log_was_switched() {
  return _was_switched;
}

void tavro_compose_log_end() {
  if (_first_update) ecore_timer_del(_first_update);
  _first_update = nullptr;
  tavro_system_log_watch(nullptr);
}

log_stand tavro_compose_log_stand(const appdata *ad) {
  if (!ad->problem_view) return log_stand::settled;
  switch (_state(ad)) {
    case TAVRO_SYSTEM_LOG_COLLECTING:
      return log_stand::awaited;
    case TAVRO_SYSTEM_LOG_READY:
      return log_stand::settled;
    case TAVRO_SYSTEM_LOG_FAILED:
      return log_stand::failed;
    case TAVRO_SYSTEM_LOG_OFF:
      break;
  }
  // One that could not even be asked for.
  return _is_mandatory(ad) ? log_stand::failed : log_stand::settled;
}
