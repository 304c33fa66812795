#include "database.h"

#include <dlog.h>
#include <fcntl.h>
#include <sys/file.h>
#include <sys/stat.h>
#include <time.h>

#include <cerrno>
#include <cstring>

#include "places.h"

namespace platform {
namespace {

constexpr int kBusyTimeoutMs = 5000;

bool is_damage(int code) {
  return code == SQLITE_NOTADB || code == SQLITE_CORRUPT;
}

// Only the process that holds the lock moves the file; one that comes later finds a sound file and leaves it.
bool is_still_damaged(const std::string &path) {
  sqlite3 *opened = nullptr;
  int code = sqlite3_open_v2(path.c_str(), &opened, SQLITE_OPEN_READWRITE, nullptr);
  const ScopedDatabase database(opened);
  if (code == SQLITE_OK) code = sqlite3_exec(opened, "PRAGMA schema_version", nullptr, nullptr, nullptr);
  if (code == SQLITE_OK) code = sqlite3_exec(opened, "PRAGMA quick_check(1)", nullptr, nullptr, nullptr);
  return is_damage(code);
}

void move_aside(const std::string &path) {
  char stamp[32];
  const time_t now = time(nullptr);
  tm local;
  localtime_r(&now, &local);
  strftime(stamp, sizeof(stamp), ".damaged-%Y%m%d%H%M%S", &local);
  for (const char *part : {"", "-wal", "-shm"}) {
    const std::string from = path + part;
    if (rename(from.c_str(), (path + stamp + part).c_str()) != 0 && errno != ENOENT) {
      dlog_print(DLOG_ERROR, "PLATFORM", "cannot set %s aside: %s", from.c_str(), strerror(errno));
    }
  }
  dlog_print(DLOG_ERROR, "PLATFORM", "%s is damaged; kept as %s%s, a new one is begun", path.c_str(),
             path.c_str(), stamp);
}

void set_aside_if_damaged(const std::string &path) {
  const ScopedFd lock(open((path + ".lock").c_str(), O_RDWR | O_CREAT | O_CLOEXEC, kPrivateFileMode));
  if (!lock || flock(lock.get(), LOCK_EX) != 0) return;
  if (is_still_damaged(path)) move_aside(path);
}

}  // namespace

int Database::report(int code, const char *what) const {
  if (code != SQLITE_CONSTRAINT) {
    dlog_print(DLOG_ERROR, "PLATFORM", "%s: %s: %s", file_name_, what,
               connection_ ? sqlite3_errmsg(connection_.get()) : sqlite3_errstr(code));
  }
  return code;
}

void Database::close() {
  statements_.clear();
  connection_.reset();
}

bool Database::is_current() const {
  struct stat named;
  const std::string path = std::string(kDatabaseFolder) + "/" + file_name_;
  return connection_ && stat(path.c_str(), &named) == 0 && named.st_ino == inode_ && named.st_dev == device_;
}

int Database::open_file(const std::string &path) {
  // SQLite takes over the mode of an existing file for the files beside it.
  ScopedFd file(::open(path.c_str(), O_RDWR | O_CREAT | O_CLOEXEC, kPrivateFileMode));
  struct stat own;
  if (!file || fstat(file.get(), &own) != 0) {
    dlog_print(DLOG_ERROR, "PLATFORM", "cannot open %s: %s", path.c_str(), strerror(errno));
    return SQLITE_CANTOPEN;
  }
  device_ = own.st_dev;
  inode_ = own.st_ino;
  // Closed before SQLite locks the file: closing it later would drop those locks, and another process that
  // closes the file would then remove the write-ahead log under our hands.
  file.reset();
  sqlite3 *opened = nullptr;
  int code = sqlite3_open_v2(path.c_str(), &opened, SQLITE_OPEN_READWRITE | SQLITE_OPEN_FULLMUTEX, nullptr);
  connection_.reset(opened);
  if (code != SQLITE_OK) return report(code, "open");
  sqlite3_busy_timeout(opened, kBusyTimeoutMs);
  sqlite3_extended_result_codes(opened, 0);
  code = sqlite3_exec(opened, "PRAGMA journal_mode=WAL; PRAGMA synchronous=FULL", nullptr, nullptr, nullptr);
  if (code == SQLITE_OK) code = sqlite3_exec(opened, schema_, nullptr, nullptr, nullptr);
  return code == SQLITE_OK ? SQLITE_OK : report(code, "prepare the file");
}

int Database::open() {
  close();
  if (!make_folder(kDatabaseFolder)) {
    dlog_print(DLOG_ERROR, "PLATFORM", "cannot make %s: %s", kDatabaseFolder, strerror(errno));
    return SQLITE_CANTOPEN;
  }
  const std::string path = std::string(kDatabaseFolder) + "/" + file_name_;
  int code = open_file(path);
  if (is_damage(code)) {
    close();
    set_aside_if_damaged(path);
    code = open_file(path);
  }
  if (code != SQLITE_OK) close();
  return code;
}

sqlite3_stmt *Database::statement(const char *sql, int *code) {
  ScopedStatement &known = statements_[sql];
  if (!known) {
    sqlite3_stmt *prepared = nullptr;
    *code = sqlite3_prepare_v3(connection_.get(), sql, -1, SQLITE_PREPARE_PERSISTENT, &prepared, nullptr);
    known.reset(prepared);
  }
  return known.get();
}

int Database::run_once(const char *sql, const Bind &bind, const Row &row) {
  int code = is_current() ? SQLITE_OK : open();
  if (code != SQLITE_OK) return code;
  sqlite3_stmt *prepared = statement(sql, &code);
  if (!prepared) return report(code, sql);
  if (bind) bind(prepared);
  while ((code = sqlite3_step(prepared)) == SQLITE_ROW && (!row || row(prepared))) {
  }
  if (code != SQLITE_DONE && code != SQLITE_ROW) report(code, sql);
  sqlite3_reset(prepared);
  sqlite3_clear_bindings(prepared);
  return code;
}

int Database::run(const char *sql, const Bind &bind, const Row &row) {
  const std::lock_guard<std::mutex> lock(mutex_);
  const int code = run_once(sql, bind, row);
  if (!is_damage(code)) return code;
  close();
  set_aside_if_damaged(std::string(kDatabaseFolder) + "/" + file_name_);
  return run_once(sql, bind, row);
}

Database &preference_database() {
  static Database &database = *new Database(
      "preference.db",
      "CREATE TABLE IF NOT EXISTS preference(key TEXT PRIMARY KEY, type INTEGER NOT NULL, value) WITHOUT "
      "ROWID;"
      "CREATE TABLE IF NOT EXISTS badge(app_id TEXT PRIMARY KEY, count INTEGER NOT NULL) WITHOUT ROWID;"
      "DROP TABLE IF EXISTS notification;"  // of an earlier version, without tags and launch requests
      "CREATE TABLE IF NOT EXISTS posted_notification(app_id TEXT NOT NULL, tag TEXT NOT NULL,"
      " server TEXT NOT NULL, id INTEGER NOT NULL, type INTEGER NOT NULL, receiver TEXT, request TEXT,"
      " PRIMARY KEY(app_id, tag), UNIQUE(server, id)) WITHOUT ROWID");
  return database;
}

}  // namespace platform
