#include "notification.h"

#include <dlog.h>
#include <glib.h>

#include <memory>
#include <new>
#include <utility>

#include "notification_server.h"

namespace {

using namespace platform;

constexpr int kToastMs = 1500;

struct DestroyRequest {
  void operator()(app_control_h request) const { app_control_destroy(request); }
};
using LaunchOption = std::shared_ptr<app_control_s>;

}  // namespace

struct _notification {
  notification_type_e type;
  NotificationContent content;
  LaunchOption launch_option;
  std::shared_ptr<PostedNotification> posted;  // null: never posted
};

namespace {

void show(notification_h noti) {
  if (!noti->posted) noti->posted = std::make_shared<PostedNotification>();
  noti->posted->type = noti->type;
  noti->posted->touched = nullptr;
  if (noti->launch_option) {
    noti->posted->touched = [option = noti->launch_option] {
      const int result = app_control_send_launch_request(option.get(), nullptr, nullptr);
      if (result != APP_CONTROL_ERROR_NONE) {
        dlog_print(DLOG_ERROR, "PLATFORM", "a touched notification launched nothing: %s",
                   get_error_message(result));
      }
    };
  }
  show_notification(noti->posted, noti->content);
}

bool is_text(const char *text) {
  return !text || g_utf8_validate(text, -1, nullptr);
}

}  // namespace

notification_h notification_create(notification_type_e type) {
  if (type != NOTIFICATION_TYPE_NOTI && type != NOTIFICATION_TYPE_ONGOING) return nullptr;
  auto *noti = new (std::nothrow) _notification{type, {}, nullptr, nullptr};
  if (!noti) return nullptr;
  noti->content.is_ongoing = type == NOTIFICATION_TYPE_ONGOING;
  // What is going on stays until it is over; for how long news are shown is the desktop's to say.
  noti->content.expire_ms = noti->content.is_ongoing ? 0 : -1;
  return noti;
}

int notification_free(notification_h noti) {
  if (!noti) return NOTIFICATION_ERROR_INVALID_PARAMETER;
  delete noti;
  return NOTIFICATION_ERROR_NONE;
}

int notification_set_text(notification_h noti, notification_text_type_e type, const char *text, const char *,
                          int args_type, ...) {
  if (!noti || !is_text(text) || args_type != NOTIFICATION_VARIABLE_TYPE_NONE) {
    return NOTIFICATION_ERROR_INVALID_PARAMETER;
  }
  if (type == NOTIFICATION_TEXT_TYPE_TITLE) {
    noti->content.title = text ? text : "";
  } else if (type == NOTIFICATION_TEXT_TYPE_CONTENT) {
    noti->content.body = text ? text : "";
  } else {
    return NOTIFICATION_ERROR_INVALID_PARAMETER;
  }
  return NOTIFICATION_ERROR_NONE;
}

int notification_set_image(notification_h noti, notification_image_type_e type, const char *image_path) {
  if (!noti || type != NOTIFICATION_IMAGE_TYPE_ICON || !image_path || !is_text(image_path)) {
    return NOTIFICATION_ERROR_INVALID_PARAMETER;
  }
  noti->content.icon_path = image_path;
  return NOTIFICATION_ERROR_NONE;
}

int notification_set_launch_option(notification_h noti, notification_launch_option_type type, void *option) {
  if (!noti || type != NOTIFICATION_LAUNCH_OPTION_APP_CONTROL || !option) {
    return NOTIFICATION_ERROR_INVALID_PARAMETER;
  }
  app_control_h copy = nullptr;
  if (app_control_clone(&copy, static_cast<app_control_h>(option)) != APP_CONTROL_ERROR_NONE) {
    return NOTIFICATION_ERROR_OUT_OF_MEMORY;
  }
  noti->launch_option = LaunchOption(copy, DestroyRequest());
  return NOTIFICATION_ERROR_NONE;
}

int notification_set_progress(notification_h noti, double percentage) {
  if (!noti || !(percentage >= 0.0 && percentage <= 1.0)) return NOTIFICATION_ERROR_INVALID_PARAMETER;
  noti->content.progress = percentage;
  return NOTIFICATION_ERROR_NONE;
}

int notification_post(notification_h noti) {
  if (!noti) return NOTIFICATION_ERROR_INVALID_PARAMETER;
  show(noti);
  return NOTIFICATION_ERROR_NONE;
}

int notification_update(notification_h noti) {
  return notification_post(noti);
}

int notification_delete(notification_h noti) {
  if (!noti) return NOTIFICATION_ERROR_INVALID_PARAMETER;
  if (!noti->posted) return NOTIFICATION_ERROR_NOT_EXIST_ID;
  close_notification(noti->posted);
  return NOTIFICATION_ERROR_NONE;
}

int notification_delete_all(notification_type_e type) {
  if (type != NOTIFICATION_TYPE_NOTI && type != NOTIFICATION_TYPE_ONGOING) {
    return NOTIFICATION_ERROR_INVALID_PARAMETER;
  }
  close_notifications_of_type(type);
  return NOTIFICATION_ERROR_NONE;
}

int notification_status_message_post(const char *message) {
  if (!message || !*message || !is_text(message)) return NOTIFICATION_ERROR_INVALID_PARAMETER;
  NotificationContent content;
  content.title = message;
  content.expire_ms = kToastMs;
  content.is_toast = true;
  show_notification(std::make_shared<PostedNotification>(), std::move(content));
  return NOTIFICATION_ERROR_NONE;
}
