// The statements that every SQLite connection of this process runs, by SQLite's own trace.
#pragma once

#include <sqlite3.h>

#include <cstring>
#include <map>
#include <string>

// Counts from its construction on, in connections that are opened after it. One at a time.
class StatementWatch {
 public:
  StatementWatch() {
    counts().clear();
    sqlite3_auto_extension(reinterpret_cast<void (*)()>(watch));
  }
  StatementWatch(const StatementWatch &) = delete;
  StatementWatch &operator=(const StatementWatch &) = delete;
  ~StatementWatch() { sqlite3_cancel_auto_extension(reinterpret_cast<void (*)()>(watch)); }

  // How many statements with this first word ran since it was asked last.
  int take(const char *verb) {
    const int count = counts()[verb];
    counts().clear();
    return count;
  }

 private:
  static std::map<std::string, int> &counts() {
    static std::map<std::string, int> counts;
    return counts;
  }
  static int count(unsigned, void *, void *, void *text) {
    const char *sql = static_cast<const char *>(text);
    counts()[std::string(sql, std::strcspn(sql, " "))]++;
    return 0;
  }
  static int watch(sqlite3 *db, const char **, const struct sqlite3_api_routines *) {
    return sqlite3_trace_v2(db, SQLITE_TRACE_STMT, count, nullptr);
  }
};
