#include "crash_object.h"

#include <cstring>

#include "crash_log.h"
#include "tavro_crash_service.h"

namespace {

// What the numbers and texts choose on other phones does not exist here: there is one log, and "delete_dump"
// means all crash folders.
constexpr char kInterface[] =
    "<node><interface name='org.tizen.system.crash.Crash'>"
    "<method name='dump_log'><annotation name='org.freedesktop.DBus.Method.NoReply' value='true'/>"
    "<arg type='i' direction='in'/><arg type='s' direction='in'/><arg type='s' direction='in'/></method>"
    "<method name='delete_dump'><annotation name='org.freedesktop.DBus.Method.NoReply' value='true'/>"
    "<arg type='i' direction='in'/><arg type='s' direction='in'/></method>"
    "</interface></node>";

void call_cb(GDBusConnection *, const char *, const char *, const char *, const char *method, GVariant *,
             GDBusMethodInvocation *invocation, gpointer jobs) {
  const bool is_log = std::strcmp(method, "dump_log") == 0;
  static_cast<CrashJobs *>(jobs)->add(is_log ? CrashJobs::Kind::kDumpLog : CrashJobs::Kind::kDeleteDump);
  g_dbus_method_invocation_return_value(invocation, nullptr);
}

}  // namespace

bool register_crash_object(CrashJobs *jobs) {
  static const GDBusInterfaceVTable kTable = {call_cb, nullptr, nullptr, {}};
  TavroError error;
  // The phone's one bus plays the system bus too. The platform keeps this connection and serves the name on
  // it.
  static const TavroObject<GDBusConnection> bus(
      g_bus_get_sync(G_BUS_TYPE_SESSION, nullptr, tavro_out(error)));
  static const TavroHandle<GDBusNodeInfo, g_dbus_node_info_unref> node(
      bus ? g_dbus_node_info_new_for_xml(kInterface, tavro_out(error)) : nullptr);
  if (node && g_dbus_connection_register_object(bus.get(), TAVRO_CRASH_SERVICE_PATH, node->interfaces[0],
                                                &kTable, jobs, nullptr, tavro_out(error)))
    return true;
  CRASH_LOGE("the crash service cannot listen: %s", error->message);
  return false;
}
