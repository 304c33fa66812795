// The system log of a report on the compose screen.
#include <gmock/gmock.h>

#include "bus_connection.h"
#include "compose_world.h"
#include "tavro_autosave.h"
#include "tavro_compose_parts.h"
#include "tavro_crash_service.h"
#include "tavro_system_log.h"

namespace {

using testing::HasSubstr;

class ComposeLog : public Compose {
 protected:
  void SetUp() override {
    std::filesystem::create_directories(TAVRO_LOG_DUMP_FOLDER);
    Compose::SetUp();
  }

  // A crash service that takes its time: the test answers for it.
  static void start_service() {
    static TavroObject<GDBusConnection> bus(connect_to_bus());
    set_name_owned(bus.get(), TAVRO_CRASH_SERVICE, true);
  }
  std::string service_answers(const char *name) {
    const std::string path = std::string(TAVRO_LOG_DUMP_FOLDER) + name;
    std::ofstream(path) << std::string(2048, 'l');
    TavroAppControl request;
    app_control_create(tavro_out(request));
    app_control_set_operation(request.get(), TAVRO_DUMP_LOG_OPERATION);
    app_control_add_extra_data(request.get(), TAVRO_DUMP_LOG_FILE, name);
    tavro_take_dump_log(request.get(), &ad_);
    return path;
  }
  std::string row() { return text(view()->log_row, "elm.text.sub"); }
  void turn_switch(bool is_on) {
    elm_check_state_set(view()->log_row, is_on);
    evas_object_smart_callback_call(view()->log_row, "changed", nullptr);
  }
};

// Before any service runs: the phone has none.
TEST_F(ComposeLog, PhoneThatMakesNoLogDoesNotKeepAReportBack) {
  write_problem("IDS_OB_MBODY_BATTERY");
  const int before = reports();
  ASSERT_TRUE(wait_for([this] { return tavro_system_log_current(&ad_) == TAVRO_SYSTEM_LOG_FAILED; }));
  EXPECT_FALSE(elm_object_disabled_get(view()->log_row)) << "it can be tried again";
  tap_send();
  ASSERT_TRUE(answer(ad_.cancel_popup, "IDS_OB_BUTTON_SEND_WITHOUT_LOG"));
  EXPECT_EQ(reports(), before + 1);
}

TEST_F(ComposeLog, TargetThatNeedsALogGetsItAndAnotherGivesItUp) {
  start_service();
  write_problem("IDS_OB_MBODY_BATTERY");
  EXPECT_EQ(tavro_system_log_current(&ad_), TAVRO_SYSTEM_LOG_COLLECTING);
  EXPECT_TRUE(elm_check_state_get(view()->log_row));
  EXPECT_TRUE(elm_object_disabled_get(view()->log_row));
  const std::string path = service_answers("needed.zip");
  EXPECT_THAT(row(), HasSubstr("2 kB"));
  // The person chooses another target.
  TAVRO_FREE(view()->app_name);
  view()->app_name = TAVRO_STRDUP("Calculator");
  tavro_compose_log_update(&ad_);
  EXPECT_FALSE(elm_check_state_get(view()->log_row));
  EXPECT_FALSE(std::filesystem::exists(path)) << "the person never asked for it";
}

TEST_F(ComposeLog, SettingSwitchesTheLogOnButDoesNotMakeAnEmptyScreenWorthKeeping) {
  start_service();
  preference_set_boolean(TAVRO_PREF_ATTACH_LOGS, true);
  const int before = reports();
  for (const bool is_end_of_all : {false, true}) {
    tavro_create_problem_page(&ad_, nullptr);
    settle();
    const std::string path = service_answers("default.zip");
    ASSERT_TRUE(ad_.problem_view->syslog_filepath);
    EXPECT_TRUE(elm_check_state_get(view()->log_row));
    if (is_end_of_all)
      tavro_autosave_at_end(&ad_);
    else
      elm_naviframe_item_pop(ad_.nf);
    EXPECT_FALSE(view());
    EXPECT_EQ(reports(), before);
    EXPECT_FALSE(std::filesystem::exists(path)) << "nobody would ever delete it";
  }
}

TEST_F(ComposeLog, SendingWithoutTheLogIsForgottenWhenThePersonGoesBackAndSwitchesItOn) {
  start_service();
  preference_set_boolean(TAVRO_PREF_SENT_PAGE_SEEN, false);
  write_problem();
  turn_switch(true);
  tap_send();
  ASSERT_TRUE(answer(ad_.cancel_popup, "IDS_OB_BUTTON_SEND_WITHOUT_LOG"));
  settle();
  ASSERT_NE(elm_naviframe_top_item_get(ad_.nf), view()->nf_it);
  elm_naviframe_item_pop(ad_.nf);
  settle();
  turn_switch(true);
  tavro_compose_review(&ad_);
  settle();
  tavro_compose_send_from_review(&ad_);
  ASSERT_TRUE(view()) << "it waits for the log";
  service_answers("given-up.zip");
  const std::string path = service_answers("wanted.zip");
  EXPECT_FALSE(view());
  EXPECT_EQ(newest("REF_2"), path);
}

TEST_F(ComposeLog, ReportWaitsForItsLogAndThenGoesByItself) {
  start_service();
  write_problem();
  turn_switch(true);
  const int before = reports();
  tap_send();
  EXPECT_EQ(reports(), before);
  const std::string path = service_answers("awaited.zip");
  EXPECT_EQ(reports(), before + 1);
  EXPECT_EQ(newest("REF_2"), path);
  EXPECT_FALSE(ad_.cancel_popup);
}

TEST_F(ComposeLog, PersonWhoKeepsWritingIsNotSentAwayByALateLog) {
  start_service();
  write_problem();
  turn_switch(true);
  tap_send();
  const int before = reports();
  ASSERT_TRUE(answer(ad_.cancel_popup, "IDS_OB_BUTTON_STAY"));
  service_answers("late.zip");
  EXPECT_TRUE(view());
  EXPECT_EQ(reports(), before);
  EXPECT_EQ(size_text(), "0.0 of 30.0 MB");
  turn_switch(false);
  EXPECT_FALSE(ad_.problem_view->syslog_filepath);
}

}  // namespace
