#include "message_bus.h"

#include <cerrno>

#include "options.h"
#include "sandbox.h"

namespace phone {

namespace {

constexpr const char *kAccessibilityBus = "/usr/libexec/at-spi-bus-launcher";

// The limits are those of a bus for one user: what is queued for a program that is just starting must fit,
// and a reply that waits for a person has no time limit.
constexpr const char *kConfig =
    R"(<!DOCTYPE busconfig PUBLIC "-//freedesktop//DTD D-Bus Bus Configuration 1.0//EN"
 "http://www.freedesktop.org/standards/dbus/1.0/busconfig.dtd">
<busconfig>
  <type>session</type>
  <keep_umask/>
  <listen>%s</listen>
  <auth>EXTERNAL</auth>
  <servicedir>%s</servicedir>
  <policy context="default">
    <allow send_destination="*"/>
    <allow receive_sender="*"/>
    <allow own="*"/>
  </policy>
  <limit name="max_incoming_bytes">1000000000</limit>
  <limit name="max_outgoing_bytes">1000000000</limit>
  <limit name="max_message_size">134217728</limit>
  <limit name="service_start_timeout">60000</limit>
  <limit name="max_pending_service_starts">10000</limit>
  <limit name="max_replies_per_connection">50000</limit>
  <limit name="max_match_rules_per_connection">50000</limit>
  <limit name="max_connections_per_user">10000</limit>
  <limit name="max_completed_connections">10000</limit>
</busconfig>
)";

// A word of a service file's Exec line, which the bus splits as a shell would.
std::string quoted(const std::string &word) {
  TavroGText text(g_shell_quote(word.c_str()));
  return text.get();
}

bool write_service(const std::string &folder, const std::string &name, const std::string &command) {
  return write_private_file(folder + "/" + name + ".service",
                            "[D-BUS Service]\nName=" + name + "\nExec=" + command + "\n");
}

bool write_services(const std::string &folder, bool starts_accessibility_bus) {
  for (const char *app_id : {kClientId, kServiceId, kCrashServiceId, kRecorderId}) {
    if (is_installed(app_id) && !write_service(folder, app_id, quoted(application_program(app_id))))
      return false;
  }
  if (!starts_accessibility_bus || !g_file_test(kAccessibilityBus, G_FILE_TEST_IS_EXECUTABLE)) return true;
  // Its settings are those of this phone, never the user's own.
  return write_service(folder, "org.a11y.Bus",
                       std::string("/usr/bin/env GSETTINGS_BACKEND=memory ") + kAccessibilityBus);
}

}  // namespace

std::string application_program(const std::string &app_id) {
  TavroGText bin(g_path_get_dirname(own_program().c_str()));
  TavroGText root(g_path_get_dirname(bin.get()));
  return std::string(root.get()) + "/apps/" + app_id + "/bin/" + app_id;
}

bool is_installed(const std::string &app_id) {
  return g_file_test(application_program(app_id).c_str(), G_FILE_TEST_IS_EXECUTABLE);
}

bool write_bus_files(const Folder &folder, const std::string &socket_folder, bool starts_accessibility_bus,
                     BusFiles *files) {
  const std::string services = folder.run("services");
  if (g_mkdir_with_parents(services.c_str(), 0700) != 0) {
    say("cannot make " + services + ": " + g_strerror(errno));
    return false;
  }
  for (const char *old : {kClientId, kServiceId, kCrashServiceId, kRecorderId, "org.a11y.Bus"}) {
    unlink((services + "/" + old + ".service").c_str());
  }
  const std::string socket = socket_folder + "/bus";
  unlink(socket.c_str());
  TavroGText address(g_dbus_address_escape_value(socket.c_str()));
  TavroGText text(g_markup_printf_escaped(kConfig, ("unix:path=" + std::string(address.get())).c_str(),
                                          services.c_str()));
  *files = {folder.run("bus.conf"), socket_folder};
  return write_services(services, starts_accessibility_bus) && write_private_file(files->config, text.get());
}

std::vector<std::string> bus_command(const BusFiles &files) {
  return {"dbus-daemon", "--config-file=" + files.config, "--nofork", "--nopidfile", "--print-address=1"};
}

TavroObject<GDBusConnection> connect_to_bus(const std::string &address, std::string *reason) {
  TavroError error;
  const auto flags = static_cast<GDBusConnectionFlags>(G_DBUS_CONNECTION_FLAGS_AUTHENTICATION_CLIENT |
                                                       G_DBUS_CONNECTION_FLAGS_MESSAGE_BUS_CONNECTION);
  TavroObject<GDBusConnection> bus(
      g_dbus_connection_new_for_address_sync(address.c_str(), flags, nullptr, nullptr, tavro_out(error)));
  if (!bus) *reason = plain_message(error.get());
  return bus;
}

bool start_by_name(GDBusConnection *bus, const std::string &name, std::string *reason) {
  TavroError error;
  TavroVariant reply(g_dbus_connection_call_sync(
      bus, "org.freedesktop.DBus", "/org/freedesktop/DBus", "org.freedesktop.DBus", "StartServiceByName",
      g_variant_new("(su)", name.c_str(), 0u), G_VARIANT_TYPE("(u)"), G_DBUS_CALL_FLAGS_NONE, G_MAXINT,
      nullptr, tavro_out(error)));
  if (!reply) *reason = plain_message(error.get());
  return reply != nullptr;
}

std::string plain_message(const GError *error) {
  TavroHandle<GError, g_error_free> copy(g_error_copy(error));
  g_dbus_error_strip_remote_error(copy.get());
  return copy->message;
}

}  // namespace phone
