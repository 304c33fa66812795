// How long a person waits for the screens of a report: from the call that a tap makes to the frame that shows
// the page, with 200 installed applications and a gallery of 2,000 files; how long the main loop is busy at a
// stretch meanwhile; and how much memory the process took at most. Runs inside a phone whose client does not
// run.
//
//   bench.screens RUNS
#include <Elementary.h>
#include <image_util.h>

#include <chrono>
#include <cstdio>
#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <random>
#include <string>
#include <vector>

#include "tavro-common.h"
#include "tavro-main.h"
#include "tavro_appdata.h"
#include "tavro_dbmgr.h"
#include "tavro_screens.h"
#include "tavro_thumbnails.h"
#include "watched_loop.h"

namespace {

namespace fs = std::filesystem;
using watched::longest_gap;
using watched::median;
using watched::open_page;
using watched::print;
using watched::run_until_calm;

constexpr int kApplications = 200;
constexpr int kPictures = 2000;
constexpr char kData[] = "/opt/usr/bench_data";
constexpr char kGallery[] = "/opt/usr/media/Images";

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

long _peak_memory_kilobytes() {
  std::ifstream status("/proc/self/status");
  for (std::string line; std::getline(status, line);)
    if (line.compare(0, 6, "VmHWM:") == 0) return std::atol(line.c_str() + 6);
  return 0;
}

// ---- The screens ----

void _measure_problem_page(appdata *ad, int runs) {
  std::vector<double> page, picker, applications;
  for (int run = 0; run < runs; ++run) {
    page.push_back(open_page([ad] { tavro_create_problem_page(ad, nullptr); }).first_frame);
    const watched::waiting_times times =
        open_page([ad] { tavro_create_target_picker(ad, [](appdata *, const char *, const char *) {}); });
    picker.push_back(times.first_frame);
    applications.push_back(times.last_frame);
    elm_naviframe_item_pop(ad->nf);
    run_until_calm();
    tavro_leave_compose_page(ad);
    run_until_calm();
  }
  print("problem_page_ms", median(page));
  print("target_picker_ms", median(picker));
  print("target_picker_applications_ms", median(applications));
  print("report_longest_gap_ms", longest_gap);
}

void _measure_gallery(appdata *ad, int runs) {
  std::vector<double> first, cold, cached;
  longest_gap = 0;
  for (int run = 0; run < runs; ++run) {
    fs::remove_all(TAVRO_THUMBNAIL_FOLDER);
    fs::create_directories(TAVRO_THUMBNAIL_FOLDER);
    for (std::vector<double> *all : {&cold, &cached}) {
      const watched::waiting_times times =
          open_page([ad] { tavro_create_gallery_picker(ad, [](appdata *, const GSList *) {}); });
      first.push_back(times.first_frame);
      all->push_back(times.last_frame);
      elm_naviframe_item_pop(ad->nf);
      run_until_calm();
    }
  }
  print("gallery_first_frame_ms", median(first));
  print("gallery_first_page_cold_ms", median(cold));
  print("gallery_first_page_cached_ms", median(cached));
  print("gallery_longest_gap_ms", longest_gap);
  print("peak_memory_mb", static_cast<double>(_peak_memory_kilobytes()) / 1024);
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
  watched::watch_loop();
  tavro_bind_locale();
  tavro_dbmgr_init_semaphore();
  tavro_dbmgr_ensure_schema();
  appdata ad{};
  tavro_initialize_application_data(&ad);
  if (!tavro_create_base_window(&ad)) return 1;
  watched::watch_window(ad.win);
  tavro_create_landing_page(&ad);
  run_until_calm(std::chrono::milliseconds(1000));
  longest_gap = 0;
  _measure_problem_page(&ad, runs);
  _measure_gallery(&ad, runs);
  evas_object_del(ad.win);
  tavro_dealloc_memory(&ad);
  elm_shutdown();
  return 0;
}
