// The plain logic behind the screens.
#include <gmock/gmock.h>

#include "tavro_dbmgr.h"
#include "tavro_details_text.h"

namespace {

using testing::IsEmpty;

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

}  // namespace
