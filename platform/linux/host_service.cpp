#include "host_service.h"

namespace platform {

ScopedVariant call_host_service(const char *service, const char *path, const char *interface,
                                const char *method, GVariant *arguments, const char *reply_type) {
  const ScopedVariant floating(g_variant_ref_sink(arguments ? arguments : g_variant_new("()")));
  GDBusConnection *bus = host_bus(HostBus::kSystem);
  if (!bus) return nullptr;
  ErrorSlot absent;
  return ScopedVariant(g_dbus_connection_call_sync(bus, service, path, interface, method, floating.get(),
                                                   G_VARIANT_TYPE(reply_type), G_DBUS_CALL_FLAGS_NONE,
                                                   kServiceTimeoutMs, nullptr, absent.out()));
}

ScopedVariant lookup(GVariant *dictionary, const char *key, const GVariantType *type) {
  return ScopedVariant(dictionary ? g_variant_lookup_value(dictionary, key, type) : nullptr);
}

}  // namespace platform
