#include "tavro_notifications.h"

#include <badge.h>
#include <notification.h>

#include <cstring>
#include <string>
#include <utility>
#include <vector>

#include "tavro-common.h"
#include "tavro-main.h"
#include "tavro_app_control_handle.h"
#include "tavro_dbmgr.h"
#include "tavro_handles.h"
#include "tavro_log.h"
#include "tavro_preferences.h"

namespace {

constexpr glong kContentCharacters = 200;
constexpr char kClientName[] = "Vantor Community";

using ScopedNotification = TavroHandle<std::remove_pointer_t<notification_h>, notification_free>;

void _log_failure(const char *call, int ret) {
  if (ret != NOTIFICATION_ERROR_NONE) TAVRO_LOGE("%s failed: %d, %s", call, ret, get_error_message(ret));
}

// A notification shows a few lines, while a report or a reply may be a book.
std::string _shortened(const char *text) {
  if (g_utf8_strlen(text, -1) <= kContentCharacters) return text;
  return std::string(text, static_cast<const char *>(g_utf8_offset_to_pointer(text, kContentCharacters))) +
         "…";
}

// What the store holds need not be UTF-8, which a notification is.
void _set_text(notification_h noti, notification_text_type_e type, const char *text) {
  const TavroGText valid(g_utf8_make_valid(text, -1));
  _log_failure("notification_set_text", notification_set_text(noti, type, _shortened(valid.get()).c_str(),
                                                              nullptr, NOTIFICATION_VARIABLE_TYPE_NONE));
}

void _set_texts(notification_h noti, const char *title, const char *content) {
  _set_text(noti, NOTIFICATION_TEXT_TYPE_TITLE, title);
  if (content) _set_text(noti, NOTIFICATION_TEXT_TYPE_CONTENT, content);
}

using Extras = std::vector<std::pair<const char *, std::string>>;

// What a touch of the notification sends to the client, beside that it was touched.
Extras _about_report(int voc_id) {
  Extras extras = {{TAVRO_NOTIFICATION_TYPE, TAVRO_NOTIFICATION_VOC}};
  if (voc_id > 0) extras.emplace_back(TAVRO_NOTIFICATION_VOC_ID, std::to_string(voc_id));
  return extras;
}

void _set_click(notification_h noti, const Extras &extras) {
  int ret = APP_CONTROL_ERROR_NONE;
  const TavroRequest click = tavro_request_create(&ret);
  if (!click) {
    TAVRO_LOGE("app_control_create failed: %d, %s", ret, get_error_message(ret));
    return;
  }
  app_control_set_operation(click.get(), APP_CONTROL_OPERATION_DEFAULT);
  app_control_set_app_id(click.get(), TAVRO_APP_ID);
  app_control_add_extra_data(click.get(), TAVRO_NOTIFICATION_EVENT, TAVRO_NOTIFICATION_CLICKED);
  for (const auto &[key, value] : extras) app_control_add_extra_data(click.get(), key, value.c_str());
  _log_failure("notification_set_launch_option",
               notification_set_launch_option(noti, NOTIFICATION_LAUNCH_OPTION_APP_CONTROL, click.get()));
}

ScopedNotification _make(notification_type_e type, const char *title, const char *content, int voc_id) {
  ScopedNotification noti(notification_create(type));
  if (!noti) {
    TAVRO_LOGE("notification_create failed");
    return nullptr;
  }
  _set_texts(noti.get(), title, content);
  _set_click(noti.get(), _about_report(voc_id));
  return noti;
}

std::string _reply_tag(int voc_id) {
  return "TAVRO_REPLY_" + std::to_string(voc_id);
}

// The news under this tag, whoever posted them, have these texts now. Without a tag they are news of their
// own.
void _post_news(const std::string &tag, const char *title, const char *content, const Extras &extras) {
  if (!tavro_preference_flag(TAVRO_PREF_NOTIFY, true)) {
    TAVRO_LOGD("notifications are switched off");
    return;
  }
  ScopedNotification noti(tag.empty() ? nullptr : notification_load_by_tag(tag.c_str()));
  const bool is_known = static_cast<bool>(noti);
  if (!is_known) noti.reset(notification_create(NOTIFICATION_TYPE_NOTI));
  if (!noti) {
    TAVRO_LOGE("notification_create failed");
    return;
  }
  if (!is_known && !tag.empty())
    _log_failure("notification_set_tag", notification_set_tag(noti.get(), tag.c_str()));
  _set_texts(noti.get(), title, content);
  _set_click(noti.get(), extras);
  _log_failure("notification_post",
               is_known ? notification_update(noti.get()) : notification_post(noti.get()));
}

}  // namespace

void tavro_create_notification(const char *title, const char *content, appdata *ad) {
  const bool is_sending = std::strcmp(title, tavro_text("IDS_OB_TPOP_SENDING_FEEDBACK_ING_ABB")) == 0;
  tavro_remove_sending_notification(ad);
  ScopedNotification noti =
      _make(is_sending ? NOTIFICATION_TYPE_ONGOING : NOTIFICATION_TYPE_NOTI, title, content, 0);
  if (!noti) return;
  _log_failure("notification_post", notification_post(noti.get()));
  if (is_sending) ad->noti = noti.release();
}

void tavro_remove_sending_notification(appdata *ad) {
  // A client that was started by the result itself has no handle of the one that its forerunner posted.
  if (!ad->noti) {
    _log_failure("notification_delete_all", notification_delete_all(NOTIFICATION_TYPE_ONGOING));
    return;
  }
  _log_failure("notification_delete", notification_delete(ad->noti));
  notification_free(ad->noti);
  ad->noti = nullptr;
}

void tavro_create_push_notification(const char *reply, int voc_id) {
  const char *title = tavro_text(reply ? "IDS_OB_MBODY_NEW_REPLY" : "IDS_OB_MBODY_REPORT_UPDATED");
  _post_news(voc_id > 0 ? _reply_tag(voc_id) : "", title, reply, _about_report(voc_id));
}

void tavro_remove_reply_notification(int voc_id) {
  const ScopedNotification noti(notification_load_by_tag(_reply_tag(voc_id).c_str()));
  if (noti) _log_failure("notification_delete", notification_delete(noti.get()));
}

void tavro_create_non_voc_notification(const char *title, const char *content, const char *beta_id,
                                       const char *noti_id) {
  Extras extras = {{TAVRO_NOTIFICATION_TYPE, TAVRO_NOTIFICATION_NONVOC}};
  if (beta_id) extras.emplace_back(TAVRO_NOTIFICATION_BETA_ID, beta_id);
  if (noti_id) extras.emplace_back(TAVRO_NOTIFICATION_NOTI_ID, noti_id);
  const bool has_id = noti_id && *noti_id;
  _post_news(has_id ? std::string("TAVRO_NEWS_") + noti_id : "", title && *title ? title : kClientName,
             content, extras);
}

void tavro_create_noti_badge_on_appicon(int count) {
  int ret = badge_add(TAVRO_APP_ID);
  if (ret == BADGE_ERROR_NONE || ret == BADGE_ERROR_ALREADY_EXIST) {
    ret = badge_set_count(TAVRO_APP_ID, static_cast<unsigned>(count > 0 ? count : 0));
  }
  if (ret != BADGE_ERROR_NONE) TAVRO_LOGE("badge failed: %d, %s", ret, get_error_message(ret));
}

void tavro_remove_noti_badge_on_appicon() {
  const int ret = badge_remove(TAVRO_APP_ID);
  if (ret != BADGE_ERROR_NONE && ret != BADGE_ERROR_NOT_EXIST) {
    TAVRO_LOGE("badge_remove failed: %d, %s", ret, get_error_message(ret));
  }
}

void tavro_refresh_unread_count(appdata *ad, const char *user_name) {
  const int count = tavro_dbmgr_get_unread_push_notification_count(user_name);
  ad->push_noti_count = count > 0 ? count : 0;
  tavro_remove_noti_badge_on_appicon();
  if (count > 0) tavro_create_noti_badge_on_appicon(count);
}
