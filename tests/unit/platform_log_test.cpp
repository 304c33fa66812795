#include <dlog.h>
#include <gmock/gmock.h>
#include <sys/stat.h>

#include "platform_support.h"

namespace {

using ::testing::ContainsRegex;
using ::testing::EndsWith;
using ::testing::HasSubstr;
using ::testing::Not;

constexpr const char *kFile = "/opt/usr/share/log/platform.log";

std::string logged(const std::string &message) {
  unlink(kFile);
  dlog_print(DLOG_ERROR, "TEST", "%s", message.c_str());
  return file_contents(kFile);
}

TEST(Log, MessageIsOneLineWhateverItHolds) {
  const std::string line = logged("first\nE/FAKE( 1): second\x1b[31m\rthird ä");
  EXPECT_THAT(line, ContainsRegex("^20[0-9-]+ [0-9:]+\\.[0-9]+ E/TEST\\([0-9]+\\): first"));
  EXPECT_THAT(line, HasSubstr("first\\nE/FAKE( 1): second\\x1b[31m\\x0dthird ä\n"));
  EXPECT_EQ(std::count(line.begin(), line.end(), '\n'), 1);
  struct stat info;
  ASSERT_EQ(stat(kFile, &info), 0);
  EXPECT_EQ(info.st_mode & 0777u, 0600u);
}

TEST(Log, MessageUpToTheLimitIsWholeAndALongerOneIsMarkedAndCutBetweenCharacters) {
  EXPECT_THAT(logged(std::string(16384, 'a')), Not(HasSubstr("…")));
  EXPECT_THAT(logged(std::string(16383, 'a') + "ä tail"), EndsWith("): " + std::string(16383, 'a') + "…\n"));
}

TEST(Log, LinesOfSeveralProcessesStayWholeAcrossARotation) {
  unlink(kFile);
  // Some 350 bytes a line: together a little above the 4 MiB at which the file is rotated.
  const pid_t children[] = {start({program_of(kService), "--log", "7000"}),
                            start({program_of(kService), "--log", "7000"})};
  for (const pid_t child : children) ASSERT_EQ(wait_for_end(child), 0);
  std::istringstream lines(file_contents(std::string(kFile) + ".1") + file_contents(kFile));
  int count = 0;
  for (std::string line; std::getline(lines, line); ++count) {
    ASSERT_THAT(line, EndsWith(" " + std::string(300, 'x') + " end"));
    ASSERT_EQ(line.find("begin"), line.rfind("begin"));
  }
  EXPECT_EQ(count, 14000);
  struct stat info;
  EXPECT_EQ(stat((std::string(kFile) + ".1").c_str(), &info), 0);
}

}  // namespace
