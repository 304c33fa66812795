// Facts that only a process with a display can tell.
#pragma once

namespace platform {

// False when the size is not known. Main loop only.
using ScreenSizeSource = bool (*)(int *width, int *height);
void set_screen_size_source(ScreenSizeSource source);

}  // namespace platform
