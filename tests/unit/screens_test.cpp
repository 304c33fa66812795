// The screens with real widgets, painted into memory, and the plain logic behind them.
#include <Elementary.h>
#include <gmock/gmock.h>
#include <sys/stat.h>
#include <unistd.h>
#include <utime.h>

#include <filesystem>
#include <fstream>

#include "tavro-common.h"
#include "tavro-main.h"
#include "tavro_appdata.h"
#include "tavro_compose.h"
#include "tavro_dbmgr.h"
#include "tavro_details_text.h"
#include "tavro_gallery.h"
#include "tavro_memory.h"
#include "tavro_screens.h"

namespace {

using testing::ElementsAre;
using testing::IsEmpty;

std::string make_file(const std::string &path, size_t size, time_t changed = 1000) {
  std::filesystem::create_directories(std::filesystem::path(path).parent_path());
  std::ofstream(path) << std::string(size, 'x');
  const utimbuf times{changed, changed};
  utime(path.c_str(), &times);
  return path;
}

TEST(Gallery, ListsPicturesNewestFirstAndStaysOutOfHiddenAndLinkedFolders) {
  const std::string root = "/opt/usr/media/gallery-test";
  const std::string old_picture = make_file(root + "/old.jpg", 1, 100);
  const std::string new_picture = make_file(root + "/deep/er/new.PNG", 1, 300);
  make_file(root + "/notes.txt", 1);
  make_file(root + "/.hidden/secret.jpg", 1);
  make_file(root + "/deep/er/and/too/far.jpg", 1);
  std::filesystem::create_directory_symlink("/", root + "/loop");
  EXPECT_THAT(tavro_gallery_pictures_in({root, root}), ElementsAre(new_picture, old_picture));
  EXPECT_THAT(tavro_gallery_pictures_in({root + "/none"}), IsEmpty());
}

TEST(Details, ShowsHowFarAReportHasCome) {
  struct {
    const char *stored;
    std::vector<tavro_step_state> steps;
    bool can_resend;
  } const cases[] = {
      {"10", {TAVRO_STEP_NOW, TAVRO_STEP_OPEN, TAVRO_STEP_OPEN, TAVRO_STEP_OPEN}, false},
      {"11", {TAVRO_STEP_STOPPED, TAVRO_STEP_OPEN, TAVRO_STEP_OPEN, TAVRO_STEP_OPEN}, true},
      {"1#2", {TAVRO_STEP_DONE, TAVRO_STEP_DONE, TAVRO_STEP_NOW, TAVRO_STEP_OPEN}, false},
      {"1#2#4", {TAVRO_STEP_DONE, TAVRO_STEP_DONE, TAVRO_STEP_DONE, TAVRO_STEP_NOW}, false},
      {"1#5", {TAVRO_STEP_DONE, TAVRO_STEP_DONE, TAVRO_STEP_DONE, TAVRO_STEP_STOPPED}, false},
      {"abc", {TAVRO_STEP_STOPPED, TAVRO_STEP_OPEN, TAVRO_STEP_OPEN, TAVRO_STEP_OPEN}, true},
  };
  for (const auto &expected : cases) {
    const tavro_status_line line = tavro_details_status_line(expected.stored);
    EXPECT_THAT(line.steps, testing::ElementsAreArray(expected.steps)) << expected.stored;
    EXPECT_EQ(tavro_details_can_resend(expected.stored), expected.can_resend) << expected.stored;
  }
}

TEST(Details, PairsEachReplyWithTheTimeOfItsAnswer) {
  char comments[] = "none#first#none#second", times[] = "3000000#2000000#1000000#0";
  svc_voc_data voc{};
  voc.push_comments = comments;
  voc.date_of_updation = times;
  const auto replies = tavro_details_replies(&voc);
  ASSERT_EQ(replies.size(), 2u);
  EXPECT_EQ(replies[0].markup, "first");
  EXPECT_EQ(replies[1].markup, "second");
  EXPECT_EQ(replies[0].time, "01/01/1970");
  voc.push_comments = nullptr;
  EXPECT_THAT(tavro_details_replies(&voc), IsEmpty());
}

class Compose : public testing::Test {
 protected:
  static void SetUpTestSuite() {
    setenv("ELM_ENGINE", "buffer", 1);
    char name[] = "screens_test", *arguments[] = {name, nullptr};
    elm_init(1, arguments);
    tavro_dbmgr_init_semaphore();
    tavro_dbmgr_ensure_schema();
  }
  static void TearDownTestSuite() { elm_shutdown(); }

  void SetUp() override {
    tavro_initialize_application_data(&ad_);
    ASSERT_TRUE(tavro_create_base_window(&ad_));
    tavro_create_landing_page(&ad_);
  }
  void TearDown() override {
    evas_object_del(ad_.win);
    ecore_main_loop_iterate();
    tavro_dealloc_memory(&ad_);
  }

  // Until the page that was pushed last has come to rest.
  static void settle() {
    const double end = ecore_time_get() + 1.0;
    while (ecore_time_get() < end) {
      ecore_main_loop_iterate();
      usleep(5000);
    }
  }

  int stored_drafts() {
    GSList *vocs = tavro_dbmgr_get_vocs_for_history("");
    const int count = static_cast<int>(g_slist_length(vocs));
    for (GSList *link = vocs; link; link = link->next)
      tavro_dbmgr_free_voc_data(static_cast<svc_voc_data *>(link->data));
    g_slist_free(vocs);
    return count;
  }

  appdata ad_{};
};

TEST_F(Compose, AttachesAFileOnceAddsUpWhatIsThereAndRefusesWhatIsNoFile) {
  tavro_create_problem_page(&ad_, nullptr);
  compose_view_win *view = tavro_compose_view(&ad_);
  const std::string small = make_file("/opt/usr/media/small.jpg", 10);
  const std::string large = make_file("/opt/usr/media/large.jpg", 1000);
  EXPECT_TRUE(tavro_compose_attach(view, small.c_str()));
  EXPECT_TRUE(tavro_compose_attach(view, small.c_str()));
  EXPECT_TRUE(tavro_compose_attach(view, large.c_str()));
  EXPECT_FALSE(tavro_compose_attach(view, "/opt/usr/media"));
  EXPECT_FALSE(tavro_compose_attach(view, "/opt/usr/media/gone.jpg"));
  EXPECT_EQ(view->buffer, 1010);
  view->app_name = TAVRO_STRDUP("Hardware");
  EXPECT_EQ(tavro_compose_check(view, 1010), TAVRO_COMPOSE_COMPLETE);
  EXPECT_EQ(tavro_compose_check(view, 1009), TAVRO_COMPOSE_TOO_LARGE);
  unlink(small.c_str());
  tavro_compose_detach(view, large.c_str());
  EXPECT_EQ(view->buffer, 0);
}

TEST_F(Compose, SecondScreenDoesNotThrowAwayWhatTheFirstHolds) {
  tavro_create_problem_page(&ad_, nullptr);
  elm_entry_entry_set(tavro_compose_view(&ad_)->entry, "hours of work");
  tavro_create_history_page(&ad_);
  settle();
  tavro_create_idea_page(&ad_, nullptr);
  settle();
  ASSERT_TRUE(ad_.problem_view);
  EXPECT_FALSE(ad_.idea_view);
  EXPECT_TRUE(ad_.cancel_popup);
  EXPECT_STREQ(elm_entry_entry_get(ad_.problem_view->entry), "hours of work");
  EXPECT_EQ(elm_naviframe_top_item_get(ad_.nf), ad_.problem_view->nf_it);
  tavro_pop_naviframe_middle_items(&ad_);
  EXPECT_TRUE(ad_.problem_view);
}

TEST_F(Compose, EmptyScreenMakesRoomForAnotherAndItsMenuGoesWithIt) {
  tavro_create_problem_page(&ad_, nullptr);
  tavro_menu_show(&ad_, &ad_.problem_view->menu_popup, {{"entry", nullptr}});
  tavro_create_idea_page(&ad_, nullptr);
  EXPECT_FALSE(ad_.problem_view);
  EXPECT_TRUE(ad_.idea_view);
}

TEST_F(Compose, LeavingAnUnchangedDraftRemovesOnlyItsAutomaticCopy) {
  tavro_dbmgr_bug_report_info report{};
  report.submitted = TAVRO_STATUS_DRAFT_SAVED;
  report.title_description = TAVRO_STRDUP("kept");
  const int draft_id = tavro_dbmgr_update_bug_report(&report);
  const int copy_id = tavro_dbmgr_update_bug_report(&report);
  TAVRO_FREE(report.title_description);
  TAVRO_FREE(report.type);
  svc_voc_data *draft = tavro_dbmgr_get_voc_by_id(draft_id);
  tavro_create_problem_page(&ad_, draft);
  tavro_dbmgr_free_voc_data(draft);
  ad_.auto_saved_id = copy_id;
  const int before = stored_drafts();
  settle();
  elm_naviframe_item_pop(ad_.nf);
  EXPECT_FALSE(ad_.problem_view);
  EXPECT_EQ(ad_.auto_saved_id, 0);
  EXPECT_EQ(stored_drafts(), before - 1);
  svc_voc_data *kept = tavro_dbmgr_get_voc_by_id(draft_id);
  EXPECT_TRUE(kept);
  tavro_dbmgr_free_voc_data(kept);
}

}  // namespace
