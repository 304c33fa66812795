// The battery and its changes, as UPower's display device tells them.

#include <device/battery.h>

#include <algorithm>
#include <utility>

#include "device_callback.h"
#include "host_service.h"

namespace {

using namespace platform;

constexpr const char *kService = "org.freedesktop.UPower";
constexpr const char *kDevicePath = "/org/freedesktop/UPower/devices/DisplayDevice";
constexpr const char *kDeviceInterface = "org.freedesktop.UPower.Device";
constexpr const char *kPropertiesInterface = "org.freedesktop.DBus.Properties";
constexpr guint32 kStateCharging = 1;

struct Battery {
  int percent = 0;
  bool is_charging = false;
};

int read_battery(Battery *battery) {
  const ScopedVariant reply = call_host_service(kService, kDevicePath, kPropertiesInterface, "GetAll",
                                                g_variant_new("(s)", kDeviceInterface), "(a{sv})");
  if (!reply) return DEVICE_ERROR_NOT_SUPPORTED;
  const ScopedVariant properties(g_variant_get_child_value(reply.get(), 0));
  // Machines without a battery have the device too; its percentage means nothing then.
  const ScopedVariant is_present = lookup(properties.get(), "IsPresent", G_VARIANT_TYPE_BOOLEAN);
  if (!is_present || !g_variant_get_boolean(is_present.get())) return DEVICE_ERROR_NOT_SUPPORTED;
  const ScopedVariant percentage = lookup(properties.get(), "Percentage", G_VARIANT_TYPE_DOUBLE);
  const ScopedVariant state = lookup(properties.get(), "State", G_VARIANT_TYPE_UINT32);
  if (!percentage || !state) return DEVICE_ERROR_OPERATION_FAILED;
  battery->percent = std::clamp(static_cast<int>(g_variant_get_double(percentage.get())), 0, 100);
  battery->is_charging = g_variant_get_uint32(state.get()) == kStateCharging;
  return DEVICE_ERROR_NONE;
}

device_battery_level_e level_of(int percent) {
  if (percent >= 100) return DEVICE_BATTERY_LEVEL_FULL;
  if (percent > 15) return DEVICE_BATTERY_LEVEL_HIGH;
  if (percent > 5) return DEVICE_BATTERY_LEVEL_LOW;
  if (percent > 1) return DEVICE_BATTERY_LEVEL_CRITICAL;
  return DEVICE_BATTERY_LEVEL_EMPTY;
}

int last_percent = -1;

void changed_cb(GDBusConnection *, const char *, const char *, const char *, const char *,
                GVariant *arguments, gpointer) {
  if (!g_variant_is_of_type(arguments, G_VARIANT_TYPE("(sa{sv}as)"))) return;
  const ScopedVariant changed(g_variant_get_child_value(arguments, 1));
  const ScopedVariant percentage = lookup(changed.get(), "Percentage", G_VARIANT_TYPE_DOUBLE);
  if (!percentage) return;
  const int percent = std::clamp(static_cast<int>(g_variant_get_double(percentage.get())), 0, 100);
  if (std::exchange(last_percent, percent) != percent)
    report_device_change(DEVICE_CALLBACK_BATTERY_CAPACITY, percent);
}

template <typename Value, typename Field>
int read_value(Value *value, Field field) {
  if (!value) return DEVICE_ERROR_INVALID_PARAMETER;
  Battery battery;
  const int result = read_battery(&battery);
  if (result == DEVICE_ERROR_NONE) *value = field(battery);
  return result;
}

}  // namespace

int device_battery_get_percent(int *percent) {
  return read_value(percent, [](const Battery &battery) { return battery.percent; });
}

int device_battery_is_charging(bool *charging) {
  return read_value(charging, [](const Battery &battery) { return battery.is_charging; });
}

int device_battery_get_level_status(device_battery_level_e *status) {
  return read_value(status, [](const Battery &battery) { return level_of(battery.percent); });
}

// The subscription stays for the life of the process: it costs nothing while the battery does not change.
void platform::watch_battery(GDBusConnection *bus) {
  static bool is_subscribed = false;
  if (!bus || std::exchange(is_subscribed, true)) return;
  g_dbus_connection_signal_subscribe(bus, kService, kPropertiesInterface, "PropertiesChanged", kDevicePath,
                                     kDeviceInterface, G_DBUS_SIGNAL_FLAGS_NONE, changed_cb, nullptr,
                                     nullptr);
}
