// Who wants to know of changes of the device, and those who tell. Main loop only.
#pragma once

#include <device/callback.h>
#include <gio/gio.h>

#include <functional>

namespace platform {

// Call everybody who asked for changes of this type.
void report_device_change(device_callback_e type, int value);

// Called with whether anybody wants the display's state; nothing by default.
void set_display_state_source(std::function<void(bool is_wanted)> source);

// Report what the power service on this bus (may be null) says of the battery from now on.
void watch_battery(GDBusConnection *bus);

}  // namespace platform
