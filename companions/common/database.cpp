#include "database.h"

#include <fcntl.h>

namespace {

constexpr int kBusyTimeoutMs = 5000;

// The file is made here, with its mode, because SQLite would take the mode from the umask; its journal files
// inherit the mode of the database.
bool _make_private(const std::string &path) {
  UniqueFd file(open(path.c_str(), O_RDWR | O_CREAT | O_CLOEXEC, 0600));
  if (!file) g_warning("%s cannot be opened: %s", path.c_str(), g_strerror(errno));
  return static_cast<bool>(file);
}

}  // namespace

Statement::Statement(sqlite3 *connection, const char *sql) {
  sqlite3_stmt *statement = nullptr;
  if (sqlite3_prepare_v2(connection, sql, -1, &statement, nullptr) != SQLITE_OK)
    g_warning("statement refused: %s: %s", sqlite3_errmsg(connection), sql);
  statement_.reset(statement);
}

void Statement::bind_one(int index, int64_t value) {
  if (statement_) sqlite3_bind_int64(statement_.get(), index, value);
}

void Statement::bind_one(int index, const std::string &value) {
  if (statement_)
    sqlite3_bind_text(statement_.get(), index, value.data(), static_cast<int>(value.size()),
                      SQLITE_TRANSIENT);
}

bool Statement::next_row() {
  if (!statement_) return false;
  int result = sqlite3_step(statement_.get());
  if (result != SQLITE_ROW && result != SQLITE_DONE)
    g_warning("statement failed: %s", sqlite3_errmsg(sqlite3_db_handle(statement_.get())));
  return result == SQLITE_ROW;
}

bool Statement::run() {
  if (!statement_) return false;
  int result = sqlite3_step(statement_.get());
  while (result == SQLITE_ROW) result = sqlite3_step(statement_.get());
  if (result != SQLITE_DONE)
    g_warning("statement failed: %s", sqlite3_errmsg(sqlite3_db_handle(statement_.get())));
  return result == SQLITE_DONE;
}

int64_t Statement::integer(int column) const {
  return sqlite3_column_int64(statement_.get(), column);
}

std::string Statement::text(int column) const {
  const unsigned char *text = sqlite3_column_text(statement_.get(), column);
  if (!text) return {};
  return {reinterpret_cast<const char *>(text),
          static_cast<size_t>(sqlite3_column_bytes(statement_.get(), column))};
}

bool Database::open(const std::string &path, const char *schema) {
  if (!_make_private(path)) return false;
  sqlite3 *connection = nullptr;
  int opened = sqlite3_open_v2(path.c_str(), &connection, SQLITE_OPEN_READWRITE, nullptr);
  connection_.reset(connection);
  if (opened == SQLITE_OK) {
    sqlite3_busy_timeout(connection, kBusyTimeoutMs);
    const std::string script =
        std::string("PRAGMA journal_mode=WAL; PRAGMA synchronous=FULL; PRAGMA foreign_keys=ON;") + schema;
    opened = sqlite3_exec(connection, script.c_str(), nullptr, nullptr, nullptr);
  }
  if (opened != SQLITE_OK) g_warning("%s cannot be used: %s", path.c_str(), sqlite3_errmsg(connection));
  return opened == SQLITE_OK;
}
