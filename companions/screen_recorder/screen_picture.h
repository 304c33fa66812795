// What the whole screen shows, with every window and without the pointer.
#pragma once

#include <cstdint>
#include <functional>
#include <memory>

struct Picture {
  std::shared_ptr<const uint8_t> pixels;  // rows from the top
  int width = 0, height = 0;
  int stride = 0;  // bytes from row to row
  int format = 0;  // TJPF of the JPEG library
};

// Whether there is an X display that holds the whole screen. One that only serves X programs on a Wayland
// desktop does not.
bool has_x_screen();

// The picture of the X display, null pixels after a log line. Blocks for a few milliseconds.
Picture take_screen_picture();

// Ask the machine's desktop portal, which may ask its user: half a minute at most, without blocking. `then`
// is called once, on the main loop; with null pixels after a log line.
void take_portal_picture(std::function<void(const Picture &)> then);
