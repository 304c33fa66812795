// The texts of the history, and other decisions without a widget.
#include <gmock/gmock.h>

#include <cstdlib>
#include <string>

#include "client_support.h"
#include "tavro_dbmgr.h"
#include "tavro_drafts.h"
#include "tavro_history_text.h"
#include "tavro_memory.h"
#include "tavro_request.h"

namespace {

std::string time_string(int year, int month, int day, int hour, int minute, int clock_format) {
  // Now is 14 March 2015, 16:00.
  struct tm now = {0, 0, 16, 14, 2, 115, 0, 0, -1, 0, nullptr};
  struct tm when = {0, minute, hour, day, month - 1, year - 1900, 0, 0, -1, 0, nullptr};
  mktime(&now);
  mktime(&when);
  const TavroText text(tavro_get_time_string_at(&when, &now, clock_format));
  return text.get();
}

TEST(HistoryText, TimesShowTheClockTodayAndTheDateOtherwise) {
  EXPECT_EQ(time_string(2014, 3, 5, 9, 0, 1), "05/03/2014");
  EXPECT_EQ(time_string(2015, 2, 5, 9, 0, 1), "05/02");
  EXPECT_EQ(time_string(2015, 3, 14, 0, 5, 2), "0:05 AM");
  EXPECT_EQ(time_string(2015, 3, 14, 11, 59, 1), "11:59 AM");
  EXPECT_EQ(time_string(2015, 3, 14, 12, 0, 1), "12:00 PM");
  EXPECT_EQ(time_string(2015, 3, 14, 15, 30, 1), "3:30 PM");
  EXPECT_EQ(time_string(2015, 3, 14, 15, 30, 2), "15:30 PM");
}

std::string row(const svc_voc_data &voc, const char *part, int index = 0) {
  char *text = tavro_history_row_text(index, &voc, part);
  const std::string shown = text ? text : "nothing";
  std::free(text);
  return shown;
}

TEST(HistoryText, TheLastStatusDecidesTextAndColour) {
  const std::pair<const char *, const char *> cases[] = {
      {"10#11", "<font_size=29><color=#ff0000>IDS_OB_SBODY_SENDING_FAILED</></>"},
      {"6#10#1", "Submitted"},
      {"12#2", "In process"},
      {"1#4", "IDS_OB_SBODY_COMPLETED_ABB"},
      {"5", "Dropped"},
      {"6", "<color=#ff0000>IDS_OB_SBODY_DRAFT_SAVED_ABB</></>"},
      {"10", "<color=#ff0000>IDS_OB_SBODY_SENDING_ING_ABB_SWA</></>"},
      {"12", "IDS_OB_SBODY_SENDING_ING_ABB_SWA"},
  };
  for (const auto &[submitted, shown] : cases) {
    std::string stored = submitted;
    svc_voc_data voc = {};
    voc.submitted = stored.data();
    EXPECT_EQ(row(voc, "elm.text.sub.right.bottom"), shown) << submitted;
  }
}

TEST(HistoryText, OddStatusesAndTimesMakeASaneRow) {
  const std::string many = std::string(20000, '#') + "5";
  const std::pair<std::string, int> statuses[] = {
      {"", 0},    {"#", 0}, {"6#", 6}, {"1#2##", 2}, {"abc", 0}, {"99999999999", -1}, {"4294967297", -1},
      {"-1", -1}, {many, 5}};
  for (const auto &[submitted, status] : statuses) EXPECT_EQ(tavro_current_status(submitted.c_str()), status);
  setenv("TZ", "UTC", 1);
  const std::pair<const char *, const char *> times[] = {{"0", "01/01/1970"},
                                                         {"4102444800000#1", "01/01/2100"},
                                                         {"253402300799999", "31/12/9999"},
                                                         {"253402300800000", ""},
                                                         {"-5", ""},
                                                         {"18446744073709551615", ""},
                                                         {"99999999999999999999", ""},
                                                         {"abc", ""},
                                                         {"", ""},
                                                         {"1425513600000x", "05/03/2015"}};
  for (const auto &[stored, shown] : times) EXPECT_EQ(tavro_shown_time(stored), shown) << stored;
}

TEST(HistoryText, NothingThatWasTypedBecomesMarkup) {
  char title[] = "";
  char description[] = "a <b>bold</b> & long story";
  char app_name[] = "<color=#fff>App";
  svc_voc_data voc = {};
  voc.title_description = title;
  voc.description = description;
  voc.app_name = app_name;
  EXPECT_EQ(row(voc, "elm.text.sub.left.bottom"),
            "<font_size=32>a &lt;b&gt;bold&lt;/b&gt; &amp; long story</></>");
  EXPECT_EQ(row(voc, "elm.text.main.left.top"), "&lt;color=#fff&gt;App");
  EXPECT_EQ(row(voc, "elm.text.sub.right.top"), "");
  EXPECT_EQ(row(voc, "elm.text.unknown"), "nothing");
  EXPECT_EQ(row(voc, "elm.text.main.left", -1), "IDS_OB_BODY_SELECT_ALL");
}

TEST(DraftDecisions, TargetsThatNeedTheSystemLog) {
  for (const char *target : {"IDS_OB_MBODY_BATTERY", "Hardware", "My Performance tool"}) {
    EXPECT_TRUE(isLogMandatory(target)) << target;
  }
  for (const char *target : {"Software", "hardware", ""}) EXPECT_FALSE(isLogMandatory(target)) << target;
  EXPECT_FALSE(isLogMandatory(nullptr));
}

TEST(DraftDecisions, AttachmentsKeepTheirOrderAndAreTypedByAnyPartOfThePath) {
  const char *const paths[] = {"/x/jpgs/clip.mp4", "/x/a.png", "/x/b.mov"};
  GSList *list = nullptr;
  for (const char *path : paths) list = g_slist_append(list, const_cast<char *>(path));
  GSList *infos = tavro_populate_attachment_info(list);
  std::string shown;
  for (const GSList *node = infos; node; node = node->next) {
    const auto *info = static_cast<const tavro_dbmgr_attachment_info *>(node->data);
    shown += std::string(info->file_path) + "=" + info->file_type + " ";
  }
  EXPECT_EQ(shown, "/x/jpgs/clip.mp4=jpg /x/a.png=png /x/b.mov=mp4 ");
  _tavro_free_attachement_list(infos);
  g_slist_free(list);
}

}  // namespace
