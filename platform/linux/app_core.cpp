#include "app_core.h"

#include <dlog.h>

#include <utility>

#include "app_control_internal.h"
#include "bus.h"

namespace platform {
namespace {

constexpr guint kDoNotQueue = 4;    // flag of RequestName
constexpr guint kPrimaryOwner = 1;  // answers of RequestName
constexpr guint kAlreadyOwner = 4;

constexpr const char *kInterfaceXml =
    "<node><interface name='org.tavro.AppControl1'><method name='Launch'>"
    "<arg type='s' name='operation' direction='in'/><arg type='s' name='uri' direction='in'/>"
    "<arg type='s' name='mime' direction='in'/><arg type='a(ss)' name='extra_data' direction='in'/>"
    "<arg type='i' name='result' direction='out'/><arg type='a(ss)' name='extra_data' direction='out'/>"
    "</method></interface></node>";

struct Application {
  LaunchHandler handler;
  std::function<void()> lost;
  guint registration = 0;
  bool refuses = false;
};

Application &application() {
  static Application &instance = *new Application;
  return instance;
}

std::string program_path() {
  ErrorSlot error;
  const ScopedGText path(g_file_read_link("/proc/self/exe", error.out()));
  return path ? path.get() : "";
}

void launch_cb(GDBusConnection *, const char *, const char *, const char *, const char *, GVariant *arguments,
               GDBusMethodInvocation *invocation, gpointer) {
  Application &self = application();
  if (self.refuses) {
    g_dbus_method_invocation_return_dbus_error(invocation, "org.tavro.AppControl1.Error.NotStarted",
                                               "the application did not start");
    return;
  }
  app_control_s request = launch_request(arguments, invocation);
  self.handler(&request);
}

bool register_object(GDBusConnection *bus) {
  static const GDBusInterfaceVTable table = {launch_cb, nullptr, nullptr, {}};
  ErrorSlot error;
  GDBusNodeInfo *node = g_dbus_node_info_new_for_xml(kInterfaceXml, error.out());
  if (node) {
    application().registration =
        g_dbus_connection_register_object(bus, launch_path(application_id()).c_str(), node->interfaces[0],
                                          &table, nullptr, nullptr, error.out());
    g_dbus_node_info_unref(node);
  }
  if (application().registration) return true;
  dlog_print(DLOG_ERROR, "PLATFORM", "%s cannot listen on the bus: %s", application_id().c_str(),
             error.text());
  return false;
}

void forward_to_running_instance() {
  app_control_s request;
  request.operation = APP_CONTROL_OPERATION_DEFAULT;
  request.app_id = application_id();
  // No loop of ours runs here, so it has left when this returns.
  app_control_send_launch_request(&request, nullptr, nullptr);
}

void bus_closed_cb(GDBusConnection *, gboolean, GError *, gpointer) {
  dlog_print(DLOG_ERROR, "PLATFORM", "%s lost the phone's bus", application_id().c_str());
  if (application().lost) application().lost();
}

gboolean mark_reached_cb(gpointer reached) {
  *static_cast<bool *>(reached) = true;
  return G_SOURCE_REMOVE;
}

// Calls that the bus connection has received are sources of the main context already, in order; a source that
// is added now runs after them.
void serve_what_arrived() {
  bool is_reached = false;
  g_idle_add_full(G_PRIORITY_DEFAULT, mark_reached_cb, &is_reached, nullptr);
  while (!is_reached) g_main_context_iteration(nullptr, TRUE);
}

}  // namespace

const std::string &application_id() {
  static const std::string &id = *new std::string([] {
    const std::string path = program_path();
    return path.substr(path.rfind('/') + 1);
  }());
  return id;
}

const std::string &application_folder() {
  static const std::string &folder = *new std::string([] {
    const ScopedGText bin(g_path_get_dirname(program_path().c_str()));
    const ScopedGText above(g_path_get_dirname(bin.get()));
    return std::string(above.get());
  }());
  return folder;
}

Claim claim_application(LaunchHandler handler, std::function<void()> lost) {
  is_started_by_hand();  // reads and clears the environment while there is only this thread
  GDBusConnection *bus = phone_bus();
  if (!bus) return Claim::kFailed;
  application().handler = std::move(handler);
  application().lost = std::move(lost);
  // The object comes first: the bus delivers what it has queued for us the moment the name is ours.
  if (!register_object(bus)) return Claim::kFailed;
  ErrorSlot error;
  const ScopedVariant reply = call_bus_daemon(
      "RequestName", g_variant_new("(su)", application_id().c_str(), kDoNotQueue), "(u)", &error);
  if (!reply) {
    dlog_print(DLOG_ERROR, "PLATFORM", "%s got no name: %s", application_id().c_str(), error.text());
    return Claim::kFailed;
  }
  guint answer = 0;
  g_variant_get(reply.get(), "(u)", &answer);
  if (answer != kPrimaryOwner && answer != kAlreadyOwner) {
    forward_to_running_instance();
    return Claim::kForwarded;
  }
  g_signal_connect(bus, "closed", G_CALLBACK(bus_closed_cb), nullptr);
  set_loop_flushes(true);
  return Claim::kOwner;
}

bool is_started_by_hand() {
  // Programs that we start must not take themselves for started by the bus: the variables end here.
  static const bool is_by_bus = [] {
    const bool is_set = g_getenv("DBUS_STARTER_ADDRESS") || g_getenv("DBUS_STARTER_BUS_TYPE");
    g_unsetenv("DBUS_STARTER_ADDRESS");
    g_unsetenv("DBUS_STARTER_BUS_TYPE");
    return is_set;
  }();
  return !is_by_bus;
}

void deliver_default_launch() {
  app_control_s request;
  request.operation = APP_CONTROL_OPERATION_DEFAULT;
  application().handler(&request);
}

void leave_application(bool refuse) {
  GDBusConnection *bus = phone_bus();
  application().refuses = refuse;
  application().lost = nullptr;
  ErrorSlot error;
  const ScopedVariant reply =
      call_bus_daemon("ReleaseName", g_variant_new("(s)", application_id().c_str()), "(u)", &error);
  if (reply) serve_what_arrived();
  if (application().registration) {
    g_dbus_connection_unregister_object(bus, std::exchange(application().registration, 0));
  }
  set_loop_flushes(false);
}

}  // namespace platform
