// Deleting reports: what goes, what stays, and the time to think again. Widgets are real and painted into
// memory.
#include <app_preference.h>

#include <random>

#include "screens_world.h"
#include "store_world.h"
#include "tavro-common.h"
#include "tavro-main.h"
#include "tavro_appdata.h"
#include "tavro_compose.h"
#include "tavro_compose_keeper.h"
#include "tavro_crash_archive.h"
#include "tavro_deleted_files.h"
#include "tavro_preferences.h"
#include "tavro_report_delete.h"
#include "tavro_screens.h"
#include "tavro_theme.h"

namespace {

namespace fs = std::filesystem;

const std::string kOwn = "/opt/usr/media/VantorCommunity/";
const std::string kGallery = "/opt/usr/media/DCIM/";
const std::string kLogs = "/opt/usr/media/QRT_debug/";
const std::string kDumps = "/opt/usr/media/Orbel/";

int redraws = 0;
int confirmations = 0;

struct named_files {
  std::vector<std::string> attachments;
  std::string log, dump, device_data;
};

int store_report(const named_files &files, int status = TAVRO_STATUS_UNDER_REVIEW) {
  const Problem report = problem_report("anna", "", files.attachments);
  report->submitted = status;
  const std::pair<char **, const std::string *> paths[] = {
      {&report->syslog_file, &files.log},
      {&report->dump_file, &files.dump},
      {&report->device_data_filepath, &files.device_data}};
  for (const auto &[member, path] : paths) {
    TAVRO_FREE(*member);
    *member = TAVRO_STRDUP(path->c_str());
  }
  return tavro_dbmgr_update_bug_report(report.get());
}

class Delete : public StoreWorld {
 protected:
  static void SetUpTestSuite() {
    setenv("ELM_ENGINE", "buffer", 1);
    char name[] = "delete_test", *arguments[] = {name, nullptr};
    elm_init(1, arguments);
    ASSERT_TRUE(tavro_theme_load());
    ASSERT_TRUE(edje_file_group_exists(tavro_theme_file(), "tavro/undo_bar"));
  }
  static void TearDownTestSuite() { elm_shutdown(); }

  void SetUp() override {
    StoreWorld::SetUp();
    preference_set_string(TAVRO_PREF_USERNAME, "anna");
    fs::remove_all("/opt/usr/media");
    tavro_initialize_application_data(&ad_);
    ASSERT_TRUE(tavro_create_base_window(&ad_));
    tavro_create_landing_page(&ad_);
    redraws = confirmations = 0;
    tavro_delete_register_screen([](appdata *) { redraws++; });
  }
  void TearDown() override {
    evas_object_del(ad_.win);
    ecore_main_loop_iterate();
    tavro_dealloc_memory(&ad_);
    StoreWorld::TearDown();
  }

  bool touch(const char *name) {
    Evas_Object *button = find_top_button(ad_.win, name);
    if (button) evas_object_smart_callback_call(button, "clicked", nullptr);
    return button;
  }
  void ask_and_confirm(const std::vector<int> &ids) {
    tavro_delete_reports(&ad_, ids, [](appdata *) { confirmations++; });
    ASSERT_TRUE(touch("IDS_OB_BUTTON_DELETE_ABB5"));
  }
  void delete_now(const std::vector<int> &ids) {
    ask_and_confirm(ids);
    tavro_delete_finish(&ad_);
  }
  static bool is_stored(int id) {
    return value("SELECT count(*) FROM TABLE_VOC WHERE VOC_ID = " + std::to_string(id)) == "1";
  }
  // Rows of a report in all tables.
  static std::string rows_of(int id) {
    const std::string is = " = " + std::to_string(id);
    return value("SELECT (SELECT count(*) FROM TABLE_VOC WHERE VOC_ID" + is +
                 ") || (SELECT count(*) FROM TABLE_VOC_EXTENDED WHERE VOC_ID" + is +
                 ") || (SELECT count(*) FROM ATTACHMENT WHERE ATTACHMENT_SUGGESTION_ID" + is + ")");
  }

  appdata ad_ = {};
};

TEST_F(Delete, OnlyFilesThatTheClientMadeGo) {
  const std::string gone[] = {
      write_file(kOwn + "edited.jpg"),       write_file(kOwn + "status.txt"),
      write_file(kLogs + "SystemLog_1.zip"), write_file(kDumps + "tavro_1.zip"),
      write_file(kOwn + "by a detour.mp4"),  write_file(kOwn + ".by a detour.mp4.jpg")};
  const std::string kept[] = {write_file(kGallery + "a.jpg"),      write_file(kGallery + "b.jpg"),
                              write_file(kGallery + "linked.jpg"), write_file(kGallery + "log.zip"),
                              write_file(kLogs + "other.zip"),     write_file(kOwn + "below/c.jpg"),
                              write_file("/opt/usr/share/d.jpg"),  write_file(kOwn + "nobody's.jpg"),
                              write_file(kOwn + "shared.jpg"),     write_file(kOwn + "it's shared.txt")};
  fs::create_symlink(kGallery + "linked.jpg", kOwn + "link.jpg");
  fs::create_directory_symlink(kGallery, kOwn + "folder");
  const int id = store_report({{gone[0], kOwn + "../VantorCommunity/by a detour.mp4", kept[0],
                                kOwn + "../DCIM/b.jpg", kOwn + "link.jpg", kOwn + "folder/linked.jpg",
                                kept[4], kept[5], kept[6], kept[8], kOwn, "VantorCommunity/edited.jpg", ""},
                               gone[2],
                               gone[3],
                               gone[1]});
  const int with_log_in_gallery = store_report({{}, kept[3], kept[0], kept[9]});
  const int other = store_report({{kGallery + "../VantorCommunity/shared.jpg"}, "", "", kept[9]});
  delete_now({id, with_log_in_gallery});
  for (const std::string &path : gone) EXPECT_FALSE(fs::exists(path)) << path;
  for (const std::string &path : kept) EXPECT_TRUE(fs::exists(path)) << path;
  EXPECT_TRUE(fs::is_symlink(kOwn + "link.jpg"));
  EXPECT_EQ(rows_of(id) + rows_of(with_log_in_gallery) + rows_of(other), "000000111");
}

TEST_F(Delete, AFolderThatIsALinkToTheGalleryIsNotTheClientsOwn) {
  const std::string picture = write_file(kGallery + "a.jpg");
  fs::create_directory_symlink(kGallery, kOwn.substr(0, kOwn.size() - 1));
  delete_now({store_report({{kOwn + "a.jpg"}, "", kOwn + "a.jpg", ""})});
  EXPECT_TRUE(fs::exists(picture));
}

TEST_F(Delete, ReportsAreHiddenUntilTheTimeIsUpAndComeBackWhenItIsUndone) {
  const std::string path = write_file(kOwn + "edited.jpg");
  const int id = store_report({{path}, "", "", ""}), unread = store_report({});
  run("UPDATE TABLE_VOC SET VOC_PUSH_READ = 0");
  tavro_delete_reports(&ad_, {id}, nullptr);
  ASSERT_TRUE(touch("IDS_OB_BUTTON_CANCEL"));
  EXPECT_FALSE(tavro_delete_is_waiting(id));
  ask_and_confirm({id});
  EXPECT_TRUE(tavro_delete_is_waiting(id));
  EXPECT_TRUE(is_stored(id) && fs::exists(path));
  EXPECT_EQ(confirmations, 1);
  ASSERT_TRUE(touch("IDS_OB_BUTTON_UNDO"));
  EXPECT_FALSE(tavro_delete_is_waiting(id));
  EXPECT_EQ(redraws, 2);
  tavro_delete_finish(&ad_);
  EXPECT_TRUE(is_stored(id) && fs::exists(path));
  ask_and_confirm({id});
  while (tavro_delete_is_waiting(id)) ecore_main_loop_iterate_may_block(1);
  EXPECT_FALSE(is_stored(id) || fs::exists(path));
  EXPECT_EQ(ad_.push_noti_count, 1) << "only that of " << unread;
  EXPECT_FALSE(touch("IDS_OB_BUTTON_UNDO")) << "the bar goes with the time";
}

TEST_F(Delete, AStoreThatRefusesKeepsEverythingAndShowsItAgain) {
  const std::string paths[] = {write_file(kOwn + "a.jpg"), write_file(kOwn + "b.jpg")};
  const int ids[] = {store_report({{paths[0]}, "", "", ""}), store_report({{paths[1]}, "", "", ""})};
  run("CREATE TRIGGER no BEFORE DELETE ON TABLE_VOC WHEN old.VOC_ID = " + std::to_string(ids[1]) +
      " BEGIN SELECT RAISE(ABORT, 'full'); END");
  delete_now({ids[0], ids[1]});
  for (const int i : {0, 1}) {
    EXPECT_EQ(rows_of(ids[i]), "111");
    EXPECT_TRUE(fs::exists(paths[i]));
    EXPECT_FALSE(tavro_delete_is_waiting(ids[i]));
  }
  EXPECT_EQ(redraws, 2);
  EXPECT_FALSE(fs::exists(TAVRO_DBMGR_FOLDER "/.tavro.delete"));
}

TEST_F(Delete, AReportThatIsSentMeanwhileStaysWithItsFiles) {
  const std::string path = write_file(kOwn + "a.jpg");
  const int sending = store_report({{path}, "", "", ""}, TAVRO_STATUS_SENDING_FAILED),
            answered = store_report({}, TAVRO_STATUS_SENDING_FAILED), other = store_report({});
  ask_and_confirm({sending, answered, other});
  tavro_dbmgr_update_sending_state(sending, TAVRO_STATUS_SENDING);
  run("UPDATE TABLE_VOC SET VOC_STATE = '10#' WHERE VOC_ID = " + std::to_string(answered));
  tavro_delete_finish(&ad_);
  EXPECT_TRUE(is_stored(sending) && is_stored(answered) && fs::exists(path));
  EXPECT_FALSE(is_stored(other));
}

TEST_F(Delete, TheScreenOfADraftGoesWithItUnlessMoreWasWrittenThere) {
  for (const bool is_changed : {false, true}) {
    const int id = store_report({{write_file(kOwn + "a.jpg")}, "", "", ""}, TAVRO_STATUS_DRAFT_SAVED);
    const Voc draft(tavro_dbmgr_get_voc_by_id(id));
    tavro_create_problem_page(&ad_, draft.get());
    if (is_changed) elm_entry_entry_set(tavro_compose_view(&ad_)->entry, "more");
    delete_now({id});
    EXPECT_EQ(tavro_compose_view(&ad_) != nullptr, is_changed);
    EXPECT_EQ(is_stored(id), is_changed);
  }
}

TEST_F(Delete, WhatAKilledScreensWritingNamesStaysUntilThatIsGone) {
  constexpr char kKilled[] = TAVRO_COMPOSE_KEEPER_FILE ".2";
  const std::string picture = write_file(kOwn + "a.jpg"), dump = write_file(kDumps + "tavro_1.zip");
  const int id = store_report({{picture}, "", dump, ""}, TAVRO_STATUS_DRAFT_SAVED);
  const Voc draft(tavro_dbmgr_get_voc_by_id(id));
  tavro_create_problem_page(&ad_, draft.get());
  tavro_compose_keeper_keep_all();
  tavro_compose_keeper_flush();
  fs::copy_file(TAVRO_COMPOSE_KEEPER_FILE, kKilled);
  delete_now({id});
  EXPECT_FALSE(is_stored(id) || fs::exists(TAVRO_COMPOSE_KEEPER_FILE));
  tavro_crash_archive_delete_unneeded(dump);
  EXPECT_TRUE(fs::exists(picture) && fs::exists(dump));
  fs::remove(kKilled);
  tavro_deleted_files_remove();  // as the next start does
  EXPECT_FALSE(fs::exists(picture) || fs::exists(dump));
}

// A deletion in a process of its own, which has begun; it kills itself behind a step (0: it does not).
pid_t start_deletion(int id, int last_step) {
  int begin[2];
  EXPECT_EQ(pipe(begin), 0);
  const pid_t pid = start_process([=] {
    std::vector<int> gone;
    if (write(begin[1], "x", 1) != 1) return 1;
    tavro_deleted_files_note({id});
    if (last_step == 1) raise(SIGKILL);
    tavro_dbmgr_destroy_vocs_by_ids({id}, &gone);
    if (last_step == 2) raise(SIGKILL);
    tavro_deleted_files_remove();
    return 0;
  });
  char byte;
  EXPECT_EQ(read(begin[0], &byte, 1), 1);
  for (const int end : begin) close(end);
  return pid;
}

TEST_F(Delete, AKillAtAnyMomentLeavesNoReportWithoutItsFilesAndNoFileForLong) {
  constexpr int kToItsEnd = 0, kRandomKills = 40;
  const unsigned seed = std::random_device{}();
  SCOPED_TRACE(seed);
  std::mt19937 random(seed);
  std::uniform_real_distribution<> part(0.0, 1.2);
  double seconds = 0.0;
  for (int turn = 0; turn < 3 + kRandomKills; turn++) {
    const std::string path = write_file(kOwn + "a.jpg"), log_path = write_file(kLogs + "SystemLog_1.zip");
    const int id = store_report({{path}, log_path, "", ""});
    const double start = ecore_time_get();
    const pid_t deletion = start_deletion(id, turn < 3 ? turn : kToItsEnd);
    if (turn >= 3) {
      usleep(static_cast<useconds_t>(1e6 * seconds * part(random)));
      kill(deletion, SIGKILL);
    }
    const bool is_killed = end_of(deletion) == -1;
    if (turn == 0) seconds = ecore_time_get() - start;
    tavro_dbmgr_init_semaphore();
    const bool is_there = is_stored(id);
    EXPECT_TRUE(turn >= 3 || is_there == (turn == 1));
    EXPECT_TRUE(is_killed || !is_there);
    EXPECT_EQ(rows_of(id), is_there ? "111" : "000");
    EXPECT_TRUE(!is_there || (fs::exists(path) && fs::exists(log_path)));
    tavro_deleted_files_remove();  // as the next start does
    EXPECT_EQ(fs::exists(path), is_there);
    EXPECT_EQ(fs::exists(log_path), is_there);
    tavro_dbmgr_destroy_vocs_by_id(id);
  }
}

}  // namespace
