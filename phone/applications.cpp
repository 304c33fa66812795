#include "applications.h"

#include <signal.h>

#include <algorithm>

#include "message_bus.h"
#include "options.h"
#include "program.h"

namespace phone {

namespace {

constexpr guint kLongestDelaySeconds = 30;
constexpr gint64 kSteadyAfterMicroseconds = 30 * G_USEC_PER_SEC;
constexpr const char *kInterface = "org.tavro.AppControl1";

std::string object_path(const std::string &app_id) {
  std::string path = "/" + app_id;
  std::replace(path.begin(), path.end(), '.', '/');
  std::replace(path.begin(), path.end(), '-', '_');
  return path;
}

GVariant *arguments_of(const LaunchRequest &request) {
  GVariantBuilder pairs;
  g_variant_builder_init(&pairs, G_VARIANT_TYPE("a(ss)"));
  for (const auto &[key, value] : request.extra_data) {
    g_variant_builder_add(&pairs, "(ss)", key.c_str(), value.c_str());
  }
  return g_variant_new("(sssa(ss))", request.operation.c_str(), request.uri.c_str(), request.mime.c_str(),
                       &pairs);
}

}  // namespace

bool is_application_id(const std::string &text) {
  return g_dbus_is_name(text.c_str()) && !g_dbus_is_unique_name(text.c_str());
}

bool send_launch_request(GDBusConnection *bus, const LaunchRequest &request, std::string *reason) {
  // A message without a reply reports no failure, so what can fail is asked first.
  if (!start_by_name(bus, request.app_id, reason)) return false;
  TavroObject<GDBusMessage> message(g_dbus_message_new_method_call(
      request.app_id.c_str(), object_path(request.app_id).c_str(), kInterface, "Launch"));
  g_dbus_message_set_body(message.get(), arguments_of(request));
  g_dbus_message_set_flags(message.get(), G_DBUS_MESSAGE_FLAGS_NO_REPLY_EXPECTED);
  TavroError error;
  const bool is_sent = g_dbus_connection_send_message(bus, message.get(), G_DBUS_SEND_MESSAGE_FLAGS_NONE,
                                                      nullptr, tavro_out(error)) &&
                       g_dbus_connection_flush_sync(bus, nullptr, tavro_out(error));
  if (!is_sent) *reason = plain_message(error.get());
  return is_sent;
}

TavroVariant send_and_wait(GDBusConnection *bus, const LaunchRequest &request, std::string *reason) {
  TavroError error;
  TavroVariant reply(
      g_dbus_connection_call_sync(bus, request.app_id.c_str(), object_path(request.app_id).c_str(),
                                  kInterface, "Launch", arguments_of(request), G_VARIANT_TYPE("(ia(ss))"),
                                  G_DBUS_CALL_FLAGS_NONE, G_MAXINT, nullptr, tavro_out(error)));
  if (!reply) *reason = plain_message(error.get());
  return reply;
}

ServiceKeeper::ServiceKeeper(GDBusConnection *bus, std::string app_id, std::string name)
    : bus_(bus), app_id_(std::move(app_id)), name_(std::move(name)) {
  // The watch calls back at once with what is; the service does not run yet, so that starts it.
  watch_ = g_bus_watch_name_on_connection(bus, app_id_.c_str(), G_BUS_NAME_WATCHER_FLAGS_NONE, appeared_cb,
                                          vanished_cb, this, nullptr);
}

ServiceKeeper::~ServiceKeeper() {
  g_cancellable_cancel(cancellable_.get());
  if (start_source_) g_source_remove(start_source_);
  g_bus_unwatch_name(watch_);
}

void ServiceKeeper::appeared_cb(GDBusConnection *, const char *, const char *, gpointer self) {
  auto *keeper = static_cast<ServiceKeeper *>(self);
  keeper->has_run_ = true;
  keeper->appeared_us_ = g_get_monotonic_time();
}

void ServiceKeeper::vanished_cb(GDBusConnection *connection, const char *, gpointer self) {
  auto *keeper = static_cast<ServiceKeeper *>(self);
  if (!connection) return;  // the bus itself is gone
  if (!keeper->has_run_) {
    start_cb(keeper);
    return;
  }
  say(keeper->name_ + " ended");
  if (g_get_monotonic_time() - keeper->appeared_us_ > kSteadyAfterMicroseconds) keeper->delay_s_ = 1;
  keeper->start_later();
}

void ServiceKeeper::start_later() {
  if (start_source_) return;
  start_source_ = g_timeout_add_seconds(delay_s_, start_cb, this);
  delay_s_ = std::min(delay_s_ * 2, kLongestDelaySeconds);
}

gboolean ServiceKeeper::start_cb(gpointer self) {
  auto *keeper = static_cast<ServiceKeeper *>(self);
  keeper->start_source_ = 0;
  g_dbus_connection_call(keeper->bus_, "org.freedesktop.DBus", "/org/freedesktop/DBus",
                         "org.freedesktop.DBus", "StartServiceByName",
                         g_variant_new("(su)", keeper->app_id_.c_str(), 0u), G_VARIANT_TYPE("(u)"),
                         G_DBUS_CALL_FLAGS_NONE, G_MAXINT, keeper->cancellable_.get(), started_cb, keeper);
  return G_SOURCE_REMOVE;
}

void ServiceKeeper::started_cb(GObject *bus, GAsyncResult *result, gpointer self) {
  TavroError error;
  TavroVariant reply(g_dbus_connection_call_finish(G_DBUS_CONNECTION(bus), result, tavro_out(error)));
  if (reply || g_error_matches(error.get(), G_IO_ERROR, G_IO_ERROR_CANCELLED)) return;
  auto *keeper = static_cast<ServiceKeeper *>(self);
  say(keeper->name_ + " cannot be started: " + plain_message(error.get()));
  keeper->start_later();
}

int application_pid(GDBusConnection *bus, const std::string &app_id) {
  TavroVariant reply(g_dbus_connection_call_sync(bus, "org.freedesktop.DBus", "/org/freedesktop/DBus",
                                                 "org.freedesktop.DBus", "GetConnectionUnixProcessID",
                                                 g_variant_new("(s)", app_id.c_str()), G_VARIANT_TYPE("(u)"),
                                                 G_DBUS_CALL_FLAGS_NONE, 1000, nullptr, nullptr));
  guint32 pid = 0;
  if (reply) g_variant_get(reply.get(), "(u)", &pid);
  return static_cast<int>(pid);
}

void end_application(GDBusConnection *bus, const std::string &app_id, int patience_ms) {
  const int pid = application_pid(bus, app_id);
  if (pid <= 1 || kill(pid, SIGTERM) != 0 || wait_for_end_of(pid, patience_ms)) return;
  say(app_id + " did not end in time and was killed");
  kill(pid, SIGKILL);
}

}  // namespace phone
