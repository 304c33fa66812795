// What the catalogue's sources share: how records and columns belong together, and the steps of an upsert.
// Not for callers of the store. Main loop only.
#pragma once

#include <cstddef>
#include <functional>
#include <optional>
#include <string>
#include <vector>

#include "tavro_dbmgr_catalogue.h"
#include "tavro_dbmgr_internal.h"

// ---- Layouts of the records ----

enum class catalogue_field { text, number, id, time, beta_status };

struct catalogue_column {
  const char *name;
  catalogue_field field;
  std::size_t offset;  // of the field in the record, bytes
};

// A plain record and the table that its rows stand in.
struct catalogue_layout {
  const char *table;
  std::size_t record_bytes;
  std::vector<catalogue_column> columns;
  std::size_t inserted_columns;  // the first so many are named by an INSERT, in this order; 0: never inserted
};

const catalogue_layout &catalogue_beta_info_layout();
const catalogue_layout &catalogue_beta_details_layout();
const catalogue_layout &catalogue_banner_layout();
const catalogue_layout &catalogue_notification_layout();
const catalogue_layout &catalogue_user_profile_layout();

// ---- Records ----

// A field as it is stored; none for a null text.
std::optional<std::string> catalogue_value(const catalogue_column &column, const void *record);
// A stored time; what is below 0 was never one.
inline unsigned long long catalogue_time_of(gint64 stored) {
  return stored > 0 ? static_cast<unsigned long long>(stored) : 0;
}
// A new tracked record of the current row. Columns are matched by name.
void *catalogue_read_record(const catalogue_layout &layout, sqlite3_stmt *statement);
void catalogue_free_record(const catalogue_layout &layout, void *record);
void catalogue_free_list(const catalogue_layout &layout, GSList *records);

const char *catalogue_beta_status_text(int status);
int catalogue_beta_status_of(const char *text);

// ---- Steps ----

// One critical section: open, work, close. The result of `work`; -1 when the file cannot be opened or closed.
int catalogue_run(const std::function<int(sqlite3 *)> &work);

// "COLUMN = 'value'", its quotes doubled.
std::string catalogue_where(const char *column, const char *value);
std::string catalogue_where(const char *column, long value);

std::vector<const void *> catalogue_last_to_first(const GSList *list);

// Column list and values of a new row, from "(" to the last value; -1 for a table without records.
int _tavro_dbmgr_set_table_coloumns_data(statement_text &sql, const char *table, const void *record);

// Write a value when the stored one differs.
void catalogue_write_change(sqlite3 *db, const char *table, const char *column, const char *value,
                            const char *where);

enum class catalogue_row { absent, present, unreadable };
struct catalogue_change {
  const char *column;
  std::string value;
};
// Whether `where` selects a row, and which of the tracked columns the record would change in it, in their
// order. One statement for the whole row: one for each column would make a list that is received again slower
// than its first time on a disk that syncs quickly.
catalogue_row catalogue_compare(sqlite3 *db, const catalogue_layout &layout, const void *record,
                                const char *where, const std::vector<const char *> &tracked_columns,
                                std::vector<catalogue_change> &changes);

// Insert the record, or write those of the tracked columns that differ, one UPDATE each.
void catalogue_upsert(sqlite3 *db, const catalogue_layout &layout, const void *record, const char *where,
                      const std::vector<const char *> &tracked_columns);

// One column of the first row that `where` selects, in a critical section of its own. -1 when the file cannot
// be opened; the value is null when there is none.
int catalogue_read_column(const char *table, const char *column, const std::string &where, TavroText &value);
char *catalogue_read_text(const char *table, const char *column, const std::string &where);
// 0 when there is no value.
unsigned long long catalogue_read_time(const char *table, const char *column, const std::string &where);
// -1 when there is no value.
int catalogue_read_number(const char *table, const char *column, const std::string &where);

// All records that `where` selects, in a critical section of its own.
int catalogue_read_list(const char *table, const char *where, const char *order,
                        tavro_dbmgr_record_list_type type, GSList **list);
