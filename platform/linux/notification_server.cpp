#include "notification_server.h"

#include <dlog.h>

#include <algorithm>
#include <map>
#include <utility>
#include <vector>

#include "app_core.h"
#include "bus.h"
#include "database.h"

namespace platform {
namespace {

using Posted = std::shared_ptr<PostedNotification>;

constexpr const char *kService = "org.freedesktop.Notifications";
constexpr const char *kPath = "/org/freedesktop/Notifications";
constexpr const char *kDefaultAction = "default";
constexpr int kCallTimeoutMs = 10'000;

// What is on the screen and can still call back.
std::map<guint32, Posted> &shown() {
  static std::map<guint32, Posted> &all = *new std::map<guint32, Posted>;
  return all;
}

void advance(const Posted &posted);

// Ids count anew when the service or its bus starts anew; this tells one run of the service from another.
std::string server_of(GDBusConnection *bus, GDBusMessage *reply) {
  const char *sender = g_dbus_message_get_sender(reply);
  return std::string(g_dbus_connection_get_guid(bus)) + " " + (sender ? sender : "");
}

void remember(const std::string &server, guint32 id, int type) {
  preference_database().run(
      "INSERT OR REPLACE INTO notification(server, id, app_id, type) VALUES(?1, ?2, ?3, ?4)",
      [&](sqlite3_stmt *statement) {
        bind_text(statement, 1, server.c_str());
        sqlite3_bind_int64(statement, 2, id);
        bind_text(statement, 3, application_id().c_str());
        sqlite3_bind_int(statement, 4, type);
      });
}

void forget(guint32 id) {
  preference_database().run("DELETE FROM notification WHERE id = ?1 AND app_id = ?2",
                            [id](sqlite3_stmt *statement) {
                              sqlite3_bind_int64(statement, 1, id);
                              bind_text(statement, 2, application_id().c_str());
                            });
}

void closed_cb(GDBusConnection *, const char *, const char *, const char *, const char *, GVariant *arguments,
               gpointer) {
  guint32 id;
  if (!g_variant_is_of_type(arguments, G_VARIANT_TYPE("(uu)"))) return;
  g_variant_get(arguments, "(uu)", &id, nullptr);
  const auto known = shown().find(id);
  if (known == shown().end()) return;
  known->second->server_id = 0;
  shown().erase(known);
  forget(id);
}

void action_cb(GDBusConnection *, const char *, const char *, const char *, const char *, GVariant *arguments,
               gpointer) {
  guint32 id;
  const char *action;
  if (!g_variant_is_of_type(arguments, G_VARIANT_TYPE("(us)"))) return;
  g_variant_get(arguments, "(u&s)", &id, &action);
  const auto known = shown().find(id);
  if (known == shown().end() || std::string(action) != kDefaultAction) return;
  const Posted posted = known->second;
  if (posted->touched) posted->touched();
}

void subscribe_once(GDBusConnection *bus) {
  static bool is_subscribed = false;
  if (std::exchange(is_subscribed, true)) return;
  g_dbus_connection_signal_subscribe(bus, kService, kService, "NotificationClosed", kPath, nullptr,
                                     G_DBUS_SIGNAL_FLAGS_NONE, closed_cb, nullptr, nullptr);
  g_dbus_connection_signal_subscribe(bus, kService, kService, "ActionInvoked", kPath, nullptr,
                                     G_DBUS_SIGNAL_FLAGS_NONE, action_cb, nullptr, nullptr);
}

using Answer = std::function<void(GDBusConnection *, GDBusMessage *)>;  // null message: it failed

void answered_cb(GObject *source, GAsyncResult *result, gpointer data) {
  const std::unique_ptr<Answer> answer(static_cast<Answer *>(data));
  release_end();
  auto *bus = reinterpret_cast<GDBusConnection *>(source);
  ErrorSlot error;
  const ScopedMessage reply(g_dbus_connection_send_message_with_reply_finish(bus, result, error.out()));
  const bool is_good = reply && !g_dbus_message_to_gerror(reply.get(), error.out());
  if (!is_good) dlog_print(DLOG_ERROR, "PLATFORM", "the notification service failed: %s", error.text());
  (*answer)(bus, is_good ? reply.get() : nullptr);
}

void call(GDBusConnection *bus, const char *method, GVariant *arguments, Answer answer) {
  const ScopedMessage message(g_dbus_message_new_method_call(kService, kPath, kService, method));
  if (arguments) g_dbus_message_set_body(message.get(), arguments);
  hold_end();
  g_dbus_connection_send_message_with_reply(bus, message.get(), G_DBUS_SEND_MESSAGE_FLAGS_NONE,
                                            kCallTimeoutMs, nullptr, nullptr, answered_cb,
                                            new Answer(std::move(answer)));
}

// Services that read markup must be given escaped text; the others would show the escapes.
enum class Markup { kUnknown, kRead, kIgnored };
Markup markup = Markup::kUnknown;

void take_capabilities(GDBusMessage *reply) {
  GVariant *body = reply ? g_dbus_message_get_body(reply) : nullptr;
  if (!body || !g_variant_is_of_type(body, G_VARIANT_TYPE("(as)"))) return;
  const ScopedVariant names(g_variant_get_child_value(body, 0));
  const std::unique_ptr<const char *, FreeWith<g_free>> list(g_variant_get_strv(names.get(), nullptr));
  markup = g_strv_contains(list.get(), "body-markup") ? Markup::kRead : Markup::kIgnored;
}

GVariant *hints_of(const NotificationContent &content) {
  GVariantBuilder hints;
  g_variant_builder_init(&hints, G_VARIANT_TYPE_VARDICT);
  g_variant_builder_add(&hints, "{sv}", "desktop-entry", g_variant_new_string(application_id().c_str()));
  if (content.is_ongoing) g_variant_builder_add(&hints, "{sv}", "resident", g_variant_new_boolean(TRUE));
  if (content.is_toast) g_variant_builder_add(&hints, "{sv}", "transient", g_variant_new_boolean(TRUE));
  if (content.progress) {
    const double share = std::clamp(*content.progress, 0.0, 1.0);
    g_variant_builder_add(&hints, "{sv}", "value", g_variant_new_int32(static_cast<int>(share * 100)));
  }
  return g_variant_builder_end(&hints);
}

GVariant *notify_arguments(const PostedNotification &posted, const NotificationContent &content) {
  const ScopedGText escaped(g_markup_escape_text(content.body.c_str(), -1));
  const char *with_action[] = {kDefaultAction, "", nullptr};
  const char *without_action[] = {nullptr};
  const std::string icon = content.icon_path.empty() ? application_id() : content.icon_path;
  return g_variant_new("(susss^as@a{sv}i)", application_id().c_str(), posted.server_id, icon.c_str(),
                       content.title.c_str(), markup == Markup::kRead ? escaped.get() : content.body.c_str(),
                       posted.touched ? with_action : without_action, hints_of(content), content.expire_ms);
}

void take_id(const Posted &posted, GDBusConnection *bus, GDBusMessage *reply) {
  GVariant *body = g_dbus_message_get_body(reply);
  if (!body || !g_variant_is_of_type(body, G_VARIANT_TYPE("(u)"))) return;
  if (posted->server_id) shown().erase(posted->server_id);
  g_variant_get(body, "(u)", &posted->server_id);
  shown()[posted->server_id] = posted;
  remember(server_of(bus, reply), posted->server_id, posted->type);
}

void notify(GDBusConnection *bus, const Posted &posted) {
  const NotificationContent content = *std::exchange(posted->wanted, std::nullopt);
  call(bus, "Notify", notify_arguments(*posted, content),
       [posted, is_toast = content.is_toast](GDBusConnection *answered, GDBusMessage *reply) {
         posted->is_busy = false;
         if (reply && !is_toast) take_id(posted, answered, reply);
         advance(posted);
       });
}

void close_on_server(GDBusConnection *bus, const Posted &posted) {
  posted->is_close_wanted = false;
  const guint32 id = std::exchange(posted->server_id, 0);
  if (id == 0) {
    posted->is_busy = false;
    return;
  }
  shown().erase(id);
  forget(id);
  call(bus, "CloseNotification", g_variant_new("(u)", id), [posted](GDBusConnection *, GDBusMessage *) {
    posted->is_busy = false;
    advance(posted);
  });
}

void act(GDBusConnection *bus, const Posted &posted) {
  if (posted->wanted) {
    notify(bus, posted);
  } else {
    close_on_server(bus, posted);
  }
}

// Take the next step towards what is wanted. One call at a time, because the next one needs the id that the
// first one brings.
void advance(const Posted &posted) {
  if (posted->is_busy || (!posted->wanted && !posted->is_close_wanted)) return;
  posted->is_busy = true;
  with_host_bus(HostBus::kSession, [posted](GDBusConnection *bus) {
    if (!bus) {
      posted->is_busy = false;
      return;
    }
    subscribe_once(bus);
    if (markup != Markup::kUnknown) return act(bus, posted);
    call(bus, "GetCapabilities", nullptr, [posted](GDBusConnection *answered, GDBusMessage *reply) {
      take_capabilities(reply);
      if (reply) return act(answered, posted);
      // Nobody shows notifications here; a later one asks again.
      posted->wanted.reset();
      posted->is_close_wanted = false;
      posted->is_busy = false;
    });
  });
}

}  // namespace

void show_notification(const Posted &notification, NotificationContent content) {
  notification->wanted = std::move(content);
  notification->is_close_wanted = false;
  advance(notification);
}

void close_notification(const Posted &notification) {
  notification->wanted.reset();
  notification->is_close_wanted = true;
  advance(notification);
}

void close_notifications_of_type(int type) {
  std::vector<Posted> own;
  for (const auto &[id, posted] : shown()) {
    if (posted->type == type) own.push_back(posted);
  }
  for (const Posted &posted : own) close_notification(posted);

  std::vector<std::pair<std::string, guint32>> rows;
  preference_database().run(
      "DELETE FROM notification WHERE app_id = ?1 AND type = ?2 RETURNING server, id",
      [type](sqlite3_stmt *statement) {
        bind_text(statement, 1, application_id().c_str());
        sqlite3_bind_int(statement, 2, type);
      },
      [&rows](sqlite3_stmt *statement) {
        rows.emplace_back(column_text(statement, 0),
                          static_cast<guint32>(sqlite3_column_int64(statement, 1)));
        return true;
      });
  if (rows.empty()) return;
  with_host_bus(HostBus::kSession, [rows](GDBusConnection *bus) {
    if (!bus) return;
    // Any answer of the service tells which run of it this is.
    call(bus, "GetServerInformation", nullptr, [rows](GDBusConnection *answered, GDBusMessage *reply) {
      for (const auto &[server, id] : rows) {
        if (!reply || server != server_of(answered, reply)) continue;
        call(answered, "CloseNotification", g_variant_new("(u)", id),
             [](GDBusConnection *, GDBusMessage *) {});
      }
    });
  });
}

}  // namespace platform
