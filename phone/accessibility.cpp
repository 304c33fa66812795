#include "accessibility.h"

#include "message_bus.h"

namespace phone {

namespace {

constexpr const char *kName = "org.a11y.Bus";
constexpr const char *kPath = "/org/a11y/bus";
constexpr const char *kStatus = "org.a11y.Status";

constexpr const char *kInterfaces = R"(<node>
  <interface name='org.a11y.Bus'><method name='GetAddress'><arg type='s' direction='out'/></method></interface>
  <interface name='org.a11y.Status'>
    <property name='IsEnabled' type='b' access='read'/>
    <property name='ScreenReaderEnabled' type='b' access='read'/>
  </interface>
</node>)";

using NodeInfo = TavroHandle<GDBusNodeInfo, g_dbus_node_info_unref>;

// Empty with the reason when there is no accessibility bus.
std::string ask_address(GDBusConnection *bus, std::string *reason) {
  constexpr int kTimeoutMilliseconds = 10000;  // it may have to be started
  TavroError error;
  TavroVariant reply(g_dbus_connection_call_sync(bus, kName, kPath, kName, "GetAddress", nullptr,
                                                 G_VARIANT_TYPE("(s)"), G_DBUS_CALL_FLAGS_NONE,
                                                 kTimeoutMilliseconds, nullptr, tavro_out(error)));
  if (!reply) {
    *reason = plain_message(error.get());
    return "";
  }
  const char *address = nullptr;
  g_variant_get(reply.get(), "(&s)", &address);
  return address;
}

bool set_status(GDBusConnection *bus, const char *property, std::string *reason) {
  TavroError error;
  TavroVariant reply(
      g_dbus_connection_call_sync(bus, kName, kPath, "org.freedesktop.DBus.Properties", "Set",
                                  g_variant_new("(ssv)", kStatus, property, g_variant_new_boolean(TRUE)),
                                  nullptr, G_DBUS_CALL_FLAGS_NONE, -1, nullptr, tavro_out(error)));
  if (!reply) *reason = plain_message(error.get());
  return reply != nullptr;
}

bool is_true(GVariant *value) {
  return value && g_variant_is_of_type(value, G_VARIANT_TYPE_BOOLEAN) && g_variant_get_boolean(value);
}

}  // namespace

std::unique_ptr<AccessibilityForwarder> AccessibilityForwarder::create(const std::string &host_address) {
  std::unique_ptr<AccessibilityForwarder> forwarder(new AccessibilityForwarder);
  std::string reason;
  if (!host_address.empty()) forwarder->host_ = connect_to_bus(host_address, &reason);
  if (!forwarder->host_) return nullptr;
  forwarder->address_ = ask_address(forwarder->host_.get(), &reason);
  if (forwarder->address_.empty()) return nullptr;
  forwarder->status_.reset(g_dbus_proxy_new_sync(forwarder->host_.get(), G_DBUS_PROXY_FLAGS_NONE, nullptr,
                                                 kName, kPath, kStatus, nullptr, nullptr));
  if (!forwarder->status_) return nullptr;
  g_signal_connect(forwarder->status_.get(), "g-properties-changed", G_CALLBACK(changed_cb), forwarder.get());
  return forwarder;
}

AccessibilityForwarder::~AccessibilityForwarder() {
  if (status_) g_signal_handlers_disconnect_by_data(status_.get(), this);
  if (name_) g_bus_unown_name(name_);
}

bool AccessibilityForwarder::is_screen_reader_on() const {
  TavroVariant value(g_dbus_proxy_get_cached_property(status_.get(), "ScreenReaderEnabled"));
  return is_true(value.get());
}

bool AccessibilityForwarder::serve(GDBusConnection *phone_bus, std::string *reason) {
  static const GDBusInterfaceVTable calls = {method_cb, property_cb, nullptr, {}};
  NodeInfo node(g_dbus_node_info_new_for_xml(kInterfaces, nullptr));
  for (GDBusInterfaceInfo **interface = node->interfaces; *interface; ++interface) {
    TavroError error;
    if (!g_dbus_connection_register_object(phone_bus, kPath, *interface, &calls, this, nullptr,
                                           tavro_out(error))) {
      *reason = error->message;
      return false;
    }
  }
  phone_bus_.reset(G_DBUS_CONNECTION(g_object_ref(phone_bus)));
  name_ = g_bus_own_name_on_connection(phone_bus, kName, G_BUS_NAME_OWNER_FLAGS_NONE, nullptr, nullptr,
                                       nullptr, nullptr);
  return true;
}

void AccessibilityForwarder::method_cb(GDBusConnection *, const char *, const char *, const char *,
                                       const char *, GVariant *, GDBusMethodInvocation *invocation,
                                       gpointer self) {
  const std::string &address = static_cast<AccessibilityForwarder *>(self)->address_;
  g_dbus_method_invocation_return_value(invocation, g_variant_new("(s)", address.c_str()));
}

GVariant *AccessibilityForwarder::property_cb(GDBusConnection *, const char *, const char *, const char *,
                                              const char *name, GError **, gpointer self) {
  GDBusProxy *status = static_cast<AccessibilityForwarder *>(self)->status_.get();
  TavroVariant value(g_dbus_proxy_get_cached_property(status, name));
  return g_variant_new_boolean(is_true(value.get()));
}

void AccessibilityForwarder::changed_cb(GDBusProxy *, GVariant *changed, char **, gpointer self) {
  auto *forwarder = static_cast<AccessibilityForwarder *>(self);
  if (!forwarder->phone_bus_) return;
  const char *none[] = {nullptr};
  g_dbus_connection_emit_signal(forwarder->phone_bus_.get(), nullptr, kPath,
                                "org.freedesktop.DBus.Properties", "PropertiesChanged",
                                g_variant_new("(s@a{sv}^as)", kStatus, changed, none), nullptr);
}

bool switch_on_accessibility(GDBusConnection *phone_bus, std::string *reason) {
  const std::string address = ask_address(phone_bus, reason);
  if (address.empty()) return false;
  TavroObject<GDBusConnection> bus = connect_to_bus(address, reason);
  // The registry comes first: a program that finds none does not publish its windows.
  return bus && start_by_name(bus.get(), "org.a11y.atspi.Registry", reason) &&
         set_status(phone_bus, "IsEnabled", reason) && set_status(phone_bus, "ScreenReaderEnabled", reason);
}

}  // namespace phone
