// The phone's display: the desktop's where there is one, else a virtual one with a window manager that shows
// each window as a phone does, without frame and over the whole screen.
#pragma once

#include <string>
#include <vector>

#include "environment.h"

namespace phone {

struct ScreenSize {
  int width = 720;
  int height = 1280;
};

// "WIDTHxHEIGHT" in pixels, each 200 to 8192. False when it is not that.
bool parse_size(const std::string &text, ScreenSize *size);

// The display that the environment names. Without a window manager the toolkit paints nothing on it.
enum class HostDisplay { kNone, kUnmanaged, kUsable };
HostDisplay probe_display(const Environment &environment);

// Write the files of a virtual display: its access cookie, and how window manager and notifications look.
// False with a message.
bool write_display_files(const Folder &folder, const ScreenSize &size);

// The display server; it prints the number of the display that it chose.
std::vector<std::string> display_command(const Folder &folder, const ScreenSize &size);
std::vector<std::string> window_manager_command(const Folder &folder);
std::vector<std::string> notification_command(const Folder &folder);

// What programs need to draw on the virtual display: its name, its cookie, 360 units to the width, software
// drawing.
void use_virtual_display(Environment *environment, const Folder &folder, const ScreenSize &size,
                         const std::string &number);

}  // namespace phone
