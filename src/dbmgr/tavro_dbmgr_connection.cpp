#include <sys/stat.h>
#include <time.h>

#include <cerrno>
#include <climits>
#include <cstdlib>
#include <cstring>

#include "tavro_dbmgr_internal.h"
#include "tavro_log.h"

namespace {

constexpr std::size_t kPathBytes = 500;
// An operation that walks a large table keeps its pages until it closes, up to 2 MB of them by SQLite's own
// measure. Once the process's SQLite memory is above this, a new page takes the place of an old one instead.
// A save, or a report that is read, needs a quarter of it.
constexpr sqlite3_int64 kPageMemoryBytes = 512 * 1024;

int _open_connection(const char *path, TavroDb &db) {
  sqlite3_soft_heap_limit64(kPageMemoryBytes);
  const int ret = sqlite3_open(path, tavro_out(db));
  if (ret == SQLITE_OK) sqlite3_busy_timeout(db.get(), kStoreBusyTimeoutMilliseconds);
  return ret;
}

void _log_sql_error(const char *message) {
  TAVRO_LOGD("SQL ERROR: %s  : %s", message, std::strerror(errno));
}

// What tavro_dbmgr_db_open took and tavro_dbmgr_db_close gives back. One is enough: nobody takes the lock
// twice.
bool is_lock_taken_by_open = false;

void _give_back() {
  if (std::exchange(is_lock_taken_by_open, false)) tavro_dbmgr_sem_signal();
}

// The lock is held when it returns a connection, if it can be taken, and free otherwise.
sqlite3 *_open_under_lock(const char *db_path) {
  char path[kPathBytes] = {};
  g_strlcpy(path, db_path, sizeof path);
  is_lock_taken_by_open = tavro_dbmgr_sem_wait() == 0;
  TavroDb opened;
  if (_open_connection(path, opened) == SQLITE_OK) return opened.release();
  _log_sql_error(sqlite3_errmsg(opened.get()));
  _give_back();
  return nullptr;
}

}  // namespace

TavroDb store_open(open_failure log) {
  char path[kPathBytes] = TAVRO_DBMGR_FILE;
  TavroDb db;
  if (_open_connection(path, db) == SQLITE_OK) return db;
  if (log == open_failure::log_plainly)
    TAVRO_LOGD("SQL ERROR: %s", sqlite3_errmsg(db.get()));
  else
    _log_sql_error(sqlite3_errmsg(db.get()));
  return nullptr;
}

int tavro_dbmgr_db_open(sqlite3 **db, const char *db_path) {
  TAVRO_LOGD("entry");
  *db = nullptr;
  if (!db_path) {
    TAVRO_LOGD("db path is NULL");
  } else if (std::strlen(db_path) >= kPathBytes) {
    TAVRO_LOGD("db path is too long");
  } else if ((*db = _open_under_lock(db_path))) {
    TAVRO_LOGD("db handle is: %x", static_cast<unsigned>(reinterpret_cast<guintptr>(*db)));
  }
  TAVRO_LOGD("exit");
  return *db ? 0 : -1;
}

int tavro_dbmgr_db_close(sqlite3 *db) {
  TAVRO_LOGD("entry");
  if (db) {
    sqlite3_close(db);
    _give_back();
  } else {
    TAVRO_LOGD("db handle is NULL");
  }
  TAVRO_LOGD("exit");
  return db ? 0 : -1;
}

bool store_execute(sqlite3 *db, const char *sql) {
  TavroSqlText message;
  if (sqlite3_exec(db, sql, nullptr, nullptr, tavro_out(message)) == SQLITE_OK) return true;
  _log_sql_error(message ? message.get() : sqlite3_errmsg(db));
  store_note_error(db);
  return false;
}

bool store_execute_logged(sqlite3 *db, const statement_text &sql) {
  TAVRO_LOGD("sql: %s", sql.c_str());
  return store_execute(db, sql.c_str());
}

TavroStmt store_prepare(sqlite3 *db, const char *sql) {
  TavroStmt statement;
  if (sqlite3_prepare_v2(db, sql, -1, tavro_out(statement), nullptr) != SQLITE_OK) {
    TAVRO_LOGD("prepare %s Fail %s", sql, sqlite3_errmsg(db));
    store_note_error(db);
  }
  return statement;
}

bool store_next_row(sqlite3_stmt *statement) {
  const int ret = sqlite3_step(statement);
  if (ret != SQLITE_ROW && ret != SQLITE_DONE) {
    _log_sql_error(sqlite3_errmsg(sqlite3_db_handle(statement)));
    store_note_error(sqlite3_db_handle(statement));
  }
  return ret == SQLITE_ROW;
}

int store_run(const statement_text &sql) {
  const store_session store;
  if (!store) return -1;
  store_execute_logged(store.db(), sql);
  return 0;
}

int store_read_number(sqlite3 *db, const char *sql, int otherwise) {
  const TavroStmt statement = store_prepare(db, sql);
  if (!statement || !store_next_row(statement.get())) return otherwise;
  return store_column_number(statement.get(), 0);
}

char *store_column_text(sqlite3_stmt *statement, int column) {
  return TAVRO_STRDUP(reinterpret_cast<const char *>(sqlite3_column_text(statement, column)));
}

int store_column_number(sqlite3_stmt *statement, int column) {
  // Spares the number the way through a text.
  if (sqlite3_column_type(statement, column) == SQLITE_INTEGER)
    return static_cast<int>(sqlite3_column_int64(statement, column));
  const auto *text = reinterpret_cast<const char *>(sqlite3_column_text(statement, column));
  return text ? std::atoi(text) : 0;
}

std::string store_now() {
  return std::to_string(static_cast<unsigned long long>(time(nullptr)) * 1000ULL);
}

int _tavro_dbmgr_update_record(sqlite3 *db, const char *table, const char *column, const char *value,
                               const char *where) {
  if (!db || !table || !column) return -1;
  statement_text sql;
  sa_strcat(sql, "UPDATE ", table, " SET ", column, "=", quoted(value), " WHERE ", where, ";");
  store_execute(db, sql.c_str());
  return 0;
}

char *_tavro_dbmgr_get_col_data(sqlite3 *db, const char *table, const char *column, const char *where) {
  if (!db || !table || !column) return nullptr;
  statement_text sql;
  sa_strcat(sql, "SELECT ", column, " FROM ", table, " WHERE ", where, ";");
  const TavroStmt statement = store_prepare(db, sql.c_str());
  if (!statement || !store_next_row(statement.get())) return nullptr;
  return store_column_text(statement.get(), 0);
}

int _tavro_dbmgr_clear_db(const char *table) {
  const store_lock lock;
  statement_text sql;
  sa_strcat(sql, "DELETE FROM ", table, ";");
  TAVRO_LOGD("sql: %s", sql.c_str());
  const TavroDb db = store_open();
  if (!db) return -1;
  const TavroStmt statement = store_prepare(db.get(), sql.c_str());
  if (statement && !store_next_row(statement.get()) && sqlite3_errcode(db.get()) == SQLITE_DONE)
    TAVRO_LOGD("Deleted all the elements from the table %s", table);
  return 0;
}
