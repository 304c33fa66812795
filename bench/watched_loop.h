// The toolkit's main loop, watched: when the last frame was painted, and how long the loop is busy at a
// stretch. For one window of one program, on the main thread.
#pragma once

#include <Elementary.h>
#include <unistd.h>

#include <algorithm>
#include <chrono>
#include <cstdio>
#include <vector>

#include "main_loop.h"

namespace watched {

using Clock = std::chrono::steady_clock;

constexpr std::chrono::milliseconds kCalm(300);

inline Ecore_Select_Function wait_for_events = nullptr;
inline Clock::time_point busy_since = Clock::now();
inline Clock::time_point painted;  // the last frame with something new
inline double longest_gap = 0;     // milliseconds between two waits for events

inline double milliseconds(Clock::duration taken) {
  return std::chrono::duration<double, std::milli>(taken).count();
}

inline int watched_wait(int highest, fd_set *to_read, fd_set *to_write, fd_set *errors, timeval *timeout) {
  longest_gap = std::max(longest_gap, milliseconds(Clock::now() - busy_since));
  const int ready = wait_for_events(highest, to_read, to_write, errors, timeout);
  busy_since = Clock::now();
  return ready;
}

inline void painted_cb(void *, Evas *, void *event_info) {
  const auto *frame = static_cast<Evas_Event_Render_Post *>(event_info);
  if (frame && frame->updated_area) painted = Clock::now();
}

// After elm_init().
inline void watch_loop() {
  platform::merge_glib_into_ecore();
  wait_for_events = static_cast<Ecore_Select_Function>(ecore_main_loop_select_func_get());
  ecore_main_loop_select_func_set(watched_wait);
}

inline void watch_window(const Evas_Object *window) {
  evas_event_callback_add(evas_object_evas_get(window), EVAS_CALLBACK_RENDER_POST, painted_cb, nullptr);
}

inline void run_until_calm(std::chrono::milliseconds calm = kCalm) {
  const Clock::time_point begin = Clock::now();
  do {
    ecore_main_loop_iterate_may_block(0);
    usleep(200);
  } while (Clock::now() - std::max(painted, begin) < calm);
}

// From a change to the next frame, in milliseconds.
template <typename Change>
double next_frame(Change change) {
  const Clock::time_point begin = Clock::now();
  painted = {};
  busy_since = begin;
  change();
  while (painted < begin) ecore_main_loop_iterate_may_block(0);
  return milliseconds(painted - begin);
}

struct waiting_times {
  double first_frame, last_frame;
};

// From opening a page to its first frame, and to the one after which nothing more comes.
template <typename Open>
waiting_times open_page(Open open) {
  const Clock::time_point begin = Clock::now();
  const double first = next_frame(open);
  run_until_calm();
  return {first, milliseconds(painted - begin)};
}

inline double median(std::vector<double> values) {
  std::sort(values.begin(), values.end());
  return values[values.size() / 2];
}

inline void print(const char *name, double value) {
  std::printf("%s=%.1f\n", name, value);
}

}  // namespace watched
