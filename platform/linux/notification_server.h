// The notification service of the desktop (org.freedesktop.Notifications), or the phone's own where there is
// no desktop. Keeps, for each notification, what should be shown and what the service was last told, and
// brings the two together without ever waiting. Posted ids are kept in the preference file, so that a later
// process of the application can remove them. Main loop only.
#pragma once

#include <gio/gio.h>

#include <functional>
#include <memory>
#include <optional>
#include <string>

namespace platform {

// What the person sees.
struct NotificationContent {
  std::string title, body;  // plain text
  std::string icon_path;    // empty: the application's own icon
  int expire_ms = -1;       // -1: as the service likes, 0: never
  bool is_ongoing = false;
  bool is_toast = false;
  std::optional<double> progress;  // 0.0 to 1.0
};

// One notification on its way to, or on, the person's screen. Held by whoever may change it and by the calls
// that are under way.
struct PostedNotification {
  int type = 0;                               // kept in the file so that all of a type can be removed
  std::function<void()> touched;              // may be empty
  std::optional<NotificationContent> wanted;  // to be shown next; empty: nothing new
  bool is_close_wanted = false;
  bool is_busy = false;   // a call is under way; the next one follows it
  guint32 server_id = 0;  // 0: not on the screen
};

// Show `content`, in place of what this notification showed before.
void show_notification(const std::shared_ptr<PostedNotification> &notification, NotificationContent content);
void close_notification(const std::shared_ptr<PostedNotification> &notification);
// Close everything of this application and type that any of its processes posted.
void close_notifications_of_type(int type);

}  // namespace platform
