// Tells the rest of the platform when the display goes dark and comes back. Main loop only.
#pragma once

namespace platform {

// While somebody wants it, watch X's screen saver, and ask for the display's power once a second, for which X
// has no events. Without a display this does nothing.
void serve_display_state();
void stop_serving_display_state();

}  // namespace platform
