// The store's file, its tables and its lock.
#include <fcntl.h>
#include <sched.h>
#include <sys/mount.h>
#include <sys/sem.h>
#include <sys/stat.h>

#include "store_world.h"

namespace {

using ::testing::EndsWith;
using ::testing::HasSubstr;

namespace fs = std::filesystem;

constexpr char kTableCount[] =
    "SELECT count(*) FROM sqlite_master WHERE type = 'table' AND name NOT LIKE 'sqlite%'";

class StoreSchema : public StoreWorld {
 protected:
  static int lock_value() { return semctl(dbmgr_semid, 0, GETVAL); }
  static std::string log() { return file_contents("/opt/usr/share/log/platform.log"); }

  static void set_lock_value(int number) {
    union {
      int val;
      void *unused;
    } argument = {number};
    ASSERT_EQ(semctl(dbmgr_semid, 0, SETVAL, argument), 0);
  }

  // A process that took the lock and never gives it back by itself.
  static pid_t start_holder() {
    int ready[2];
    EXPECT_EQ(pipe(ready), 0);
    const pid_t pid = start_process([&] {
      tavro_dbmgr_sem_wait();
      if (write(ready[1], "x", 1) == 1) pause();
      return 0;
    });
    char byte;
    EXPECT_EQ(read(ready[0], &byte, 1), 1);
    close(ready[0]);
    close(ready[1]);
    return pid;
  }

  static std::string file_set_aside() {
    for (const auto &entry : fs::directory_iterator(TAVRO_DBMGR_FOLDER))
      if (entry.path().filename().string().find(".tavro.db.damaged-20") == 0) return entry.path();
    return "";
  }
};

TEST_F(StoreSchema, NewPhoneGetsAllTablesTheBannerAndPrivateFiles) {
  EXPECT_EQ(value(kTableCount), "9");
  EXPECT_EQ(value("SELECT BANNER_TYPE || BANNER_ACTION FROM TABLE_BANNER WHERE BANNER_ID = 0"), "BETABETA");
  EXPECT_THAT(value("SELECT BANNER_IMAGE_PATH FROM TABLE_BANNER"), EndsWith("images/kxbanner2.jpg"));
  struct stat folder = {}, file = {};
  stat(TAVRO_DBMGR_FOLDER, &folder);
  stat(TAVRO_DBMGR_FILE, &file);
  EXPECT_EQ(folder.st_mode & 0777u, 0700u);
  EXPECT_EQ(file.st_mode & 0777u, 0600u);
}

TEST_F(StoreSchema, SecondCreationStopsAtTheBannerAndChangesNothing) {
  const std::string before = file_contents(TAVRO_DBMGR_FILE);
  EXPECT_EQ(tavro_dbmgr_init(), 0);
  EXPECT_EQ(file_contents(TAVRO_DBMGR_FILE), before);
  EXPECT_THAT(log(), HasSubstr("SQL ERROR: UNIQUE constraint failed: TABLE_BANNER"));
}

TEST_F(StoreSchema, InterruptedFirstCreationIsCompleted) {
  run("DROP TABLE TABLE_NOTIFICATIONS; DROP INDEX ATTACHMENT_BY_VOC; DELETE FROM TABLE_BANNER");
  const int id = save_problem("user", "kept");
  EXPECT_EQ(tavro_dbmgr_ensure_schema(), TAVRO_STORE_READY);
  EXPECT_EQ(value(kTableCount), "9");
  EXPECT_THAT(value("SELECT BANNER_IMAGE_PATH FROM TABLE_BANNER"), EndsWith("images/kxbanner2.jpg"));
  EXPECT_EQ(taken(tavro_dbmgr_get_voc_description_by_id(id)), "kept");
}

TEST_F(StoreSchema, SeveralProcessesMayCreateOrReplaceTheStoreAtOnce) {
  for (int round = 0; round < 6; round++) {
    fs::remove_all(TAVRO_DBMGR_FOLDER);
    const bool is_damaged = round % 2 == 1;
    if (is_damaged) {
      fs::create_directories(TAVRO_DBMGR_FOLDER);
      std::ofstream(TAVRO_DBMGR_FILE) << "no database at all, and long enough to be told apart from one";
    }
    std::vector<pid_t> processes;
    for (int i = 0; i < 4; i++)
      processes.push_back(start_process([is_damaged] {
        if (is_damaged) dbmgr_semid = -1;  // before the lock was set up
        return static_cast<int>(tavro_dbmgr_ensure_schema());
      }));
    int replaced = 0;
    for (const pid_t pid : processes) replaced += end_of(pid);
    EXPECT_EQ(replaced, is_damaged ? 1 : 0);
    EXPECT_EQ(value(kTableCount), "9");
    EXPECT_EQ(value("SELECT count(*) FROM TABLE_BANNER"), "1");
  }
}

TEST_F(StoreSchema, DamagedFileIsKeptUnderADatedNameWithItsJournal) {
  save_problem("user", std::string(20000, 'x').c_str());
  const std::string whole = file_contents(TAVRO_DBMGR_FILE);
  std::string torn_schema = whole;
  torn_schema.replace(100, 400, 400, '\x55');
  for (const std::string &damaged :
       {std::string("this is a letter, not a database, and long enough to be one"), torn_schema}) {
    SCOPED_TRACE(damaged.size());
    fs::remove_all(TAVRO_DBMGR_FOLDER);
    fs::create_directories(TAVRO_DBMGR_FOLDER);
    std::ofstream(TAVRO_DBMGR_FILE) << damaged;
    const std::string journal("\0left behind", 12);
    std::ofstream(TAVRO_DBMGR_FILE "-journal") << journal;
    EXPECT_EQ(tavro_dbmgr_ensure_schema(), TAVRO_STORE_REPLACED);
    const std::string kept =
        file_set_aside().substr(0, sizeof TAVRO_DBMGR_FILE ".damaged-20260101000000" - 1);
    EXPECT_EQ(file_contents(kept), damaged);
    EXPECT_EQ(file_contents(kept + "-journal"), journal);
    EXPECT_EQ(tavro_dbmgr_ensure_schema(), TAVRO_STORE_READY);
    EXPECT_GE(save_problem("user", "after"), 1);
  }
}

TEST_F(StoreSchema, ReadOnlyStoreRefusesTheSaveAndStaysReadable) {
  const int id = save_problem("user", "kept");
  fs::permissions(TAVRO_DBMGR_FILE, fs::perms::owner_read);
  if (geteuid() == 0) {  // whom permissions do not stop
    for (fs::path path = TAVRO_DBMGR_FILE; path != "/opt"; path = path.parent_path())
      ASSERT_EQ(chown(path.c_str(), 65534, 65534), 0);
  }
  const std::string before = file_contents(TAVRO_DBMGR_FILE);
  EXPECT_EQ(end_of(start_process([id] {
              if (geteuid() == 0 && setuid(65534) != 0) return 10;
              if (tavro_dbmgr_ensure_schema() != TAVRO_STORE_READY) return 11;
              if (save_problem("user", "refused") >= 1) return 12;
              return taken(tavro_dbmgr_get_voc_description_by_id(id)) == "kept" ? 0 : 13;
            })),
            0);
  EXPECT_EQ(file_contents(TAVRO_DBMGR_FILE), before);
  if (geteuid() == 0) {
    for (fs::path path = TAVRO_DBMGR_FILE; path != "/opt"; path = path.parent_path())
      ASSERT_EQ(chown(path.c_str(), 0, 0), 0);
  }
}

// In a process of its own, whose store is on a disk of one mebibyte.
int on_a_small_disk(const std::function<int()> &work) {
  return end_of(start_process([&] {
    const std::string uid = std::to_string(geteuid()), gid = std::to_string(getegid());
    if (unshare(CLONE_NEWNS | (uid == "0" ? 0 : CLONE_NEWUSER)) != 0) return 77;
    if (uid != "0") {
      std::ofstream("/proc/self/setgroups") << "deny";
      std::ofstream("/proc/self/uid_map") << uid << " " << uid << " 1";
      std::ofstream("/proc/self/gid_map") << gid << " " << gid << " 1";
    }
    if (mount(nullptr, "/", nullptr, MS_REC | MS_PRIVATE, nullptr) != 0) return 77;
    if (mount("none", TAVRO_DBMGR_FOLDER, "tmpfs", 0, "size=1m") != 0) return 77;
    return work();
  }));
}

TEST_F(StoreSchema, FullDiskRefusesTheSaveAndKeepsWhatIsStored) {
  const int result = on_a_small_disk([] {
    if (tavro_dbmgr_ensure_schema() != TAVRO_STORE_READY) return 10;
    const int id = save_problem("user", "kept");
    if (save_problem("user", std::string(1500000, 'x').c_str()) >= 1) return 11;
    if (value("SELECT count(*) FROM TABLE_VOC") != "1") return 12;
    if (taken(tavro_dbmgr_get_voc_title_description_by_id(id)) != "kept") return 13;
    return save_problem("user", "fits again") >= 1 ? 0 : 14;
  });
  if (result == 77) GTEST_SKIP() << "no small disk can be had here";
  EXPECT_EQ(result, 0);
}

TEST_F(StoreSchema, KilledHolderGivesTheLockBack) {
  const pid_t holder = start_holder();
  EXPECT_EQ(lock_value(), 0);
  kill(holder, SIGKILL);
  end_of(holder);
  ASSERT_EQ(lock_value(), 1);
  EXPECT_EQ(tavro_dbmgr_sem_wait(), 0);
  EXPECT_EQ(tavro_dbmgr_sem_signal(), 0);
  EXPECT_EQ(lock_value(), 1);
}

TEST_F(StoreSchema, StartOfTheClientSetsTheLockFreeAndThatOfTheServiceLeavesIt) {
  set_lock_value(5);
  EXPECT_EQ(tavro_dbmgr_init_semaphore(), 0);
  EXPECT_EQ(lock_value(), 1);
  const pid_t holder = start_holder();
  EXPECT_EQ(tavro_dbmgr_open_semaphore(), 0);
  EXPECT_EQ(lock_value(), 0);
  EXPECT_EQ(tavro_dbmgr_init_semaphore(), 0);
  EXPECT_EQ(lock_value(), 1);
  kill(holder, SIGKILL);
  end_of(holder);
  EXPECT_EQ(lock_value(), 1);
  semctl(dbmgr_semid, 0, IPC_RMID);
  EXPECT_EQ(tavro_dbmgr_open_semaphore(), 0);
  EXPECT_EQ(lock_value(), 1);
}

TEST_F(StoreSchema, RefusedOpenAndCloseLeaveTheLockAlone) {
  sqlite3 *db = nullptr;
  EXPECT_EQ(tavro_dbmgr_db_open(&db, nullptr), -1);
  EXPECT_EQ(tavro_dbmgr_db_open(&db, TAVRO_DBMGR_FOLDER "/no/such/file"), -1);
  EXPECT_EQ(tavro_dbmgr_db_close(nullptr), -1);
  EXPECT_EQ(lock_value(), 1);
  ASSERT_EQ(tavro_dbmgr_db_open(&db, TAVRO_DBMGR_FILE), 0);
  EXPECT_EQ(lock_value(), 0);
  EXPECT_EQ(tavro_dbmgr_db_close(db), 0);
  EXPECT_EQ(lock_value(), 1);
}

TEST_F(StoreSchema, ClearingATableEmptiesIt) {
  save_problem("user", "text");
  for (int i = 0; i < 2; i++) EXPECT_EQ(_tavro_dbmgr_clear_db("TABLE_VOC"), 0);
  EXPECT_EQ(value("SELECT count(*) FROM TABLE_VOC"), "0");
  EXPECT_THAT(log(), HasSubstr("Deleted all the elements from the table TABLE_VOC"));
}

}  // namespace
