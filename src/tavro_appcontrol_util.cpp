#include "tavro_appcontrol_util.h"

#include <cstring>
#include <initializer_list>

#include "tavro-main.h"
#include "tavro_appdata.h"
#include "tavro_capture.h"
#include "tavro_crash_report.h"
#include "tavro_launch_tables.h"
#include "tavro_log.h"
#include "tavro_memory.h"
#include "tavro_not_yet.h"
#include "tavro_notifications.h"
#include "tavro_push_handlers.h"
#include "tavro_recovery.h"
#include "tavro_request.h"
#include "tavro_screens.h"
#include "tavro_service_bridge.h"
#include "tavro_service_events.h"
#include "tavro_start.h"
#include "tavro_version_check.h"

namespace {

constexpr size_t kMostSteps = 3;

using step = void (*)(app_control_h request, appdata *ad);

struct operation_row {
  const char *operation;  // null matches any
  const char *log_line;   // null: none
  step steps[kMostSteps];
};

void _capture_failed(app_control_h, appdata *ad) {
  tavro_cpmgr_on_get_error_cb(0, ad);
}

void _null_window(app_control_h, appdata *ad) {
  tavro_handle_null_window(ad);
}

void _load_url(app_control_h, appdata *ad) {
  tavro_load_url(ad, 0);
}

void _load_known_url(app_control_h, appdata *ad) {
  if (ad->load_urls_to_webview == 1) tavro_load_url(ad, 1);
}

// A client that was started for a message alone does not stay behind without a window.
void _exit_without_window(app_control_h, appdata *ad) {
  if (ad->win || ad->crash_popup || tavro_version_popup_is_up(ad) || ad->crashed_appname) return;
  TAVRO_LOGD("dump log inside exit");
  tavro_request_exit(ad);
}

TavroText _read_extra(app_control_h request, const char *key, const char *what) {
  int error = APP_CONTROL_ERROR_NONE;
  TavroText value = tavro_request_text(request, key, &error);
  if (value) {
    TAVRO_LOGD("%s:%s", what, value.get());
  } else {
    TAVRO_LOGD("app_control_get_extra_data(%s) failed:%d", what, error);
  }
  return value;
}

void _ordinary_start(appdata *ad) {
  _tavro_launch_upload_mgr_svc(TAVRO_OPERATION_TYPE_GET_USER_BETA_STATUS, 0);
  _tavro_launch_upload_mgr_svc(TAVRO_OPERATION_TYPE_GET_MODEL_ALIAS_STATUS, 0);
  tavro_handle_welcome_page(ad);
}

void _notification_click(app_control_h request, appdata *ad) {
  const TavroText type = tavro_request_text(request, TAVRO_NOTIFICATION_TYPE);
  if (!type || std::strcmp(type.get(), TAVRO_NOTIFICATION_NONVOC) != 0) {
    tavro_handle_notification_event(request, ad, type.get(), nullptr, nullptr);
    return;
  }
  const TavroText beta_id = _read_extra(request, TAVRO_NOTIFICATION_BETA_ID, "betaId");
  const TavroText noti_id = _read_extra(request, TAVRO_NOTIFICATION_NOTI_ID, "notiId");
  tavro_handle_notification_event(request, ad, type.get(), beta_id.get(), noti_id.get());
}

void _start_or_click(app_control_h request, appdata *ad) {
  const TavroText action = _read_extra(request, TAVRO_NOTIFICATION_EVENT, "noti_action");
  if (action && std::strcmp(action.get(), TAVRO_NOTIFICATION_CLICKED) == 0) {
    _notification_click(request, ad);
  } else {
    _ordinary_start(ad);
  }
}

// The order of the rows is part of the contract: the first that matches decides.
constexpr operation_row kRows[] = {
    {"CPMGR_ERROR", "Error received from CPMGR", {_capture_failed, _null_window}},
    {"TAVRO_GET_BETA_URLS", "beta urls obtained", {_null_window, _load_url}},
    {"TAVRO_LICENSE_URL", "License url obtained", {_null_window, _load_url}},
    {"TAVRO_BOARDS_URLS", "Boards urls obtained", {_exit_without_window, _load_known_url}},
    {"TAVRO_BANNER_INFO", "TAVRO_BANNER_INFO", {_null_window, tavro_handle_banner_info}},
    {"TAVRO_JOIN_BETA", "TAVRO_JOIN_BETA", {tavro_handle_beta_join, _null_window, tavro_handle_banner_info}},
    {"TAVRO_GET_BETA_LIST", "TAVRO_GET_BETA_LIST", {_null_window}},
    {"TAVRO_GET_BETA_DETAILS", "TAVRO_GET_BETA_DETAILS", {tavro_handle_beta_details, _null_window}},
    {"TAVRO_QUIT_BETA", "TAVRO_QUIT_BETA", {tavro_handle_quit_beta, _null_window, tavro_handle_banner_info}},
    {"TAVRO_OPT_IN_BETA", "TAVRO_OPT_IN_BETA", {tavro_handle_opt_in_beta, _null_window}},
    {"TAVRO_OPT_OUT_BETA", "TAVRO_OPT_OUT_BETA", {tavro_handle_opt_out_beta, _null_window}},
    {"TAVRO_GET_BETA_USER_STATUS",
     "TAVRO_GET_BETA_USER_STATUS",
     {tavro_handle_user_beta_status, tavro_handle_banner_info, _null_window}},
    {"TAVRO_NON_VOC_PUSH_NTFCTN",
     "TAVRO_NON_VOC_PUSH_NTFCTN",
     {tavro_handle_non_voc_push_noti, _null_window}},
    {"TAVRO_BETA_PUSH_NTFCTN", "TAVRO_BETA_PUSH_NTFCTN", {tavro_handle_beta_push_noti, _null_window}},
    {"TAVRO_USER_LOGOUT", "TAVRO_USER_LOGOUT", {tavro_handle_user_logout, _null_window}},
    {"CRASH_PROCESS", nullptr, {tavro_handle_crash_event}},
    {"DUMP_LOG_PROCESS", "dump log", {_exit_without_window, tavro_handle_log_dump_event}},
    {APP_CONTROL_OPERATION_SHARE, nullptr, {tavro_handle_share_event}},
    {"TAVRO_UPDATE_HISTORY", nullptr, {tavro_handle_service_updates, _null_window}},
    {nullptr, nullptr, {_start_or_click}},
};

TavroText _read_operation(app_control_h request) {
  char *operation = nullptr;
  const int ret = app_control_get_operation(request, &operation);
  if (ret != APP_CONTROL_ERROR_NONE) {
    TAVRO_LOGD("app_control_get_operation failed:%s", get_error_message(ret));
    operation = nullptr;
  }
  if (operation) {
    TAVRO_LOGD("op:%s", operation);
  } else {
    TAVRO_LOGD("Operation type NULL");
  }
  return TavroText(TAVRO_ADOPT(operation));
}

const operation_row &_find_row(const char *operation) {
  const operation_row *row = kRows;
  while (row->operation && (!operation || std::strcmp(operation, row->operation) != 0)) ++row;
  return *row;
}

void _ask_service_for_news() {
  for (const char *operation : {TAVRO_OPERATION_TYPE_APP_UPDATE, TAVRO_OPERATION_TYPE_GET_BETA_URLS,
                                TAVRO_OPERATION_TYPE_GET_MAX_LIMIT}) {
    _tavro_launch_upload_mgr_svc(operation, 0);
  }
}

// What came up before there was a window to show it in.
void _show_due_popups(appdata *ad) {
  if (tavro_is_ending()) return;
  tavro_show_due_version_popup(ad);
  tavro_tell_store_was_replaced(ad);
  tavro_compose_keeper_offer(ad);
}

}  // namespace

void app_control(app_control_h request, void *user_data) {
  _ask_service_for_news();
  auto *ad = static_cast<appdata *>(user_data);
  if (!ad) {
    TAVRO_LOGD("ad is NULL");
    return;
  }
  tavro_prepare_store();
  const TavroText operation = _read_operation(request);
  const operation_row &row = _find_row(operation.get());
  if (row.log_line) TAVRO_LOGD("%s", row.log_line);
  for (const step run : row.steps) {
    if (run) run(request, ad);
  }
  _show_due_popups(ad);
}

std::vector<tavro_accepted_operation> tavro_accepted_operations() {
  std::vector<tavro_accepted_operation> all;
  for (const operation_row &row : kRows) all.push_back({row.operation, row.log_line});
  return all;
}
