// The catalogue's machinery: inserting, comparing, listing and deleting rows of any of its tables.
#include "tavro_dbmgr_catalogue_internal.h"
#include "tavro_log.h"

namespace {

// Null for a table that has no record.
const catalogue_layout *_layout_of_new_row(const char *table) {
  for (const catalogue_layout *layout : {&catalogue_beta_details_layout(), &catalogue_banner_layout(),
                                         &catalogue_notification_layout(), &catalogue_user_profile_layout()})
    if (std::strcmp(layout->table, table) == 0) return layout;
  TAVRO_LOGD("no record of table %s", table);
  return nullptr;
}

const catalogue_layout *_layout_of_list(tavro_dbmgr_record_list_type type) {
  switch (type) {
    case TAVRO_RECORD_LIST_TYPE_BETA_AVAILABLE:
    case TAVRO_RECORD_LIST_TYPE_BETA_OPTED:
      return &catalogue_beta_info_layout();
    case TAVRO_RECORD_LIST_TYPE_BANNERS:
      return &catalogue_banner_layout();
    case TAVRO_RECORD_LIST_TYPE_NTFCTNS:
      return &catalogue_notification_layout();
    case TAVRO_RECORD_LIST_TYPE_NA:
      break;
  }
  return nullptr;
}

std::optional<std::string> _value_of(const catalogue_layout &layout, const void *record, const char *column) {
  for (const catalogue_column &each : layout.columns)
    if (std::strcmp(each.name, column) == 0) return catalogue_value(each, record);
  return std::nullopt;
}

int _refuse() {
  TAVRO_LOGD("invalid inputs");
  return -1;
}

}  // namespace

int catalogue_run(const std::function<int(sqlite3 *)> &work) {
  sqlite3 *db = nullptr;
  if (tavro_dbmgr_db_open(&db, TAVRO_DBMGR_FILE) == -1) {
    TAVRO_LOGD("db open failed");
    return -1;
  }
  const int result = work(db);
  if (tavro_dbmgr_db_close(db) == -1) {
    TAVRO_LOGD("db close failed");
    return -1;
  }
  return result;
}

std::string catalogue_where(const char *column, const char *value) {
  statement_text where;
  return sa_strcat(where, column, " = ", quoted(value)).c_str();
}

std::string catalogue_where(const char *column, long value) {
  return catalogue_where(column, std::to_string(value).c_str());
}

std::vector<const void *> catalogue_last_to_first(const GSList *list) {
  std::vector<const void *> elements;
  for (; list; list = list->next) elements.push_back(list->data);
  return {elements.rbegin(), elements.rend()};
}

int _tavro_dbmgr_set_table_coloumns_data(statement_text &sql, const char *table, const void *record) {
  const catalogue_layout *layout = _layout_of_new_row(table);
  if (!layout) return -1;
  for (std::size_t i = 0; i < layout->inserted_columns; i++)
    sa_strcat(sql, i == 0 ? "(" : ", ", layout->columns[i].name);
  sa_strcat(sql, ") VALUES(");
  for (std::size_t i = 0; i < layout->inserted_columns; i++) {
    const std::optional<std::string> value = catalogue_value(layout->columns[i], record);
    sa_strcat(sql, i == 0 ? "" : ", ", quoted(value ? value->c_str() : nullptr));
  }
  return 0;
}

int _tavro_dbmgr_insert_new_record(sqlite3 *db, const char *table, const void *record) {
  if (!db || !table || !record) return _refuse();
  statement_text sql;
  sa_strcat(sql, "INSERT INTO ", table);
  if (_tavro_dbmgr_set_table_coloumns_data(sql, table, record) == -1) return -1;
  if (store_execute(db, sa_strcat(sql, ");").c_str()))
    TAVRO_LOGD("Inserted Row ID: %d", static_cast<int>(sqlite3_last_insert_rowid(db)));
  return 0;
}

int _tavro_dbmgr_get_matching_record_count(sqlite3 *db, const char *table, const char *where) {
  if (!db || !table) return _refuse();
  statement_text sql;
  sa_strcat(sql, "SELECT count(*) FROM ", table, where ? " WHERE " : "", where, ";");
  return store_read_number(db, sql.c_str(), -1);
}

int _tavro_dbmgr_get_matching_record_list(sqlite3 *db, const char *table, const char *where,
                                          const char *order, tavro_dbmgr_record_list_type type,
                                          GSList **list) {
  if (list) *list = nullptr;
  const catalogue_layout *layout = _layout_of_list(type);
  if (!db || !table || !layout || !list) return _refuse();
  statement_text sql;
  sa_strcat(sql, "SELECT * FROM ", table, where ? " WHERE " : "", where);
  sa_strcat(sql, order ? " " : "", order, ";");
  const TavroStmt statement = store_prepare(db, sql.c_str());
  while (statement && store_next_row(statement.get()))
    *list = g_slist_prepend(*list, catalogue_read_record(*layout, statement.get()));
  *list = g_slist_reverse(*list);
  return 0;
}

int _tavro_dbmgr_is_data_changed(sqlite3 *db, const char *table, const char *column, const char *value,
                                 const char *where) {
  if (!db || !table || !column || !value || !where) {
    TAVRO_LOGD("invalid inputs");
    return 0;
  }
  const TavroText stored(_tavro_dbmgr_get_col_data(db, table, column, where));
  return stored && std::strcmp(stored.get(), value) == 0 ? 0 : 1;
}

int _tavro_dbmgr_delete_record(sqlite3 *db, const char *table, const char *where) {
  if (!db || !table) return _refuse();
  statement_text sql;
  sa_strcat(sql, "DELETE FROM ", table, where ? " WHERE " : "", where, ";");
  store_execute(db, sql.c_str());
  return 0;
}

void catalogue_write_change(sqlite3 *db, const char *table, const char *column, const char *value,
                            const char *where) {
  if (_tavro_dbmgr_is_data_changed(db, table, column, value, where) == 1)
    _tavro_dbmgr_update_record(db, table, column, value, where);
}

catalogue_row catalogue_compare(sqlite3 *db, const catalogue_layout &layout, const void *record,
                                const char *where, const std::vector<const char *> &tracked_columns,
                                std::vector<catalogue_change> &changes) {
  statement_text sql;
  const char *separator = "SELECT ";
  for (const char *column : tracked_columns) {
    sa_strcat(sql, separator, column);
    separator = ", ";
  }
  const TavroStmt statement =
      store_prepare(db, sa_strcat(sql, " FROM ", layout.table, " WHERE ", where, ";").c_str());
  if (!statement) return catalogue_row::unreadable;
  if (!store_next_row(statement.get()))
    return sqlite3_errcode(db) == SQLITE_DONE ? catalogue_row::absent : catalogue_row::unreadable;
  int index = 0;
  for (const char *column : tracked_columns) {
    const auto *stored = reinterpret_cast<const char *>(sqlite3_column_text(statement.get(), index++));
    const std::optional<std::string> value = _value_of(layout, record, column);
    if (!value)
      TAVRO_LOGD("invalid inputs");
    else if (!stored || *value != stored)
      changes.push_back({column, *value});
  }
  return catalogue_row::present;
}

void catalogue_upsert(sqlite3 *db, const catalogue_layout &layout, const void *record, const char *where,
                      const std::vector<const char *> &tracked_columns) {
  std::vector<catalogue_change> changes;
  const catalogue_row row = catalogue_compare(db, layout, record, where, tracked_columns, changes);
  if (row == catalogue_row::absent) _tavro_dbmgr_insert_new_record(db, layout.table, record);
  for (const catalogue_change &change : changes)
    _tavro_dbmgr_update_record(db, layout.table, change.column, change.value.c_str(), where);
}

int catalogue_read_column(const char *table, const char *column, const std::string &where, TavroText &value) {
  return catalogue_run([&](sqlite3 *db) {
    value.reset(_tavro_dbmgr_get_col_data(db, table, column, where.c_str()));
    return 0;
  });
}

char *catalogue_read_text(const char *table, const char *column, const std::string &where) {
  TavroText value;
  catalogue_read_column(table, column, where, value);
  return value.release();
}

unsigned long long catalogue_read_time(const char *table, const char *column, const std::string &where) {
  // Cast: an earlier version stored a time of 2^63 and more as a fraction.
  const std::string whole = std::string("CAST(") + column + " AS INTEGER)";
  const TavroText value(catalogue_read_text(table, whole.c_str(), where));
  return value ? catalogue_time_of(g_ascii_strtoll(value.get(), nullptr, 10)) : 0;
}

int catalogue_read_number(const char *table, const char *column, const std::string &where) {
  const TavroText value(catalogue_read_text(table, column, where));
  return value ? static_cast<int>(g_ascii_strtoll(value.get(), nullptr, 10)) : -1;
}

int catalogue_read_list(const char *table, const char *where, const char *order,
                        tavro_dbmgr_record_list_type type, GSList **list) {
  if (!list) return _refuse();
  *list = nullptr;
  return catalogue_run([&](sqlite3 *db) {
    return _tavro_dbmgr_get_matching_record_list(db, table, where, order, type, list);
  });
}
