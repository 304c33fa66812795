// What stands in the store's place is no store, or a damaged one.
#include "store_world.h"

namespace {

namespace fs = std::filesystem;

constexpr char kMark[] = TAVRO_DBMGR_FOLDER "/.tavro.db.suspect";
constexpr std::size_t kPageBytes = 4096;

class StoreDamage : public StoreWorld {
 protected:
  static std::string file_set_aside() {
    std::string path;
    for (const auto &entry : fs::directory_iterator(TAVRO_DBMGR_FOLDER))
      if (entry.path().filename().string().find(".tavro.db.damaged-20") == 0 &&
          (path.empty() || entry.path().string() < path))
        path = entry.path();
    return path;
  }

  // A store of more than a hundred pages.
  static std::string whole_store() {
    for (int i = 0; i < 8; i++) save_problem("user", std::string(9000, 'x').c_str(), {"/a", "/b"});
    return file_contents(TAVRO_DBMGR_FILE);
  }

  static std::string foreign_database() {
    run("DROP TABLE IF EXISTS NOTES; CREATE TABLE NOTES(N TEXT); INSERT INTO NOTES VALUES('of another')");
    for (const char *table :
         {"ATTACHMENT", "TABLE_VOC", "TABLE_USER_PROFILE", "APP_CRASH", "APP_DATA", "TABLE_VOC_EXTENDED",
          "TABLE_BETA_PROGRAM", "TABLE_BANNER", "TABLE_NOTIFICATIONS"})
      run(std::string("DROP TABLE ") + table);
    return file_contents(TAVRO_DBMGR_FILE);
  }

  static std::string database_with_a_table_of_the_same_name() {
    run("DROP TABLE TABLE_VOC; CREATE TABLE TABLE_VOC(VOC_ID INTEGER PRIMARY KEY, SOUND BLOB)");
    return file_contents(TAVRO_DBMGR_FILE);
  }

  static void put_in_place(const std::string &contents) {
    fs::remove_all(TAVRO_DBMGR_FOLDER);
    fs::create_directories(TAVRO_DBMGR_FOLDER);
    std::ofstream(TAVRO_DBMGR_FILE) << contents;
  }

  static void expect_replaced_once() {
    EXPECT_EQ(tavro_dbmgr_ensure_schema(), TAVRO_STORE_REPLACED);
    EXPECT_TRUE(tavro_dbmgr_is_replacement_untold());
    tavro_dbmgr_set_replacement_told();
    EXPECT_EQ(tavro_dbmgr_ensure_schema(), TAVRO_STORE_READY);
    EXPECT_FALSE(tavro_dbmgr_is_replacement_untold());
    EXPECT_EQ(save_problem("user", "after"), 1);
    EXPECT_EQ(value("PRAGMA integrity_check"), "ok");
  }
};

TEST_F(StoreDamage, WhatIsNoStoreIsKeptUnderADatedNameWithItsJournal) {
  const std::string whole = whole_store();
  std::string torn_schema = whole, garbage_pages = whole;
  torn_schema.replace(100, 400, 400, '\x55');
  garbage_pages.replace(kPageBytes, whole.size() - kPageBytes, whole.size() - kPageBytes, '\x55');
  const std::pair<const char *, std::string> files[] = {
      {"a letter", "this is a letter, not a database, and long enough to be one"},
      {"torn schema", torn_schema},
      {"truncated", whole.substr(0, whole.size() / 2)},
      {"truncated within the first page", whole.substr(0, 1000)},
      {"whole header, then garbage", garbage_pages},
      {"a database with a table of the same name", database_with_a_table_of_the_same_name()},
      {"another program's database", foreign_database()},
  };
  for (const auto &[name, contents] : files) {
    SCOPED_TRACE(name);
    put_in_place(contents);
    const std::string journal("\0left behind", 12);
    std::ofstream(TAVRO_DBMGR_FILE "-journal") << journal;
    expect_replaced_once();
    const std::string kept = file_set_aside();
    EXPECT_EQ(kept.size(), sizeof TAVRO_DBMGR_FILE ".damaged-20260101000000" - 1);
    EXPECT_EQ(file_contents(kept), contents);
    EXPECT_EQ(file_contents(kept + "-journal"), journal);
  }
}

TEST_F(StoreDamage, FolderInTheStoresPlaceIsKeptAside) {
  fs::remove(TAVRO_DBMGR_FILE);
  fs::create_directories(TAVRO_DBMGR_FILE "/inside");
  expect_replaced_once();
  EXPECT_TRUE(fs::exists(file_set_aside() + "/inside"));
}

TEST_F(StoreDamage, FileWithoutContentsBecomesAStore) {
  put_in_place("");
  EXPECT_EQ(tavro_dbmgr_ensure_schema(), TAVRO_STORE_READY);
  EXPECT_EQ(file_set_aside(), "");
  EXPECT_EQ(save_problem("user", "after"), 1);
}

TEST_F(StoreDamage, PageThatAnOperationCannotReadHasTheStoreReplacedAtTheNextStart) {
  std::string damaged = whole_store();
  const auto leaf = static_cast<std::size_t>(
      std::stoi(value("SELECT rootpage FROM sqlite_master WHERE name = 'VOC_EXTENDED_BY_VOC'")));
  damaged.replace((leaf - 1) * kPageBytes, kPageBytes, kPageBytes, '\x55');
  put_in_place(damaged);
  ASSERT_EQ(tavro_dbmgr_ensure_schema(), TAVRO_STORE_READY) << "found too early: choose another page";
  save_problem("user", "meets the page");
  ASSERT_TRUE(fs::exists(kMark));
  expect_replaced_once();
}

TEST_F(StoreDamage, SuspicionThatIsNotConfirmedChangesNothing) {
  const int id = save_problem("user", "kept");
  std::ofstream(kMark) << "";
  EXPECT_EQ(tavro_dbmgr_ensure_schema(), TAVRO_STORE_READY);
  EXPECT_FALSE(fs::exists(kMark));
  EXPECT_EQ(taken(tavro_dbmgr_get_voc_description_by_id(id)), "kept");
}

}  // namespace
