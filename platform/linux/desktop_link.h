// Between the phone and the desktop, for as long as the phone runs, which is longer than its applications do:
// posts the notifications of all applications, sends the launch request of one that is touched, forgets those
// that are closed, and tells launchers the badges, again whenever a launcher appears. Survives the desktop's
// bus and services going and coming. Main loop only.
#pragma once

namespace platform {

// Serve on the default GLib main context from now on, in a process that is on the phone's bus. False without
// such a bus, or when another process serves already.
bool start_desktop_link();

}  // namespace platform
