// How long a person waits for the screens of a report: from the call that a tap makes to the frame that shows
// the page, with 200 installed applications and a gallery of 2,000 files; how long the main loop is busy at a
// stretch meanwhile; and how much memory the process took at most. Runs inside a phone whose client does not
// run.
//
//   bench.screens RUNS
#include <Elementary.h>
#include <image_util.h>
#include <unistd.h>

#include <algorithm>
#include <chrono>
#include <cstdio>
#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <random>
#include <string>
#include <vector>

#include "main_loop.h"
#include "tavro-common.h"
#include "tavro-main.h"
#include "tavro_appdata.h"
#include "tavro_dbmgr.h"
#include "tavro_screens.h"
#include "tavro_thumbnails.h"

namespace {

namespace fs = std::filesystem;
using Clock = std::chrono::steady_clock;

constexpr int kApplications = 200;
constexpr int kPictures = 2000;
constexpr char kData[] = "/opt/usr/bench_data";
constexpr char kGallery[] = "/opt/usr/media/Images";

double _milliseconds(Clock::duration taken) {
  return std::chrono::duration<double, std::milli>(taken).count();
}

// ---- What the phone holds ----

void _install_applications() {
  fs::create_directories(std::string(kData) + "/applications");
  for (int i = 0; i < kApplications; ++i) {
    const std::string name = "Application " + std::to_string(i);
    std::ofstream(std::string(kData) + "/applications/bench" + std::to_string(i) + ".desktop")
        << "[Desktop Entry]\nType=Application\nName=" << name << "\nExec=true\nIcon=bench\n";
  }
  setenv("XDG_DATA_HOME", kData, 1);
}

// As large and as detailed as a phone's camera makes them.
void _write_photo(const std::string &path) {
  constexpr int kWidth = 4000, kHeight = 3000;
  std::minstd_rand random(1);
  std::vector<unsigned char> pixels(static_cast<size_t>(kWidth) * kHeight * 4);
  for (size_t i = 0; i < pixels.size(); ++i)
    pixels[i] = static_cast<unsigned char>((i / 4 % kWidth) / 20 + random() % 10);
  if (image_util_encode_jpeg(pixels.data(), kWidth, kHeight, IMAGE_UTIL_COLORSPACE_BGRA8888, 85,
                             path.c_str()) != IMAGE_UTIL_ERROR_NONE)
    std::abort();
}

// One file under many names: each name has a thumbnail of its own.
void _fill_gallery() {
  fs::create_directories(kGallery);
  const std::string first = std::string(kGallery) + "/photo0.jpg";
  _write_photo(first);
  for (int i = 1; i < kPictures; ++i)
    fs::create_hard_link(first, std::string(kGallery) + "/photo" + std::to_string(i) + ".jpg");
}

// ---- The main loop, watched ----

Ecore_Select_Function _wait = nullptr;
Clock::time_point _busy_since = Clock::now();
Clock::time_point _painted;  // the last frame with something new
double _longest_gap = 0;     // milliseconds between two waits for events

int _watched_wait(int highest, fd_set *to_read, fd_set *to_write, fd_set *errors, timeval *timeout) {
  _longest_gap = std::max(_longest_gap, _milliseconds(Clock::now() - _busy_since));
  const int ready = _wait(highest, to_read, to_write, errors, timeout);
  _busy_since = Clock::now();
  return ready;
}

void _painted_cb(void *, Evas *, void *event_info) {
  const auto *painted = static_cast<Evas_Event_Render_Post *>(event_info);
  if (painted && painted->updated_area) _painted = Clock::now();
}

void _run_until_calm(std::chrono::milliseconds calm) {
  const Clock::time_point begin = Clock::now();
  do {
    ecore_main_loop_iterate_may_block(0);
    usleep(200);
  } while (Clock::now() - std::max(_painted, begin) < calm);
}

struct waiting_times {
  double first_frame, last_frame;
};

// From opening a page to its first frame, and to the one after which nothing more comes.
template <typename Open>
waiting_times _open(Open open, std::chrono::milliseconds calm) {
  const Clock::time_point begin = Clock::now();
  _painted = {};
  _busy_since = begin;
  open();
  while (_painted < begin) ecore_main_loop_iterate_may_block(0);
  const double first = _milliseconds(_painted - begin);
  _run_until_calm(calm);
  return {first, _milliseconds(_painted - begin)};
}

double _median(std::vector<double> values) {
  std::sort(values.begin(), values.end());
  return values[values.size() / 2];
}

long _peak_memory_kilobytes() {
  std::ifstream status("/proc/self/status");
  for (std::string line; std::getline(status, line);)
    if (line.compare(0, 6, "VmHWM:") == 0) return std::atol(line.c_str() + 6);
  return 0;
}

// ---- The screens ----

constexpr std::chrono::milliseconds kCalm(300);

void _print(const char *name, double value) {
  std::printf("%s=%.1f\n", name, value);
}

void _measure_problem_page(appdata *ad, int runs) {
  std::vector<double> page, picker, applications;
  for (int run = 0; run < runs; ++run) {
    page.push_back(_open([ad] { tavro_create_problem_page(ad, nullptr); }, kCalm).first_frame);
    const waiting_times times =
        _open([ad] { tavro_create_target_picker(ad, [](appdata *, const char *, const char *) {}); }, kCalm);
    picker.push_back(times.first_frame);
    applications.push_back(times.last_frame);
    elm_naviframe_item_pop(ad->nf);
    _run_until_calm(kCalm);
    tavro_leave_compose_page(ad);
    _run_until_calm(kCalm);
  }
  _print("problem_page_ms", _median(page));
  _print("target_picker_ms", _median(picker));
  _print("target_picker_applications_ms", _median(applications));
  _print("report_longest_gap_ms", _longest_gap);
}

void _measure_gallery(appdata *ad, int runs) {
  std::vector<double> first, cold, cached;
  _longest_gap = 0;
  for (int run = 0; run < runs; ++run) {
    fs::remove_all(TAVRO_THUMBNAIL_FOLDER);
    fs::create_directories(TAVRO_THUMBNAIL_FOLDER);
    for (std::vector<double> *all : {&cold, &cached}) {
      const waiting_times times =
          _open([ad] { tavro_create_gallery_picker(ad, [](appdata *, const GSList *) {}); }, kCalm);
      first.push_back(times.first_frame);
      all->push_back(times.last_frame);
      elm_naviframe_item_pop(ad->nf);
      _run_until_calm(kCalm);
    }
  }
  _print("gallery_first_frame_ms", _median(first));
  _print("gallery_first_page_cold_ms", _median(cold));
  _print("gallery_first_page_cached_ms", _median(cached));
  _print("gallery_longest_gap_ms", _longest_gap);
  _print("peak_memory_mb", static_cast<double>(_peak_memory_kilobytes()) / 1024);
}

}  // namespace

int main(int argc, char **argv) {
  const int runs = argc == 2 ? std::atoi(argv[1]) : 0;
  if (runs < 1) {
    std::fprintf(stderr, "usage: bench.screens RUNS\n");
    return 2;
  }
  _install_applications();
  _fill_gallery();
  if (!elm_init(argc, argv)) return 1;
  platform::merge_glib_into_ecore();
  _wait = static_cast<Ecore_Select_Function>(ecore_main_loop_select_func_get());
  ecore_main_loop_select_func_set(_watched_wait);
  tavro_bind_locale();
  tavro_dbmgr_init_semaphore();
  tavro_dbmgr_ensure_schema();
  appdata ad{};
  tavro_initialize_application_data(&ad);
  if (!tavro_create_base_window(&ad)) return 1;
  evas_event_callback_add(evas_object_evas_get(ad.win), EVAS_CALLBACK_RENDER_POST, _painted_cb, nullptr);
  tavro_create_landing_page(&ad);
  _run_until_calm(std::chrono::milliseconds(1000));
  _longest_gap = 0;
  _measure_problem_page(&ad, runs);
  _measure_gallery(&ad, runs);
  evas_object_del(ad.win);
  tavro_dealloc_memory(&ad);
  elm_shutdown();
  return 0;
}
