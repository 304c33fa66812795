// Two programs write the store at once while one of them is killed, or while the client starts.
//
// The kills take half a minute; TAVRO_FAULT_SECONDS lets them go on for longer, TAVRO_FAULT_SEED repeats
// their moments.
#include <fcntl.h>

#include <algorithm>
#include <chrono>
#include <cstdlib>
#include <map>
#include <random>
#include <thread>

#include "store_world.h"

namespace {

using std::chrono::microseconds;
using std::chrono::milliseconds;
using std::chrono::seconds;
using std::chrono::steady_clock;

constexpr int kKills = 200;
constexpr milliseconds kLongestPause(300);  // 150 in the mean
constexpr char kStop[] = TAVRO_DBMGR_FOLDER "/stop";
constexpr char kNotes[] = TAVRO_DBMGR_FOLDER "/notes";

unsigned long number_from_environment(const char *name, unsigned long otherwise) {
  const char *text = std::getenv(name);
  return text ? std::strtoul(text, nullptr, 10) : otherwise;
}

// What report `number` says: told from the number alone, so that a note of it is short.
std::string text_of(int number) {
  const char *pieces[] = {"it's ", "'); DROP TABLE TABLE_VOC; --", "\xf0\x9f\x98\x80 ", "a#b\n", "\xff\xfe ",
                          "%s%n "};
  std::string text = "report " + std::to_string(number) + ": ";
  const int length = number % 10 == 0 ? 3000 : 6;
  for (int i = 0; i < length; i++) text += pieces[(number + i) % 6];
  return text;
}

struct noted_report {
  int number;
  int answers;
};

class StoreKill : public StoreWorld {
 protected:
  // One program's work: saves reports, sends them and has them answered twice, until kStop is there. What the
  // store has said yes to is noted at once. The result is 1 when the store refused something.
  static int write_reports(int number) {
    const TavroFd notes(open(kNotes, O_WRONLY | O_CREAT | O_APPEND | O_CLOEXEC, 0600));
    for (; access(kStop, F_OK) != 0; number++) {
      const std::string text = text_of(number);
      const Idea idea(TAVRO_ZALLOC(tavro_dbmgr_suggestion_info));
      for (char **member : {&idea->suggestion, &idea->title_description})
        *member = TAVRO_STRDUP(text.c_str());
      idea->attachments = attachment_list({"/a", "/b"});
      const int id = number % 2 ? save_problem("user", text.c_str(), {"/a", "/b"})
                                : tavro_dbmgr_update_suggestion(idea.get());
      if (id < 1) return 1;
      for (int answers = 0; answers <= 2; answers++) {
        if (answers == 1) tavro_dbmgr_set_voc_data_submitted_to_server(id, id, TAVRO_STATUS_SENDING_SUCCESS);
        if (answers > 0) _tavro_dbmgr_update_push_status_comments(std::to_string(id).c_str(), "2", "it's #1");
        const std::string note =
            std::to_string(id) + " " + std::to_string(number) + " " + std::to_string(answers) + "\n";
        if (write(notes.get(), note.data(), note.size()) != static_cast<ssize_t>(note.size())) return 2;
      }
    }
    return 0;
  }

  // The client sets the lock free at its start, the service leaves it as it is.
  static pid_t start_program(int which, int number) {
    return start_process([which, number] {
      const int is_refused = which == 0 ? tavro_dbmgr_init_semaphore() : tavro_dbmgr_open_semaphore();
      return is_refused ? 3 : write_reports(number);
    });
  }

  // Every noted report is whole, with the answers it got; the file is sound and the lock free. Returns how
  // many there are.
  static std::size_t expect_all_noted_are_whole() {
    std::map<int, noted_report> reports;
    std::ifstream notes(kNotes);
    for (int id, number, answers; notes >> id >> number >> answers;) reports[id] = {number, answers};
    for (const auto &[id, noted] : reports) expect_whole(id, noted);
    EXPECT_EQ(value("PRAGMA integrity_check"), "ok");
    EXPECT_EQ(lock_value(), 1);
    return reports.size();
  }

  static void expect_whole(int id, const noted_report &noted) {
    const Voc voc(tavro_dbmgr_get_voc_by_id(id));
    ASSERT_NE(voc, nullptr) << id;
    const std::string text = text_of(noted.number);
    EXPECT_STREQ(voc->description, text.c_str());
    EXPECT_STREQ(voc->title_description, text.c_str());
    EXPECT_EQ(g_slist_length(voc->attachments), 2u);
    // The last answer may have been stored just before its note was cut off.
    const std::string states = voc->submitted, replies = voc->push_comments ? voc->push_comments : "none";
    const auto answers = std::count(states.begin(), states.end(), '#');
    EXPECT_TRUE(answers == noted.answers || answers == noted.answers + 1) << states;
    std::string expected = "none";
    for (auto i = 0; i < answers; i++) expected += "#it&apos;s  1";
    EXPECT_EQ(replies, expected);
  }
};

TEST_F(StoreKill, ReportsOfTwoProgramsSurviveTheirKills) {
  const unsigned long seed = number_from_environment("TAVRO_FAULT_SEED", std::random_device()());
  const auto duration = seconds(number_from_environment("TAVRO_FAULT_SECONDS", 0));
  std::printf("TAVRO_FAULT_SEED=%lu\n", seed);
  std::mt19937 random(static_cast<unsigned>(seed));
  const auto start = steady_clock::now();
  int number = 0;
  pid_t programs[] = {start_program(0, number += 100000), start_program(1, number += 100000)};
  for (int kills = 0; kills < kKills || steady_clock::now() - start < duration; kills++) {
    std::this_thread::sleep_for(microseconds(kLongestPause) * (random() % 1000) / 1000);
    const int which = static_cast<int>(random() % 2);
    kill(programs[which], SIGKILL);
    ASSERT_EQ(end_of(programs[which]), -1) << "a program ended by itself";
    programs[which] = start_program(which, number += 100000);
  }
  for (const pid_t program : programs) {
    kill(program, SIGKILL);
    end_of(program);
  }
  const std::size_t reports = expect_all_noted_are_whole();
  std::printf("%zu reports noted\n", reports);
  EXPECT_GT(reports, static_cast<std::size_t>(kKills) / 10) << "the programs hardly got to work";
}

TEST_F(StoreKill, StartsOfTheClientUnderLongOperationsLoseNoWrite) {
  const pid_t programs[] = {start_program(1, 1000), start_program(1, 2000)};
  const auto wait_until_waiting = [](int number) {
    while (lock_value() != 0 || semctl(dbmgr_semid, 0, GETNCNT) != number) usleep(1000);
  };
  TavroDb foreign;
  sqlite3_open(TAVRO_DBMGR_FILE, tavro_out(foreign));
  sqlite3_busy_timeout(foreign.get(), 20000);
  ASSERT_EQ(sqlite3_exec(foreign.get(), "BEGIN IMMEDIATE", nullptr, nullptr, nullptr), SQLITE_OK);
  wait_until_waiting(1);
  // Longer than a start waits: it sets the lock free, and the second program goes in beside the first.
  ASSERT_EQ(tavro_dbmgr_init_semaphore(), 0);
  wait_until_waiting(0);
  ASSERT_EQ(sqlite3_exec(foreign.get(), "COMMIT", nullptr, nullptr, nullptr), SQLITE_OK);
  for (int starts = 0; starts < 50; starts++) ASSERT_EQ(tavro_dbmgr_init_semaphore(), 0);
  std::ofstream(kStop) << "";
  for (const pid_t program : programs) EXPECT_EQ(end_of(program), 0) << "a write was refused";
  EXPECT_EQ(std::to_string(expect_all_noted_are_whole()), value("SELECT count(*) FROM TABLE_VOC"));
}

}  // namespace
