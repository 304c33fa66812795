// Helpers of the platform's tests: running sample applications in this test's phone, and waiting for what
// they do while the GLib main loop runs.
#pragma once

#include <app_control.h>
#include <gio/gio.h>
#include <signal.h>
#include <sys/wait.h>
#include <unistd.h>

#include <algorithm>
#include <fstream>
#include <functional>
#include <sstream>
#include <string>
#include <vector>

#include "files.h"

inline const std::string kService = "test.sample-service";
inline const std::string kWindow = "test.window";

// Runs the main loop until the condition holds; false after `seconds`.
inline bool wait_for(const std::function<bool()> &condition, double seconds = 20) {
  const gint64 end = g_get_monotonic_time() + static_cast<gint64>(seconds * G_USEC_PER_SEC);
  while (!condition()) {
    if (g_get_monotonic_time() > end) return false;
    g_main_context_iteration(nullptr, FALSE);
    g_usleep(500);
  }
  return true;
}

inline std::vector<std::string> record_of(const std::string &app_id) {
  std::istringstream content(file_contents("/opt/usr/" + app_id + ".record"));
  std::vector<std::string> lines;
  for (std::string line; std::getline(content, line);) lines.push_back(line);
  return lines;
}

inline long count_in_record(const std::string &app_id, const std::string &line) {
  const auto lines = record_of(app_id);
  return std::count(lines.begin(), lines.end(), line);
}

// Start a program; the process id.
inline pid_t start(const std::vector<std::string> &command, int output = -1) {
  const pid_t child = fork();
  if (child != 0) return child;
  if (output >= 0) dup2(output, STDOUT_FILENO);
  std::vector<char *> arguments;
  for (const auto &argument : command) arguments.push_back(const_cast<char *>(argument.c_str()));
  arguments.push_back(nullptr);
  execvp(arguments[0], arguments.data());
  _exit(127);
}

// The exit status of a child; minus the signal that ended it.
inline int wait_for_end(pid_t child) {
  int status = 0;
  wait_for([&] { return waitpid(child, &status, WNOHANG) == child; });
  return WIFEXITED(status) ? WEXITSTATUS(status) : -WTERMSIG(status);
}

inline std::string program_of(const std::string &app_id) {
  return std::string(TAVRO_SAMPLE_APPS) + "/" + app_id + "/bin/" + app_id;
}

// Send one request; reply callback or none.
inline int send(const std::string &app_id, const std::string &operation, const std::string &number = "",
                app_control_reply_cb callback = nullptr, void *data = nullptr) {
  app_control_h request = nullptr;
  app_control_create(&request);
  app_control_set_app_id(request, app_id.c_str());
  app_control_set_operation(request, operation.c_str());
  if (!number.empty()) app_control_add_extra_data(request, "number", number.c_str());
  const int result = app_control_send_launch_request(request, callback, data);
  app_control_destroy(request);
  return result;
}

// Make the bus able to start an application, with further variables in its environment.
inline void make_startable(const std::string &app_id, const std::string &environment = "") {
  const std::string folder = std::string(g_getenv("XDG_RUNTIME_DIR")) + "/dbus-1/services";
  g_mkdir_with_parents(folder.c_str(), 0700);
  std::ofstream(folder + "/" + app_id + ".service")
      << "[D-BUS Service]\nName=" << app_id << "\nExec=/usr/bin/env " << environment << " "
      << program_of(app_id) << "\n";
  GDBusConnection *bus = g_bus_get_sync(G_BUS_TYPE_SESSION, nullptr, nullptr);
  GVariant *reply = g_dbus_connection_call_sync(bus, "org.freedesktop.DBus", "/org/freedesktop/DBus",
                                                "org.freedesktop.DBus", "ReloadConfig", nullptr, nullptr,
                                                G_DBUS_CALL_FLAGS_NONE, -1, nullptr, nullptr);
  if (reply) g_variant_unref(reply);
}
