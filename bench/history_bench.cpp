// The history with 100 answered reports: from the call that a tap makes to the frame that shows the page, the
// time of one frame while it scrolls beside that of the toolkit's own list with 100 rows of nothing, and how
// long the main loop is busy at a stretch when an answer changes a row of the open list. Runs inside a phone
// whose client does not run.
//
//   bench.history RUNS
#include <cstdlib>
#include <string>

#include "tavro-common.h"
#include "tavro-main.h"
#include "tavro_appdata.h"
#include "tavro_dbmgr.h"
#include "tavro_history.h"
#include "tavro_memory.h"
#include "tavro_preferences.h"
#include "tavro_screens.h"
#include "tavro_type.h"
#include "watched_loop.h"

namespace {

using namespace watched;

constexpr int kReports = 100;
constexpr int kFrames = 120;
constexpr int kPixelsPerFrame = 24;  // a brisk drag
constexpr int kFirstServerId = 1000;

void _store_report(int number, const char *user_name) {
  tavro_dbmgr_bug_report_info *report = TAVRO_ZALLOC(tavro_dbmgr_bug_report_info);
  const std::string title = "Report " + std::to_string(number) + " about something that went wrong";
  report->title_description = TAVRO_STRDUP(title.c_str());
  report->description = TAVRO_STRDUP("It happens each time, and then it is gone for some hours.");
  report->app_name = TAVRO_STRDUP(number % 2 ? "Hardware" : "Battery");
  report->user_name = TAVRO_STRDUP(user_name);
  report->submitted = TAVRO_STATUS_SENDING_SUCCESS;
  const int id = tavro_dbmgr_update_bug_report(report);
  tavro_dbmgr_free_bug_report_data(report);
  tavro_dbmgr_update_server_voc_id(id, kFirstServerId + number);
  const std::string server_id = std::to_string(kFirstServerId + number);
  _tavro_dbmgr_update_push_status_comments(server_id.c_str(), number % 3 ? "2" : "3",
                                           "We are looking at it.");
}

bool _fill_store() {
  const TavroText user_name = tavro_get_username_from_preference();
  if (!user_name) return false;
  for (int i = 0; i < kReports; ++i) _store_report(i, user_name.get());
  return true;
}

// Down and, at the end, from the top again.
double _scrolling_frame(Evas_Object *list) {
  int width = 0, height = 0, all = 0;
  evas_object_geometry_get(list, nullptr, nullptr, &width, &height);
  elm_scroller_child_size_get(list, nullptr, &all);
  const int way = std::max(1, all - height);
  std::vector<double> frames;
  for (int i = 1; i <= kFrames; ++i)
    frames.push_back(
        next_frame([&] { elm_scroller_region_show(list, 0, i * kPixelsPerFrame % way, width, height); }));
  return median(frames);
}

double _empty_list_frame(appdata *ad) {
  Evas_Object *list = elm_genlist_add(ad->nf);
  Elm_Genlist_Item_Class *rows = elm_genlist_item_class_new();
  rows->item_style = "default";
  for (int i = 0; i < kReports; ++i)
    elm_genlist_item_append(list, rows, nullptr, nullptr, ELM_GENLIST_ITEM_NONE, nullptr, nullptr);
  elm_genlist_item_class_free(rows);
  Elm_Object_Item *page = elm_naviframe_item_push(ad->nf, nullptr, nullptr, nullptr, list, nullptr);
  run_until_calm();
  const double frame = _scrolling_frame(list);
  elm_object_item_del(page);
  run_until_calm();
  return frame;
}

double _refresh(appdata *ad, int run) {
  const std::string server_id = std::to_string(kFirstServerId + run % kReports);
  _tavro_dbmgr_update_push_status_comments(server_id.c_str(), "2", "One more answer.");
  longest_gap = 0;
  busy_since = Clock::now();
  tavro_update_history_page(nullptr, ad);
  run_until_calm();
  return longest_gap;
}

void _measure(appdata *ad, int runs) {
  std::vector<double> page, frame, empty_frame, refresh;
  for (int run = 0; run < runs; ++run) {
    page.push_back(open_page([ad] { tavro_create_history_page(ad); }).first_frame);
    frame.push_back(_scrolling_frame(ad->history_ad->history_genlist));
    refresh.push_back(_refresh(ad, run));
    elm_naviframe_item_pop(ad->nf);
    run_until_calm();
    empty_frame.push_back(_empty_list_frame(ad));
  }
  print("history_page_ms", median(page));
  print("history_frame_ms", median(frame));
  print("empty_list_frame_ms", median(empty_frame));
  print("history_refresh_ms", median(refresh));
}

}  // namespace

int main(int argc, char **argv) {
  const int runs = argc == 2 ? std::atoi(argv[1]) : 0;
  if (runs < 1) {
    std::fprintf(stderr, "usage: bench.history RUNS\n");
    return 2;
  }
  if (!elm_init(argc, argv)) return 1;
  watch_loop();
  tavro_bind_locale();
  tavro_dbmgr_init_semaphore();
  tavro_dbmgr_ensure_schema();
  appdata ad{};
  tavro_initialize_application_data(&ad);
  if (!_fill_store() || !tavro_create_base_window(&ad)) return 1;
  watch_window(ad.win);
  tavro_create_landing_page(&ad);
  run_until_calm(std::chrono::milliseconds(1000));
  _measure(&ad, runs);
  evas_object_del(ad.win);
  tavro_dealloc_memory(&ad);
  elm_shutdown();
  return 0;
}
