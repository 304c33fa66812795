#include "notification_requests.h"

#include <list>
#include <utility>

#include "app_core.h"
#include "bus.h"
#include "database.h"

namespace platform {
namespace {

constexpr int kLinkTimeoutMs = 60'000;  // many steps may wait for a slow service
constexpr double kNoProgress = -1.0;

using Steps = std::list<NotificationStep>;

struct Requests {
  Steps pending;  // not known to be taken, in order
  std::function<void(const std::string &)> show_toast;
};

Requests &requests() {
  static Requests &instance = *new Requests;
  return instance;
}

void finish(Steps::iterator step, bool is_done) {
  const NotificationContent content = std::move(step->content);
  requests().pending.erase(step);
  if (!is_done && content.is_toast && requests().show_toast) requests().show_toast(content.title);
}

void take_here(Steps::iterator step) {
  take_notification_step(*step, [step](bool is_done) { finish(step, is_done); });
}

void answered_cb(GObject *bus, GAsyncResult *result, gpointer data) {
  const std::unique_ptr<Steps::iterator> step(static_cast<Steps::iterator *>(data));
  release_end();
  ErrorSlot error;
  const ScopedVariant reply(
      g_dbus_connection_call_finish(reinterpret_cast<GDBusConnection *>(bus), result, error.out()));
  if (!reply) return take_here(*step);
  gboolean is_done;
  g_variant_get(reply.get(), "(b)", &is_done);
  finish(*step, is_done);
}

void add(NotificationStep step) {
  step.app_id = application_id();
  requests().pending.push_back(std::move(step));
  const auto added = std::prev(requests().pending.end());
  GDBusConnection *bus = phone_bus();
  if (!bus) return take_here(added);
  hold_end();
  g_dbus_connection_call(bus, kLinkName, kLinkPath, kLinkInterface, kLinkTakeStep, step_to_variant(*added),
                         G_VARIANT_TYPE("(b)"), G_DBUS_CALL_FLAGS_NONE, kLinkTimeoutMs, nullptr, answered_cb,
                         new Steps::iterator(added));
}

std::optional<int> kept_type(const std::string &tag) {
  std::optional<int> type;
  preference_database().run(
      "SELECT type FROM posted_notification WHERE app_id = ?1 AND tag = ?2",
      [&tag](sqlite3_stmt *statement) {
        bind_text(statement, 1, application_id().c_str());
        bind_text(statement, 2, tag.c_str());
      },
      [&type](sqlite3_stmt *statement) {
        type = sqlite3_column_int(statement, 0);
        return true;
      });
  return type;
}

}  // namespace

GVariant *step_to_variant(const NotificationStep &step) {
  const NotificationContent &content = step.content;
  return g_variant_new(kStepArguments, static_cast<int>(step.kind), step.app_id.c_str(), content.type,
                       content.tag.c_str(), content.title.c_str(), content.body.c_str(),
                       content.icon_path.c_str(), content.receiver.c_str(), content.request.c_str(),
                       content.expire_ms, content.is_ongoing, content.is_toast,
                       content.progress.value_or(kNoProgress));
}

NotificationStep step_from_variant(GVariant *arguments) {
  const char *app_id, *tag, *title, *body, *icon_path, *receiver, *request;
  int kind, type, expire_ms;
  gboolean is_ongoing, is_toast;
  double progress;
  g_variant_get(arguments, "(i&si&s&s&s&s&s&sibbd)", &kind, &app_id, &type, &tag, &title, &body, &icon_path,
                &receiver, &request, &expire_ms, &is_ongoing, &is_toast, &progress);
  NotificationContent content = {tag,     type,      title,           body,          icon_path, receiver,
                                 request, expire_ms, is_ongoing != 0, is_toast != 0, {}};
  if (progress >= 0.0) content.progress = progress;
  return {static_cast<NotificationStep::Kind>(kind), app_id, std::move(content)};
}

void show_notification(NotificationContent content) {
  add({NotificationStep::kShow, "", std::move(content)});
}

void close_notification(const std::string &tag) {
  NotificationStep step;
  step.kind = NotificationStep::kClose;
  step.content.tag = tag;
  add(std::move(step));
}

void close_notifications_of_type(int type) {
  NotificationStep step;
  step.kind = NotificationStep::kCloseType;
  step.content.type = type;
  add(std::move(step));
}

std::optional<int> shown_notification_type(const std::string &tag) {
  std::optional<int> type = kept_type(tag);
  for (const NotificationStep &step : requests().pending) {
    const bool is_tag = step.kind != NotificationStep::kCloseType && step.content.tag == tag;
    const bool is_type = step.kind == NotificationStep::kCloseType && type == step.content.type;
    if (is_tag && step.kind == NotificationStep::kShow) {
      type = step.content.type;
    } else if (is_tag || is_type) {
      type.reset();
    }
  }
  return type;
}

void set_toast_fallback(std::function<void(const std::string &)> show) {
  requests().show_toast = std::move(show);
}

}  // namespace platform
