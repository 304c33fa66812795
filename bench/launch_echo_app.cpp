// The other end of the launch request benchmark: answers launch requests as any application does, and the
// same data by a bare method of an object of its own.

#include <gio/gio.h>
#include <service_app.h>

namespace {

void echo_cb(GDBusConnection *, const char *, const char *, const char *, const char *, GVariant *arguments,
             GDBusMethodInvocation *invocation, gpointer) {
  GVariant *pairs = g_variant_get_child_value(arguments, 3);
  g_dbus_method_invocation_return_value(invocation, g_variant_new("(i@a(ss))", 0, pairs));
  g_variant_unref(pairs);
}

bool created(void *) {
  static const GDBusInterfaceVTable table = {echo_cb, nullptr, nullptr, {}};
  GDBusNodeInfo *node = g_dbus_node_info_new_for_xml(
      "<node><interface name='bench.Bare'><method name='Echo'><arg type='s' direction='in'/>"
      "<arg type='s' direction='in'/><arg type='s' direction='in'/><arg type='a(ss)' direction='in'/>"
      "<arg type='i' direction='out'/><arg type='a(ss)' direction='out'/></method></interface></node>",
      nullptr);
  GDBusConnection *bus = g_bus_get_sync(G_BUS_TYPE_SESSION, nullptr, nullptr);
  return g_dbus_connection_register_object(bus, "/bare", node->interfaces[0], &table, nullptr, nullptr,
                                           nullptr) > 0;
}

bool copy_pair(app_control_h request, const char *key, void *reply) {
  char *value = nullptr;
  app_control_get_extra_data(request, key, &value);
  app_control_add_extra_data(static_cast<app_control_h>(reply), key, value);
  free(value);
  return true;
}

void launched(app_control_h request, void *) {
  app_control_h reply = nullptr;
  app_control_create(&reply);
  app_control_foreach_extra_data(request, copy_pair, reply);
  app_control_reply_to_launch_request(reply, request, APP_CONTROL_RESULT_SUCCEEDED);
  app_control_destroy(reply);
}

}  // namespace

int main(int argc, char **argv) {
  service_app_lifecycle_callback_s callback = {created, nullptr, launched};
  return service_app_main(argc, argv, &callback, nullptr);
}
