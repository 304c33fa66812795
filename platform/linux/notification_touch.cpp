#include "notification_touch.h"

#include <dlog.h>

#include <string>
#include <utility>

#include "app_control_internal.h"
#include "database.h"
#include "notification_server.h"
#include "scoped.h"

namespace platform {
namespace {

guint service_watch = 0;
// The run of the notification service that is there now; empty: none.
std::string &server_now = *new std::string;

// The launch request of a notification; without a receiver when there is none.
app_control_s request_of(const std::string &server, guint32 id) {
  app_control_s request;
  preference_database().run(
      "SELECT receiver, request FROM posted_notification WHERE server = ?1 AND id = ?2"
      " AND receiver IS NOT NULL AND request IS NOT NULL",
      [&](sqlite3_stmt *statement) {
        bind_text(statement, 1, server.c_str());
        sqlite3_bind_int64(statement, 2, id);
      },
      [&request](sqlite3_stmt *statement) {
        ErrorSlot error;
        const ScopedVariant arguments(g_variant_parse(
            G_VARIANT_TYPE(kLaunchArguments), column_text(statement, 1), nullptr, nullptr, error.out()));
        if (!arguments) {
          dlog_print(DLOG_ERROR, "PLATFORM", "a kept launch request cannot be read: %s", error.text());
          return true;
        }
        request = launch_request(arguments.get(), nullptr);
        request.app_id = column_text(statement, 0);
        return true;
      });
  return request;
}

void touched_cb(GDBusConnection *bus, const char *sender, const char *, const char *, const char *,
                GVariant *arguments, gpointer) {
  guint32 id;
  const char *action;
  if (!g_variant_is_of_type(arguments, G_VARIANT_TYPE("(us)"))) return;
  g_variant_get(arguments, "(u&s)", &id, &action);
  if (std::string(action) != kTouchAction) return;
  app_control_s request = request_of(notification_server_of(bus, sender), id);
  if (!request.app_id) return;  // not ours
  const int result = app_control_send_launch_request(&request, nullptr, nullptr);
  if (result == APP_CONTROL_ERROR_NONE) return;
  dlog_print(DLOG_ERROR, "PLATFORM", "a touched notification launched nothing: %s",
             get_error_message(result));
}

void closed_cb(GDBusConnection *bus, const char *sender, const char *, const char *, const char *,
               GVariant *arguments, gpointer) {
  guint32 id;
  if (!g_variant_is_of_type(arguments, G_VARIANT_TYPE("(uu)"))) return;
  g_variant_get(arguments, "(uu)", &id, nullptr);
  preference_database().run("DELETE FROM posted_notification WHERE server = ?1 AND id = ?2",
                            [server = notification_server_of(bus, sender), id](sqlite3_stmt *statement) {
                              bind_text(statement, 1, server.c_str());
                              sqlite3_bind_int64(statement, 2, id);
                            });
}

// No service takes over what another run of it showed.
void service_appeared_cb(GDBusConnection *bus, const char *, const char *owner, gpointer) {
  server_now = notification_server_of(bus, owner);
  preference_database().run("DELETE FROM posted_notification WHERE server <> ?1",
                            [](sqlite3_stmt *statement) { bind_text(statement, 1, server_now.c_str()); });
}

void service_vanished_cb(GDBusConnection *, const char *, gpointer) {
  if (server_now.empty()) return;
  preference_database().run("DELETE FROM posted_notification WHERE server = ?1",
                            [](sqlite3_stmt *statement) { bind_text(statement, 1, server_now.c_str()); });
  server_now.clear();
}

void subscribe(GDBusConnection *bus, const char *signal, GDBusSignalCallback callback) {
  g_dbus_connection_signal_subscribe(bus, kNotificationService, kNotificationService, signal,
                                     kNotificationPath, nullptr, G_DBUS_SIGNAL_FLAGS_NONE, callback, nullptr,
                                     nullptr);
}

}  // namespace

void watch_notifications(GDBusConnection *desktop) {
  subscribe(desktop, "ActionInvoked", touched_cb);
  subscribe(desktop, "NotificationClosed", closed_cb);
  service_watch = g_bus_watch_name_on_connection(desktop, kNotificationService, G_BUS_NAME_WATCHER_FLAGS_NONE,
                                                 service_appeared_cb, service_vanished_cb, nullptr, nullptr);
}

void stop_watching_notifications() {
  if (service_watch) g_bus_unwatch_name(std::exchange(service_watch, 0));
  service_vanished_cb(nullptr, nullptr, nullptr);
}

}  // namespace platform
