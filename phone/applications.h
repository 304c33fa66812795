// The phone's applications as the phone itself handles them: the upload and the crash service run for as long
// as the phone does, the client is shown once; both are asked to end before anything they need goes away.
// Main loop only.
#pragma once

#include <string>
#include <utility>
#include <vector>

#include "tavro_handles.h"

namespace phone {

struct LaunchRequest {
  std::string app_id;
  std::string operation;
  std::string uri;
  std::string mime;
  std::vector<std::pair<std::string, std::string>> extra_data;
};

// Whether the text can be a bus name, so that a mistyped application id is told from a missing application.
bool is_application_id(const std::string &text);

// Send the request, starting the application where it does not run. False with the reason.
bool send_launch_request(GDBusConnection *bus, const LaunchRequest &request, std::string *reason);

// The same, and wait for the reply, however long a person takes. Null with the reason; else (ia(ss)).
TavroVariant send_and_wait(GDBusConnection *bus, const LaunchRequest &request, std::string *reason);

// Keeps a service running: started at once, and again, later each time, when it is gone.
class ServiceKeeper {
 public:
  // `name` is for messages.
  ServiceKeeper(GDBusConnection *bus, std::string app_id, std::string name);
  ServiceKeeper(const ServiceKeeper &) = delete;
  ServiceKeeper &operator=(const ServiceKeeper &) = delete;
  ~ServiceKeeper();

 private:
  static void appeared_cb(GDBusConnection *, const char *, const char *, gpointer self);
  static void vanished_cb(GDBusConnection *, const char *, gpointer self);
  static void started_cb(GObject *bus, GAsyncResult *result, gpointer self);
  static gboolean start_cb(gpointer self);
  void start_later();

  GDBusConnection *bus_;
  const std::string app_id_, name_;
  TavroObject<GCancellable> cancellable_{g_cancellable_new()};
  guint watch_ = 0;
  guint start_source_ = 0;
  guint delay_s_ = 1;
  gint64 appeared_us_ = 0;
  bool has_run_ = false;
};

// Ask the application to end and wait until it has, `patience_ms` at most; then it is killed. Returns at once
// when it does not run.
void end_application(GDBusConnection *bus, const std::string &app_id, int patience_ms);

// The process of the application, 0 when it does not run.
int application_pid(GDBusConnection *bus, const std::string &app_id);

}  // namespace phone
