// The application's end of its notifications: steps go to the desktop link over the phone's bus, in order and
// without waiting; where no link runs this process takes them itself, and nobody serves touches. What is on
// the screen outlives the process. Main loop only.
#pragma once

#include <functional>
#include <optional>
#include <string>

#include "notification_server.h"

namespace platform {

constexpr const char *kLinkName = "org.tavro.DesktopLink";
constexpr const char *kLinkPath = "/org/tavro/DesktopLink";
constexpr const char *kLinkInterface = "org.tavro.DesktopLink1";
constexpr const char *kLinkTakeStep = "TakeNotificationStep";
constexpr const char *kStepArguments = "(isissssssibbd)";

// A step as it travels; floating.
GVariant *step_to_variant(const NotificationStep &step);
NotificationStep step_from_variant(GVariant *arguments);

// Show `content`, in place of what this application shows under its tag.
void show_notification(NotificationContent content);
void close_notification(const std::string &tag);
// Close everything of this application and type that any of its processes posted.
void close_notifications_of_type(int type);
// The type of what this application shows, or is about to show, under the tag; empty: nothing.
std::optional<int> shown_notification_type(const std::string &tag);

// Who shows a toast where no service does; may be empty.
void set_toast_fallback(std::function<void(const std::string &)> show);

}  // namespace platform
