#include "desktop_link.h"

#include <dlog.h>

#include <memory>

#include "badge_link.h"
#include "bus.h"
#include "notification_requests.h"
#include "notification_touch.h"

namespace platform {
namespace {

constexpr guint kReconnectSeconds = 30;
constexpr guint kDoNotQueue = 4;    // flag of RequestName
constexpr guint kPrimaryOwner = 1;  // answer of RequestName

constexpr const char *kInterfaceXml =
    "<node><interface name='org.tavro.DesktopLink1'><method name='TakeNotificationStep'>"
    "<arg type='i' name='kind' direction='in'/><arg type='s' name='app_id' direction='in'/>"
    "<arg type='i' name='type' direction='in'/><arg type='s' name='tag' direction='in'/>"
    "<arg type='s' name='title' direction='in'/><arg type='s' name='body' direction='in'/>"
    "<arg type='s' name='icon_path' direction='in'/><arg type='s' name='receiver' direction='in'/>"
    "<arg type='s' name='request' direction='in'/><arg type='i' name='expire_ms' direction='in'/>"
    "<arg type='b' name='is_ongoing' direction='in'/><arg type='b' name='is_toast' direction='in'/>"
    "<arg type='d' name='progress' direction='in'/><arg type='b' name='is_done' direction='out'/>"
    "</method></interface></node>";

using ScopedNode = std::unique_ptr<GDBusNodeInfo, FreeWith<g_dbus_node_info_unref>>;

void step_cb(GDBusConnection *, const char *, const char *, const char *, const char *, GVariant *arguments,
             GDBusMethodInvocation *invocation, gpointer) {
  take_notification_step(step_from_variant(arguments), [invocation](bool is_done) {
    g_dbus_method_invocation_return_value(invocation, g_variant_new("(b)", is_done));
  });
}

// The object comes first: who finds the name finds it, too.
bool serve_steps(GDBusConnection *phone) {
  static const GDBusInterfaceVTable table = {step_cb, nullptr, nullptr, {}};
  ErrorSlot error;
  const ScopedNode node(g_dbus_node_info_new_for_xml(kInterfaceXml, error.out()));
  const bool is_registered =
      node && g_dbus_connection_register_object(phone, kLinkPath, node->interfaces[0], &table, nullptr,
                                                nullptr, error.out()) != 0;
  const ScopedVariant reply(
      is_registered
          ? call_bus_daemon("RequestName", g_variant_new("(su)", kLinkName, kDoNotQueue), "(u)", &error)
          : nullptr);
  guint answer = 0;
  if (reply) g_variant_get(reply.get(), "(u)", &answer);
  if (answer == kPrimaryOwner) return true;
  dlog_print(DLOG_ERROR, "PLATFORM", "no link to the desktop: %s", reply ? "another one runs" : error.text());
  return false;
}

gboolean connect_cb(gpointer);

void disconnected_cb(GDBusConnection *, gboolean, GError *, gpointer) {
  show_badges_on(nullptr);
  stop_watching_notifications();
  g_timeout_add_seconds(kReconnectSeconds, connect_cb, nullptr);
}

void connected(GDBusConnection *bus) {
  if (!bus) {
    g_timeout_add_seconds(kReconnectSeconds, connect_cb, nullptr);
    return;
  }
  g_signal_connect(bus, "closed", G_CALLBACK(disconnected_cb), nullptr);
  watch_notifications(bus);
  show_badges_on(bus);
}

gboolean connect_cb(gpointer) {
  with_host_bus(HostBus::kSession, connected);
  return G_SOURCE_REMOVE;
}

}  // namespace

bool start_desktop_link() {
  GDBusConnection *phone = phone_bus();
  if (!phone || !serve_steps(phone)) return false;
  listen_for_badges(phone);
  connect_cb(nullptr);
  return true;
}

}  // namespace platform
