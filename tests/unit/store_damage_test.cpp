// What stands in the store's place is no store, or a damaged one.
#include "store_world.h"
#include "tavro_dbmgr_catalogue.h"

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

  static std::string foreign_database(const char *sql) {
    fs::remove(TAVRO_DBMGR_FILE);
    run(sql);
    return file_contents(TAVRO_DBMGR_FILE);
  }

  static std::string with_garbage_at(std::string contents, std::size_t page) {
    return contents.replace(page * kPageBytes, kPageBytes, kPageBytes, '\x55');
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
      {"another program's database", foreign_database("CREATE TABLE NOTES(N); INSERT INTO NOTES VALUES(1)")},
      {"with a table named like ours", foreign_database("CREATE TABLE ATTACHMENT(X); CREATE TABLE MINE(Y)")},
      {"and a column too", foreign_database("CREATE TABLE TABLE_VOC(VOC_ID INTEGER PRIMARY KEY, Z)")},
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

TEST_F(StoreDamage, FolderInTheStoresPlaceIsKeptAsideWithSqlitesFiles) {
  fs::remove(TAVRO_DBMGR_FILE);
  fs::create_directories(TAVRO_DBMGR_FILE "/inside");
  for (const char *ending : {"-wal", "-shm"}) std::ofstream(TAVRO_DBMGR_FILE + std::string(ending)) << "x";
  expect_replaced_once();
  for (const char *part : {"/inside", "-wal", "-shm"})
    EXPECT_TRUE(fs::exists(file_set_aside() + part)) << part;
}

TEST_F(StoreDamage, FileWithoutContentsBecomesAStore) {
  put_in_place("");
  EXPECT_EQ(tavro_dbmgr_ensure_schema(), TAVRO_STORE_READY);
  EXPECT_EQ(file_set_aside(), "");
  EXPECT_EQ(save_problem("user", "after"), 1);
}

TEST_F(StoreDamage, PageOfATableThatAnOperationCannotReadHasTheStoreReplacedAtTheNextStart) {
  const std::string whole = whole_store();
  put_in_place(with_garbage_at(whole, whole.find(TAVRO_DBMGR_BUG_REPORT) / kPageBytes));
  ASSERT_EQ(tavro_dbmgr_ensure_schema(), TAVRO_STORE_READY) << "found too early: choose another page";
  for (int id = 1; id <= 8; id++) Voc(tavro_dbmgr_get_voc_by_id(id));
  ASSERT_TRUE(fs::exists(kMark));
  expect_replaced_once();
}

TEST_F(StoreDamage, DamageOutsideTheTablesIsHealedWithoutLoss) {
  run("CREATE TABLE ADDED_LATER(\"it's\"); INSERT INTO ADDED_LATER VALUES('later')");
  const std::string whole = whole_store();
  const auto page_of = [](const char *name) {
    return std::stoul(
        value(std::string("SELECT rootpage - 1 FROM sqlite_master WHERE name = '") + name + "'"));
  };
  std::vector<std::string> stores;
  for (const char *index : {"VOC_EXTENDED_BY_VOC", "VOC_BY_USER_AND_CHANGE", "sqlite_autoindex_TABLE_VOC_1"})
    stores.push_back(with_garbage_at(whole, page_of(index)));
  run("DROP INDEX VOC_BY_USER_AND_CHANGE; CREATE INDEX VOC_BY_USER_AND_CHANGE ON "
      "TABLE_VOC(VOC_USER_NAME, VOC_DATE_OF_UPDATION) WHERE VOC_ID <> 3; PRAGMA writable_schema = ON; "
      "UPDATE sqlite_master SET sql = replace(sql, ' WHERE VOC_ID <> 3', '')");
  const char *in_history =
      "SELECT count(*) FROM TABLE_VOC INDEXED BY VOC_BY_USER_AND_CHANGE WHERE VOC_USER_NAME = 'user'";
  ASSERT_EQ(value(in_history), "7");
  stores.push_back(file_contents(TAVRO_DBMGR_FILE));
  for (const std::string &contents : stores) {
    SCOPED_TRACE(&contents - stores.data());
    put_in_place(contents);
    std::ofstream(kMark) << "";
    EXPECT_EQ(tavro_dbmgr_ensure_schema(), TAVRO_STORE_READY);
    EXPECT_FALSE(fs::exists(kMark));
    EXPECT_EQ(file_set_aside(), "");
    EXPECT_EQ(value("PRAGMA integrity_check"), "ok");
    EXPECT_EQ(value(in_history), "8");
    EXPECT_EQ(value("SELECT \"it's\" FROM ADDED_LATER"), "later");
    EXPECT_EQ(value("SELECT count(*) FROM sqlite_master WHERE type = 'index' AND sql IS NOT NULL"), "4");
    const Voc voc(tavro_dbmgr_get_voc_by_id(3));
    EXPECT_STREQ(voc->description, std::string(9000, 'x').c_str());
    EXPECT_EQ(g_slist_length(voc->attachments), 2u);
    tavro_dbmgr_destroy_vocs_by_id(8);
    EXPECT_EQ(save_problem("user", "after"), 9);
  }
}

TEST_F(StoreDamage, DamageOfAnotherFileCastsNoSuspicionOnTheStore) {
  const std::string other = TAVRO_DBMGR_FOLDER "/other.db";
  std::ofstream(other) << "no database at all, and long enough to be told apart from one";
  sqlite3 *db = nullptr;
  ASSERT_EQ(tavro_dbmgr_db_open(&db, other.c_str()), 0);
  EXPECT_EQ(_tavro_dbmgr_get_matching_record_count(db, "TABLE_VOC", nullptr), -1);
  tavro_dbmgr_db_close(db);
  EXPECT_FALSE(fs::exists(kMark));
}

TEST_F(StoreDamage, SuspicionThatIsNotConfirmedChangesNothing) {
  const int id = save_problem("user", "kept");
  std::ofstream(kMark) << "";
  EXPECT_EQ(tavro_dbmgr_ensure_schema(), TAVRO_STORE_READY);
  EXPECT_FALSE(fs::exists(kMark));
  EXPECT_EQ(taken(tavro_dbmgr_get_voc_description_by_id(id)), "kept");
}

}  // namespace
