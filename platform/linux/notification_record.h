// The record of what is on the screen: the table posted_notification of the preference file, by application
// and tag. It outlives the process. Main loop only.
#pragma once

#include <string>
#include <vector>

#include "notification_server.h"

namespace platform {

// A notification as the service knows it.
struct Shown {
  std::string server;
  guint32 id;
};

void remember_shown(const NotificationStep &step, const Shown &shown);
void forget_shown(const Shown &shown);

// What the step's application shows under the step's tag, or of its type.
std::vector<Shown> shown_under_tag(const NotificationStep &step);
std::vector<Shown> shown_of_type(const NotificationStep &step);

}  // namespace platform
