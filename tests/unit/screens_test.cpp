// The plain logic behind the screens.
#include <Ecore.h>
#include <gmock/gmock.h>

#include "tavro_dbmgr.h"
#include "tavro_details_text.h"

namespace {

using testing::IsEmpty;

// Times are told in the person's clock, which is remembered until the main loop goes round.
class Details : public testing::Test {
 protected:
  static void SetUpTestSuite() { ecore_init(); }
  static void TearDownTestSuite() { ecore_shutdown(); }
};

TEST_F(Details, ShowsHowFarAReportHasCome) {
  struct {
    const char *stored;
    std::vector<tavro_step_state> steps;
    bool can_resend;
  } const cases[] = {
      {"10", {TAVRO_STEP_NOW, TAVRO_STEP_OPEN, TAVRO_STEP_OPEN, TAVRO_STEP_OPEN}, false},
      {"11", {TAVRO_STEP_STOPPED, TAVRO_STEP_OPEN, TAVRO_STEP_OPEN, TAVRO_STEP_OPEN}, true},
      {"1#2", {TAVRO_STEP_DONE, TAVRO_STEP_DONE, TAVRO_STEP_NOW, TAVRO_STEP_OPEN}, false},
      {"1#2#4", {TAVRO_STEP_DONE, TAVRO_STEP_DONE, TAVRO_STEP_DONE, TAVRO_STEP_NOW}, false},
      {"1#5", {TAVRO_STEP_DONE, TAVRO_STEP_DONE, TAVRO_STEP_OPEN, TAVRO_STEP_STOPPED}, false},
      {"abc", {TAVRO_STEP_STOPPED, TAVRO_STEP_OPEN, TAVRO_STEP_OPEN, TAVRO_STEP_OPEN}, true},
  };
  for (const auto &expected : cases) {
    const tavro_status_line line = tavro_details_status_line(expected.stored);
    EXPECT_THAT(line.steps, testing::ElementsAreArray(expected.steps)) << expected.stored;
    EXPECT_EQ(tavro_details_can_resend(expected.stored), expected.can_resend) << expected.stored;
  }
}

TEST_F(Details, TimelineShowsWhatIsSaneOfAStoredHistory) {
  // In 1970, in UTC: day n of January is shown as "n/01/1970".
  const std::string many = std::string(20000, '#') + "1#2";
  struct {
    std::string states, times, shown;
    size_t count;
  } const cases[] = {
      {"1#2#4", "259200000#172800000#86400000", "4@04/01/1970 2@03/01/1970 1@02/01/1970", 3},
      {"10", "", "10@01/02/1970", 1},
      {"1#2", "86400000", "2@02/01/1970 1@01/02/1970", 2},
      {"1", "86400000#172800000", "1@02/01/1970", 1},
      {"1#2#3#4", "86400000#-5#0#abc", "4@02/01/1970 3@ 2@", 4},
      {"1#2", "99999999999999999999#4102444800000", "2@ 1@01/01/2100", 2},
      {"", "86400000", "", 0},
      {"#", "#", "", 0},
      {"6#", "172800000#86400000", "6@02/01/1970", 1},
      {"abc#1x#2#-1#7#99999999999", "5#4#3#172800000#1#0", "2@03/01/1970", 1},
      {many, "86400000", "2@02/01/1970 1@", 2},
  };
  for (const auto &expected : cases) {
    svc_voc_data voc{};
    std::string created = "2678400000";  // 1 February
    voc.submitted = const_cast<char *>(expected.states.c_str());
    voc.date_of_updation = const_cast<char *>(expected.times.c_str());
    voc.date_of_creation = created.data();
    const tavro_timeline timeline = tavro_details_timeline(&voc, 3);
    std::string shown;
    for (const auto &state : timeline.states)
      shown += (shown.empty() ? "" : " ") + std::to_string(state.status) + "@" + state.time;
    EXPECT_EQ(shown, expected.shown) << expected.states.substr(0, 40);
    EXPECT_EQ(timeline.count, expected.count) << expected.states.substr(0, 40);
  }
}

TEST_F(Details, ConversationIsInTheOrderOfItsTimesAndOfValidText) {
  char reply[] = "none#<b>a &amp; \xff</b>#late", times[] = "3000000#1000000#500000", own[] = "mine \xfe";
  char created[] = "400000", later[] = "2000000", second[] = "again", state[] = "11";
  svc_voc_data first{}, follow_up{};
  first.push_comments = reply;
  first.date_of_updation = times;
  first.description = own;
  first.date_of_creation = created;
  follow_up.description = second;
  follow_up.date_of_creation = later;
  follow_up.submitted = state;
  std::vector<std::string> said;
  for (const auto &message : tavro_details_messages(&first, {{&follow_up, "works_now"}}))
    said.push_back(message.text + "|" + std::to_string(message.status));
  EXPECT_THAT(said, testing::ElementsAre("mine \xEF\xBF\xBD|0", "a & \xEF\xBF\xBD|0", "again|11", "late|0"));
}

TEST_F(Details, SettledIsAskedOnceForEachTimeThatSupportClosesAReport) {
  char closed[] = "1#2#4", open[] = "1#2", changed[] = "5000#4000#3000";
  svc_voc_data voc{};
  voc.date_of_updation = changed;
  voc.submitted = closed;
  EXPECT_FALSE(tavro_details_can_follow_up(&voc, 0)) << "the desk has given no id";
  voc.server_voc_id = 41;
  EXPECT_TRUE(tavro_details_can_follow_up(&voc, 0));
  EXPECT_TRUE(tavro_details_can_follow_up(&voc, 4999));
  EXPECT_FALSE(tavro_details_can_follow_up(&voc, 5000));
  voc.submitted = open;
  EXPECT_FALSE(tavro_details_can_follow_up(&voc, 0));
}

TEST_F(Details, PairsEachReplyWithTheTimeOfItsAnswer) {
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

}  // namespace
