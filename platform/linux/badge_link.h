// Badges towards the desktop's launchers, with the signal of the Unity launcher that others have taken over.
// Launchers forget what a program told them when it ends, so one long-lived process speaks for all
// applications. Main loop only.
#pragma once

#include <gio/gio.h>

namespace platform {

// Applications tell by a signal on the phone's bus, with the application id, that a badge has changed; the
// count itself is in the preference file.
constexpr const char *kBadgePath = "/org/tavro/Badge";
constexpr const char *kBadgeInterface = "org.tavro.Badge1";
constexpr const char *kBadgeChanged = "Changed";

// Listen for changes on the phone's bus.
void listen_for_badges(GDBusConnection *phone);
// Tell the launchers on this connection from now on, first all badges; null: nobody.
void show_badges_on(GDBusConnection *desktop);

}  // namespace platform
