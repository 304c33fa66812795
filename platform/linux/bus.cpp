#include "bus.h"

#include <dlog.h>

#include <utility>
#include <vector>

namespace platform {
namespace {

constexpr gint64 kRetryAfterUs = 5 * G_USEC_PER_SEC;
constexpr int kDaemonTimeoutMs = 10'000;  // the daemon always answers, only a loaded machine is slow
constexpr guint kFinishMs = 2000;
constexpr auto kConnectFlags = static_cast<GDBusConnectionFlags>(
    G_DBUS_CONNECTION_FLAGS_AUTHENTICATION_CLIENT | G_DBUS_CONNECTION_FLAGS_MESSAGE_BUS_CONNECTION);

using Use = std::function<void(GDBusConnection *)>;

// One of the machine's buses: its connection once there is one, and who waits for it.
struct Host {
  const char *variable;
  ScopedBus connection;
  bool is_connecting = false;
  gint64 failed_at = 0;  // monotonic, 0: not failed
  std::vector<Use> waiting;
};

Host &host(HostBus kind) {
  static Host &session = *new Host{"TAVRO_HOST_SESSION_BUS", nullptr, false, 0, {}};
  static Host &system = *new Host{"TAVRO_HOST_SYSTEM_BUS", nullptr, false, 0, {}};
  return kind == HostBus::kSession ? session : system;
}

const char *address_of(const Host &host) {
  const char *address = g_getenv(host.variable);
  return address && *address ? address : nullptr;
}

// The connection as it is known now: `known` is false when one has still to be made.
GDBusConnection *known_connection(const Host &host, bool *known) {
  *known = true;
  if (!address_of(host)) return phone_bus();
  if (host.connection && !g_dbus_connection_is_closed(host.connection.get())) return host.connection.get();
  if (host.failed_at && g_get_monotonic_time() - host.failed_at < kRetryAfterUs) return nullptr;
  *known = false;
  return nullptr;
}

void finish(Host *host, GAsyncResult *result) {
  ErrorSlot error;
  host->connection.reset(g_dbus_connection_new_for_address_finish(result, error.out()));
  host->failed_at = host->connection ? 0 : g_get_monotonic_time();
  if (host->connection) {
    g_dbus_connection_set_exit_on_close(host->connection.get(), FALSE);
  } else {
    dlog_print(DLOG_ERROR, "PLATFORM", "no connection to %s: %s", host->variable, error.text());
  }
}

void connected_cb(GObject *, GAsyncResult *result, gpointer data) {
  auto *host = static_cast<Host *>(data);
  host->is_connecting = false;
  if (host->connection) {
    // Somebody could not wait and has connected in the meantime; that connection is in use.
    ErrorSlot ignored;
    const ScopedBus second(g_dbus_connection_new_for_address_finish(result, ignored.out()));
  } else {
    finish(host, result);
  }
  for (const Use &use : std::exchange(host->waiting, {})) use(host->connection.get());
  release_end();
}

struct Wait {
  Host *host;
  bool is_done = false;
};

void waited_cb(GObject *, GAsyncResult *result, gpointer data) {
  auto *wait = static_cast<Wait *>(data);
  finish(wait->host, result);
  wait->is_done = true;
}

gboolean cancel_cb(gpointer cancellable) {
  g_cancellable_cancel(static_cast<GCancellable *>(cancellable));
  return G_SOURCE_REMOVE;
}

// A main context of its own keeps the wait apart from everything else that the main loop would do.
void connect_and_wait(Host *host) {
  GMainContext *context = g_main_context_new();
  g_main_context_push_thread_default(context);
  const ScopedObject<GCancellable> cancellable(g_cancellable_new());
  GSource *limit = g_timeout_source_new(kServiceTimeoutMs);
  g_source_set_callback(limit, cancel_cb, cancellable.get(), nullptr);
  g_source_attach(limit, context);
  Wait wait{host};
  g_dbus_connection_new_for_address(address_of(*host), kConnectFlags, nullptr, cancellable.get(), waited_cb,
                                    &wait);
  while (!wait.is_done) g_main_context_iteration(context, TRUE);
  g_source_destroy(limit);
  g_source_unref(limit);
  g_main_context_pop_thread_default(context);
  g_main_context_unref(context);
}

int holds = 0;

gboolean raise_flag_cb(gpointer flag) {
  *static_cast<bool *>(flag) = true;
  return G_SOURCE_CONTINUE;
}

void flush(GDBusConnection *bus) {
  ErrorSlot error;
  if (!bus || g_dbus_connection_is_closed(bus)) return;
  if (!g_dbus_connection_flush_sync(bus, nullptr, error.out())) {
    dlog_print(DLOG_ERROR, "PLATFORM", "messages may not have left: %s", error.text());
  }
}

GDBusConnection *connect_phone_bus() {
  const char *address = g_getenv("DBUS_SESSION_BUS_ADDRESS");
  ErrorSlot error;
  // Without an address GIO would start a bus of its own, which is no phone.
  GDBusConnection *bus = address ? g_bus_get_sync(G_BUS_TYPE_SESSION, nullptr, error.out()) : nullptr;
  if (bus) {
    g_dbus_connection_set_exit_on_close(bus, FALSE);
  } else {
    dlog_print(DLOG_ERROR, "PLATFORM", "no phone bus: %s", address ? error.text() : "no address is set");
  }
  return bus;
}

}  // namespace

GDBusConnection *phone_bus() {
  static GDBusConnection *const bus = connect_phone_bus();
  return bus;
}

GDBusConnection *host_bus(HostBus kind) {
  Host &wanted = host(kind);
  bool is_known;
  GDBusConnection *connection = known_connection(wanted, &is_known);
  if (is_known) return connection;
  connect_and_wait(&wanted);
  return wanted.connection.get();
}

void with_host_bus(HostBus kind, Use use) {
  Host &wanted = host(kind);
  bool is_known;
  GDBusConnection *connection = known_connection(wanted, &is_known);
  if (is_known) return use(connection);
  wanted.waiting.push_back(std::move(use));
  if (std::exchange(wanted.is_connecting, true)) return;
  hold_end();
  g_dbus_connection_new_for_address(address_of(wanted), kConnectFlags, nullptr, nullptr, connected_cb,
                                    &wanted);
}

void hold_end() {
  ++holds;
}
void release_end() {
  --holds;
}

void finish_outgoing() {
  bool is_late = false;
  const guint limit = g_timeout_add(kFinishMs, raise_flag_cb, &is_late);
  while (holds > 0 && !is_late) g_main_context_iteration(nullptr, TRUE);
  g_source_remove(limit);
  if (is_late) dlog_print(DLOG_ERROR, "PLATFORM", "ended with %d calls under way", holds);
  for (const HostBus kind : {HostBus::kSession, HostBus::kSystem}) flush(host(kind).connection.get());
  flush_phone_bus();
}

void flush_phone_bus() {
  flush(phone_bus());
}

ScopedVariant call_bus_daemon(const char *method, GVariant *arguments, const char *reply_type,
                              ErrorSlot *error) {
  const ScopedVariant floating(g_variant_ref_sink(arguments ? arguments : g_variant_new("()")));
  GDBusConnection *bus = phone_bus();
  if (!bus) return nullptr;
  return ScopedVariant(g_dbus_connection_call_sync(bus, kBusName, kBusPath, kBusName, method, floating.get(),
                                                   G_VARIANT_TYPE(reply_type), G_DBUS_CALL_FLAGS_NONE,
                                                   kDaemonTimeoutMs, nullptr, error->out()));
}

}  // namespace platform
