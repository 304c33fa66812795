// The screen recorder, asked as the client asks it: screenshots from the request to the file, and what a
// recording of 480x640 pixels at 10 frames a second costs while the screen moves. Runs inside a phone whose
// recorder does not run.
//
//   recorder_bench SCREENSHOTS SECONDS
#include <gio/gio.h>
#include <xcb/xcb.h>

#include <algorithm>
#include <chrono>
#include <cstdio>
#include <cstdlib>
#include <fstream>
#include <sstream>
#include <string>
#include <thread>
#include <utility>
#include <vector>

#include "tavro_handles.h"

namespace {

constexpr char kRecorder[] = "corvane.tavro-screen-recorder";
constexpr std::chrono::milliseconds kFrame(100);
constexpr int kRectangles = 200;

using Clock = std::chrono::steady_clock;
using Keys = std::vector<std::pair<const char *, std::string>>;

double _milliseconds_since(Clock::time_point start) {
  return std::chrono::duration<double, std::milli>(Clock::now() - start).count();
}

std::string _path(const char *name, int number) {
  return std::string("/opt/usr/media/bench/") + name + std::to_string(number);
}

// The reply's "handle", "0" when it has none; the bench ends when the request failed.
std::string _ask(GDBusConnection *bus, const Keys &keys) {
  GVariantBuilder pairs;
  g_variant_builder_init(&pairs, G_VARIANT_TYPE("a(ss)"));
  for (const auto &[key, value] : keys) g_variant_builder_add(&pairs, "(ss)", key, value.c_str());
  const TavroVariant reply(
      g_dbus_connection_call_sync(bus, kRecorder, "/corvane/tavro_screen_recorder", "org.tavro.AppControl1",
                                  "Launch", g_variant_new("(sssa(ss))", "", "", "", &pairs),
                                  G_VARIANT_TYPE("(ia(ss))"), G_DBUS_CALL_FLAGS_NONE, -1, nullptr, nullptr));
  int result = -1;
  GVariant *raw = nullptr;
  if (reply) g_variant_get(reply.get(), "(i@a(ss))", &result, &raw);
  const TavroVariant answer(raw);
  if (result != 0) {
    std::fprintf(stderr, "recorder_bench: %s failed\n", keys[0].second.c_str());
    std::exit(1);
  }
  const char *key = nullptr, *handle = "0";
  if (g_variant_n_children(answer.get()) > 0) g_variant_get_child(answer.get(), 0, "(&s&s)", &key, &handle);
  return handle;
}

double _screenshot(GDBusConnection *bus, int number) {
  const auto start = Clock::now();
  _ask(bus,
       {{"action_type", "Screenshot"}, {"orientation", "0"}, {"outfilename", _path("", number) + ".jpg"}});
  return _milliseconds_since(start);
}

// User and system time that the recorder has used, in seconds.
double _processor_seconds(GDBusConnection *bus) {
  const TavroVariant reply(g_dbus_connection_call_sync(bus, "org.freedesktop.DBus", "/org/freedesktop/DBus",
                                                       "org.freedesktop.DBus", "GetConnectionUnixProcessID",
                                                       g_variant_new("(s)", kRecorder), G_VARIANT_TYPE("(u)"),
                                                       G_DBUS_CALL_FLAGS_NONE, -1, nullptr, nullptr));
  guint32 pid = 0;
  if (reply) g_variant_get(reply.get(), "(u)", &pid);
  std::ifstream stat("/proc/" + std::to_string(pid) + "/stat");
  const std::string line((std::istreambuf_iterator<char>(stat)), std::istreambuf_iterator<char>());
  std::istringstream fields(line.substr(std::min(line.rfind(')') + 1, line.size())));
  std::string skipped;
  for (int i = 3; i < 14; ++i) fields >> skipped;  // to utime and stime, the 14th and 15th
  double user = 0, system = 0;
  fields >> user >> system;
  return (user + system) / static_cast<double>(sysconf(_SC_CLK_TCK));
}

// A window over the whole screen in which many things change in each frame.
class MovingScreen {
 public:
  MovingScreen() : connection_(xcb_connect(nullptr, nullptr)) {
    const auto *screen = xcb_setup_roots_iterator(xcb_get_setup(connection_.get())).data;
    const uint32_t over_all = 1;
    window_ = xcb_generate_id(connection_.get());
    xcb_create_window(connection_.get(), XCB_COPY_FROM_PARENT, window_, screen->root, 0, 0,
                      screen->width_in_pixels, screen->height_in_pixels, 0, XCB_WINDOW_CLASS_INPUT_OUTPUT,
                      screen->root_visual, XCB_CW_OVERRIDE_REDIRECT, &over_all);
    xcb_map_window(connection_.get(), window_);
    context_ = xcb_generate_id(connection_.get());
    xcb_create_gc(connection_.get(), context_, window_, 0, nullptr);
    width_ = screen->width_in_pixels;
    height_ = screen->height_in_pixels;
  }

  void move() {
    for (int i = 0; i < kRectangles; ++i) {
      const auto colour = static_cast<uint32_t>(g_random_int() & 0xffffff);
      xcb_change_gc(connection_.get(), context_, XCB_GC_FOREGROUND, &colour);
      const xcb_rectangle_t rectangle = {static_cast<int16_t>(g_random_int_range(0, width_)),
                                         static_cast<int16_t>(g_random_int_range(0, height_)), 40, 12};
      xcb_poly_fill_rectangle(connection_.get(), window_, context_, 1, &rectangle);
    }
    xcb_flush(connection_.get());
  }

 private:
  TavroHandle<xcb_connection_t, xcb_disconnect> connection_;
  xcb_window_t window_ = 0;
  xcb_gcontext_t context_ = 0;
  int width_ = 0, height_ = 0;
};

// Share of one core, in percent.
double _recording(GDBusConnection *bus, int seconds, MovingScreen &screen) {
  const std::string handle = _ask(bus, {{"action_type", "Video_Init"},
                                        {"outfilename", _path("video", 0) + ".mp4"},
                                        {"video_quality", "HIGH"},
                                        {"video_fps", "10"},
                                        {"video_width", "480"},
                                        {"video_height", "640"}});
  _ask(bus, {{"action_type", "Video_Start"}, {"handle", handle}});
  const double before = _processor_seconds(bus);
  const auto start = Clock::now();
  while (_milliseconds_since(start) < seconds * 1000) {
    screen.move();
    std::this_thread::sleep_for(kFrame);
  }
  const double percent = 1e5 * (_processor_seconds(bus) - before) / _milliseconds_since(start);
  _ask(bus, {{"action_type", "Video_Stop"}, {"handle", handle}});
  return percent;
}

}  // namespace

int main(int argc, char **argv) {
  const int screenshots = argc == 3 ? std::atoi(argv[1]) : 0, seconds = argc == 3 ? std::atoi(argv[2]) : 0;
  if (screenshots < 1 || seconds < 1) {
    std::fprintf(stderr, "usage: recorder_bench SCREENSHOTS SECONDS\n");
    return 2;
  }
  const TavroObject<GDBusConnection> bus(g_bus_get_sync(G_BUS_TYPE_SESSION, nullptr, nullptr));
  if (!bus) return 1;
  MovingScreen screen;
  for (int i = 0; i < 100; ++i) screen.move();
  const double cold = _screenshot(bus.get(), 0);
  std::vector<double> times;
  for (int i = 1; i <= screenshots; ++i) times.push_back(_screenshot(bus.get(), i));
  std::sort(times.begin(), times.end());
  std::printf("screenshot_ms=%.1f\nfirst_screenshot_ms=%.1f\n", times[times.size() / 2], cold);
  std::printf("recording_percent=%.1f\n", _recording(bus.get(), seconds, screen));
  return 0;
}
