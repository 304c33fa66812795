// One of the phone's small SQLite files under /opt/usr/dbspace: opened at first use, durable (WAL with
// synchronous=FULL), the user's alone. A file that is no database is set aside under a dated name and a new
// one begun; a file that was replaced or removed is opened anew. Any thread; a lock is held while a statement
// runs.
#pragma once

#include <sys/types.h>

#include <functional>
#include <map>
#include <mutex>
#include <string>

#include "scoped.h"

namespace platform {

class Database {
 public:
  // `schema`: statements that make the tables, harmless when they exist. `file_name` lies in the database
  // folder.
  Database(const char *file_name, const char *schema) : file_name_(file_name), schema_(schema) {}

  // Binds the values of a statement; statement parameters count from 1.
  using Bind = std::function<void(sqlite3_stmt *)>;
  // Reads one row; false ends the walk.
  using Row = std::function<bool(sqlite3_stmt *)>;

  // SQLITE_DONE when all rows were read, SQLITE_ROW when `row` ended the walk, otherwise SQLite's error code,
  // which has been logged (SQLITE_CONSTRAINT is left to the caller to judge). `sql` must be a literal: it is
  // the key of the prepared statement. `row` must not use this database.
  int run(const char *sql, const Bind &bind, const Row &row = nullptr);

 private:
  int run_once(const char *sql, const Bind &bind, const Row &row);
  sqlite3_stmt *statement(const char *sql, int *code);
  bool is_current() const;
  int open();
  int open_file(const std::string &path);
  void close();
  int report(int code, const char *what) const;

  const char *file_name_;
  const char *schema_;
  std::mutex mutex_;  // guards everything below
  ScopedDatabase connection_;
  std::map<const char *, ScopedStatement> statements_;
  dev_t device_ = 0;
  ino_t inode_ = 0;
};

// The file that preferences, badges and posted notifications share.
Database &preference_database();

inline void bind_text(sqlite3_stmt *statement, int index, const char *text) {
  sqlite3_bind_text(statement, index, text, -1, SQLITE_TRANSIENT);
}

// The text of a column; null for SQL's null.
inline const char *column_text(sqlite3_stmt *statement, int column) {
  return reinterpret_cast<const char *>(sqlite3_column_text(statement, column));
}

}  // namespace platform
