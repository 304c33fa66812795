#include "tavro_push_handlers.h"

#include <cstring>

#include "tavro-common.h"
#include "tavro-main.h"
#include "tavro_appdata.h"
#include "tavro_dbmgr.h"
#include "tavro_handles.h"
#include "tavro_log.h"
#include "tavro_memory.h"
#include "tavro_not_yet.h"
#include "tavro_notifications.h"
#include "tavro_preferences.h"
#include "tavro_request.h"
#include "tavro_screens.h"
#include "tavro_service_keys.h"
#include "tavro_share.h"
#include "tavro_start.h"
#include "tavro_system_log.h"

namespace {

constexpr int kNoCode = -1;

// The service's answer to a request about beta programmes or the account. `message_key` may be null.
void _log_answer(const char *code_key, const char *message_key) {
  const TavroText message = message_key ? tavro_preference_text(message_key) : nullptr;
  TAVRO_LOGD("%s:%d %s", code_key, tavro_preference_int(code_key, kNoCode), message ? message.get() : "");
}

bool _log_extra(app_control_h service, const char *key, void *) {
  const TavroText value = tavro_request_text(service, key);
  TAVRO_LOGD("%s:%s", key, value ? value.get() : "(null)");
  return true;
}

void _log_request(app_control_h service) {
  app_control_foreach_extra_data(service, _log_extra, nullptr);
}

void _open_report(app_control_h request, appdata *ad) {
  const TavroText id_text = tavro_request_text(request, TAVRO_NOTIFICATION_VOC_ID);
  const int voc_id = tavro_record_id_from_text(id_text.get());
  if (voc_id == 0) return;
  const TavroHandle<svc_voc_data, tavro_dbmgr_free_voc_data> voc(tavro_dbmgr_get_voc_by_id(voc_id));
  if (!voc) {
    TAVRO_LOGD("report %d is not in the store", voc_id);
    return;
  }
  tavro_create_history_details_page(ad, voc_id);
}

}  // namespace

void tavro_handle_push_notifications(app_control_h service, appdata *ad) {
  const TavroText id_text = tavro_request_text(service, TAVRO_SERVER_PUSH_NOTI_VOC_ID);
  const int voc_id = tavro_record_id_from_text(id_text.get());
  tavro_update_history_page(service, ad);
  if (voc_id > 0) tavro_update_history_details_page(ad, voc_id);
}

void tavro_handle_community_replies(appdata *ad) {
  const TavroText count = tavro_preference_text(TAVRO_PREF_COMM_NUM_REPLIES);
  TAVRO_LOGD("unread community replies:%s", count ? count.get() : "(null)");
  tavro_refresh_beta_pages(ad, "the badge of the community pages");
}

void tavro_handle_banner_info(app_control_h service, appdata *ad) {
  _log_request(service);
  tavro_refresh_banners(ad);
}

void tavro_handle_beta_join(app_control_h, appdata *ad) {
  _log_answer(TAVRO_PREF_JOIN_BETA_STATUS_CODE, TAVRO_PREF_JOIN_BETA_STATUS_MSG);
  tavro_refresh_beta_pages(ad, "joining the beta programme");
}

void tavro_handle_beta_details(app_control_h service, appdata *ad) {
  _log_request(service);
  tavro_refresh_beta_pages(ad, "the details of a beta programme");
}

void tavro_handle_quit_beta(app_control_h, appdata *ad) {
  _log_answer(TAVRO_PREF_QUIT_BETA_STATUS_CODE, TAVRO_PREF_QUIT_BETA_STATUS_MSG);
  tavro_refresh_beta_pages(ad, "quitting the beta programme");
}

void tavro_handle_opt_in_beta(app_control_h, appdata *ad) {
  _log_answer(TAVRO_PREF_OPT_IN_STATUS_CODE, nullptr);
  tavro_refresh_beta_pages(ad, "opting in to a beta");
}

void tavro_handle_opt_out_beta(app_control_h, appdata *ad) {
  _log_answer(TAVRO_PREF_OPT_OUT_STATUS_CODE, TAVRO_PREF_OPT_OUT_STATUS_MSG);
  tavro_refresh_beta_pages(ad, "opting out of a beta");
}

void tavro_handle_user_beta_status(app_control_h, appdata *ad) {
  _log_answer(TAVRO_PREF_BETA_USER_STATUS_CODE, TAVRO_PREF_BETA_USER_STATUS_MSG);
  tavro_refresh_beta_pages(ad, "the user's beta status");
}

void tavro_handle_user_logout(app_control_h, appdata *ad) {
  _log_answer(TAVRO_PREF_LOG_OUT_STATUS_CODE, TAVRO_PREF_LOG_OUT_STATUS_MSG);
  tavro_sign_out(ad);
}

void tavro_handle_non_voc_push_noti(app_control_h service, appdata *ad) {
  _log_request(service);
  tavro_refresh_beta_pages(ad, "notifications that concern no report");
}

void tavro_handle_beta_push_noti(app_control_h service, appdata *ad) {
  _log_request(service);
  tavro_refresh_beta_pages(ad, "beta notifications");
}

void tavro_handle_log_dump_event(app_control_h service, appdata *ad) {
  _log_request(service);
  tavro_take_dump_log(service, ad);
}

void tavro_handle_share_event(app_control_h service, appdata *ad) {
  _log_request(service);
  tavro_handle_welcome_page(ad);
  tavro_attach_shared_files(service, ad);
}

void tavro_handle_notification_event(app_control_h request, appdata *ad, const char *type,
                                     const char *beta_id, const char *noti_id) {
  tavro_handle_welcome_page(ad);
  if (type && std::strcmp(type, TAVRO_NOTIFICATION_NONVOC) == 0) {
    TAVRO_LOGD("touched notification %s of beta %s", noti_id ? noti_id : "(null)",
               beta_id ? beta_id : "(null)");
    tavro_refresh_beta_pages(ad, "the view of beta notifications");
    return;
  }
  const bool is_signed_in = static_cast<bool>(tavro_get_username_from_preference());
  if (!ad->win || !is_signed_in || !type || std::strcmp(type, TAVRO_NOTIFICATION_VOC) != 0) return;
  tavro_create_history_page(ad);
  _open_report(request, ad);
}

void tavro_create_server_connection_fail_popup(appdata *ad) {
  tavro_popup_show(ad, &ad->connection_popup, tavro_text("IDS_OB_HEADER_CONNECTION_FAILED"),
                   tavro_text("IDS_OB_POP_REPORT_IS_SENT_LATER"),
                   {{tavro_text("IDS_OB_BUTTON_OK"), nullptr}});
}
