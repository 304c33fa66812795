// Saving, sending and resending reports: what is stored, what the service is asked for and what the screen
// keeps.
#include <gmock/gmock.h>
#include <sys/stat.h>

#include <filesystem>
#include <fstream>

#include "client_support.h"
#include "files.h"
#include "store_access.h"
#include "tavro_autosave.h"
#include "tavro_dbmgr.h"
#include "tavro_drafts.h"
#include "tavro_lifecycle.h"
#include "tavro_memory.h"
#include "tavro_preferences.h"
#include "tavro_resend.h"

using ::testing::ElementsAre;
using ::testing::HasSubstr;
using ::testing::IsEmpty;

namespace {

constexpr char kUpload[] =
    "/corvane/tavro_svc http://tizen.org/appcontrol/operation/default  TAVRO_OPERATION_TYPE=";
constexpr char kDraftToast[] = "Notify IDS_OB_TPOP_FEEDBACK_MESSAGE_SAVED_AS_DRAFT_IN_HISTORY|";

class Drafts : public ClientTest {
 protected:
  void SetUp() override {
    ClientTest::SetUp();
    sign_in();
    win_ = elm_win_add(nullptr, "compose", ELM_WIN_BASIC);
  }
  void TearDown() override {
    ClientTest::TearDown();
    evas_object_del(win_);
  }

  void fill(compose_view_win *view, const char *title, const char *text) {
    view->entry = elm_entry_add(win_);
    view->title_entry = elm_entry_add(win_);
    elm_entry_entry_set(view->entry, text);
    elm_entry_entry_set(view->title_entry, title);
    view->app_name = TAVRO_STRDUP("O'Neil's App");
    view->attachments = g_slist_append(nullptr, TAVRO_STRDUP("/gone/picture.png"));
  }
  void open_problem(const char *title = "It's loud", const char *text = "a &lt;b&gt; c") {
    ad.type = PROBLEM;
    ad.problem_view = TAVRO_ZALLOC(problem_view_win);
    fill(ad.problem_view, title, text);
  }
  void open_idea() {
    ad.type = IDEA;
    ad.idea_view = TAVRO_ZALLOC(idea_view_win);
    fill(ad.idea_view, "Quieter", "please");
  }
  void battery(int percent) {
    __tavro_app_battery_capacity_changed_cb(DEVICE_CALLBACK_BATTERY_CAPACITY,
                                            reinterpret_cast<void *>(static_cast<intptr_t>(percent)), &ad);
  }
  // These statements fail until unblock_store, as on a full disk.
  static void block_store(const std::string &what) {
    run("CREATE TRIGGER \"" + what + "\" BEFORE " + what + " BEGIN SELECT RAISE(FAIL, 'full'); END");
  }
  static void unblock_store(const std::string &what) { run("DROP TRIGGER \"" + what + "\""); }
  static std::ptrdiff_t media_file_count() {
    const std::filesystem::directory_iterator files("/opt/usr/media/VantorCommunity");
    return std::distance(begin(files), end(files));
  }
  Evas_Object *win_ = nullptr;
};

TEST_F(Drafts, ASentProblemIsStoredWholeAndHandedOverAfterItsNotification) {
  open_problem();
  const int id = tavro_save_problem_compose_data(&ad, TAVRO_STATUS_SENDING);
  ASSERT_GE(id, 1);
  EXPECT_EQ(ad.problem_view, nullptr);
  EXPECT_EQ(column(id, "VOC_TEXT"), "a <b> c");
  EXPECT_EQ(column(id, "VOC_TITLE_TEXT"), "It's loud");
  EXPECT_EQ(column(id, "VOC_APP_NAME"), "O'Neil's App");
  EXPECT_EQ(column(id, "VOC_STATE || VOC_SEVERITY || VOC_USER_NAME"), "10Highanna");
  const std::string status_file = column(id, "REF_3");
  EXPECT_THAT(status_file,
              ::testing::MatchesRegex("/opt/usr/media/VantorCommunity/VantorCommunity_20[0-9]{12}\\.txt"));
  EXPECT_THAT(file_contents(status_file),
              ::testing::MatchesRegex(
                  "System Info - Build Version : .*, Screen width : [0-9]+, Screen height : [0-9]+\n"
                  "Battery Info - Percent : [0-9]+, Battery Level : [0-9], (Not )?Charging\n"
                  "Internal Memory - Total : [0-9]+ bytes, Available : [0-9]+ bytes\n"));
  struct stat info = {};
  stat(status_file.c_str(), &info);
  EXPECT_EQ(info.st_mode & 0777, 0600u);
  EXPECT_EQ(row_count("ATTACHMENT WHERE ATTACHMENT_FILE_PATH = '/gone/picture.png'"), 1);
  EXPECT_NE(ad.noti, nullptr);
  EXPECT_THAT(Listener::get().take(),
              ::testing::UnorderedElementsAre(
                  ::testing::StartsWith("Notify IDS_OB_TPOP_SENDING_FEEDBACK_ING_ABB|a "),
                  kUpload + std::string("TAVRO_OPERATION_TYPE_UI TAVRO_VOC_ID=") + std::to_string(id)));
}

TEST_F(Drafts, ADraftOfAnIdeaIsKeptQuietlyWithItsToast) {
  open_idea();
  const int id = tavro_save_idea_compose_data(&ad, TAVRO_STATUS_DRAFT_SAVED);
  ASSERT_GE(id, 1);
  EXPECT_EQ(ad.idea_view, nullptr);
  EXPECT_EQ(column(id, "VOC_TYPE || VOC_SEVERITY || VOC_STATE || VOC_TEXT"),
            "TAVRO_DBMGR_SUGGESTIONMedium6please");
  EXPECT_EQ(column(id, "REF_3"), "NULL");
  EXPECT_THAT(Listener::get().take(), ElementsAre(kDraftToast));
  EXPECT_EQ(tavro_save_idea_compose_data(&ad, TAVRO_STATUS_SENDING), 0);
}

TEST_F(Drafts, AReopenedDraftWhoseLogWasTakenOffLosesThatFile) {
  const std::string log_path = std::string(getenv("TMPDIR")) + "/draft.log";
  std::ofstream(log_path) << "log";
  ad.id_to_delete = store_report("older", 6, log_path.c_str());
  for (const bool is_taken_off : {false, true}) {
    open_problem();
    ad.problem_view->collectBtn = elm_button_add(win_);
    if (is_taken_off) evas_object_show(ad.problem_view->collectBtn);
    tavro_save_problem_compose_data(&ad, TAVRO_STATUS_DRAFT_SAVED);
    EXPECT_EQ(std::filesystem::exists(log_path), !is_taken_off);
  }
}

TEST_F(Drafts, SendingLeavesOneRecordInPlaceOfDraftAndAutomaticCopy) {
  ad.id_to_delete = store_report("draft", 6);
  ad.auto_saved_id = store_report("copy", 6);
  ad.image_list = g_slist_append(nullptr, TAVRO_STRDUP("/x.png"));
  open_problem();
  const int id = tavro_send_compose_data(&ad);
  EXPECT_EQ(row_count("TABLE_VOC"), 1);
  EXPECT_EQ(column(id, "VOC_STATE"), "10");
  EXPECT_EQ(ad.id_to_delete, 0);
  EXPECT_EQ(ad.auto_saved_id, 0);
  EXPECT_EQ(ad.image_list, nullptr);
  EXPECT_THAT(ui_calls, ElementsAre("pop"));
}

TEST_F(Drafts, TheSizeLimitIsThirtyMegabytesUnlessThePreferenceSaysOtherwise) {
  const std::tuple<int, gint64, bool> cases[] = {
      {0, 31457280, true}, {0, 31457281, false}, {51200, 31457281, true}, {1, 1025, false}, {-5, 9, true}};
  for (const auto &[limit_kilobytes, size, is_sent] : cases) {
    preference_set_int(TAVRO_PREF_MAX_SIZE_ATTACHMENT, limit_kilobytes);
    tavro_dbmgr_destroy_vocs();
    open_problem();
    ad.problem_view->buffer = size;
    EXPECT_EQ(tavro_send_compose_data(&ad) >= 1, is_sent) << size;
    EXPECT_EQ(row_count("TABLE_VOC"), is_sent ? 1 : 0);
    const std::vector<std::string> seen = Listener::get().take();
    if (is_sent) continue;
    EXPECT_THAT(seen, ElementsAre("Notify Cannot send. Feedback message exceeded max limit of 30.0 MB|"));
    EXPECT_TRUE(ad.problem_view->server_size_error);
    tavro_free_problem_view(ad.problem_view);
    TAVRO_FREE(ad.problem_view);
  }
  preference_remove(TAVRO_PREF_MAX_SIZE_ATTACHMENT);
  open_problem();
  const std::string log_path = std::string(getenv("TMPDIR")) + "/big.log";
  std::ofstream(log_path) << "12";
  ad.problem_view->syslog_filepath = TAVRO_STRDUP(log_path.c_str());
  ad.problem_view->buffer = 31457279;
  EXPECT_EQ(tavro_send_compose_data(&ad), -1);
}

TEST_F(Drafts, AStoreThatRefusesLeavesScreenAndDraftAndSendsNothing) {
  ad.id_to_delete = store_report("draft", 6);
  open_problem();
  Listener::get().take();
  block_store("INSERT ON TABLE_VOC");
  EXPECT_LT(tavro_send_compose_data(&ad), 1);
  ASSERT_NE(ad.problem_view, nullptr);
  EXPECT_STREQ(elm_entry_entry_get(ad.problem_view->title_entry), "It's loud");
  EXPECT_EQ(ad.noti, nullptr);
  for (const std::string &line : Listener::get().take()) EXPECT_THAT(line, Not(HasSubstr("TAVRO_VOC_ID")));
  EXPECT_LT(tavro_save_problem_compose_data(&ad, TAVRO_STATUS_SENDING), 1);
  EXPECT_EQ(ad.problem_view, nullptr);
  EXPECT_EQ(row_count("ATTACHMENT") + row_count("TABLE_VOC_EXTENDED WHERE VOC_ID = 0"), 0);
  unblock_store("INSERT ON TABLE_VOC");
  EXPECT_EQ(row_count("TABLE_VOC WHERE VOC_TEXT = 'draft'"), 1);

  // The note of the report that was given up is not replaced by the next one's.
  open_problem("next", "next");
  ASSERT_GE(tavro_send_compose_data(&ad), 1);
  EXPECT_EQ(query("group_concat(VOC_TITLE_TEXT) FROM TABLE_VOC JOIN TABLE_VOC_EXTENDED USING (VOC_ID) "
                  "WHERE VOC_STATE = 10"),
            "It's loud,next");
}

TEST_F(Drafts, AReportThatIsStoredInPartIsNotStoredAndIsNotDoubledByTheNextTry) {
  for (const std::string part : {"INSERT ON TABLE_VOC_EXTENDED", "INSERT ON ATTACHMENT"}) {
    for (const std::string removal : {"", "DELETE ON TABLE_VOC"}) {
      SCOPED_TRACE(part + removal);
      SetUp();
      sign_in();
      ad.id_to_delete = store_report("draft", 6);
      open_problem();
      const std::ptrdiff_t file_count = media_file_count();
      block_store(part);
      if (!removal.empty()) block_store(removal);
      EXPECT_LT(tavro_send_compose_data(&ad), 1);
      ASSERT_NE(ad.problem_view, nullptr);
      EXPECT_EQ(row_count("TABLE_VOC"), removal.empty() ? 1 : 2);
      EXPECT_EQ(column(ad.id_to_delete, "VOC_TEXT"), "draft");
      EXPECT_EQ(media_file_count(), file_count);
      EXPECT_LT(removal.empty() ? 0 : tavro_send_compose_data(&ad), 1);
      for (const std::string &line : Listener::get().take())
        EXPECT_THAT(line, Not(HasSubstr("TAVRO_VOC_ID")));

      unblock_store(part);
      if (!removal.empty()) unblock_store(removal);
      const int id = tavro_send_compose_data(&ad);
      EXPECT_EQ(column(id, "VOC_TITLE_TEXT"), "It's loud");
      EXPECT_EQ(row_count("TABLE_VOC") * 10 + row_count("ATTACHMENT"), 11);
    }
  }
}

TEST_F(Drafts, ReportsSentInTheSameSecondHaveAStatusFileEach) {
  const auto send = [this] {
    open_problem();
    return column(tavro_send_compose_data(&ad), "REF_3");
  };
  const std::string first = send(), second = send(), third = send();
  EXPECT_NE(first, second);
  EXPECT_NE(second, third);
  for (const std::string &path : {first, second, third}) EXPECT_TRUE(std::filesystem::exists(path)) << path;
}

TEST_F(Drafts, ALowBatterySavesACopyAndTheScreenStaysOpen) {
  open_problem("", "");
  GSList *attachments = std::exchange(ad.problem_view->attachments, nullptr);
  battery(3);
  EXPECT_EQ(ad.auto_saved_id, 0);
  ad.problem_view->attachments = attachments;
  battery(16);
  battery(14);
  EXPECT_EQ(row_count("TABLE_VOC"), 0);
  EXPECT_EQ(ad.auto_saved_id, -1);
  battery(15);
  const int first = ad.auto_saved_id;
  EXPECT_EQ(column(first, "VOC_STATE"), "6");
  elm_entry_entry_set(ad.problem_view->entry, "more");
  battery(5);
  EXPECT_EQ(column(first, "VOC_STATE"), "no row");
  EXPECT_EQ(column(ad.auto_saved_id, "VOC_TEXT"), "more");
  EXPECT_EQ(ad.problem_view->description, nullptr);
  EXPECT_THAT(Listener::get().take(), IsEmpty());
}

TEST_F(Drafts, AnotherReportThatIsSentLeavesTheScreensNotedCopyAlone) {
  open_problem("", "hours of work");
  block_store("INSERT ON TABLE_VOC");
  battery(15);
  const TavroHandle<tavro_dbmgr_bug_report_info, tavro_free_bug_report> report(
      TAVRO_ZALLOC(tavro_dbmgr_bug_report_info));
  report->description = TAVRO_STRDUP("a follow-up");
  EXPECT_LT(tavro_send_report(&ad, report.get()), 1);
  unblock_store("INSERT ON TABLE_VOC");
  const int id = tavro_send_report(&ad, report.get());
  EXPECT_EQ(column(id, "VOC_TEXT"), "a follow-up");
  EXPECT_EQ(column(ad.auto_saved_id, "VOC_STATE || VOC_TEXT"), "6hours of work");
  ASSERT_GE(tavro_send_compose_data(&ad), 1);
  EXPECT_EQ(row_count("TABLE_VOC"), 2) << "the copy went with its screen";
}

TEST_F(Drafts, WhatIsOnAScreenWhenTheApplicationIsEndedBecomesADraft) {
  ad.id_to_delete = store_report("older text", 6);
  open_idea();
  app_terminate(&ad);
  EXPECT_EQ(query("VOC_STATE || VOC_TEXT FROM TABLE_VOC"), "6please");
}

class Resend : public Drafts {
 protected:
  // The history's send action on a stored report; `meanwhile` runs after the history read it.
  void send_again(int id, const char *meanwhile = "") {
    Evas_Object *button = elm_button_add(win_);
    evas_object_data_set(button, "app_data", &ad);
    tavro_resend_register_screen(
        {[](appdata *) { ui_calls.push_back("no file"); }, [](appdata *) { ui_calls.push_back("close"); }});
    const TavroHandle<svc_voc_data, tavro_dbmgr_free_voc_data> voc(tavro_dbmgr_get_voc_by_id(id));
    run(meanwhile);
    tavro_send_cb(voc.get(), button, nullptr);
  }
};

TEST_F(Resend, AFailedReportIsSendingAgainAndADraftStaysADraft) {
  for (const int status : {0, 11, 6}) {
    const int id = store_report("text", status);
    Listener::get().take();
    ui_calls.clear();
    send_again(id);
    EXPECT_EQ(column(id, "VOC_STATE || '/' || VOC_PUSH_READ"), status == 6 ? "6/1" : "10/1");
    EXPECT_THAT(Listener::get().take(),
                ::testing::Contains(kUpload + std::string("TAVRO_SEND_FAILED_VOC TAVRO_VOC_ID=") +
                                    std::to_string(id)));
    EXPECT_THAT(ui_calls, ElementsAre("close", "pop"));
  }
}

TEST_F(Resend, AReportThatReachedTheDeskMeanwhileIsLeftAsItIs) {
  const int id = store_report("text", 11);
  Listener::get().take();
  send_again(id, "UPDATE TABLE_VOC SET VOC_STATE = '1#2', VOC_PUSH_READ = 0");
  EXPECT_EQ(column(id, "VOC_STATE || '/' || VOC_PUSH_READ"), "1#2/0");
  EXPECT_THAT(Listener::get().take(), IsEmpty());
  EXPECT_THAT(ui_calls, ElementsAre("update history", "close", "pop"));
}

TEST_F(Resend, AReportOfAttachmentsThatAreAllGoneIsNotSent) {
  open_problem("", "");
  ad.problem_view->attachments = g_slist_append(ad.problem_view->attachments, TAVRO_STRDUP("/gone/too.jpg"));
  const int id = tavro_save_problem_compose_data(&ad, TAVRO_STATUS_DRAFT_SAVED);
  send_again(id);
  EXPECT_THAT(ui_calls, ElementsAre("no file"));
  EXPECT_EQ(column(id, "VOC_PUSH_READ"), "NULL");
  EXPECT_THAT(Listener::get().take(), ElementsAre(kDraftToast));
}

}  // namespace
