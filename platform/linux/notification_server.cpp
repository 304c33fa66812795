#include "notification_server.h"

#include <dlog.h>

#include <algorithm>
#include <deque>
#include <memory>
#include <utility>
#include <vector>

#include "bus.h"
#include "notification_record.h"

namespace platform {
namespace {

constexpr int kCallTimeoutMs = 10'000;
constexpr guint kSuccessorMs = 100;  // within which what is closed may be replaced by something new

struct Waiting {
  NotificationStep step;
  NotificationDone done;
};

struct Queue {
  std::deque<Waiting> steps;
  bool is_busy = false;       // the service is being asked for the first step
  guint successor_timer = 0;  // the first step closes something, and waits for what may follow it
  bool has_waited = false;
  Shown inherited = {"", 0};  // what was to be closed, for the notification that comes next
};

Queue &queue() {
  static Queue &instance = *new Queue;
  return instance;
}

void advance();

// A run of the service that answered, and whether it reads markup: such a service must be given escaped
// text, the others would show the escapes.
struct Server {
  GDBusConnection *bus;
  std::string address;
  std::string name;
  bool reads_markup;
};

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

void call(GDBusConnection *bus, const char *address, const char *method, GVariant *arguments, Answer answer) {
  const ScopedMessage message(
      g_dbus_message_new_method_call(address, kNotificationPath, kNotificationService, method));
  if (arguments) g_dbus_message_set_body(message.get(), arguments);
  hold_end();
  g_dbus_connection_send_message_with_reply(bus, message.get(), G_DBUS_SEND_MESSAGE_FLAGS_NONE,
                                            kCallTimeoutMs, nullptr, nullptr, answered_cb,
                                            new Answer(std::move(answer)));
}

bool lists_markup(GDBusMessage *capabilities) {
  GVariant *body = g_dbus_message_get_body(capabilities);
  if (!body || !g_variant_is_of_type(body, G_VARIANT_TYPE("(as)"))) return false;
  const ScopedVariant names(g_variant_get_child_value(body, 0));
  const std::unique_ptr<const char *, FreeWith<g_free>> list(g_variant_get_strv(names.get(), nullptr));
  return g_strv_contains(list.get(), "body-markup");
}

GVariant *hints_of(const NotificationStep &step) {
  const NotificationContent &content = step.content;
  GVariantBuilder hints;
  g_variant_builder_init(&hints, G_VARIANT_TYPE_VARDICT);
  g_variant_builder_add(&hints, "{sv}", "desktop-entry", g_variant_new_string(step.app_id.c_str()));
  if (content.is_ongoing) g_variant_builder_add(&hints, "{sv}", "resident", g_variant_new_boolean(TRUE));
  if (content.is_toast) {
    g_variant_builder_add(&hints, "{sv}", "transient", g_variant_new_boolean(TRUE));
    // Stands out from a light and a dark page, where the service takes colours.
    for (const char *ground : {"bgcolor", "frcolor"})
      g_variant_builder_add(&hints, "{sv}", ground, g_variant_new_string("#323B48"));
    g_variant_builder_add(&hints, "{sv}", "fgcolor", g_variant_new_string("#FFFFFF"));
  }
  if (content.progress) {
    const double share = std::clamp(*content.progress, 0.0, 1.0);
    g_variant_builder_add(&hints, "{sv}", "value", g_variant_new_int32(static_cast<int>(share * 100)));
  }
  return g_variant_builder_end(&hints);
}

GVariant *notify_arguments(const NotificationStep &step, guint32 replaced, bool reads_markup) {
  const NotificationContent &content = step.content;
  const ScopedGText escaped(g_markup_escape_text(content.body.c_str(), -1));
  const char *with_action[] = {kTouchAction, "", nullptr};
  const char *without_action[] = {nullptr};
  const std::string icon = content.icon_path.empty() ? step.app_id : content.icon_path;
  return g_variant_new("(susss^as@a{sv}i)", step.app_id.c_str(), replaced, icon.c_str(),
                       content.title.c_str(), reads_markup ? escaped.get() : content.body.c_str(),
                       content.request.empty() ? without_action : with_action, hints_of(step),
                       content.expire_ms);
}

void end_step(bool is_done) {
  const NotificationDone done = std::move(queue().steps.front().done);
  queue().steps.pop_front();
  queue().is_busy = false;
  queue().has_waited = false;
  done(is_done);
  advance();
}

// The id that the content is to be shown under; 0: a new one.
guint32 replaced_by(const NotificationStep &step, const Server &server) {
  if (step.content.is_toast) return 0;
  const Shown inherited = std::exchange(queue().inherited, {"", 0});
  for (const Shown &shown : shown_under_tag(step)) {
    if (shown.server == server.name) return shown.id;
  }
  return inherited.server == server.name ? inherited.id : 0;
}

void show(const Server &server, const NotificationStep &step) {
  call(server.bus, server.address.c_str(), "Notify",
       notify_arguments(step, replaced_by(step, server), server.reads_markup),
       [step, name = server.name](GDBusConnection *, GDBusMessage *reply) {
         GVariant *body = reply ? g_dbus_message_get_body(reply) : nullptr;
         const bool is_shown = body && g_variant_is_of_type(body, G_VARIANT_TYPE("(u)"));
         if (is_shown && !step.content.is_toast) {
           Shown shown{name, 0};
           g_variant_get(body, "(u)", &shown.id);
           remember_shown(step, shown);
         }
         end_step(is_shown);
       });
}

// Whether the same application shows something new right behind the step that is being taken.
bool is_new_notification_next() {
  const auto &steps = queue().steps;
  if (steps.size() < 2) return false;
  const NotificationStep &next = steps[1].step;
  return next.kind == NotificationStep::kShow && next.app_id == steps[0].step.app_id &&
         !next.content.is_toast && shown_under_tag(next).empty();
}

void stop_waiting() {
  queue().successor_timer = 0;
  queue().is_busy = false;
  release_end();
}

gboolean waited_cb(gpointer) {
  stop_waiting();
  advance();
  return G_SOURCE_REMOVE;
}

// The close and the show of a replacement are two requests, between which their sender may lose the
// processor.
bool must_wait(const std::vector<Shown> &found) {
  if (found.empty() || queue().steps.size() > 1 || queue().has_waited) return false;
  queue().has_waited = true;
  hold_end();
  queue().successor_timer = g_timeout_add(kSuccessorMs, waited_cb, nullptr);
  return true;
}

void close(const Server &server, const std::vector<Shown> &found) {
  if (must_wait(found)) return;
  // What is on the screen becomes the one that follows, so that there is never a moment with none or both.
  // Its row stays until then: a process that dies in between leaves a notification that can be closed.
  if (!found.empty() && found.back().server == server.name && is_new_notification_next()) {
    queue().inherited = found.back();
  }
  for (const Shown &shown : found) {
    const bool is_there = shown.server == server.name;
    if (is_there && shown.id == queue().inherited.id) continue;
    forget_shown(shown);
    if (is_there) {
      g_dbus_connection_call(server.bus, server.address.c_str(), kNotificationPath, kNotificationService,
                             "CloseNotification", g_variant_new("(u)", shown.id), nullptr,
                             G_DBUS_CALL_FLAGS_NONE, -1, nullptr, nullptr, nullptr);
    }
  }
  end_step(true);
}

std::vector<Shown> to_close(const NotificationStep &step) {
  return step.kind == NotificationStep::kClose ? shown_under_tag(step) : shown_of_type(step);
}

// Nobody shows notifications here, now; what comes later asks again.
void drop_all() {
  queue().is_busy = false;
  queue().has_waited = false;
  queue().inherited = {"", 0};
  for (const Waiting &waiting : std::exchange(queue().steps, {})) waiting.done(false);
}

// The answer tells which run of the service this is; all that follows goes to that run alone, so that no id
// can meet another run's notification.
void take_step(GDBusConnection *bus, GDBusMessage *capabilities) {
  const NotificationStep &step = queue().steps.front().step;
  const char *address = g_dbus_message_get_sender(capabilities);
  const Server server = {bus, address ? address : kNotificationService, notification_server_of(bus, address),
                         lists_markup(capabilities)};
  if (step.kind == NotificationStep::kShow) return show(server, step);
  close(server, to_close(step));
}

// What has nothing to close needs no service.
bool is_empty(const NotificationStep &step) {
  return step.kind != NotificationStep::kShow && to_close(step).empty();
}

void advance() {
  if (queue().is_busy || queue().steps.empty()) return;
  queue().is_busy = true;
  if (is_empty(queue().steps.front().step)) return end_step(true);
  with_host_bus(HostBus::kSession, [](GDBusConnection *bus) {
    if (!bus) return drop_all();
    call(bus, kNotificationService, "GetCapabilities", nullptr,
         [](GDBusConnection *answered, GDBusMessage *reply) {
           if (!reply) return drop_all();
           take_step(answered, reply);
         });
  });
}

}  // namespace

void take_notification_step(NotificationStep step, NotificationDone done) {
  queue().steps.push_back({std::move(step), std::move(done)});
  if (queue().successor_timer) {
    g_source_remove(queue().successor_timer);
    stop_waiting();
  }
  advance();
}

std::string notification_server_of(GDBusConnection *bus, const char *sender) {
  return std::string(g_dbus_connection_get_guid(bus)) + " " + (sender ? sender : "");
}

}  // namespace platform
