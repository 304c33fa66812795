// The store's file, its tables and its lock.
#include "store_world.h"

namespace {

using ::testing::EndsWith;
using ::testing::HasSubstr;
using ::testing::Not;

namespace fs = std::filesystem;

constexpr char kTableCount[] =
    "SELECT count(*) FROM sqlite_master WHERE type = 'table' AND name NOT LIKE 'sqlite%'";
constexpr char kIndexCount[] =
    "SELECT count(*) FROM sqlite_master WHERE type = 'index' AND name NOT LIKE 'sqlite%'";

class StoreSchema : public StoreWorld {
 protected:
  static void set_lock_value(int number) {
    union {
      int val;
      void *unused;
    } argument = {number};
    ASSERT_EQ(semctl(dbmgr_semid, 0, SETVAL, argument), 0);
  }

  // A process that took the lock and never gives it back by itself.
  static pid_t start_holder() {
    return start_process_that_stays([] { tavro_dbmgr_sem_wait(); });
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
  EXPECT_EQ(value(kIndexCount), "4");
  EXPECT_EQ(value(kTableCount), "9");
  EXPECT_THAT(value("SELECT BANNER_IMAGE_PATH FROM TABLE_BANNER"), EndsWith("images/kxbanner2.jpg"));
  EXPECT_EQ(taken(tavro_dbmgr_get_voc_description_by_id(id)), "kept");
}

TEST_F(StoreSchema, OlderFileGainsTheIndexesAndANewerOnesColumnsAreLeftAlone) {
  run("DROP INDEX VOC_BY_USER_AND_CHANGE; DROP INDEX VOC_EXTENDED_BY_VOC; DROP INDEX ATTACHMENT_BY_VOC; "
      "DROP INDEX VOC_UNREAD");
  for (const char *table : {"TABLE_VOC", "TABLE_VOC_EXTENDED", "ATTACHMENT", "APP_DATA"})
    run(std::string("ALTER TABLE ") + table + " ADD COLUMN ADDED_LATER TEXT DEFAULT 'later'");
  EXPECT_EQ(tavro_dbmgr_ensure_schema(), TAVRO_STORE_READY);
  EXPECT_EQ(value(kIndexCount), "4");
  const std::string log_before = log();
  const int id = save_problem("user", "text", {"/a"});
  const Voc voc(tavro_dbmgr_get_voc_by_id(id));
  ASSERT_NE(voc, nullptr);
  EXPECT_STREQ(voc->title_description, "text");
  EXPECT_EQ(g_slist_length(voc->attachments), 1u);
  EXPECT_EQ(value("SELECT ADDED_LATER FROM TABLE_VOC"), "later");
  EXPECT_THAT(log().substr(log_before.size()), Not(HasSubstr("SQL ERROR")));
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

}  // namespace
