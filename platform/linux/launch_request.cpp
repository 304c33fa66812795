// Sending launch requests over the phone's bus, and answering them.

#include <dlog.h>

#include <algorithm>
#include <atomic>
#include <mutex>
#include <set>

#include "app_control_internal.h"
#include "bus.h"
#include "scoped.h"

namespace platform {
namespace {

std::atomic<bool> loop_flushes{false};

// Applications that the bus can start. The list changes only when an application is installed: an id that is
// not in it makes us ask again.
bool is_startable(const std::string &app_id) {
  static std::set<std::string> &startable = *new std::set<std::string>;
  if (startable.count(app_id)) return true;
  ErrorSlot error;
  const ScopedVariant reply = call_bus_daemon("ListActivatableNames", nullptr, "(as)", &error);
  if (!reply) return false;
  startable.clear();
  GVariantIter *names;
  const char *name;
  g_variant_get(reply.get(), "(as)", &names);
  while (g_variant_iter_next(names, "&s", &name)) startable.insert(name);
  g_variant_iter_free(names);
  return startable.count(app_id) > 0;
}

bool is_running(const std::string &app_id) {
  ErrorSlot error;
  const ScopedVariant reply =
      call_bus_daemon("NameHasOwner", g_variant_new("(s)", app_id.c_str()), "(b)", &error);
  gboolean has_owner = FALSE;
  if (reply) g_variant_get(reply.get(), "(b)", &has_owner);
  return has_owner;
}

// Names of the bus itself and unique names are no application ids.
bool is_application_id(const std::string &app_id) {
  return g_dbus_is_name(app_id.c_str()) && !g_dbus_is_unique_name(app_id.c_str()) && app_id != kBusName;
}

// A request that waits for its reply.
struct Sent {
  app_control_s request;
  app_control_reply_cb callback;
  void *user_data;
  bool is_repeated = false;
};

void call_with_reply(std::unique_ptr<Sent> sent);

void report(Sent *sent, GVariant *answer) {
  if (!answer) return sent->callback(&sent->request, nullptr, APP_CONTROL_RESULT_FAILED, sent->user_data);
  int result;
  GVariant *pairs;
  g_variant_get(answer, "(i@a(ss))", &result, &pairs);
  const ScopedVariant owned_pairs(pairs);
  app_control_s reply;
  reply.extra_data = extra_data_from_variant(pairs);
  sent->callback(&sent->request, &reply, static_cast<app_control_result_e>(result), sent->user_data);
}

void replied_cb(GObject *source, GAsyncResult *result, gpointer data) {
  std::unique_ptr<Sent> sent(static_cast<Sent *>(data));
  ErrorSlot error;
  const ScopedVariant answer(
      g_dbus_connection_call_finish(reinterpret_cast<GDBusConnection *>(source), result, error.out()));
  // No reply means that the receiver left the bus while it had the request, most likely because it was just
  // ending. Handlers bear a repeat.
  if (!answer && error.is(G_DBUS_ERROR, G_DBUS_ERROR_NO_REPLY) && !sent->is_repeated) {
    sent->is_repeated = true;
    return call_with_reply(std::move(sent));
  }
  if (!answer) {
    dlog_print(DLOG_ERROR, "PLATFORM", "launch request to %s failed: %s", sent->request.app_id->c_str(),
               error.text());
  }
  report(sent.get(), answer.get());
}

void call_with_reply(std::unique_ptr<Sent> sent) {
  const std::string &app_id = *sent->request.app_id;
  GVariant *arguments = launch_arguments(sent->request);
  const std::string path = launch_path(app_id);
  // The receiver may be waiting for a person: no time limit.
  g_dbus_connection_call(phone_bus(), app_id.c_str(), path.c_str(), kLaunchInterface, kLaunchMethod,
                         arguments, G_VARIANT_TYPE(kLaunchReply), G_DBUS_CALL_FLAGS_NONE, kNoTimeLimit,
                         nullptr, replied_cb, sent.release());
}

// Serials of the latest requests that were sent without asking for a reply. The bus says even of those when
// it could not deliver them.
class UnansweredRequests {
 public:
  void add(guint32 serial, const std::string &app_id) {
    const std::lock_guard<std::mutex> lock(mutex_);
    slots_[next_++ % kRemembered] = {serial, app_id};
  }

  void log_failure(guint32 serial, const char *reason) {
    const std::lock_guard<std::mutex> lock(mutex_);
    const auto slot = std::find_if(std::begin(slots_), std::end(slots_),
                                   [serial](const Slot &candidate) { return candidate.serial == serial; });
    if (slot == std::end(slots_)) return;
    dlog_print(DLOG_ERROR, "PLATFORM", "launch request to %s was not delivered: %s", slot->app_id.c_str(),
               reason ? reason : "no reason given");
  }

 private:
  static constexpr size_t kRemembered = 256;
  struct Slot {
    guint32 serial;
    std::string app_id;
  };

  std::mutex mutex_;  // guards the slots: the filter runs on the bus connection's own thread
  Slot slots_[kRemembered] = {};
  size_t next_ = 0;
};

UnansweredRequests &unanswered() {
  static UnansweredRequests &requests = *new UnansweredRequests;
  return requests;
}

GDBusMessage *log_errors_cb(GDBusConnection *, GDBusMessage *message, gboolean is_incoming, gpointer) {
  if (is_incoming && g_dbus_message_get_message_type(message) == G_DBUS_MESSAGE_TYPE_ERROR) {
    unanswered().log_failure(g_dbus_message_get_reply_serial(message), g_dbus_message_get_arg0(message));
  }
  return message;
}

void watch_unanswered_requests() {
  static const guint filter =
      phone_bus() ? g_dbus_connection_add_filter(phone_bus(), log_errors_cb, nullptr, nullptr) : 0;
  static_cast<void>(filter);
}

int send_without_reply(const app_control_s &request) {
  watch_unanswered_requests();
  const ScopedMessage message(g_dbus_message_new_method_call(
      request.app_id->c_str(), launch_path(*request.app_id).c_str(), kLaunchInterface, kLaunchMethod));
  g_dbus_message_set_flags(message.get(), G_DBUS_MESSAGE_FLAGS_NO_REPLY_EXPECTED);
  g_dbus_message_set_body(message.get(), launch_arguments(request));
  ErrorSlot error;
  guint32 serial = 0;
  if (!g_dbus_connection_send_message(phone_bus(), message.get(), G_DBUS_SEND_MESSAGE_FLAGS_NONE, &serial,
                                      error.out())) {
    dlog_print(DLOG_ERROR, "PLATFORM", "launch request to %s failed: %s", request.app_id->c_str(),
               error.text());
    return APP_CONTROL_ERROR_LAUNCH_FAILED;
  }
  unanswered().add(serial, *request.app_id);
  if (!loop_flushes) flush_phone_bus();
  return APP_CONTROL_ERROR_NONE;
}

int view_with(GAppInfo *viewer, std::string uri) {
  if (!viewer) return APP_CONTROL_ERROR_APP_NOT_FOUND;
  ErrorSlot error;
  GList uris = {uri.data(), nullptr, nullptr};
  if (g_app_info_launch_uris(viewer, &uris, nullptr, error.out())) return APP_CONTROL_ERROR_NONE;
  dlog_print(DLOG_ERROR, "PLATFORM", "%s cannot show %s: %s", g_app_info_get_id(viewer), uri.c_str(),
             error.text());
  return APP_CONTROL_ERROR_LAUNCH_FAILED;
}

// Show what the address names in the application that the machine has for its type.
int view_with_default_application(const app_control_s &request) {
  const ScopedGText guessed(g_content_type_guess(request.uri->c_str(), nullptr, 0, nullptr));
  const char *type = request.mime ? request.mime->c_str() : guessed.get();
  const ScopedObject<GAppInfo> viewer(g_app_info_get_default_for_type(type, FALSE));
  return view_with(viewer.get(), *request.uri);
}

// Applications that a phone has, in whose place a Linux machine has one for the scheme of the address.
bool is_played_by_machine(const std::string &app_id) {
  return app_id == "corvane.browser" || app_id == "org.tizen.tizenstore";
}

int view_with_scheme_handler(const app_control_s &request) {
  const ScopedGText scheme(g_uri_parse_scheme(request.uri->c_str()));
  const ScopedObject<GAppInfo> viewer(scheme ? g_app_info_get_default_for_uri_scheme(scheme.get()) : nullptr);
  return view_with(viewer.get(), *request.uri);
}

}  // namespace

std::string launch_path(const std::string &app_id) {
  std::string path = "/" + app_id;
  std::replace(path.begin(), path.end(), '.', '/');
  std::replace(path.begin(), path.end(), '-', '_');
  return path;
}

GVariant *launch_arguments(const app_control_s &request) {
  return g_variant_new("(sss@a(ss))", request.operation.value_or("").c_str(),
                       request.uri.value_or("").c_str(), request.mime.value_or("").c_str(),
                       extra_data_to_variant(request.extra_data));
}

app_control_s launch_request(GVariant *arguments, GDBusMethodInvocation *invocation) {
  const char *operation, *uri, *mime;
  GVariant *pairs;
  g_variant_get(arguments, "(&s&s&s@a(ss))", &operation, &uri, &mime, &pairs);
  const ScopedVariant owned_pairs(pairs);
  const auto set = [](std::optional<std::string> *field, const char *text) {
    if (*text) *field = text;
  };
  app_control_s request;
  set(&request.operation, operation);
  set(&request.uri, uri);
  set(&request.mime, mime);
  request.extra_data = extra_data_from_variant(pairs);
  if (invocation) request.pending = std::make_shared<PendingAnswer>(invocation);
  return request;
}

void set_loop_flushes(bool flushes) {
  loop_flushes = flushes;
}

}  // namespace platform

int app_control_send_launch_request(app_control_h app_control, app_control_reply_cb callback,
                                    void *user_data) {
  using namespace platform;
  if (!app_control) return APP_CONTROL_ERROR_INVALID_PARAMETER;
  if (!app_control->app_id && app_control->uri && app_control->operation == APP_CONTROL_OPERATION_VIEW &&
      !callback) {
    return view_with_default_application(*app_control);
  }
  if (!app_control->app_id || !is_application_id(*app_control->app_id))
    return APP_CONTROL_ERROR_APP_NOT_FOUND;
  if (!phone_bus()) return APP_CONTROL_ERROR_LAUNCH_FAILED;
  if (!is_startable(*app_control->app_id) && !is_running(*app_control->app_id)) {
    const bool is_view = app_control->uri && app_control->operation == APP_CONTROL_OPERATION_VIEW;
    return is_view && !callback && is_played_by_machine(*app_control->app_id)
               ? view_with_scheme_handler(*app_control)
               : APP_CONTROL_ERROR_APP_NOT_FOUND;
  }
  if (!callback) return send_without_reply(*app_control);
  auto sent = std::make_unique<Sent>(Sent{*app_control, callback, user_data});
  sent->request.pending.reset();
  call_with_reply(std::move(sent));
  return APP_CONTROL_ERROR_NONE;
}

int app_control_reply_to_launch_request(app_control_h reply, app_control_h request,
                                        app_control_result_e result) {
  if (!reply || !request || !request->pending) return APP_CONTROL_ERROR_INVALID_PARAMETER;
  const bool is_first = request->pending->answer(result, platform::extra_data_to_variant(reply->extra_data));
  return is_first ? APP_CONTROL_ERROR_NONE : APP_CONTROL_ERROR_LAUNCH_REJECTED;
}
