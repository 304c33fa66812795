// What the notification service tells about notifications that were posted: a touched one sends its launch
// request, a closed one is forgotten, and so are all when the service ends. Main loop only.
#pragma once

#include <gio/gio.h>

namespace platform {

// Listen on a connection to the desktop's bus, the one that the notifications are posted over.
void watch_notifications(GDBusConnection *desktop);
// The connection is closed.
void stop_watching_notifications();

}  // namespace platform
