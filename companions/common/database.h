// A companion's own SQLite file, readable by its owner alone.
//
// Write-ahead log with synchronous=FULL: what a call has written survives kill -9 and a power cut once it
// returned. All values are bound, never embedded. One thread. Failures are logged once, here.
#pragma once

#include <cstdint>
#include <optional>
#include <string>

#include "handles.h"

// One prepared statement. A statement that SQLite refused is inert: every step of it fails.
class Statement {
 public:
  Statement(sqlite3 *connection, const char *sql);

  template <class... Values>
  Statement &bind(const Values &...values) {
    int index = 0;
    (bind_one(++index, values), ...);
    return *this;
  }

  bool next_row();  // true while there is a row
  bool run();       // true when it ran to its end
  int64_t integer(int column) const;
  std::string text(int column) const;

 private:
  void bind_one(int index, int64_t value);
  void bind_one(int index, int value) { bind_one(index, static_cast<int64_t>(value)); }
  void bind_one(int index, const std::string &value);
  void bind_one(int index, const char *value) { bind_one(index, std::string(value)); }

  SqliteStatementPtr statement_;
};

class Database {
 public:
  // Opens or creates the file and runs `schema` (statements that may run again). False with a message when it
  // is no database or cannot be written.
  bool open(const std::string &path, const char *schema);

  template <class... Values>
  Statement prepare(const char *sql, const Values &...values) {
    Statement statement(connection_.get(), sql);
    statement.bind(values...);
    return statement;
  }
  template <class... Values>
  bool run(const char *sql, const Values &...values) {
    return prepare(sql, values...).run();
  }
  // First column of the first row.
  template <class... Values>
  std::optional<int64_t> number(const char *sql, const Values &...values) {
    Statement statement = prepare(sql, values...);
    if (!statement.next_row()) return std::nullopt;
    return statement.integer(0);
  }
  int64_t last_row_id() const { return sqlite3_last_insert_rowid(connection_.get()); }

 private:
  SqlitePtr connection_;
};

// Groups writes: all of them happen at commit, or none.
class Transaction {
 public:
  explicit Transaction(Database &database) : database_(database), open_(database.run("BEGIN IMMEDIATE")) {}
  Transaction(const Transaction &) = delete;
  Transaction &operator=(const Transaction &) = delete;
  ~Transaction() {
    if (open_) database_.run("ROLLBACK");
  }
  bool commit() {
    if (!open_ || !database_.run("COMMIT")) return false;
    open_ = false;
    return true;
  }

 private:
  Database &database_;
  bool open_;
};
