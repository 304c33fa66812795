#include "display.h"

#include <sys/random.h>

#include <algorithm>
#include <cstdio>
#include <cstring>

#include "message_bus.h"
#include "options.h"

namespace phone {

namespace {

constexpr double kUnitsPerWidth = 360.0;

constexpr const char *kWindowManagerConfig = R"(<?xml version="1.0" encoding="UTF-8"?>
<openbox_config xmlns="http://openbox.org/3.4/rc">
  <focus><focusNew>yes</focusNew><focusLast>yes</focusLast></focus>
  <placement><policy>Smart</policy></placement>
  <theme><animateIconify>no</animateIconify><keepBorder>no</keepBorder></theme>
  <desktops><number>1</number><popupTime>0</popupTime></desktops>
  <applications>
    <application class="*" type="normal"><decor>no</decor><maximized>yes</maximized></application>
    <application class="*"><decor>no</decor></application>
  </applications>
</openbox_config>
)";

// Cards across the top of the screen, in the client's colours; there is no compositor, so their corners are
// square and nothing lies between them. Sizes follow the screen.
constexpr const char *kNotificationConfig = R"([global]
    follow = none
    width = %d
    height = %d
    origin = top-center
    offset = 0x0
    notification_limit = 2
    indicate_hidden = no
    show_indicators = no
    ellipsize = end
    padding = %d
    horizontal_padding = %d
    frame_width = 2
    frame_color = "#E1E6ED"
    separator_color = frame
    font = Noto Sans %d
    markup = full
    format = "<b>%%s</b>\n%%b"
    alignment = left
    word_wrap = yes
    icon_path = "%s"
    icon_position = left
    min_icon_size = %d
    max_icon_size = %d
    sticky_history = no
    idle_threshold = 0
    mouse_left_click = do_action, close_current
[urgency_low]
    background = "#FFFFFF"
    foreground = "#1B2430"
    timeout = 4
[urgency_normal]
    background = "#FFFFFF"
    foreground = "#1B2430"
    timeout = 4
[urgency_critical]
    background = "#FFFFFF"
    foreground = "#C62828"
    timeout = 0
)";

// One entry for any host and any display, as `xauth` writes it: lengths are big-endian.
std::string cookie_file() {
  constexpr char kName[] = "MIT-MAGIC-COOKIE-1";
  constexpr size_t kCookieSize = 16;
  char cookie[kCookieSize];
  if (getrandom(cookie, sizeof cookie, 0) != static_cast<ssize_t>(sizeof cookie)) return "";
  std::string file("\xff\xff\0\0\0\0\0", 7);
  file += static_cast<char>(sizeof kName - 1);
  file += kName;
  file += std::string("\0\x10", 2);
  return file.append(cookie, sizeof cookie);
}

// Where the client's icon is.
std::string client_folder() {
  TavroGText bin(g_path_get_dirname(application_program(kClientId).c_str()));
  TavroGText folder(g_path_get_dirname(bin.get()));
  return folder.get();
}

std::string notification_config(const ScreenSize &size) {
  const double scale = size.width / kUnitsPerWidth;
  const auto units = [scale](int count) { return static_cast<int>(count * scale + 0.5); };
  TavroGText text(g_strdup_printf(kNotificationConfig, size.width - 4, units(160), units(12), units(16),
                                  units(11), client_folder().c_str(), units(24), units(32)));
  return text.get();
}

}  // namespace

bool parse_size(const std::string &text, ScreenSize *size) {
  constexpr int kSmallest = 200;
  constexpr int kLargest = 8192;
  ScreenSize parsed;
  char end;
  if (std::sscanf(text.c_str(), "%5dx%5d%c", &parsed.width, &parsed.height, &end) != 2) return false;
  for (const int side : {parsed.width, parsed.height}) {
    if (side < kSmallest || side > kLargest) return false;
  }
  *size = parsed;
  return true;
}

HostDisplay probe_display(const Environment &environment) {
  if (environment.get("DISPLAY").empty()) return HostDisplay::kNone;
  TavroStrv variables = environment.to_strv();
  const char *command[] = {"xwininfo", "-root", "-events", nullptr};
  TavroGText events;
  int status = -1;
  const auto flags = static_cast<GSpawnFlags>(G_SPAWN_SEARCH_PATH | G_SPAWN_STDERR_TO_DEV_NULL);
  if (!g_spawn_sync(nullptr, const_cast<char **>(command), variables.get(), flags, nullptr, nullptr,
                    tavro_out(events), nullptr, &status, nullptr) ||
      status != 0)
    return HostDisplay::kNone;
  // Only a window manager asks for this one, whatever its kind, and no longer than it lives.
  return std::strstr(events.get(), "SubstructureRedirect") ? HostDisplay::kUsable : HostDisplay::kUnmanaged;
}

bool write_display_files(const Folder &folder, const ScreenSize &size) {
  const std::string cookie = cookie_file();
  if (cookie.empty()) {
    say("no random numbers for the display's access cookie");
    return false;
  }
  return write_private_file(folder.run("xauthority"), cookie) &&
         write_private_file(folder.run("openbox.xml"), kWindowManagerConfig) &&
         write_private_file(folder.run("dunstrc"), notification_config(size));
}

std::vector<std::string> display_command(const Folder &folder, const ScreenSize &size) {
  const std::string screen = std::to_string(size.width) + "x" + std::to_string(size.height) + "x24";
  return {"Xvfb",
          "-displayfd",
          "1",
          "-screen",
          "0",
          screen,
          "-nolisten",
          "tcp",
          "-noreset",
          "-auth",
          folder.run("xauthority")};
}

std::vector<std::string> window_manager_command(const Folder &folder) {
  return {"openbox", "--sm-disable", "--config-file", folder.run("openbox.xml")};
}

std::vector<std::string> notification_command(const Folder &folder) {
  return {"dunst", "-config", folder.run("dunstrc")};
}

void use_virtual_display(Environment *environment, const Folder &folder, const ScreenSize &size,
                         const std::string &number) {
  // A phone that is turned keeps its scale.
  char scale[G_ASCII_DTOSTR_BUF_SIZE];
  g_ascii_formatd(scale, sizeof scale, "%.3f", std::min(size.width, size.height) / kUnitsPerWidth);
  environment->set("DISPLAY", ":" + number);
  environment->set("XAUTHORITY", folder.run("xauthority"));
  environment->set("ELM_SCALE", scale);
  environment->set("ELM_ACCEL", "none");
}

}  // namespace phone
