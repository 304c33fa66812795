#include <gio/gio.h>

#include <cstdlib>
#include <cstring>

#include "tavro_handles.h"
#include "tavro_log.h"
#include "tavro_service_bridge.h"

namespace {

// The signature is compared with what the values fill, since a wrong one would read past them.
bool _set_body(GDBusMessage *message, const char *method, const char *signature,
               const char *const parameters[]) {
  const bool takes_three = std::strcmp(method, "dump_log") == 0;
  if (std::strcmp(signature, takes_three ? "(iss)" : "(is)") != 0) return false;
  const int number = std::atoi(parameters[0]);
  g_dbus_message_set_body(message, takes_three ? g_variant_new("(iss)", number, parameters[1], parameters[2])
                                               : g_variant_new("(is)", number, parameters[1]));
  return true;
}

}  // namespace

int _tavro_dbus_method_sync(const char *destination, const char *path, const char *interface,
                            const char *method, const char *signature, const char *const parameters[]) {
  TAVRO_LOGD("-- start --");
  const TavroObject<GDBusConnection> bus(g_bus_get_sync(G_BUS_TYPE_SYSTEM, nullptr, nullptr));
  if (!bus) {
    TAVRO_LOGD("dbus_bus_get error");
    return -1;
  }
  // GLib treats a malformed name as a programming error, so it is asked before.
  const bool names_are_valid = g_dbus_is_name(destination) && g_variant_is_object_path(path) &&
                               g_dbus_is_interface_name(interface) && g_dbus_is_member_name(method);
  const TavroObject<GDBusMessage> message(
      names_are_valid ? g_dbus_message_new_method_call(destination, path, interface, method) : nullptr);
  if (!message || (signature && !_set_body(message.get(), method, signature, parameters))) {
    TAVRO_LOGD("dbus_message_new_method_call(%s:%s-%s)", path, interface, method);
    return -1;
  }
  g_dbus_message_set_flags(message.get(), G_DBUS_MESSAGE_FLAGS_NO_REPLY_EXPECTED);
  const gboolean sent = g_dbus_connection_send_message(bus.get(), message.get(),
                                                       G_DBUS_SEND_MESSAGE_FLAGS_NONE, nullptr, nullptr);
  // Unless somebody else holds this connection it closes here, and what it has not written is lost.
  g_dbus_connection_flush_sync(bus.get(), nullptr, nullptr);
  TAVRO_LOGD("-- start 5 -- = %d", sent);
  TAVRO_LOGD("-- end --");
  return 0;
}
