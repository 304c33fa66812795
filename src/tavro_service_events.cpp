#include "tavro_service_events.h"

#include <algorithm>
#include <cstring>

#include "tavro-common.h"
#include "tavro-main.h"
#include "tavro_appdata.h"
#include "tavro_dbmgr.h"
#include "tavro_follow_up.h"
#include "tavro_log.h"
#include "tavro_memory.h"
#include "tavro_notifications.h"
#include "tavro_preferences.h"
#include "tavro_push_handlers.h"
#include "tavro_report_delete.h"
#include "tavro_report_files.h"
#include "tavro_request.h"
#include "tavro_screens.h"
#include "tavro_version_check.h"

namespace {

const char *_or_null(const TavroText &text) {
  return text ? text.get() : "(null)";
}

bool _equals(const TavroText &text, const char *expected) {
  return text && std::strcmp(text.get(), expected) == 0;
}

// One kind of event; a request that does not carry it is logged and examined further.
TavroText _read_event(app_control_h service, const char *key, const char *what) {
  int error = APP_CONTROL_ERROR_NONE;
  TavroText value = tavro_request_text(service, key, &error);
  if (value) {
    TAVRO_LOGD("%s:%s", what, value.get());
  } else {
    TAVRO_LOGD("app_control_get_extra_data(%s) failed:%d", what, error);
  }
  return value;
}

TavroText _read_user_name() {
  TavroText user_name = tavro_get_username_from_preference();
  TAVRO_LOGD("user_name:%s", _or_null(user_name));
  return user_name;
}

void _take_community_replies(app_control_h service, appdata *ad) {
  const TavroText replies = _read_event(service, TAVRO_COMM_PUSH, "community_replies");
  if (_equals(replies, TAVRO_PUSH_NUM_REPLIES)) tavro_handle_community_replies(ad);
}

// False when the client must be replaced first: the rest of the request is then left alone.
bool _take_version(app_control_h service, appdata *ad) {
  const TavroText version = _read_event(service, TAVRO_APP_UPDATE_STATUS, "version_updated");
  if (!version) return true;
  const int update = check_version_update(ad);
  TAVRO_LOGD("ret value :%d", update);
  if (update != TAVRO_UPDATE_MANDATORY) return true;
  TAVRO_LOGD("update is mandatory");
  return false;
}

void _take_upload_result(app_control_h service, appdata *ad) {
  const TavroText status = _read_event(service, TAVRO_SERVER_UPLOAD_STATUS, "upload_status");
  if (status) tavro_handle_upload_status(service, ad, status.get());
}

void _take_push_replies(app_control_h service, appdata *ad) {
  const TavroText status = _read_event(service, TAVRO_SERVER_PUSH_NOTI_STATUS, "push_noti_status");
  if (!_equals(status, TAVRO_SERVER_PUSH_NOTI_UPDATED)) return;
  tavro_handle_badge_notifications(service, ad);
  tavro_handle_push_notifications(service, ad);
}

void _refresh_screens(app_control_h service, appdata *ad, int voc_id) {
  tavro_update_history_page(service, ad);
  if (voc_id > 0) tavro_update_history_details_page(ad, voc_id);
}

// A report whose deletion waits is gone for the person, and nothing is told about it.
bool _is_hidden(int voc_id) {
  return voc_id > 0 && tavro_delete_is_waiting(voc_id);
}

// Reports of whoever used the phone before are sent, and answered, after they signed out.
bool _is_of_another(int voc_id) {
  const TavroVoc voc(voc_id > 0 ? tavro_dbmgr_get_voc_by_id(voc_id) : nullptr);
  return voc && !tavro_is_for_signed_in_user(voc->user_name);
}

void _upload_succeeded(appdata *ad, int voc_id, const char *description, const char *user_name) {
  TAVRO_LOGD("successfully uploaded");
  if (ad->connection_popup) evas_object_del(ad->connection_popup);  // What it says is no longer so.
  if (voc_id > 0) {
    tavro_delete_dump_file(voc_id);
    tavro_delete_syslog_file(voc_id);
  }
  if (user_name && !_is_hidden(voc_id) && !_is_of_another(voc_id))
    tavro_create_notification(tavro_text("IDS_OB_MBODY_FEEDBACK_SENT"), description, ad);
  if (!ad->win) tavro_request_exit(ad);
}

void _upload_failed(appdata *ad, int voc_id, const char *description, const char *user_name) {
  if (!user_name || _is_hidden(voc_id)) return;
  TAVRO_LOGD("launch error popup");
  tavro_create_server_connection_fail_popup(ad);
  if (!_is_of_another(voc_id))
    tavro_create_notification(tavro_text("IDS_OB_TMBODY_SENDING_FAILED"), description, ad);
}

}  // namespace

void tavro_handle_service_updates(app_control_h service, appdata *ad) {
  _take_community_replies(service, ad);
  if (!_take_version(service, ad)) return;
  _take_upload_result(service, ad);
  _take_push_replies(service, ad);
}

void tavro_handle_upload_status(app_control_h service, appdata *ad, const char *upload_status) {
  const TavroText id_text = tavro_request_text(service, TAVRO_SERVER_PUSH_NOTI_VOC_ID);
  TAVRO_LOGD("voc_id:%s", _or_null(id_text));
  const int voc_id = tavro_record_id_from_text(id_text.get());
  TavroText description;
  if (voc_id > 0) {
    description.reset(tavro_dbmgr_get_voc_description_by_id(voc_id));
    TAVRO_LOGD("content:%s", _or_null(description));
  }
  const TavroText user_name = _read_user_name();
  if (std::strcmp(upload_status, TAVRO_SERVER_UPLOAD_SUCCESS) == 0) {
    _upload_succeeded(ad, voc_id, description.get(), user_name.get());
  } else if (std::strcmp(upload_status, TAVRO_SERVER_UPLOAD_FAIL) == 0) {
    _upload_failed(ad, voc_id, description.get(), user_name.get());
  } else {
    return;
  }
  _refresh_screens(service, ad, voc_id);
}

void tavro_handle_badge_notifications(app_control_h service, appdata *ad) {
  const TavroText user_name = _read_user_name();
  const TavroText reply = tavro_request_text(service, TAVRO_SERVER_PUSH_NOTI_VOC_COMMENTS);
  if (!reply) TAVRO_LOGD("Null voc_comments");
  const int count = user_name ? tavro_dbmgr_get_unread_push_notification_count(user_name.get()) : 0;
  // A store that cannot be counted keeps the count that was known, and the reply is told all the same.
  const bool is_counted = count >= 0;
  if (user_name) ad->push_noti_count = is_counted ? count : std::max(ad->push_noti_count, 0);
  if (is_counted && ad->push_noti_count < 1) return;
  if (ad->push_noti_count >= 1) {
    tavro_remove_noti_badge_on_appicon();
    tavro_create_noti_badge_on_appicon(ad->push_noti_count);
  }
  const TavroText id_text = tavro_request_text(service, TAVRO_SERVER_PUSH_NOTI_VOC_ID);
  const int voc_id = tavro_record_id_from_text(id_text.get());
  if (!_is_hidden(voc_id) && !_is_of_another(voc_id)) tavro_create_push_notification(reply.get(), voc_id);
  if (ad->layout) {
    tavro_update_landing_page_history_badge(ad);
  } else {
    tavro_request_exit(ad);
  }
}
