// The notification service of the desktop (org.freedesktop.Notifications), or the phone's own where there is
// no desktop. Steps are taken in order, one after the other, without ever waiting; a service that is absent
// or fails loses the steps that are due, with a log line.
//
// What is on the screen is kept in the preference file, by application and tag, with the launch request of a
// touch. Services tell only the process that posted a notification that it was touched, and some take down
// what a process posted when that process ends: so the steps of all applications are taken by the desktop
// link (notification_requests.h), which lives as long as the phone. Main loop only.
#pragma once

#include <gio/gio.h>

#include <functional>
#include <optional>
#include <string>

namespace platform {

constexpr const char *kNotificationService = "org.freedesktop.Notifications";
constexpr const char *kNotificationPath = "/org/freedesktop/Notifications";
constexpr const char *kTouchAction = "default";

// What the person sees, and what a touch does.
struct NotificationContent {
  std::string tag;  // empty: not kept, as for a toast
  int type = 0;
  std::string title, body;        // plain text
  std::string icon_path;          // empty: the application's own icon
  std::string receiver, request;  // application and printed arguments of the launch request; empty: none
  int expire_ms = -1;             // -1: as the service likes, 0: never
  bool is_ongoing = false;
  bool is_toast = false;
  std::optional<double> progress;  // 0.0 to 1.0
};

struct NotificationStep {
  enum Kind {
    kShow,       // in place of what the application shows under the tag
    kClose,      // what it shows under the tag
    kCloseType,  // everything of the type
  };
  Kind kind = kShow;
  std::string app_id;
  NotificationContent content;  // closing: only tag or type
};

// Told once whether the step was taken, not whether a person saw it.
using NotificationDone = std::function<void(bool)>;
void take_notification_step(NotificationStep step, NotificationDone done);

// One run of the service, from the address of a message that it sent: ids count anew with each run.
std::string notification_server_of(GDBusConnection *bus, const char *sender);

}  // namespace platform
