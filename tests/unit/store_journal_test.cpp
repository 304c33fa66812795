// A save that was interrupted at any moment is completed, once.
#include "tavro_save_journal.h"

#include <sys/resource.h>
#include <sys/stat.h>

#include <chrono>
#include <random>
#include <thread>

#include "store_world.h"

namespace {

constexpr char kJournal[] = TAVRO_DBMGR_FOLDER "/.tavro.save";
constexpr char kAbandoned[] = TAVRO_DBMGR_FOLDER "/.tavro.save.abandoned";
constexpr char kText[] = "it's\n not \xff text \\ 'x' ";

class SaveJournal : public StoreWorld {
 protected:
  static Problem report() {
    Problem report = problem_report("o'user", kText, {"/a \xfe.jpg", "/b", "/c"});
    report->follow_up_of = 41;
    report->follow_up_verdict = TAVRO_STRDUP(kText);
    return report;
  }

  static void expect_whole(int id) {
    const Voc voc(tavro_dbmgr_get_voc_by_id(id));
    ASSERT_NE(voc, nullptr);
    for (const char *text :
         {voc->description, voc->title_description, voc->app_name, voc->dump_file, voc->syslog_file})
      EXPECT_STREQ(text, kText);
    EXPECT_STREQ(voc->submitted, "10");
    EXPECT_EQ(g_slist_length(voc->attachments), 3u);
    EXPECT_STREQ(static_cast<tavro_dbmgr_attachment_info *>(voc->attachments->data)->file_path,
                 "/a \xfe.jpg");
    EXPECT_EQ(taken(tavro_dbmgr_get_device_data_file_by_id(id)), kText);
    char *verdict = nullptr;
    EXPECT_EQ(tavro_dbmgr_get_follow_up(id, &verdict), 41);
    EXPECT_EQ(taken(verdict), kText);
  }
};

TEST_F(SaveJournal, SaveCutOffAfterAnyStepIsCompletedOnce) {
  const char *cuts[] = {
      ("DELETE FROM TABLE_VOC WHERE VOC_ID > 1; DELETE FROM ATTACHMENT WHERE ATTACHMENT_ID > 1; "
       "DELETE FROM TABLE_VOC_EXTENDED WHERE VOC_ID > 1"),
      "DELETE FROM ATTACHMENT WHERE ATTACHMENT_ID > 1; DELETE FROM TABLE_VOC_EXTENDED WHERE VOC_ID > 1",
      "DELETE FROM ATTACHMENT WHERE ATTACHMENT_ID > 2; DELETE FROM TABLE_VOC_EXTENDED WHERE VOC_ID > 1",
      "DELETE FROM TABLE_VOC_EXTENDED WHERE VOC_ID > 1",
      "SELECT 'only the note is left to be removed'",
  };
  for (const char *cut : cuts) {
    SCOPED_TRACE(cut);
    SetUp();
    save_problem("o'user", kText, {"/older, with the same text"});
    ASSERT_EQ(tavro_journal_write(report().get()), 0);
    tavro_dbmgr_update_bug_report(report().get());
    run(cut);
    const int id = tavro_journal_recover();
    ASSERT_GT(id, 1);
    expect_whole(id);
    EXPECT_EQ(rows(), "2/4/2");
    EXPECT_EQ(tavro_journal_recover(), 0);
    EXPECT_EQ(rows(), "2/4/2");
  }
}

TEST_F(SaveJournal, SaveKilledAtAnyMomentIsWholeAfterTheNextStart) {
  const auto save = [] {
    const Problem whole = report();
    if (tavro_journal_write(whole.get()) == 0)
      tavro_journal_clear(tavro_dbmgr_update_bug_report(whole.get()));
    return 0;
  };
  const auto start = std::chrono::steady_clock::now();
  end_of(start_process(save));
  const auto save_time = std::chrono::steady_clock::now() - start;
  std::mt19937 random(1);
  int saved = 1, recovered = 0;
  for (int i = 0; i < 50; i++) {
    const pid_t pid = start_process(save);
    std::this_thread::sleep_for(save_time * (random() % 1000) / 1000);
    kill(pid, SIGKILL);
    end_of(pid);
    const bool is_noted = access(kJournal, F_OK) == 0;
    const int id = tavro_journal_recover();
    ASSERT_EQ(is_noted, id > 0);
    recovered += is_noted;
    const int last = std::stoi(value("SELECT max(VOC_ID) FROM TABLE_VOC"));
    ASSERT_LE(last, saved + 1);
    saved = last;
    expect_whole(last);
    ASSERT_EQ(rows(), std::to_string(saved) + "/" + std::to_string(3 * saved) + "/" + std::to_string(saved));
  }
  EXPECT_GT(recovered, 3) << "the kills did not hit the saves";
}

TEST_F(SaveJournal, SaveThatIsUnderWayInAnotherProcessIsNotCompletedASecondTime) {
  const pid_t pid = start_process([] {
    const Problem whole = report();
    if (tavro_journal_write(whole.get()) != 0) return 1;
    std::this_thread::sleep_for(std::chrono::milliseconds(300));
    tavro_journal_clear(tavro_dbmgr_update_bug_report(whole.get()));
    return 0;
  });
  while (access(kJournal, F_OK) == -1) std::this_thread::sleep_for(std::chrono::milliseconds(1));
  EXPECT_EQ(tavro_journal_recover(), 0);
  EXPECT_EQ(end_of(pid), 0);
  EXPECT_EQ(rows(), "1/3/1");
}

TEST_F(SaveJournal, NoteThatWaitsIsNotReplaced) {
  ASSERT_EQ(tavro_journal_write(report().get()), 0);
  EXPECT_EQ(tavro_journal_clear(-1), -1);
  EXPECT_EQ(tavro_journal_write(problem_report("o'user", "later").get()), -1);
  expect_whole(tavro_journal_recover());
}

TEST_F(SaveJournal, NoteThatCannotBeReadNowIsHeededLater) {
  rlimit files = {};
  getrlimit(RLIMIT_NOFILE, &files);
  const rlimit none = {0, files.rlim_max};
  for (const bool is_abandoned : {true, false}) {
    ASSERT_EQ(tavro_journal_write(report().get()), 0);  // and holds the journal's lock from now on
    if (is_abandoned) {
      tavro_dbmgr_update_bug_report(report().get());
      std::filesystem::rename(kJournal, kAbandoned);
    }
    setrlimit(RLIMIT_NOFILE, &none);
    EXPECT_EQ(tavro_journal_recover(), 0);
    setrlimit(RLIMIT_NOFILE, &files);
    EXPECT_EQ(access(is_abandoned ? kAbandoned : kJournal, F_OK), 0);
    EXPECT_EQ(tavro_journal_recover(), is_abandoned ? 0 : 2);
    EXPECT_EQ(rows(), is_abandoned ? "0/0/0" : "1/3/1");
  }
}

TEST_F(SaveJournal, IdeaIsCompletedToo) {
  Idea idea(TAVRO_ZALLOC(tavro_dbmgr_suggestion_info));
  idea->suggestion = TAVRO_STRDUP("brighter");
  idea->title_description = TAVRO_STRDUP("");
  idea->submitted = TAVRO_STATUS_DRAFT_SAVED;
  ASSERT_EQ(tavro_journal_write(idea.get()), 0);
  const Voc voc(tavro_dbmgr_get_voc_by_id(tavro_journal_recover()));
  ASSERT_NE(voc, nullptr);
  EXPECT_STREQ(voc->type, "TAVRO_DBMGR_SUGGESTION");
  EXPECT_STREQ(voc->description, "brighter");
  EXPECT_STREQ(voc->submitted, "6");
  EXPECT_EQ(voc->dump_name, nullptr);
}

TEST_F(SaveJournal, RefusedSaveIsTriedAgainAtTheNextStart) {
  ASSERT_EQ(tavro_journal_write(report().get()), 0);
  struct stat file = {};
  stat(kJournal, &file);
  EXPECT_EQ(file.st_mode & 0777u, 0600u);
  run("CREATE TRIGGER refuse BEFORE INSERT ON TABLE_VOC BEGIN SELECT raise(ABORT, 'full'); END");
  tavro_journal_clear(tavro_dbmgr_update_bug_report(report().get()));
  EXPECT_EQ(tavro_journal_recover(), 0);
  run("DROP TRIGGER refuse");
  expect_whole(tavro_journal_recover());
}

TEST_F(SaveJournal, ReportIsRecoveredIntoANewStoreAfterTheOldOneWasDamaged) {
  for (int i = 0; i < 3; i++) save_problem("o'user", "lost with the store");
  ASSERT_EQ(tavro_journal_write(report().get()), 0);
  std::ofstream(TAVRO_DBMGR_FILE) << "no database at all, and long enough to be told apart from one";
  ASSERT_EQ(tavro_dbmgr_ensure_schema(), TAVRO_STORE_REPLACED);
  const int id = tavro_dbmgr_update_bug_report(report().get());  // a first recovery, killed before its end
  EXPECT_EQ(tavro_journal_recover(), id);
  EXPECT_EQ(rows(), "1/3/1");
}

TEST_F(SaveJournal, DamagedNotesAreAllKeptAsideAndHarmNothing) {
  std::string aside = std::string(kJournal) + ".damaged";
  int place = 1;
  for (const char *contents :
       {"", "garbage", "[report]\ntype=\"other\"\n", "[report]\ntype=x\nattachments=9999999\n"}) {
    std::ofstream(kJournal) << contents;
    EXPECT_EQ(tavro_journal_recover(), 0);
    EXPECT_EQ(file_contents(aside), contents);
    aside = std::string(kJournal) + ".damaged." + std::to_string(++place);
    EXPECT_EQ(access(kJournal, F_OK), -1);
  }
  EXPECT_EQ(rows(), "0/0/0");
}

}  // namespace
