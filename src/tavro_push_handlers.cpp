#include "tavro_push_handlers.h"

#include <notification.h>

#include <cstring>
#include <ctime>

#include "tavro-common.h"
#include "tavro-main.h"
#include "tavro_appdata.h"
#include "tavro_compose.h"
#include "tavro_dbmgr.h"
#include "tavro_dbmgr_catalogue.h"
#include "tavro_handles.h"
#include "tavro_history.h"
#include "tavro_log.h"
#include "tavro_memory.h"
#include "tavro_not_yet.h"
#include "tavro_notifications.h"
#include "tavro_preferences.h"
#include "tavro_request.h"
#include "tavro_screens.h"
#include "tavro_service_keys.h"
#include "tavro_share.h"
#include "tavro_sign_out.h"
#include "tavro_start.h"
#include "tavro_system_log.h"

namespace {

constexpr int kNoCode = -1;
constexpr unsigned long long kMillisecondsPerSecond = 1000;

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

// Which of the catalogue's notifications and programmes a message is about; null texts when it does not say.
struct news_ids {
  TavroText beta_id, noti_id;
};

news_ids _read_news(app_control_h service) {
  return {tavro_request_text(service, TAVRO_NOTIFICATION_BETA_ID),
          tavro_request_text(service, TAVRO_NOTIFICATION_NOTI_ID)};
}

using TavroNews = TavroHandle<tavro_dbmgr_notification_details, tavro_dbmgr_free_non_voc_ntfctn_details>;

bool _is_worth_telling(const tavro_dbmgr_notification_details *news) {
  const auto now = static_cast<unsigned long long>(std::time(nullptr)) * kMillisecondsPerSecond;
  const bool is_expired = news->ntfctn_expiry_time != 0 && news->ntfctn_expiry_time < now;
  if (news->ntfctn_read_status || is_expired) {
    TAVRO_LOGD("notification %ld is %s", news->ntfctn_id, is_expired ? "expired" : "read");
  }
  return !news->ntfctn_read_status && !is_expired;
}

// The service stores what there is to tell before it says so. False when the store does not know it.
bool _post_news(const news_ids &ids) {
  const long id = tavro_server_id_from_text(ids.noti_id.get());
  const TavroNews news(id > 0 ? tavro_dbmgr_get_non_voc_ntfctn_details(id) : nullptr);
  if (!news) {
    TAVRO_LOGD("notification %ld is not in the store", id);
    return false;
  }
  if (_is_worth_telling(news.get())) {
    tavro_create_non_voc_notification(news->ntfctn_title, news->ntfctn_message, ids.beta_id.get(),
                                      ids.noti_id.get());
  }
  return true;
}

void _post_beta_news(const news_ids &ids) {
  const long id = tavro_server_id_from_text(ids.beta_id.get());
  const TavroText name(id > 0 ? tavro_dbmgr_get_beta_name(id) : nullptr);
  if (!name) return;
  tavro_create_non_voc_notification(tavro_text("IDS_OB_MBODY_BETA_NEWS"), name.get(), ids.beta_id.get(),
                                    ids.noti_id.get());
}

// A touched notification counts as read: itself, or all that is told about its programme.
void _mark_news_read(const char *beta_id, const char *noti_id) {
  const long noti = tavro_server_id_from_text(noti_id), beta = tavro_server_id_from_text(beta_id);
  if (noti > 0) {
    tavro_dbmgr_mark_nonvoc_notification_as_read(noti, TAVRO_NTFCTN_KEY_ID);
  } else if (beta > 0) {
    tavro_dbmgr_mark_nonvoc_notification_as_read(beta, TAVRO_NTFCTN_KEY_TYPE_ID);
  }
}

// False when the notification was about no report in particular.
bool _open_report(app_control_h request, appdata *ad) {
  const TavroText id_text = tavro_request_text(request, TAVRO_NOTIFICATION_VOC_ID);
  const int voc_id = tavro_record_id_from_text(id_text.get());
  if (voc_id == 0) return false;
  const TavroHandle<svc_voc_data, tavro_dbmgr_free_voc_data> voc(tavro_dbmgr_get_voc_by_id(voc_id));
  if (!voc) {
    TAVRO_LOGD("report %d is not in the store", voc_id);
    notification_status_message_post(tavro_text("IDS_OB_TPOP_REPORT_IS_GONE"));
  } else {
    tavro_create_history_details_page(ad, voc_id);
  }
  return true;
}

// The history may lie below a report that was opened from it; a page that is written on stays in front.
void _uncover_history(appdata *ad) {
  if (ad->history_ad && !tavro_compose_view(ad)) elm_naviframe_item_pop_to(ad->history_ad->history_nf_it);
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
  _post_news(_read_news(service));
  tavro_refresh_beta_pages(ad, "notifications that concern no report");
}

void tavro_handle_beta_push_noti(app_control_h service, appdata *ad) {
  _log_request(service);
  const news_ids ids = _read_news(service);
  if (!_post_news(ids)) _post_beta_news(ids);
  tavro_refresh_beta_pages(ad, "beta notifications");
}

void tavro_handle_log_dump_event(app_control_h service, appdata *ad) {
  _log_request(service);
  tavro_take_dump_log(service, ad);
}

void tavro_handle_share_event(app_control_h service, appdata *ad) {
  tavro_handle_welcome_page(ad);
  tavro_attach_shared_files(service, ad);
}

void tavro_handle_notification_event(app_control_h request, appdata *ad, const char *type,
                                     const char *beta_id, const char *noti_id) {
  tavro_handle_welcome_page(ad);
  if (type && std::strcmp(type, TAVRO_NOTIFICATION_NONVOC) == 0) {
    TAVRO_LOGD("touched notification %s of beta %s", noti_id ? noti_id : "(null)",
               beta_id ? beta_id : "(null)");
    _mark_news_read(beta_id, noti_id);
    tavro_refresh_beta_pages(ad, "the view of beta notifications");
    return;
  }
  const bool is_signed_in = static_cast<bool>(tavro_get_username_from_preference());
  if (!ad->win || !is_signed_in || !type || std::strcmp(type, TAVRO_NOTIFICATION_VOC) != 0) return;
  tavro_create_history_page(ad);
  if (!_open_report(request, ad)) _uncover_history(ad);
}

void tavro_create_server_connection_fail_popup(appdata *ad) {
  tavro_popup_show(ad, &ad->connection_popup, tavro_text("IDS_OB_HEADER_CONNECTION_FAILED"),
                   tavro_text("IDS_OB_POP_REPORT_IS_SENT_LATER"),
                   {{tavro_text("IDS_OB_BUTTON_OK"), nullptr}});
}
