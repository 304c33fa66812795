// Start-up measurement: tells a waiting program when the first frame was painted. Main loop only.
#pragma once

namespace platform {

// When TAVRO_FIRST_FRAME_FD names an open descriptor, write one byte to it and close it as soon as a window
// of this process has painted its first frame. Without the variable, or a window, nothing happens; calling
// again is harmless.
void report_first_frame();

}  // namespace platform
