// The system log of an open problem screen: what the crash service is asked, and what its answers do.
#include <gmock/gmock.h>

#include <chrono>
#include <filesystem>
#include <fstream>

#include "client_support.h"
#include "tavro-common.h"
#include "tavro_crash_service.h"
#include "tavro_drafts.h"
#include "tavro_memory.h"
#include "tavro_preferences.h"
#include "tavro_system_log.h"
#include "tavro_type.h"

namespace {

using namespace std::chrono_literals;
using ::testing::ElementsAre;
using ::testing::IsEmpty;

constexpr char kCall[] = "dump_log /Org/Tizen/System/Crash/Crash (2, 'none', 'none')";
std::vector<tavro_system_log_state> states;

class SystemLog : public ClientTest {
 protected:
  void SetUp() override {
    ClientTest::SetUp();
    tavro_create_base_window(&ad);
    open_screen();
    std::filesystem::remove_all(TAVRO_LOG_DUMP_FOLDER);
    std::filesystem::create_directories(TAVRO_LOG_DUMP_FOLDER);
    tavro_system_log_watch([](appdata *of) { states.push_back(tavro_system_log_current(of)); });
    states.clear();
  }

  // Without a service no answer is to come any more.
  void TearDown() override {
    tavro_system_log_end(&ad);
    Listener::get().set_crash_service(false);
    Listener::get().take();
    Listener::get().set_crash_service(true);
    tavro_system_log_watch(nullptr);
    ClientTest::TearDown();
  }

  void open_screen() {
    if (ad.problem_view) tavro_free_problem_view(ad.problem_view);
    TAVRO_FREE(ad.problem_view);
    ad.problem_view = TAVRO_ZALLOC(problem_view_win);
  }

  static std::string make_log(const std::string &name) {
    std::ofstream(TAVRO_LOG_DUMP_FOLDER + name) << "log";
    return TAVRO_LOG_DUMP_FOLDER + name;
  }

  void answer(const std::string &file) { launch("DUMP_LOG_PROCESS", {{"TAVRO_DUMP_LOG_FILE", file}}); }
  std::string path() const {
    return ad.problem_view->syslog_filepath ? ad.problem_view->syslog_filepath : "";
  }
  tavro_system_log_state state() const { return tavro_system_log_current(&ad); }

  bool wait_for(tavro_system_log_state wanted) {
    const auto deadline = std::chrono::steady_clock::now() + std::chrono::seconds(10);
    while (state() != wanted && std::chrono::steady_clock::now() < deadline)
      g_main_context_iteration(nullptr, FALSE);
    return state() == wanted;
  }
};

TEST_F(SystemLog, IsAskedForOnceAndIsThereWithTheAnswer) {
  tavro_system_log_collect(&ad);
  tavro_system_log_collect(&ad);
  EXPECT_TRUE(tavro_preference_flag(TAVRO_PREF_SYSLOGS, false));
  EXPECT_THAT(Listener::get().take(), ElementsAre(kCall));
  const std::string log = make_log("SystemLog_1.zip");
  answer("SystemLog_1.zip");
  EXPECT_EQ(path(), log);
  EXPECT_STREQ(ad.problem_view->syslog_filename, "SystemLog_1.zip");
  EXPECT_FALSE(tavro_preference_flag(TAVRO_PREF_SYSLOGS, true));
  EXPECT_THAT(states, ElementsAre(TAVRO_SYSTEM_LOG_COLLECTING, TAVRO_SYSTEM_LOG_READY));
  tavro_system_log_collect(&ad);
  EXPECT_THAT(Listener::get().take_answers(), IsEmpty());
  // One whose file vanished is collected anew.
  std::filesystem::remove(log);
  EXPECT_EQ(state(), TAVRO_SYSTEM_LOG_OFF);
  tavro_system_log_collect(&ad);
  EXPECT_THAT(Listener::get().take_answers(), ElementsAre(kCall));
}

TEST_F(SystemLog, AnAnswerThatNamesNoFileOfTheLogFolderFailsAndTouchesNothing) {
  const std::string outside = make_log("../private.zip");
  std::filesystem::create_directories(TAVRO_LOG_DUMP_FOLDER + std::string("folder"));
  std::filesystem::create_symlink(outside, TAVRO_LOG_DUMP_FOLDER + std::string("link.zip"));
  make_log("folder/1.zip");
  for (const char *name : {"", ".", "folder", "folder/1.zip", "../private.zip", "link.zip", "missing.zip"}) {
    tavro_system_log_collect(&ad);
    answer(name);
    EXPECT_EQ(state(), TAVRO_SYSTEM_LOG_FAILED) << name;
    EXPECT_EQ(path(), "") << name;
  }
  EXPECT_FALSE(tavro_preference_flag(TAVRO_PREF_SYSLOGS, true));
  EXPECT_TRUE(std::filesystem::exists(outside));
}

TEST_F(SystemLog, AnswersForScreensThatHaveEndedAreThrownAwayWithTheirFiles) {
  const std::string older = make_log("0.zip");
  std::filesystem::last_write_time(older, std::filesystem::file_time_type::clock::now() - 1min);
  for (int i = 0; i < 3; ++i) {
    tavro_system_log_collect(&ad);
    tavro_system_log_end(&ad);
  }
  const std::string first = make_log("1.zip"), third = make_log("3.zip"), of_draft = make_log("5.zip");
  store_report("a draft", TAVRO_STATUS_DRAFT_SAVED, of_draft.c_str());
  open_screen();
  tavro_system_log_collect(&ad);
  tavro_system_log_drop(&ad);
  EXPECT_EQ(state(), TAVRO_SYSTEM_LOG_OFF);
  const std::string second = make_log("2.zip");
  tavro_system_log_collect(&ad);
  for (const char *name : {"0.zip", "5.zip", "1.zip", "2.zip"}) answer(name);
  EXPECT_EQ(state(), TAVRO_SYSTEM_LOG_COLLECTING);
  EXPECT_TRUE(std::filesystem::exists(older)) << "it was there before it was asked for";
  EXPECT_TRUE(std::filesystem::exists(of_draft));
  EXPECT_FALSE(std::filesystem::exists(first));
  EXPECT_FALSE(std::filesystem::exists(second));
  answer("3.zip");
  EXPECT_EQ(path(), third);
  // Nobody asked for these: another program may have sent them.
  const std::string fourth = make_log("4.zip");
  for (const char *name : {"3.zip", "4.zip"}) answer(name);
  EXPECT_EQ(path(), third);
  EXPECT_TRUE(std::filesystem::exists(third) && std::filesystem::exists(fourth));
}

TEST_F(SystemLog, ALostAnswerDoesNotTakeThePlaceOfALaterOne) {
  const double now = ecore_loop_time_get();
  ecore_loop_time_set(now - 31);
  tavro_system_log_collect(&ad);
  tavro_system_log_drop(&ad);
  ecore_loop_time_set(now);
  tavro_system_log_collect(&ad);
  const std::string log = make_log("1.zip");
  answer("1.zip");
  EXPECT_EQ(path(), log);
}

TEST_F(SystemLog, OldLogsGoWhenThereAreManyAndNoStoredReportNeedsThem) {
  std::vector<std::string> logs;
  for (int day = 10; day < 35; ++day)
    logs.push_back(make_log("SystemLog_202001" + std::to_string(day) + "_000000.zip"));
  logs.push_back(make_log("AppLog_20200110.zip"));
  for (const std::string &log : logs)
    std::filesystem::last_write_time(log, std::filesystem::file_time_type::clock::now() - 24h * 14);
  make_log("SystemLog_20200112_000000.zip");  // young; 10 to 14 are beyond the newest 20
  store_report("a draft", TAVRO_STATUS_DRAFT_SAVED, logs[3].c_str());
  tavro_system_log_collect(&ad);
  for (size_t i = 0; i < logs.size(); ++i)
    EXPECT_EQ(std::filesystem::exists(logs[i]), i != 0 && i != 1 && i != 4) << logs[i];
}

TEST_F(SystemLog, GivingItUpDeletesOnlyALogThatNoStoredDraftNeeds) {
  const std::string collected = make_log("1.zip"), of_draft = make_log("2.zip"),
                    elsewhere = make_log("../3.zip");
  ad.id_to_delete = store_report("a draft", TAVRO_STATUS_DRAFT_SAVED, of_draft.c_str());
  for (const std::string &log : {collected, of_draft, elsewhere}) {
    ad.problem_view->syslog_filepath = TAVRO_STRDUP(log.c_str());
    EXPECT_EQ(state(), TAVRO_SYSTEM_LOG_READY);
    tavro_system_log_drop(&ad);
    EXPECT_EQ(path(), "");
    EXPECT_EQ(std::filesystem::exists(log), log != collected) << log;
  }
}

TEST_F(SystemLog, AServiceThatIsMissingOrDiesFailsAtOnceAndCanBeAskedAgain) {
  Listener::get().set_crash_service(false);
  tavro_system_log_collect(&ad);
  EXPECT_TRUE(wait_for(TAVRO_SYSTEM_LOG_FAILED));
  Listener::get().set_crash_service(true);
  tavro_system_log_collect(&ad);
  tavro_system_log_drop(&ad);
  tavro_system_log_collect(&ad);
  Listener::get().take();
  Listener::get().set_crash_service(false);
  EXPECT_TRUE(wait_for(TAVRO_SYSTEM_LOG_FAILED));
  Listener::get().set_crash_service(true);
  tavro_system_log_collect(&ad);
  // The answers of the dead service will not come: this one is for the screen.
  const std::string log = make_log("1.zip");
  answer("1.zip");
  EXPECT_EQ(path(), log);
}

}  // namespace
