// One launch request and its reply, beside a bare D-Bus call with the same data to the same process. Both are
// asynchronous and served by the main loop, as in an application. Run inside a phone.

#include <app_control.h>
#include <benchmark/benchmark.h>
#include <gio/gio.h>

#include <fstream>
#include <string>

namespace {

constexpr const char *kEcho = "bench.echo";
constexpr const char *kKeys[] = {"TAVRO_OPERATION_TYPE", "TAVRO_VOC_ID"};

GDBusConnection *bus() {
  static GDBusConnection *const connection = g_bus_get_sync(G_BUS_TYPE_SESSION, nullptr, nullptr);
  return connection;
}

void make_echo_startable() {
  const std::string folder = std::string(g_getenv("XDG_RUNTIME_DIR")) + "/dbus-1/services";
  g_mkdir_with_parents(folder.c_str(), 0700);
  std::ofstream(folder + "/" + kEcho + ".service")
      << "[D-BUS Service]\nName=" << kEcho << "\nExec=" << TAVRO_BENCH_ECHO << "\n";
  GVariant *reply = g_dbus_connection_call_sync(bus(), "org.freedesktop.DBus", "/org/freedesktop/DBus",
                                                "org.freedesktop.DBus", "ReloadConfig", nullptr, nullptr,
                                                G_DBUS_CALL_FLAGS_NONE, -1, nullptr, nullptr);
  if (reply) g_variant_unref(reply);
}

void wait_until(const bool &is_done) {
  while (!is_done) g_main_context_iteration(nullptr, TRUE);
}

struct Outcome {
  bool is_done = false;
  bool is_good = false;
};

void replied_cb(app_control_h, app_control_h reply, app_control_result_e result, void *data) {
  *static_cast<Outcome *>(data) = {true, reply && result == APP_CONTROL_RESULT_SUCCEEDED};
}

Outcome launch() {
  Outcome outcome;
  app_control_h request = nullptr;
  app_control_create(&request);
  app_control_set_app_id(request, kEcho);
  app_control_set_operation(request, APP_CONTROL_OPERATION_DEFAULT);
  for (const char *key : kKeys) app_control_add_extra_data(request, key, "12345");
  const bool is_sent =
      app_control_send_launch_request(request, replied_cb, &outcome) == APP_CONTROL_ERROR_NONE;
  app_control_destroy(request);
  if (is_sent) wait_until(outcome.is_done);
  return outcome;
}

void answered_cb(GObject *, GAsyncResult *result, gpointer data) {
  GVariant *reply = g_dbus_connection_call_finish(bus(), result, nullptr);
  *static_cast<Outcome *>(data) = {true, reply != nullptr};
  if (reply) g_variant_unref(reply);
}

Outcome call() {
  Outcome outcome;
  GVariantBuilder pairs;
  g_variant_builder_init(&pairs, G_VARIANT_TYPE("a(ss)"));
  for (const char *key : kKeys) g_variant_builder_add(&pairs, "(ss)", key, "12345");
  g_dbus_connection_call(bus(), kEcho, "/bare", "bench.Bare", "Echo",
                         g_variant_new("(sssa(ss))", APP_CONTROL_OPERATION_DEFAULT, "", "", &pairs),
                         G_VARIANT_TYPE("(ia(ss))"), G_DBUS_CALL_FLAGS_NONE, -1, nullptr, answered_cb,
                         &outcome);
  wait_until(outcome.is_done);
  return outcome;
}

void measure(benchmark::State &state, Outcome (*action)()) {
  for (auto step : state) {
    static_cast<void>(step);
    if (!action().is_good) return state.SkipWithError("no good answer");
  }
}

void LaunchRequest(benchmark::State &state) {
  measure(state, launch);
}
void BareCall(benchmark::State &state) {
  measure(state, call);
}

// Wall clock: the time passes in two processes.
BENCHMARK(LaunchRequest)->UseRealTime()->Unit(benchmark::kMicrosecond);
BENCHMARK(BareCall)->UseRealTime()->Unit(benchmark::kMicrosecond);

}  // namespace

int main(int argc, char **argv) {
  if (!bus()) return 1;
  make_echo_startable();
  launch();  // starts the application
  benchmark::Initialize(&argc, argv);
  benchmark::RunSpecifiedBenchmarks();
  return 0;
}
