// A toast over the application's own window, for a machine whose desktop shows none. Main loop only.
#pragma once

#include <string>

namespace platform {

// Shown for a moment in the topmost window, in place of an earlier one; nothing happens without a window.
void show_toast_over_window(const std::string &text);

}  // namespace platform
