// The coloured frame that the client draws around the screen during a capture: no part of what is recorded.
#pragma once

#include <optional>

struct ScreenArea {
  int left, top, right, bottom;  // pixels; the last two are still inside
};

// What the frame surrounds; none when there is no frame. Any thread; asks the X display.
std::optional<ScreenArea> area_within_frame();
