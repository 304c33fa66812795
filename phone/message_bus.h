// The phone's private message bus, which plays both its session and its system bus: the files that it is
// started with, generated anew at each start of the phone.
#pragma once

#include <string>
#include <vector>

#include "environment.h"

namespace phone {

struct BusFiles {
  std::string config;         // path of the configuration file
  std::string socket_folder;  // the socket is "bus" in there
};

// Write the configuration and the service files: one for each of the phone's applications whose program is
// there, and one for the accessibility bus unless the desktop's is forwarded. False with a message.
bool write_bus_files(const Folder &folder, const std::string &socket_folder, bool starts_accessibility_bus,
                     BusFiles *files);

std::vector<std::string> bus_command(const BusFiles &files);

// Path of an application's program in the build or installation that this program belongs to.
std::string application_program(const std::string &app_id);
bool is_installed(const std::string &app_id);

// A connection to the bus at `address` that does not end the process when the bus does. Null with the reason.
TavroObject<GDBusConnection> connect_to_bus(const std::string &address, std::string *reason);

// Start the owner of `name` if it does not run. False with the reason.
bool start_by_name(GDBusConnection *bus, const std::string &name, std::string *reason);

// What a D-Bus call reports, without the prefix that GDBus puts before it.
std::string plain_message(const GError *error);

constexpr const char *kClientId = "corvane.tavro-lite";
constexpr const char *kServiceId = "corvane.tavro-svc";
constexpr const char *kRecorderId = "corvane.tavro-screen-recorder";
constexpr const char *kCrashServiceId = "org.tizen.system.crash";

}  // namespace phone
