#include "notification.h"

#include <new>
#include <utility>

#include "app_control_internal.h"
#include "app_core.h"
#include "notification_requests.h"
#include "scoped.h"

namespace {

using namespace platform;

constexpr int kToastMs = 1500;

}  // namespace

struct _notification {
  NotificationContent content;
  bool is_posted = false;
};

namespace {

// Each notification is kept under a tag, so that others than this handle can reach it.
void take_tag(notification_h noti) {
  if (!noti->content.tag.empty()) return;
  const ScopedGText unique(g_uuid_string_random());
  noti->content.tag = std::string("untagged ") + unique.get();
}

bool is_text(const char *text) {
  return !text || g_utf8_validate(text, -1, nullptr);
}

}  // namespace

notification_h notification_create(notification_type_e type) {
  if (type != NOTIFICATION_TYPE_NOTI && type != NOTIFICATION_TYPE_ONGOING) return nullptr;
  auto *noti = new (std::nothrow) _notification;
  if (!noti) return nullptr;
  noti->content.type = type;
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
  const auto *request = static_cast<app_control_h>(option);
  const ScopedVariant arguments(g_variant_ref_sink(launch_arguments(*request)));
  const ScopedGText printed(g_variant_print(arguments.get(), FALSE));
  noti->content.receiver = request->app_id.value_or(application_id());
  noti->content.request = printed.get();
  return NOTIFICATION_ERROR_NONE;
}

int notification_set_progress(notification_h noti, double percentage) {
  if (!noti || !(percentage >= 0.0 && percentage <= 1.0)) return NOTIFICATION_ERROR_INVALID_PARAMETER;
  noti->content.progress = percentage;
  return NOTIFICATION_ERROR_NONE;
}

int notification_set_tag(notification_h noti, const char *tag) {
  if (!noti || !tag || !*tag || !is_text(tag)) return NOTIFICATION_ERROR_INVALID_PARAMETER;
  noti->content.tag = tag;
  return NOTIFICATION_ERROR_NONE;
}

notification_h notification_load_by_tag(const char *tag) {
  if (!tag || !*tag || !is_text(tag)) return nullptr;
  const std::optional<int> type = shown_notification_type(tag);
  notification_h noti = type ? notification_create(static_cast<notification_type_e>(*type)) : nullptr;
  if (!noti) return nullptr;
  noti->content.tag = tag;
  noti->is_posted = true;
  return noti;
}

int notification_post(notification_h noti) {
  if (!noti) return NOTIFICATION_ERROR_INVALID_PARAMETER;
  take_tag(noti);
  noti->is_posted = true;
  show_notification(noti->content);
  return NOTIFICATION_ERROR_NONE;
}

int notification_update(notification_h noti) {
  return notification_post(noti);
}

int notification_delete(notification_h noti) {
  if (!noti) return NOTIFICATION_ERROR_INVALID_PARAMETER;
  if (!noti->is_posted) return NOTIFICATION_ERROR_NOT_EXIST_ID;
  close_notification(noti->content.tag);
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
  show_notification(std::move(content));
  return NOTIFICATION_ERROR_NONE;
}
