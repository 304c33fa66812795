// A connection of its own to the phone's bus, on which a test plays other programs.
#pragma once

#include <gio/gio.h>

inline GDBusConnection *connect_to_bus() {
  return g_dbus_connection_new_for_address_sync(
      g_getenv("DBUS_SESSION_BUS_ADDRESS"),
      static_cast<GDBusConnectionFlags>(G_DBUS_CONNECTION_FLAGS_AUTHENTICATION_CLIENT |
                                        G_DBUS_CONNECTION_FLAGS_MESSAGE_BUS_CONNECTION),
      nullptr, nullptr, nullptr);
}

// The program of this name appears or ends.
inline void set_name_owned(GDBusConnection *bus, const char *name, bool is_owned) {
  constexpr guint32 kDoNotQueue = 4;
  GVariant *arguments = is_owned ? g_variant_new("(su)", name, kDoNotQueue) : g_variant_new("(s)", name);
  GVariant *reply =
      g_dbus_connection_call_sync(bus, "org.freedesktop.DBus", "/org/freedesktop/DBus",
                                  "org.freedesktop.DBus", is_owned ? "RequestName" : "ReleaseName", arguments,
                                  nullptr, G_DBUS_CALL_FLAGS_NONE, -1, nullptr, nullptr);
  if (reply) g_variant_unref(reply);
}
