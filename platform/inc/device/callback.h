/* Changes of the device, reported on the main loop. */
#pragma once

#include <device/device-error.h>
#include <device/display.h>

#ifdef __cplusplus
extern "C" {
#endif

typedef enum {
  DEVICE_CALLBACK_BATTERY_CAPACITY = 0,
  DEVICE_CALLBACK_DISPLAY_STATE = 4,
} device_callback_e;

/* BATTERY_CAPACITY: `value` carries the percentage in the pointer itself, as (int)(intptr_t)value;
 * DISPLAY_STATE: a display_state_e in the same way. */
typedef void (*device_changed_cb)(device_callback_e type, void *value, void *user_data);

/* The same pair of type and callback can be added once (ALREADY_IN_PROGRESS). Does not block: a machine
 * without the device never calls back. */
int device_add_callback(device_callback_e type, device_changed_cb callback, void *user_data);
int device_remove_callback(device_callback_e type, device_changed_cb callback);

#ifdef __cplusplus
}
#endif
