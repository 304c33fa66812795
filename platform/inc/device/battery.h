/* The battery, from the machine's power service. A machine without one answers NOT_SUPPORTED and leaves the
 * value alone. Each call may wait for the service, at most half a second. Main loop only. */
#pragma once

#include <device/device-error.h>
#include <stdbool.h>

#ifdef __cplusplus
extern "C" {
#endif

typedef enum {
  DEVICE_BATTERY_LEVEL_EMPTY = 0,
  DEVICE_BATTERY_LEVEL_CRITICAL,
  DEVICE_BATTERY_LEVEL_LOW,
  DEVICE_BATTERY_LEVEL_HIGH,
  DEVICE_BATTERY_LEVEL_FULL,
} device_battery_level_e;

int device_battery_get_percent(int *percent);
int device_battery_is_charging(bool *charging);
int device_battery_get_level_status(device_battery_level_e *status);

#ifdef __cplusplus
}
#endif
