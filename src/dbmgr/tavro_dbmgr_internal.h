// What the store's own sources share: statement texts, the critical section, and rows. Not for callers of the
// store. Main loop only.
#pragma once

#include <sqlite3.h>

#include <cstddef>
#include <cstring>
#include <initializer_list>
#include <string>
#include <utility>
#include <vector>

#include "tavro_dbmgr.h"
#include "tavro_handles.h"
#include "tavro_memory.h"

// ---- Statement texts ----

// A statement under construction: a zeroed buffer of 4000 bytes that grows with the text.
//
// Statements are assembled as text. Whatever is not one of our own constants or a number goes in as
// quoted(text) or through sa_strcat_values, which double the quotes inside it, so no text can become SQL.
class statement_text {
 public:
  statement_text();
  statement_text(const statement_text &) = delete;
  statement_text &operator=(const statement_text &) = delete;
  ~statement_text();
  const char *c_str() const { return text_; }
  void append(const char *text);

 private:
  char *text_;
  std::size_t length_ = 0;
  std::size_t capacity_;
};

// A text that goes between single quotes, its own quotes doubled; '' for null.
struct quoted_text {
  const char *text;
};
inline quoted_text quoted(const char *text) {
  return {text};
}

// Each returns the destination, so that calls chain. A null source adds nothing.
statement_text &sa_strcat(statement_text &destination, const char *source);
statement_text &sa_strcat(statement_text &destination, int source);
statement_text &sa_strcat(statement_text &destination, quoted_text source);

template <typename First, typename Second, typename... Rest>
statement_text &sa_strcat(statement_text &destination, First first, Second second, Rest... rest) {
  return sa_strcat(sa_strcat(destination, first), second, rest...);
}

// Quoted values separated by "', '".
statement_text &sa_strcat_values(statement_text &destination, std::initializer_list<const char *> values);

// ---- The critical section ----

// Holds the store's lock. A wait that fails is logged and the operation proceeds unlocked.
class store_lock {
 public:
  store_lock() : is_held_(tavro_dbmgr_sem_wait() == 0) {}
  store_lock(const store_lock &) = delete;
  store_lock &operator=(const store_lock &) = delete;
  ~store_lock() {
    if (is_held_) tavro_dbmgr_sem_signal();
  }

 private:
  bool is_held_;
};

// Should two processes ever get past the lock at once, SQLite's own locks make the second wait.
constexpr int kStoreBusyTimeoutMilliseconds = 5000;

enum class open_failure { log_with_system_error, log_plainly };

// A connection to the store's file; null, and a log line, when it cannot be opened.
TavroDb store_open(open_failure log = open_failure::log_with_system_error);

// The usual operation: lock, open; at the end of its scope close, then unlock.
class store_session {
 public:
  store_session() : db_(store_open()) {}
  sqlite3 *db() const { return db_.get(); }
  explicit operator bool() const { return db_ != nullptr; }

 private:
  store_lock lock_;  // first member: taken before the file is opened, given back after it is closed
  TavroDb db_;
};

// ---- Running statements (failures are logged) ----

bool store_execute(sqlite3 *db, const char *sql);
// Log the text, then run it.
bool store_execute_logged(sqlite3 *db, const statement_text &sql);
TavroStmt store_prepare(sqlite3 *db, const char *sql);
// Step to the next row. False at the end and, with a log line, on failure.
bool store_next_row(sqlite3_stmt *statement);

// One critical section that runs one statement. 0, or -1 when the file cannot be opened.
int store_run(const statement_text &sql);
// First number of the first row; `otherwise` when there is no row or the statement fails.
int store_read_number(sqlite3 *db, const char *sql, int otherwise);

// ---- Damage ----

// Whether the connection's last failure was for a damaged page, or no database at all.
bool store_is_damage(sqlite3 *db);
// After a statement failed: has the whole file checked at the next tavro_dbmgr_ensure_schema when the reason
// was a damaged page of our own file.
void store_note_error(sqlite3 *db);
bool store_is_suspect();
// Read the whole file. Damage that is not in a table is healed and nothing is lost; no suspicion is left
// then. False when a table is damaged. True also when it cannot be told or healed now (locked, full disk):
// the suspicion stays.
bool store_heal(sqlite3 *db);
// Give the file, with SQLite's beside it, a dated name and mark that the person is to be told. False, with a
// log line, when it stays.
bool store_set_aside();

// ---- Rows ----

// New tracked copy of a column; null for NULL.
char *store_column_text(sqlite3_stmt *statement, int column);
int store_column_number(sqlite3_stmt *statement, int column);

// Where the value of a column goes in a record of type Record: the one member that is not null.
template <typename Record>
struct store_column {
  const char *name;
  char *Record::*text;
  int Record::*number;
  double Record::*whole_number = nullptr;  // a size: its fraction is dropped
};

// Reads the rows of one statement. Columns are matched by name, whatever their order in the table; those that
// are not asked for are left alone.
template <typename Record>
class store_row_reader {
 public:
  template <std::size_t Count>
  store_row_reader(sqlite3_stmt *statement, const store_column<Record> (&columns)[Count])
      : statement_(statement) {
    const int column_count = sqlite3_column_count(statement);
    for (int i = 0; i < column_count; i++) {
      const char *name = sqlite3_column_name(statement, i);
      for (const store_column<Record> &column : columns)
        if (std::strcmp(name, column.name) == 0) targets_.push_back({i, &column});
    }
  }

  void read(Record *record) const {
    for (const auto &[index, column] : targets_) {
      if (column->text)
        record->*column->text = store_column_text(statement_, index);
      else if (column->whole_number)
        record->*column->whole_number = store_column_number(statement_, index);
      else
        record->*column->number = store_column_number(statement_, index);
    }
  }

 private:
  sqlite3_stmt *statement_;
  std::vector<std::pair<int, const store_column<Record> *>> targets_;
};

// ---- Shared steps ----

// The wall clock in milliseconds since the epoch (whole seconds) as decimal text.
std::string store_now();
void store_add_attachments(const GSList *attachments, int voc_id);
// The extension row of a report that is a follow-up.
void store_add_follow_up_extension(const tavro_dbmgr_bug_report_info *report, int voc_id);

// The reports that `selection`, from FROM on, picks from TABLE_VOC, in its order, with their extension rows
// and attachments.
GSList *store_read_reports(sqlite3 *db, const statement_text &selection);

// ---- What the save journal asks ----

// The highest VOC_ID ever given in this store; -1 on failure.
int store_last_voc_id();
// The first report above `voc_id` with this kind, user and description; 0 for none, -1 on failure.
int store_find_voc_above(int voc_id, const char *type, const char *user_name, const char *description);
// Whether the save of a report came to its end, the extension row.
bool store_is_voc_complete(int voc_id);
bool store_has_attachments(int voc_id, unsigned int count);
// Take out what refused saves left under id 0. Costs a look when there is nothing.
void store_remove_remains();
// Write the attachments of a report anew.
void store_replace_attachments(const GSList *attachments, int voc_id);
