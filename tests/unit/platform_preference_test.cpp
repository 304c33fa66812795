#include <app_preference.h>
#include <gmock/gmock.h>
#include <sys/stat.h>

#include "platform_support.h"

namespace {

constexpr const char *kFile = "/opt/usr/dbspace/preference.db";

TEST(Preference, KeepsEachTypeAndGivesItOnlyAsThatType) {
  const struct {
    const char *key;
    int (*set)(const char *);
    int type;
  } kRows[] = {
      {"text", [](const char *key) { return preference_set_string(key, "O'Neil; DROP TABLE preference"); },
       0},
      {"int", [](const char *key) { return preference_set_int(key, -7); }, 1},
      {"double", [](const char *key) { return preference_set_double(key, 0.1); }, 2},
      {"boolean", [](const char *key) { return preference_set_boolean(key, true); }, 3},
  };
  for (const auto &row : kRows) {
    ASSERT_EQ(row.set(row.key), 0);
    char *text = nullptr;
    int number = 0;
    double real = 0;
    bool flag = false;
    const int results[] = {preference_get_string(row.key, &text), preference_get_int(row.key, &number),
                           preference_get_double(row.key, &real), preference_get_boolean(row.key, &flag)};
    for (int type = 0; type < 4; ++type) {
      EXPECT_EQ(results[type], type == row.type ? 0 : PREFERENCE_ERROR_INVALID_PARAMETER) << row.key << type;
    }
    EXPECT_STREQ(text, row.type == 0 ? "O'Neil; DROP TABLE preference" : nullptr);
    EXPECT_EQ(number, row.type == 1 ? -7 : 0);
    EXPECT_EQ(real, row.type == 2 ? 0.1 : 0);
    EXPECT_EQ(flag, row.type == 3);
    free(text);
  }
}

TEST(Preference, ThatIsAbsentLeavesTheValueAlone) {
  int value = 42;
  bool existing = true;
  EXPECT_EQ(preference_get_int("never set", &value), PREFERENCE_ERROR_NO_KEY);
  EXPECT_EQ(value, 42);
  EXPECT_EQ(preference_is_existing("never set", &existing), 0);
  EXPECT_FALSE(existing);
  EXPECT_EQ(preference_remove("never set"), PREFERENCE_ERROR_NO_KEY);
}

TEST(Preference, IsOnTheDiskWhenTheCallReturns) {
  int ends[2];
  ASSERT_EQ(pipe(ends), 0);
  const pid_t child = start({program_of(kService), "--count", "counter"}, ends[1]);
  close(ends[1]);
  std::string seen;
  char buffer[512];
  while (std::count(seen.begin(), seen.end(), '\n') < 200) {
    const ssize_t length = read(ends[0], buffer, sizeof(buffer));
    ASSERT_GT(length, 0);
    seen.append(buffer, static_cast<size_t>(length));
  }
  kill(child, SIGKILL);
  for (ssize_t length; (length = read(ends[0], buffer, sizeof(buffer))) > 0;) {
    seen.append(buffer, static_cast<size_t>(length));
  }
  close(ends[0]);
  wait_for_end(child);
  seen.erase(seen.rfind('\n'));
  const int last_said = atoi(seen.substr(seen.rfind('\n') + 1).c_str());
  int stored = 0;
  ASSERT_EQ(preference_get_int("counter", &stored), 0);
  EXPECT_GE(stored, last_said);
  EXPECT_LE(stored, last_said + 1);
}

TEST(Preference, IsNotLostWhenAnotherProcessClosesTheFile) {
  const auto value_elsewhere = [] {
    return wait_for_end(
        start({"/usr/bin/python3", "-c",
               "import sqlite3, sys\n"
               "database = sqlite3.connect('/opt/usr/dbspace/preference.db')\n"
               "row = database.execute(\"SELECT value FROM preference WHERE key = 'shared'\")\n"
               "value, = row.fetchone()\n"
               "database.close()\n"
               "sys.exit(int(value))"}));
  };
  preference_set_int("shared", 1);
  EXPECT_EQ(value_elsewhere(), 1);
  preference_set_int("shared", 2);
  EXPECT_EQ(value_elsewhere(), 2);
}

TEST(Preference, FileIsTheUsersAloneAndADamagedOneIsSetAside) {
  ASSERT_EQ(preference_set_int("before", 1), 0);
  struct stat info;
  ASSERT_EQ(stat(kFile, &info), 0);
  EXPECT_EQ(info.st_mode & 0077u, 0u);

  for (const char *part : {"", "-wal", "-shm"}) unlink((std::string(kFile) + part).c_str());
  std::ofstream(kFile) << std::string(8192, '#');
  EXPECT_EQ(preference_set_int("after", 2), 0);
  int value = 0;
  EXPECT_EQ(preference_get_int("after", &value), 0);
  EXPECT_EQ(value, 2);
  GDir *folder = g_dir_open("/opt/usr/dbspace", 0, nullptr);
  std::string kept;
  while (const char *name = g_dir_read_name(folder)) {
    const bool is_beside = g_str_has_suffix(name, "-wal") || g_str_has_suffix(name, "-shm");
    if (g_str_has_prefix(name, "preference.db.damaged-") && !is_beside) kept = name;
  }
  g_dir_close(folder);
  EXPECT_NE(file_contents("/opt/usr/dbspace/" + kept).find("####"), std::string::npos);
}

TEST(Preference, ChangeIsHeardByOthers) {
  std::string heard;
  preference_set_changed_cb(
      "watched", [](const char *key, void *into) { *static_cast<std::string *>(into) = key; }, &heard);
  preference_set_int("unwatched", 1);
  preference_set_int("watched", 1);
  EXPECT_TRUE(wait_for([&] { return heard == "watched"; }));
  preference_unset_changed_cb("watched");
}

}  // namespace
