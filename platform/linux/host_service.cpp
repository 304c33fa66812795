#include "host_service.h"

#include <map>
#include <string>

namespace platform {
namespace {

constexpr gint64 kStuckForUs = 5 * G_USEC_PER_SEC;

// When a service last let a call run into its time limit (monotonic). Its next callers do not wait again.
std::map<std::string, gint64> &stuck_since() {
  static std::map<std::string, gint64> &services = *new std::map<std::string, gint64>;
  return services;
}

bool is_stuck(const char *service) {
  const auto known = stuck_since().find(service);
  return known != stuck_since().end() && g_get_monotonic_time() - known->second < kStuckForUs;
}

}  // namespace

ScopedVariant call_host_service(const char *service, const char *path, const char *interface,
                                const char *method, GVariant *arguments, const char *reply_type) {
  const ScopedVariant floating(g_variant_ref_sink(arguments ? arguments : g_variant_new("()")));
  GDBusConnection *bus = is_stuck(service) ? nullptr : host_bus(HostBus::kSystem);
  if (!bus) return nullptr;
  ErrorSlot absent;
  ScopedVariant reply(g_dbus_connection_call_sync(bus, service, path, interface, method, floating.get(),
                                                  G_VARIANT_TYPE(reply_type), G_DBUS_CALL_FLAGS_NONE,
                                                  kServiceTimeoutMs, nullptr, absent.out()));
  if (absent.is(G_IO_ERROR, G_IO_ERROR_TIMED_OUT)) stuck_since()[service] = g_get_monotonic_time();
  return reply;
}

ScopedVariant lookup(GVariant *dictionary, const char *key, const GVariantType *type) {
  return ScopedVariant(dictionary ? g_variant_lookup_value(dictionary, key, type) : nullptr);
}

}  // namespace platform
