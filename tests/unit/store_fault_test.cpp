// Full disk, read-only file, foreign locks, a lock that is removed: each refuses what it must, loses nothing,
// and is over when its cause is gone.
#include <fcntl.h>
#include <sched.h>
#include <sys/mount.h>

#include "statement_watch.h"
#include "store_world.h"
#include "tavro_save_journal.h"

namespace {

using ::testing::HasSubstr;
using ::testing::Not;

namespace fs = std::filesystem;

constexpr int kNotHere = 77;
constexpr char kFiller[] = TAVRO_DBMGR_FOLDER "/filler";
constexpr char kLockFailed[] = "Semaphore Wait failed with error";

class StoreFault : public StoreWorld {
 protected:
  // As the client saves: the id when the report is whole in the store, else below 1.
  static int save_with_note(const std::string &text, bool *is_noted) {
    const Problem report = problem_report("user", text.c_str(), {"/a", "/b"});
    *is_noted = tavro_journal_write(report.get()) == 0;
    return *is_noted ? tavro_journal_clear(tavro_dbmgr_update_bug_report(report.get())) : 0;
  }

  static std::string rows_of(int reports) {
    return std::to_string(reports) + "/" + std::to_string(2 * reports) + "/" + std::to_string(reports);
  }

  // A foreign program that locks the file until it is killed; it may have run `sql` first.
  static pid_t start_foreign_lock(const char *sql) {
    return start_process_that_stays([sql] {
      sqlite3 *db = nullptr;
      sqlite3_open(TAVRO_DBMGR_FILE, &db);
      sqlite3_exec(db, sql, nullptr, nullptr, nullptr);
    });
  }

  static void kill_and_wait(pid_t pid) {
    kill(pid, SIGKILL);
    end_of(pid);
  }
};

// In a process of its own, whose store is on a disk of one mebibyte.
int on_a_small_disk(const std::function<int()> &work) {
  return end_of(start_process([&] {
    const std::string uid = std::to_string(geteuid()), gid = std::to_string(getegid());
    if (unshare(CLONE_NEWNS | (uid == "0" ? 0 : CLONE_NEWUSER)) != 0) return kNotHere;
    if (uid != "0") {
      std::ofstream("/proc/self/setgroups") << "deny";
      std::ofstream("/proc/self/uid_map") << uid << " " << uid << " 1";
      std::ofstream("/proc/self/gid_map") << gid << " " << gid << " 1";
    }
    if (mount("none", "/", "none", MS_REC | MS_PRIVATE, nullptr) != 0) return kNotHere;
    if (mount("none", TAVRO_DBMGR_FOLDER, "tmpfs", 0, "size=1m") != 0) return kNotHere;
    return work();
  }));
}

// Fill the disk but for some pages.
void fill_disk(int pages_left) {
  const TavroFd filler(open(kFiller, O_WRONLY | O_CREAT | O_TRUNC | O_CLOEXEC, 0600));
  const std::string page(4096, 'x');
  off_t size = 0;
  while (write(filler.get(), page.data(), page.size()) > 0) size += 4096;
  if (ftruncate(filler.get(), size - 4096 * pages_left) != 0) ADD_FAILURE() << "filler";
}

TEST_F(StoreFault, DiskThatIsFullAtAnyStepOfASaveLosesNoTextAndDoublesNone) {
  const int result = on_a_small_disk([] {
    if (tavro_dbmgr_ensure_schema() != TAVRO_STORE_READY) return 10;
    const std::string text(1500, 'x');
    int stored = 0, refused = 0, completed_later = 0;
    for (int pages_left = 0; stored == completed_later; pages_left++) {
      if (pages_left > 60) return 15;  // no save ever fitted
      fill_disk(pages_left);
      bool is_noted = false;
      const int id = save_with_note(text, &is_noted);
      fs::remove(kFiller);
      const int completed = tavro_journal_recover();
      if (is_noted != (id >= 1 || completed >= 1) || (id >= 1 && completed >= 1)) return 11;
      stored += is_noted;
      refused += !is_noted;
      completed_later += completed >= 1;
      if (rows() != rows_of(stored)) return 12;
      if (is_noted && taken(tavro_dbmgr_get_voc_title_description_by_id(stored)) != text) return 13;
    }
    return refused > 0 && completed_later > 0 ? 0 : 14;
  });
  if (result == kNotHere) GTEST_SKIP() << "no small disk can be had here";
  EXPECT_EQ(result, 0);
}

TEST_F(StoreFault, FullDiskRefusesChangesWithALogLineUntilThereIsSpace) {
  const int result = on_a_small_disk([] {
    if (tavro_dbmgr_ensure_schema() != TAVRO_STORE_READY) return 10;
    const int id = save_problem("user", "kept");
    tavro_dbmgr_set_voc_data_submitted_to_server(id, 77, TAVRO_STATUS_SENDING_SUCCESS);
    const std::string before = value("SELECT VOC_STATE || VOC_DATE_OF_UPDATION FROM TABLE_VOC");
    fill_disk(0);
    if (save_problem("user", "refused") >= 1) return 11;
    if (tavro_dbmgr_update_sending_state(id, TAVRO_STATUS_SENDING_FAILED) != 0) return 12;
    if (_tavro_dbmgr_update_push_status_comments("77", "2", "hello") != 0) return 13;
    tavro_dbmgr_destroy_vocs_by_id(id);
    if (value("SELECT VOC_STATE || VOC_DATE_OF_UPDATION FROM TABLE_VOC") != before) return 14;
    if (taken(tavro_dbmgr_get_voc_description_by_id(id)) != "kept") return 15;
    fs::remove(kFiller);
    _tavro_dbmgr_update_push_status_comments("77", "2", "hello");
    if (taken(tavro_dbmgr_get_voc_comments_by_id(id)) != "none#hello") return 16;
    return save_problem("user", "fits again") >= 1 ? 0 : 17;
  });
  if (result == kNotHere) GTEST_SKIP() << "no small disk can be had here";
  EXPECT_EQ(result, 0);
  EXPECT_THAT(log(), HasSubstr("SQL ERROR: database or disk is full"));
}

// Root is not stopped by permissions, so the store then becomes that of nobody.
void give_store_to(uid_t user) {
  if (geteuid() != 0) return;
  for (fs::path path = TAVRO_DBMGR_FILE; path != "/opt"; path = path.parent_path())
    ASSERT_EQ(chown(path.c_str(), user, user), 0);
}

TEST_F(StoreFault, ReadOnlyStoreRefusesTheSaveStaysReadableAndRecovers) {
  constexpr uid_t kNobody = 65534;
  const int id = save_problem("user", "kept");
  fs::permissions(TAVRO_DBMGR_FILE, fs::perms::owner_read);
  give_store_to(kNobody);
  const std::string before = file_contents(TAVRO_DBMGR_FILE);
  const int result = end_of(start_process([&] {
    if (geteuid() == 0 && setuid(kNobody) != 0) return 10;
    if (tavro_dbmgr_ensure_schema() != TAVRO_STORE_READY) return 11;
    bool is_noted = false;
    if (save_with_note("waits", &is_noted) >= 1 || !is_noted) return 12;
    if (tavro_dbmgr_update_sending_state(id, TAVRO_STATUS_SENDING_FAILED) != 0) return 13;
    if (taken(tavro_dbmgr_get_voc_description_by_id(id)) != "kept") return 14;
    if (file_contents(TAVRO_DBMGR_FILE) != before) return 15;
    fs::permissions(TAVRO_DBMGR_FILE, fs::perms::owner_read | fs::perms::owner_write);
    return taken(tavro_dbmgr_get_voc_description_by_id(tavro_journal_recover())) == "waits" ? 0 : 16;
  }));
  EXPECT_EQ(result, 0);
  give_store_to(geteuid());
}

TEST_F(StoreFault, SaveWaitsForAForeignProgramThatWritesForThreeSeconds) {
  int ready[2];
  ASSERT_EQ(pipe(ready), 0);
  const pid_t foreign = start_process([&] {
    TavroDb db;
    sqlite3_open(TAVRO_DBMGR_FILE, tavro_out(db));
    sqlite3_exec(db.get(), "BEGIN EXCLUSIVE", nullptr, nullptr, nullptr);
    if (write(ready[1], "x", 1) != 1) return 1;
    sleep(3);
    TavroStmt count;
    sqlite3_prepare_v2(db.get(), "SELECT 1 FROM TABLE_VOC", -1, tavro_out(count), nullptr);
    if (sqlite3_step(count.get()) != SQLITE_DONE) return 2;  // nobody got in
    count.reset();
    return sqlite3_exec(db.get(), "INSERT INTO APP_CRASH(APP_ID) VALUES('x'); COMMIT", nullptr, nullptr,
                        nullptr);
  });
  char byte;
  ASSERT_EQ(read(ready[0], &byte, 1), 1);
  EXPECT_EQ(save_problem("user", "waited"), 1);
  EXPECT_EQ(end_of(foreign), SQLITE_OK);
  EXPECT_EQ(value("SELECT VOC_TEXT || APP_ID FROM TABLE_VOC, APP_CRASH"), "waitedx");
}

TEST_F(StoreFault, SaveThatAForeignProgramBlocksForTooLongIsMadeUpFor) {
  bool is_noted = false;
  const pid_t foreign = start_foreign_lock("BEGIN IMMEDIATE; INSERT INTO APP_CRASH(APP_ID) VALUES('x')");
  const Problem report = problem_report("user", "waits", {"/a", "/b"});
  ASSERT_EQ(tavro_journal_write(report.get()), 0);
  StatementWatch watch;
  EXPECT_EQ(tavro_dbmgr_update_bug_report(report.get()), 0);
  EXPECT_EQ(watch.take("INSERT"), 1) << "it waited again for each row that cannot be stored either";
  EXPECT_THAT(log(), HasSubstr("SQL ERROR: database is locked"));
  EXPECT_EQ(lock_value(), 1);
  EXPECT_EQ(tavro_journal_clear(0), 0);
  EXPECT_EQ(watch.take("DELETE"), 0);
  kill_and_wait(foreign);
  EXPECT_EQ(tavro_journal_recover(), 1);
  EXPECT_EQ(rows(), rows_of(1));
  EXPECT_EQ(taken(tavro_dbmgr_get_voc_title_description_by_id(1)), "waits");
  EXPECT_EQ(save_with_note("next", &is_noted), 2);
}

void remove_lock() {
  ASSERT_EQ(semctl(dbmgr_semid, 0, IPC_RMID), 0);
}

TEST_F(StoreFault, LockThatIsRemovedAtAnyMomentIsThereAgainForTheNextOperation) {
  sqlite3 *db = nullptr;
  const std::pair<const char *, std::function<void()>> moments[] = {
      {"between operations",
       [] {
         remove_lock();
         EXPECT_GE(save_problem("user", "unlocked"), 1);
       }},
      {"before an open, whose close must not give back what was not taken",
       [&db] {
         remove_lock();
         EXPECT_EQ(tavro_dbmgr_db_open(&db, TAVRO_DBMGR_FILE), 0);
         EXPECT_EQ(tavro_dbmgr_db_close(db), 0);
       }},
      {"while it is held",
       [] {
         EXPECT_EQ(tavro_dbmgr_sem_wait(), 0);
         remove_lock();
         EXPECT_EQ(tavro_dbmgr_sem_signal(), -1);
       }},
      {"and another program has made it anew",
       [] {
         remove_lock();
         EXPECT_EQ(end_of(start_process([] { return tavro_dbmgr_init_semaphore(); })), 0);
         EXPECT_EQ(tavro_dbmgr_sem_wait(), -1);
       }},
  };
  for (const auto &[moment, happen] : moments) {
    SCOPED_TRACE(moment);
    const std::size_t logged = log().size();
    happen();
    EXPECT_THAT(log().substr(logged), HasSubstr(kLockFailed));
    const std::size_t healed = log().size();
    ASSERT_EQ(tavro_dbmgr_sem_wait(), 0);
    EXPECT_EQ(lock_value(), 0);
    EXPECT_EQ(tavro_dbmgr_sem_signal(), 0);
    EXPECT_EQ(lock_value(), 1);
    EXPECT_GE(save_problem("user", "locked"), 1);
    EXPECT_THAT(log().substr(healed), Not(HasSubstr(kLockFailed)));
  }
}

TEST_F(StoreFault, OperationThatWaitsForALockWhichIsRemovedGoesOnAndBothProgramsShareTheNextOne) {
  const pid_t holder = start_process_that_stays([] { tavro_dbmgr_sem_wait(); });
  const pid_t waiting = start_process([] {
    if (save_problem("user", "waited") < 1) return 1;
    tavro_dbmgr_sem_wait();
    return lock_value() == 0 ? 0 : 2;
  });
  while (semctl(dbmgr_semid, 0, GETNCNT) == 0) usleep(1000);
  remove_lock();
  EXPECT_EQ(end_of(waiting), 0);
  kill_and_wait(holder);
  EXPECT_EQ(tavro_dbmgr_sem_wait(), -1);
  EXPECT_EQ(tavro_dbmgr_sem_wait(), 0);
  EXPECT_EQ(tavro_dbmgr_sem_signal(), 0);
  EXPECT_EQ(lock_value(), 1);
  EXPECT_EQ(taken(tavro_dbmgr_get_voc_title_description_by_id(1)), "waited");
}

}  // namespace
