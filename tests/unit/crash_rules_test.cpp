#include "tavro_crash_rules.h"

#include <gmock/gmock.h>

#include <limits>

namespace {

using testing::HasSubstr;
using testing::Not;

constexpr gint64 kNow = 1795000000000;
constexpr gint64 kHour = 60 * 60 * 1000;
constexpr gint64 kDay = 24 * kHour;

std::string text(gint64 number) {
  return std::to_string(number);
}

tavro_crash crash_of(const char *app_id, gint64 time) {
  return *tavro_crash_read(app_id, nullptr, text(time).c_str(), nullptr, kNow);
}

TEST(CrashRules, WhatTheBusTellsIsBoundedAndOnOneLine) {
  const std::string long_name(1024 * 1024, 'x'), cut_name = std::string(254, 'x') + "\u2026";
  const struct {
    const char *id, *name, *expected_id, *expected_name;
  } cases[] = {
      {"org.mail", "Mail", "org.mail", "Mail"},
      {"org.mail", nullptr, "org.mail", "org.mail"},
      {"", "Mail", "Mail", "Mail"},
      {"a\nb\tc", " <b>Mail</b>\r\n\xE2\x80\xAE now ", "a b c", "<b>Mail</b> now"},
      {"\xFF", "\xC3\xA4\xFF", "\uFFFD", "\u00E4\uFFFD"},
      {"a", long_name.c_str(), "a", cut_name.c_str()},
  };
  for (const auto &one : cases) {
    const auto crash = tavro_crash_read(one.id, one.name, nullptr, nullptr, kNow);
    ASSERT_TRUE(crash) << one.expected_id;
    EXPECT_EQ(crash->app_id, one.expected_id);
    EXPECT_EQ(crash->app_name, one.expected_name);
  }
  EXPECT_LT(tavro_crash_read(long_name.c_str(), nullptr, nullptr, nullptr, kNow)->app_id.size(), 300u);
  EXPECT_EQ(tavro_crash_short_name(cut_name), std::string(59, 'x') + "\u2026");
  for (const char *nothing : {"", " \n", "\xE2\x80\xAE"})
    EXPECT_FALSE(tavro_crash_read(nothing, nullptr, nullptr, nullptr, kNow)) << nothing;
}

TEST(CrashRules, ATimeOrAFolderThatCannotBeIsNotBelieved) {
  const auto read = [](const std::string &time, const char *folder) {
    return *tavro_crash_read("a", "A", time.c_str(), folder, kNow);
  };
  EXPECT_EQ(read(text(kNow - kHour), nullptr).time, kNow - kHour);
  for (const std::string &bad : {text(kNow + 1), text(kNow - 8 * kDay), std::string("12abc"),
                                 std::string("-5"), std::string("99999999999999999999"), std::string()})
    EXPECT_EQ(read(bad, nullptr).time, kNow) << bad;
  EXPECT_EQ(read("", "mail_1_x").folder, "mail_1_x");
  for (const std::string &bad :
       {std::string(".."), std::string("."), std::string("a/../b"), std::string(256, 'x')})
    EXPECT_EQ(read("", bad.c_str()).folder, "") << bad;
}

TEST(CrashRules, AnApplicationIsAskedAboutOnceADayWhateverTheClockDoes) {
  const struct {
    std::string asked;
    bool is_silent;
  } cases[] = {{text(kNow - kHour), true},
               {text(kNow), true},
               {text(kNow - kDay + 1), true},
               {text(kNow - kDay), false},
               {text(kNow + kHour), false},
               {"", false},
               {"NULL", false},
               {"-1", false},
               {text(std::numeric_limits<gint64>::max()), false}};
  for (const auto &one : cases)
    EXPECT_EQ(tavro_crash_was_asked_lately(one.asked.c_str(), kNow), one.is_silent) << one.asked;
  EXPECT_FALSE(tavro_crash_was_asked_lately(nullptr, kNow));
}

TEST(CrashRules, CrashesOfAWeekAreCountedOnceEach) {
  std::string times =
      "damaged\nother\t1 2 x\nmail\t" + text(kNow - 8 * kDay) + " " + text(kNow + kDay) + " 7 \n\t\n";
  EXPECT_EQ(tavro_crash_count(&times, crash_of("mail", kNow - 2), kNow), 1);
  EXPECT_EQ(tavro_crash_count(&times, crash_of("mail", kNow - 1), kNow), 2);
  EXPECT_EQ(tavro_crash_count(&times, crash_of("mail", kNow - 1), kNow), 2) << "told twice";
  EXPECT_EQ(tavro_crash_count(&times, crash_of("maps", kNow), kNow), 1);
  EXPECT_THAT(times, Not(HasSubstr("other")));
  for (int i = 0; i < 300; i++) {
    EXPECT_LE(tavro_crash_count(&times, crash_of("mail", kNow - kHour - i), kNow), 99);
    tavro_crash_count(&times, crash_of(("app" + text(i)).c_str(), kNow), kNow);
  }
  EXPECT_LT(times.size(), 10'000u);
  EXPECT_THAT(times, HasSubstr("mail\t"));
}

TEST(CrashRules, NeverHoldsUntilItIsTakenBack) {
  std::string list = "\n\nold\n";
  EXPECT_FALSE(tavro_crash_list_has(list, ""));
  list = tavro_crash_list_with(tavro_crash_list_with(list, "mail"), "mail");
  EXPECT_EQ(list, "old\nmail\n");
  EXPECT_TRUE(tavro_crash_list_has(list, "mail"));
  EXPECT_FALSE(tavro_crash_list_has(list, "ail"));
  EXPECT_EQ(tavro_crash_list_without(list, "mail"), "old\n");
  for (int i = 0; i < 1000; i++) list = tavro_crash_list_with(list, text(i));
  EXPECT_TRUE(tavro_crash_list_has(list, "999"));
  EXPECT_FALSE(tavro_crash_list_has(list, "mail")) << "the list has an end";
}

TEST(CrashRules, AnArchiveIsCalledAfterTheLastPartOfItsFolder) {
  EXPECT_EQ(tavro_crash_archive_name("a_b_c"), "tavro_c.zip");
  EXPECT_EQ(tavro_crash_archive_name("abc"), "tavro_abc.zip");
  EXPECT_EQ(tavro_crash_archive_name("abc_"), "tavro_.zip");
}

}  // namespace
