// What is sent with a report, as a list and as texts: the plain logic behind the pages.
#include <gmock/gmock.h>
#include <minizip/zip.h>

#include <filesystem>
#include <fstream>

#include "files.h"
#include "screens_world.h"
#include "tavro-common.h"
#include "tavro-main.h"
#include "tavro_appdata.h"
#include "tavro_dbmgr.h"
#include "tavro_device_status.h"
#include "tavro_log_archive.h"
#include "tavro_review.h"
#include "tavro_screens.h"
#include "tavro_text_parts.h"

namespace {

using testing::ElementsAre;
using testing::HasSubstr;

constexpr char kArchive[] = "/opt/usr/media/log.zip";

std::string make_file(const std::string &name, size_t size) {
  return write_file("/opt/usr/media/" + name, std::string(size, 'x'));
}

// "title|detail|what its button does", for each item.
std::vector<std::string> lines_of(const tavro_review_facts &facts) {
  std::vector<std::string> lines;
  for (const tavro_review_item &item : tavro_review_items(facts)) {
    const char *const kActions[] = {"keep", "remove", "put back"};
    lines.push_back(item.title + "|" + item.detail + "|" + kActions[item.action]);
  }
  return lines;
}

class Review : public testing::Test {
 protected:
  static void SetUpTestSuite() { ASSERT_EQ(tavro_bind_locale(), 0); }
};

TEST_F(Review, ProblemShowsEverythingThatLeavesThePhone) {
  tavro_review_facts facts;
  facts.is_problem = true;
  facts.target = "Gallery";
  facts.title = "Grey";
  facts.description = "\xC3\xA4\xF0\x9F\x98\x80";  // two characters, six bytes
  facts.attachments = {make_file("a.jpg", 188416), "/opt/usr/media/gone.png", make_file("c.mp4", 3565158)};
  facts.dump_path = make_file("core.zip", 0);
  facts.log_path = make_file("log.zip", 1);
  facts.device_status = "System\nRSSI : 1\n";
  facts.account = "ana";
  EXPECT_THAT(
      lines_of(facts),
      ElementsAre("Your text|About Gallery · Title and 2 characters|keep", "Picture 1|a.jpg · 184 kB|remove",
                  "Picture 2|gone.png · Cannot be read, only its name is sent|remove",
                  "Video 3|c.mp4 · 3.4 MB|remove", "Crash dump|core.zip · 0 kB|remove",
                  "System log|1 kB|remove", "Device status|Build, battery, storage, network · 1 kB|remove",
                  "Account|ana|keep"));
  EXPECT_EQ(tavro_review_total(tavro_review_items(facts)), "8 items, 3.6 MB");
  EXPECT_EQ(tavro_review_text(facts), "About Gallery\n\nGrey\n\n" + facts.description);
}

TEST_F(Review, WhatIsTakenOffOrNotThereIsNotCounted) {
  tavro_review_facts facts;
  facts.is_problem = facts.is_device_status_removed = facts.is_log_mandatory = true;
  facts.log_state = TAVRO_SYSTEM_LOG_FAILED;
  facts.device_status = "System\n";
  EXPECT_THAT(lines_of(facts), ElementsAre("Your text|No text|keep",
                                           "System log|Could not be collected · needed for this target|keep",
                                           "Device status|Not sent|put back", "Account|No account|keep"));
  EXPECT_EQ(tavro_review_total(tavro_review_items(facts)), "1 item, 0 kB");
  facts.log_state = TAVRO_SYSTEM_LOG_COLLECTING;
  facts.is_device_status_removed = facts.is_log_mandatory = false;
  EXPECT_EQ(tavro_review_total(tavro_review_items(facts)), "3 items, 1 kB");
}

TEST_F(Review, IdeaIsTextAttachmentsAndAccountOnly) {
  tavro_review_facts facts;
  facts.title = "Swipe";
  facts.attachments = {make_file("a.jpg", 10)};
  facts.dump_path = facts.log_path = facts.attachments[0];
  facts.account = "ana";
  EXPECT_THAT(lines_of(facts),
              ElementsAre("Your text|Title|keep", "Picture 1|a.jpg · 1 kB|remove", "Account|ana|keep"));
}

TEST(TextParts, AddUpToTheTextAndEndBehindLinesAndCharacters) {
  EXPECT_THAT(tavro_text_parts("", 8), ElementsAre(""));
  EXPECT_THAT(tavro_text_parts("12345678", 8), ElementsAre("12345678"));
  EXPECT_THAT(tavro_text_parts("one\ntwo\nthree\n", 8), ElementsAre("one\ntwo\n", "three\n"));
  EXPECT_THAT(tavro_text_parts("abc\xF0\x9F\x98\x80xyz", 5), ElementsAre("abc", "\xF0\x9F\x98\x80x", "yz"));
  EXPECT_THAT(tavro_text_parts("\x80\x80\x80\x80\x80\x80\x80\x80", 4).size(), testing::Ge(2u));
}

void make_archive(const std::string &log) {
  make_file("log.zip", 0);
  zipFile zip = zipOpen(kArchive, APPEND_STATUS_CREATE);
  zipOpenNewFileInZip(zip, "log.txt", nullptr, nullptr, 0, nullptr, 0, nullptr, Z_DEFLATED, 1);
  zipWriteInFileInZip(zip, log.data(), static_cast<unsigned>(log.size()));
  zipCloseFileInZip(zip);
  zipClose(zip, nullptr);
}

TEST(LogArchive, GivesTheEndOfTheLogFromAWholeLineOnAsValidText) {
  tavro_log_tail tail;
  make_archive(std::string("first\nsec\0nd\n\xFF\n", 15));
  ASSERT_TRUE(tavro_log_archive_read(kArchive, 100, &tail));
  EXPECT_EQ(tail.text, "first\nsec nd\n\xEF\xBF\xBD\n");
  EXPECT_FALSE(tail.is_cut);

  std::string lines;
  for (int i = 0; i < 40000; ++i) lines += "line " + std::to_string(i) + "\n";
  make_archive(lines);
  ASSERT_TRUE(tavro_log_archive_read(kArchive, 100, &tail));
  EXPECT_TRUE(tail.is_cut);
  EXPECT_LE(tail.text.size(), 100u);
  EXPECT_THAT(tail.text, testing::StartsWith("line 39"));
  EXPECT_THAT(tail.text, testing::EndsWith("line 39999\n"));
}

TEST(LogArchive, RefusesWhatIsNoArchiveDamagedOrATrap) {
  tavro_log_tail tail;
  EXPECT_FALSE(tavro_log_archive_read("/opt/usr/media/none.zip", 100, &tail));
  make_file("log.zip", 1000);
  EXPECT_FALSE(tavro_log_archive_read(kArchive, 100, &tail));
  std::string noise(100000, '\0');
  for (char &byte : noise) byte = static_cast<char>(rand());
  make_archive(noise);
  std::fstream(kArchive, std::ios::in | std::ios::out | std::ios::binary)
      .seekp(5000)
      .write("damaged here", 12);
  EXPECT_FALSE(tavro_log_archive_read(kArchive, 100, &tail));
  make_archive(std::string(65 * 1024 * 1024, ' '));
  EXPECT_FALSE(tavro_log_archive_read(kArchive, 100, &tail));
}

TEST(DeviceStatus, HasAZeroForEachValueThatTheMachineDoesNotHave) {
  const std::string text = tavro_device_status_text();
  EXPECT_THAT(text, HasSubstr("\nBattery Info - Percent : 0, Battery Level : 0, Not Charging\n"));
  EXPECT_THAT(text, testing::Not(HasSubstr("RSSI")));
  const std::string path = make_file("status.txt", 0);
  tavro_get_extra_device_data(path.c_str());
  EXPECT_EQ(text.substr(0, 100), file_contents(path).substr(0, 100));
  tavro_get_extra_device_data("/opt/usr/media/none/status.txt");
  EXPECT_FALSE(std::filesystem::exists("/opt/usr/media/none"));
}

TEST(DeviceStatus, SkipsExternalStorageAndEndsAtTheFirstInternalOne) {
  char *text = nullptr;
  size_t size = 0;
  FILE *stream = open_memstream(&text, &size);
  EXPECT_TRUE(storage_device_cb(1, STORAGE_TYPE_EXTERNAL, STORAGE_STATE_MOUNTED, "/sd", stream));
  std::fflush(stream);
  EXPECT_EQ(size, 0u);
  EXPECT_FALSE(storage_device_cb(0, STORAGE_TYPE_INTERNAL, STORAGE_STATE_MOUNTED, "/opt/usr", stream));
  std::fclose(stream);
  EXPECT_THAT(text, testing::StartsWith("Internal Memory - Total : "));
  free(text);
}

class ReviewPage : public Screens {
 protected:
  void SetUp() override {
    start();
    tavro_create_problem_page(&ad_, nullptr);
  }
  void TearDown() override { end(); }

  size_t pages() {
    Eina_List *items = elm_naviframe_items_get(ad_.nf);
    const size_t count = eina_list_count(items);
    eina_list_free(items);
    return count;
  }
};

TEST_F(ReviewPage, IsThereOnceAndGoesWithItsComposeScreen) {
  settle();
  tavro_create_review_page(&ad_, nullptr);
  tavro_create_review_page(&ad_, nullptr);
  settle();
  EXPECT_EQ(pages(), 3u);
  EXPECT_TRUE(tavro_leave_compose_page(&ad_));
  settle();
  EXPECT_EQ(pages(), 1u);
}

}  // namespace
