// A damaged store: how an operation's suspicion is kept until the next start, what is healed then, and how a
// file that cannot be healed, or is not ours, is set aside.
#include <fcntl.h>
#include <sys/stat.h>
#include <time.h>

#include <cerrno>

#include "tavro_dbmgr_internal.h"
#include "tavro_log.h"

namespace {

// Made by an operation that met a damaged page. Only then is the whole file read at the next start.
constexpr char kSuspectMark[] = TAVRO_DBMGR_FOLDER "/.tavro.db.suspect";
// Stays until the person was told, whichever program found the damage.
constexpr char kReplacedMark[] = TAVRO_DBMGR_FOLDER "/.tavro.db.replaced";

using backup_owner = TavroHandle<sqlite3_backup, sqlite3_backup_finish>;

// By its inode: SQLite tells the path with its links resolved.
bool _is_our_file(sqlite3 *db) {
  const char *path = sqlite3_db_filename(db, "main");
  struct stat ours = {}, its = {};
  return path && stat(path, &its) == 0 && stat(TAVRO_DBMGR_FILE, &ours) == 0 && its.st_dev == ours.st_dev &&
         its.st_ino == ours.st_ino;
}

// ---- Healing ----

#define TAVRO_THEIR_TABLES \
  "FROM damaged.sqlite_master WHERE type = 'table' AND substr(name, 1, 7) <> 'sqlite_'"
// Each yields the statements of one step. Rows are read in the order of the table itself: in any other they
// might come from an index, and lack what it lacks.
constexpr const char *kCopySteps[] = {
    "SELECT sql " TAVRO_THEIR_TABLES ";",
    ("SELECT printf('INSERT INTO main.\"%w\" SELECT * FROM damaged.\"%w\" NOT INDEXED ORDER BY rowid;', "
     "name, name) " TAVRO_THEIR_TABLES ";"),
    ("SELECT 'DELETE FROM main.sqlite_sequence; "
     "INSERT INTO main.sqlite_sequence SELECT * FROM damaged.sqlite_sequence;';"),
    "SELECT sql FROM damaged.sqlite_master WHERE type <> 'table' AND sql IS NOT NULL;",
};
#undef TAVRO_THEIR_TABLES

bool _collect(sqlite3 *copy, const char *step, std::vector<std::string> &statements) {
  const TavroStmt statement = store_prepare(copy, step);
  while (statement && store_next_row(statement.get()))
    statements.emplace_back(reinterpret_cast<const char *>(sqlite3_column_text(statement.get(), 0)));
  return statement && sqlite3_errcode(copy) == SQLITE_DONE;
}

// Collected first: the end of a statement would take the place of a later one's error.
bool _run_step(sqlite3 *copy, const char *step) {
  std::vector<std::string> statements;
  if (!_collect(copy, step, statements)) return false;
  for (const std::string &sql : statements)
    if (!store_execute(copy, sql.c_str())) return false;
  return true;
}

// Tables, their rows, then new indexes.
bool _copy_store(sqlite3 *copy) {
  if (!store_execute(copy, "ATTACH '" TAVRO_DBMGR_FILE "' AS damaged; BEGIN;")) return false;
  for (const char *step : kCopySteps)
    if (!_run_step(copy, step)) return false;
  return store_execute(copy, "COMMIT; DETACH damaged;");
}

// In one commit, which an end of the process leaves whole or undone.
bool _write_back(sqlite3 *copy, sqlite3 *db) {
  backup_owner backup(sqlite3_backup_init(db, "main", copy, "main"));
  if (!backup || sqlite3_backup_step(backup.get(), -1) != SQLITE_DONE) return false;
  return sqlite3_backup_finish(backup.release()) == SQLITE_OK;
}

// REINDEX would not do: it stumbles over the pages of the index that it is to replace. So everything is
// copied into a temporary file, and from there over the store.
bool _rebuild(sqlite3 *db) {
  TavroDb copy;
  sqlite3_open("", tavro_out(copy));
  sqlite3_busy_timeout(copy.get(), kStoreBusyTimeoutMilliseconds);
  if (!_copy_store(copy.get())) return !store_is_damage(copy.get());
  if (_write_back(copy.get(), db)) {
    TAVRO_LOGE("store was damaged outside its tables, all of it is healed");
    unlink(kSuspectMark);
  } else {
    TAVRO_LOGE("store is damaged outside its tables, healed at a later start: %s", sqlite3_errmsg(db));
  }
  return true;
}

// ---- Setting aside ----

std::string _dated_name() {
  const time_t now = time(nullptr);
  tm local = {};
  localtime_r(&now, &local);
  char date[sizeof "YYYYMMDDhhmmss"] = {};
  strftime(date, sizeof date, "%Y%m%d%H%M%S", &local);
  const std::string name = std::string(TAVRO_DBMGR_FILE) + ".damaged-" + date;
  std::string free_name = name;
  for (int i = 2; access(free_name.c_str(), F_OK) == 0; i++) free_name = name + "." + std::to_string(i);
  return free_name;
}

}  // namespace

bool store_is_damage(sqlite3 *db) {
  const int error = sqlite3_errcode(db);
  return error == SQLITE_NOTADB || error == SQLITE_CORRUPT;
}

void store_note_error(sqlite3 *db) {
  if (!store_is_damage(db) || !_is_our_file(db)) return;
  const TavroFd mark(open(kSuspectMark, O_WRONLY | O_CREAT | O_CLOEXEC, 0600));
}

bool store_is_suspect() {
  return access(kSuspectMark, F_OK) == 0;
}

bool store_heal(sqlite3 *db) {
  const TavroText finding = [db] {
    const TavroStmt check = store_prepare(db, "PRAGMA integrity_check(1);");
    return TavroText(check && store_next_row(check.get()) ? store_column_text(check.get(), 0) : nullptr);
  }();
  if (!finding) return !store_is_damage(db);
  if (std::strcmp(finding.get(), "ok") != 0) return _rebuild(db);
  unlink(kSuspectMark);
  return true;
}

// SQLite's own files go first: left behind, they would be applied to the new store.
bool store_set_aside() {
  const std::string name = _dated_name();
  for (const char *ending : {"-journal", "-wal", "-shm"})
    rename((std::string(TAVRO_DBMGR_FILE) + ending).c_str(), (name + ending).c_str());
  if (rename(TAVRO_DBMGR_FILE, name.c_str()) == -1) {
    TAVRO_LOGE("damaged store could not be set aside: %s", std::strerror(errno));
    return false;
  }
  TAVRO_LOGE("store is damaged or not ours, kept as %s", name.c_str());
  unlink(kSuspectMark);
  const TavroFd mark(open(kReplacedMark, O_WRONLY | O_CREAT | O_CLOEXEC, 0600));
  return true;
}

bool tavro_dbmgr_is_replacement_untold() {
  return access(kReplacedMark, F_OK) == 0;
}

void tavro_dbmgr_set_replacement_told() {
  unlink(kReplacedMark);
}
