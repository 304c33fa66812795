#include <app_common.h>
#include <fcntl.h>
#include <sys/file.h>
#include <sys/stat.h>

#include <cerrno>

#include "tavro_dbmgr_internal.h"
#include "tavro_log.h"

namespace {

#define TAVRO_FOUR_RESERVED(prefix) \
  prefix "_REF_1 TEXT, " prefix "_REF_2 TEXT, " prefix "_REF_3 TEXT, " prefix "_REF_4 TEXT"

// The store's format: columns may only be added, at the end of a table.
constexpr const char *kTablesBeforeBanner[] = {
    "CREATE TABLE IF NOT EXISTS ATTACHMENT(ATTACHMENT_ID INTEGER PRIMARY KEY AUTOINCREMENT, "
    "ATTACHMENT_FILE_PATH TEXT NOT NULL, ATTACHMENT_FILE_SIZE INTEGER, ATTACHMENT_FILE_TYPE TEXT NOT NULL, "
    "ATTACHMENT_SUGGESTION_ID INTEGER NOT NULL, "
    "FOREIGN KEY(ATTACHMENT_SUGGESTION_ID) REFERENCES TABLE_VOC(VOC_ID));",
    "CREATE TABLE IF NOT EXISTS TABLE_VOC(VOC_ID INTEGER PRIMARY KEY AUTOINCREMENT, VOC_TYPE TEXT NOT NULL, "
    "VOC_TEXT TEXT, VOC_APP_NAME TEXT NOT NULL, VOC_APP_ICON TEXT, VOC_SEVERITY TEXT, VOC_DUMP_PATH TEXT, "
    "VOC_STATE TEXT, VOC_PUSH_COMMENTS TEXT, VOC_PUSH_READ INTEGER, VOC_FILE_NAME TEXT, "
    "VOC_USER_NAME TEXT NOT NULL, VOC_DATE_OF_CREATION TEXT, VOC_DATE_OF_UPDATION TEXT, "
    "VOC_RETRY_COUNT INTEGER, VOC_ID_SERVER INTEGER UNIQUE);",
    "CREATE TABLE IF NOT EXISTS TABLE_USER_PROFILE(USER_ID TEXT PRIMARY KEY, USER_NAME TEXT, "
    "PROFILE_PIC TEXT, EMAIL_ID TEXT, MOBILE_NUMBER TEXT, TEL_NUMBER TEXT, USER_BETA_TESTER_STATUS INTEGER);",
    "CREATE TABLE IF NOT EXISTS APP_CRASH(ID INTEGER PRIMARY KEY AUTOINCREMENT, APP_ID TEXT NOT NULL, "
    "APP_CRASH_REPORTED_TIME TEXT);",
    "CREATE TABLE IF NOT EXISTS APP_DATA(ID INTEGER PRIMARY KEY AUTOINCREMENT, PKG_ID TEXT, "
    "APP_ID TEXT UNIQUE, APP_NAME TEXT, APP_ICON TEXT, APP_DOWNLOADED INTEGER);",
    "CREATE TABLE IF NOT EXISTS TABLE_VOC_EXTENDED(ID INTEGER PRIMARY KEY AUTOINCREMENT, VOC_ID INTEGER, "
    "VOC_TITLE_TEXT TEXT, REF_2 TEXT, REF_3 TEXT, REF_4 TEXT, REF_5 TEXT);",
    "CREATE TABLE IF NOT EXISTS TABLE_BETA_PROGRAM(BETA_ID INTEGER PRIMARY KEY, BETA_TYPE TEXT, "
    "BETA_NAME TEXT, BETA_USER_NAME TEXT, BETA_USER_STATUS TEXT, BETA_VERSION TEXT, BETA_DATE INTEGER, "
    "BETA_START_DATE INTEGER, BETA_END_DATE INTEGER, BETA_URL TEXT, BETA_LANGUAGE TEXT, "
    "BETA_DESCRIPTION TEXT, BETA_WHATS_NEW TEXT, BETA_DISCUSSION_URL TEXT, " TAVRO_FOUR_RESERVED("BETA") ");",
    "CREATE TABLE IF NOT EXISTS TABLE_BANNER(BANNER_ID INTEGER, BANNER_TYPE TEXT, BANNER_ACTION TEXT, "
    "BANNER_ACTION_DATA TEXT, BANNER_IMAGE_URL TEXT, BANNER_SEQ_NO INTEGER, BANNER_UPDATE_FLAG INTEGER, "
    "BANNER_IMAGE_PATH TEXT, " TAVRO_FOUR_RESERVED(
        "BANNER") ", CONSTRAINT pk_Banner PRIMARY KEY (BANNER_ID, BANNER_SEQ_NO));",
};
// Refused on every run after the first, which ends the run there.
constexpr const char *kSeedBanner =
    "INSERT INTO TABLE_BANNER VALUES(0, 'BETA', 'BETA', '', '', 0, 0, '', '', '', '', '');";
constexpr const char *kTableAfterBanner =
    "CREATE TABLE IF NOT EXISTS TABLE_NOTIFICATIONS(NTFCTN_ID INTEGER PRIMARY KEY, NTFCTN_TYPE INTEGER, "
    "NTFCTN_TYPE_ID INTEGER, NTFCTN_TYPE_STATUS INTEGER, NTFCTN_TITLE TEXT, NTFCTN_MESSAGE TEXT, "
    "NTFCTN_ACTION TEXT, NTFCTN_ACTION_DATA TEXT, NTFCTN_SENT_TIME INTEGER, NTFCTN_EXPIRY_TIME INTEGER, "
    "NTFCTN_READ_STATUS INTEGER, " TAVRO_FOUR_RESERVED("NTFCTN") ");";
#undef TAVRO_FOUR_RESERVED

// So that the history of a user with 100,000 reports opens as quickly as that of one with 100, and unread
// answers are counted without a look at the others.
constexpr const char *kIndexes[] = {
    "CREATE INDEX IF NOT EXISTS VOC_BY_USER_AND_CHANGE ON TABLE_VOC(VOC_USER_NAME, VOC_DATE_OF_UPDATION);",
    "CREATE INDEX IF NOT EXISTS VOC_EXTENDED_BY_VOC ON TABLE_VOC_EXTENDED(VOC_ID);",
    "CREATE INDEX IF NOT EXISTS ATTACHMENT_BY_VOC ON ATTACHMENT(ATTACHMENT_SUGGESTION_ID);",
    "CREATE INDEX IF NOT EXISTS VOC_UNREAD ON TABLE_VOC(VOC_PUSH_READ) WHERE VOC_PUSH_READ = 0;",
};

constexpr int kTableCount = 9;
constexpr int kIndexCount = 4;
constexpr const char *kCountTables =
    "SELECT count(*) FROM sqlite_master WHERE type = 'table' AND name IN ('ATTACHMENT', 'TABLE_VOC', "
    "'TABLE_USER_PROFILE', 'APP_CRASH', 'APP_DATA', 'TABLE_VOC_EXTENDED', 'TABLE_BETA_PROGRAM', "
    "'TABLE_BANNER', 'TABLE_NOTIFICATIONS');";
constexpr const char *kCountAnyTables = "SELECT count(*) FROM sqlite_master WHERE type = 'table';";
// Walks to the last page of every table, which is where rows are added, and of the history's index.
constexpr const char *kReadTheEnds =
    "SELECT (SELECT max(rowid) FROM ATTACHMENT), (SELECT max(rowid) FROM TABLE_VOC), "
    "(SELECT max(rowid) FROM TABLE_USER_PROFILE), (SELECT max(rowid) FROM APP_CRASH), "
    "(SELECT max(rowid) FROM APP_DATA), (SELECT max(rowid) FROM TABLE_VOC_EXTENDED), "
    "(SELECT max(rowid) FROM TABLE_BETA_PROGRAM), (SELECT max(rowid) FROM TABLE_BANNER), "
    "(SELECT max(rowid) FROM TABLE_NOTIFICATIONS), (SELECT max(VOC_USER_NAME) FROM TABLE_VOC);";
// Every column of ours. A file with tables of these names but without one of them is another program's. Who
// adds a column adds it to older files first.
constexpr const char *kNameTheColumns[] = {
    "SELECT ATTACHMENT_ID, ATTACHMENT_FILE_PATH, ATTACHMENT_FILE_SIZE, ATTACHMENT_FILE_TYPE, "
    "ATTACHMENT_SUGGESTION_ID FROM ATTACHMENT;",
    "SELECT VOC_ID, VOC_TYPE, VOC_TEXT, VOC_APP_NAME, VOC_APP_ICON, VOC_SEVERITY, VOC_DUMP_PATH, VOC_STATE, "
    "VOC_PUSH_COMMENTS, VOC_PUSH_READ, VOC_FILE_NAME, VOC_USER_NAME, VOC_DATE_OF_CREATION, "
    "VOC_DATE_OF_UPDATION, VOC_RETRY_COUNT, VOC_ID_SERVER FROM TABLE_VOC;",
    "SELECT ID, VOC_ID, VOC_TITLE_TEXT, REF_2, REF_3 FROM TABLE_VOC_EXTENDED;",
    "SELECT PKG_ID, APP_ID, APP_NAME, APP_ICON, APP_DOWNLOADED FROM APP_DATA;",
    "SELECT APP_ID, APP_CRASH_REPORTED_TIME FROM APP_CRASH;",
    "SELECT BETA_ID, BETA_USER_STATUS FROM TABLE_BETA_PROGRAM;",
    "SELECT BANNER_ID, BANNER_SEQ_NO, BANNER_IMAGE_PATH FROM TABLE_BANNER;",
    "SELECT NTFCTN_ID, NTFCTN_READ_STATUS FROM TABLE_NOTIFICATIONS;",
    "SELECT USER_ID, USER_BETA_TESTER_STATUS FROM TABLE_USER_PROFILE;",
};
constexpr const char *kCountIndexes =
    "SELECT count(*) FROM sqlite_master WHERE type = 'index' AND name IN ('VOC_BY_USER_AND_CHANGE', "
    "'VOC_EXTENDED_BY_VOC', 'ATTACHMENT_BY_VOC', 'VOC_UNREAD');";

constexpr char kSeedBannerRow[] = "BANNER_ID = 0 AND BANNER_SEQ_NO = 0";

std::string _seed_banner_image() {
  const TavroText folder(TAVRO_ADOPT(app_get_resource_path()));
  return std::string(folder ? folder.get() : "") + "/images/kxbanner2.jpg";
}

void _set_seed_banner_image(sqlite3 *db, const char *where) {
  _tavro_dbmgr_update_record(db, "TABLE_BANNER", "BANNER_IMAGE_PATH", _seed_banner_image().c_str(), where);
}

// The picture comes with the client alone. When the upload service made the store, the client puts its own
// path.
bool _owns_seed_banner_image() {
  return access(_seed_banner_image().c_str(), R_OK) == 0;
}

bool _is_seed_banner_image_known(sqlite3 *db) {
  if (!_owns_seed_banner_image()) return true;
  const TavroText stored(_tavro_dbmgr_get_col_data(db, "TABLE_BANNER", "BANNER_IMAGE_PATH", kSeedBannerRow));
  // Without a row the place was taken over by a banner of the server's, which brings its own image.
  return !stored || _seed_banner_image() == stored.get();
}

enum class contents { complete, incomplete, empty, no_store, unreadable };

// Neither ours nor repairable, or just not readable now (locked, no permission)?
contents _after_error(sqlite3 *db) {
  return store_is_damage(db) ? contents::no_store : contents::unreadable;
}

// A table that is missing can be made; one that lacks a column is another program's.
bool _has_our_columns(sqlite3 *db) {
  for (const char *sql : kNameTheColumns)
    if (!store_prepare(db, sql) && sqlite3_errcode(db) == SQLITE_ERROR &&
        !std::strstr(sqlite3_errmsg(db), "no such table"))
      return false;
  return true;
}

bool _can_read_the_ends(sqlite3 *db) {
  const TavroStmt statement = store_prepare(db, kReadTheEnds);
  return (statement && store_next_row(statement.get())) || !store_is_damage(db);
}

contents _inspect() {
  struct stat file = {};
  if (stat(TAVRO_DBMGR_FILE, &file) == 0 && !S_ISREG(file.st_mode)) return contents::no_store;
  const TavroDb db = store_open();
  if (!db) return contents::unreadable;
  const int table_count = store_read_number(db.get(), kCountTables, -1);
  if (table_count < 0) return _after_error(db.get());
  if (table_count == 0) {
    const int others = store_read_number(db.get(), kCountAnyTables, -1);
    return others < 0 ? _after_error(db.get()) : others == 0 ? contents::empty : contents::no_store;
  }
  if (!_has_our_columns(db.get())) return contents::no_store;
  const bool is_suspect = store_is_suspect() || !_can_read_the_ends(db.get());
  if (is_suspect && !store_heal(db.get())) return contents::no_store;
  const bool is_complete = table_count == kTableCount &&
                           store_read_number(db.get(), kCountIndexes, 0) == kIndexCount &&
                           _is_seed_banner_image_known(db.get());
  return is_complete ? contents::complete : contents::incomplete;
}

// A first creation that was interrupted behind the banner's table cannot be continued by tavro_dbmgr_init.
void _add_what_is_missing() {
  const TavroDb db = store_open();
  if (!db) return;
  for (const char *sql : kTablesBeforeBanner) store_execute(db.get(), sql);
  if (store_read_number(db.get(), "SELECT count(*) FROM TABLE_BANNER WHERE BANNER_SEQ_NO = 0;", 1) == 0)
    store_execute(db.get(), kSeedBanner);
  if (_owns_seed_banner_image())
    _set_seed_banner_image(db.get(), kSeedBannerRow);
  else
    _set_seed_banner_image(db.get(), "BANNER_SEQ_NO = 0 AND BANNER_IMAGE_PATH = ''");
  store_execute(db.get(), kTableAfterBanner);
  for (const char *sql : kIndexes) store_execute(db.get(), sql);
}

// Held by the process that makes or replaces the store: the lock of the operations may not be set up yet.
TavroFd _take_creation_guard() {
  TavroFd folder(open(TAVRO_DBMGR_FOLDER, O_RDONLY | O_DIRECTORY | O_CLOEXEC));
  if (folder && flock(folder.get(), LOCK_EX) == -1)
    TAVRO_LOGD("store folder not guarded: %s", std::strerror(errno));
  return folder;
}

// SQLite would make it with the mode that the process's mask leaves.
void _create_private_file() {
  const TavroFd created(open(TAVRO_DBMGR_FILE, O_WRONLY | O_CREAT | O_EXCL | O_CLOEXEC, 0600));
  if (!created && errno != EEXIST) TAVRO_LOGD("store file not created: %s", std::strerror(errno));
}

bool _create_schema(contents found) {
  _create_private_file();
  if (found != contents::incomplete && tavro_dbmgr_init() == -1) return false;
  _add_what_is_missing();
  return _inspect() == contents::complete;
}

tavro_dbmgr_store_state _mend(contents found) {
  if (found == contents::complete) return TAVRO_STORE_READY;
  if (found == contents::unreadable) return TAVRO_STORE_UNUSABLE;
  const bool is_replaced = found == contents::no_store;
  if (is_replaced && !store_set_aside()) return TAVRO_STORE_UNUSABLE;
  if (!_create_schema(found)) return TAVRO_STORE_UNUSABLE;
  return is_replaced ? TAVRO_STORE_REPLACED : TAVRO_STORE_READY;
}

}  // namespace

tavro_dbmgr_store_state tavro_dbmgr_ensure_schema() {
  if (g_mkdir_with_parents(TAVRO_DBMGR_FOLDER, 0700) == -1) {
    TAVRO_LOGE("store folder not created: %s", std::strerror(errno));
    return TAVRO_STORE_UNUSABLE;
  }
  const TavroFd guard = _take_creation_guard();
  const store_lock lock;
  if (access(TAVRO_DBMGR_FILE, F_OK) == -1) return _mend(contents::empty);
  return _mend(_inspect());
}

int tavro_dbmgr_init() {
  char path[500] = TAVRO_DBMGR_FILE;
  TAVRO_LOGD("db_file_path %s", path);
  const TavroDb db = store_open();
  if (!db) {
    TAVRO_LOGD("DB open fail");
    return -1;
  }
  TAVRO_LOGD("DB open success");
  for (const char *sql : kTablesBeforeBanner)
    if (!store_execute(db.get(), sql)) return 0;
  if (!store_execute(db.get(), kSeedBanner) || !store_execute(db.get(), kTableAfterBanner)) return 0;
  _set_seed_banner_image(db.get(), "BANNER_SEQ_NO = 0");
  return 0;
}
