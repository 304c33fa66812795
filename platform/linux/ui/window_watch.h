// Whether anything of the application can be seen: follows the application's top-level windows on the
// display. Main loop only.
#pragma once

#include <functional>

namespace platform {

// `changed` runs when the first window comes into sight and when the last one goes out of sight (closed,
// iconified, covered), a moment after it happened, so that a window manager's shuffling is not reported.
void watch_windows(std::function<void(bool is_seen)> changed);
void stop_watching_windows();

// Bring the application's topmost window back before the user.
void raise_windows();

}  // namespace platform
