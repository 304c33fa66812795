#include "environment.h"

#include <cstring>

namespace phone {

namespace {

constexpr const char *kSystemBusSocket = "/run/dbus/system_bus_socket";

// The address when something can answer there, else empty.
std::string usable_address(const std::string &address) {
  const char *prefix = "unix:path=";
  if (address.compare(0, std::strlen(prefix), prefix) != 0) return address;
  const std::string path = address.substr(std::strlen(prefix), address.find(',') - std::strlen(prefix));
  return g_file_test(path.c_str(), G_FILE_TEST_EXISTS) ? address : "";
}

void hand_on_host_buses(Environment *environment, bool keeps_host_session) {
  const std::string session = usable_address(environment->get("DBUS_SESSION_BUS_ADDRESS"));
  std::string system = environment->get("DBUS_SYSTEM_BUS_ADDRESS");
  if (system.empty()) system = std::string("unix:path=") + kSystemBusSocket;
  system = usable_address(system);
  environment->unset("TAVRO_HOST_SESSION_BUS");
  environment->unset("TAVRO_HOST_SYSTEM_BUS");
  if (keeps_host_session && !session.empty()) environment->set("TAVRO_HOST_SESSION_BUS", session);
  if (!system.empty()) environment->set("TAVRO_HOST_SYSTEM_BUS", system);
}

}  // namespace

Environment Environment::current() {
  Environment environment;
  TavroStrv all(g_get_environ());
  for (char **entry = all.get(); *entry; ++entry) {
    if (const char *equals = std::strchr(*entry, '='))
      environment.set(std::string(*entry, static_cast<size_t>(equals - *entry)), equals + 1);
  }
  return environment;
}

std::string Environment::get(const std::string &key) const {
  const auto found = values_.find(key);
  return found == values_.end() ? "" : found->second;
}

TavroStrv Environment::to_strv() const {
  TavroStrv list(g_new0(char *, values_.size() + 1));
  size_t count = 0;
  for (const auto &[key, value] : values_) list.get()[count++] = g_strdup((key + "=" + value).c_str());
  return list;
}

Environment phone_environment(const Folder &folder, const std::string &socket_folder,
                              bool keeps_host_session) {
  Environment environment = Environment::current();
  hand_on_host_buses(&environment, keeps_host_session);
  for (const char *key : {"WAYLAND_DISPLAY", "WAYLAND_SOCKET", "AT_SPI_BUS_ADDRESS", "DESKTOP_STARTUP_ID",
                          "DBUS_STARTER_ADDRESS", "DBUS_STARTER_BUS_TYPE", "ELM_ATSPI_MODE"})
    environment.unset(key);
  TavroGText bus(g_dbus_address_escape_value((socket_folder + "/bus").c_str()));
  const std::string address = std::string("unix:path=") + bus.get();
  const std::map<std::string, std::string> phone_values = {
      {"TAVRO_PHONE_DIR", folder.dir},
      {"DBUS_SESSION_BUS_ADDRESS", address},
      {"DBUS_SYSTEM_BUS_ADDRESS", address},
      {"XDG_RUNTIME_DIR", socket_folder},
      {"XDG_CONFIG_HOME", folder.dir + "/config"},
      {"XDG_CACHE_HOME", folder.dir + "/cache"},
      {"ELM_CONFIG_DIR_XDG", "1"},
      {"ELM_DISPLAY", "x11"},
      {"ELM_THUMBSCROLL_ENABLE", "1"},  // lists follow the finger
      {"EINA_LOG_BACKTRACE", "-1"},
  };
  for (const auto &[key, value] : phone_values) environment.set(key, value);
  return environment;
}

}  // namespace phone
