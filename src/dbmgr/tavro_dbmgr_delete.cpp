#include "tavro_dbmgr_internal.h"
#include "tavro_log.h"

namespace {

// What a report consists of, its own row last.
constexpr const char *kOfReport[] = {"DELETE FROM ATTACHMENT WHERE ATTACHMENT_SUGGESTION_ID",
                                     "DELETE FROM TABLE_VOC_EXTENDED WHERE VOC_ID",
                                     "DELETE FROM TABLE_VOC WHERE VOC_ID"};

// One critical section that runs deleting statements in order.
void _delete(std::initializer_list<const char *> statements) {
  const store_lock lock;
  const TavroDb db = store_open(open_failure::log_plainly);
  if (!db) return;
  for (const char *sql : statements) store_execute(db.get(), sql);
}

void _delete_of_report(const char *statement_start, int voc_id) {
  statement_text sql;
  sa_strcat(sql, statement_start, " = '", voc_id, "';");
  _delete({sql.c_str()});
}

bool _is_being_sent(sqlite3 *db, int voc_id) {
  statement_text sql;
  // Behind the current state may be the empty entries of answers without one.
  sa_strcat(sql, "SELECT rtrim(VOC_STATE, '#') = '10' OR rtrim(VOC_STATE, '#') LIKE '%#10' FROM TABLE_VOC ",
            "WHERE VOC_ID = ", voc_id, ";");
  return store_read_number(db, sql.c_str(), 0) != 0;
}

bool _delete_whole(sqlite3 *db, int voc_id) {
  for (const char *start : kOfReport) {
    statement_text sql;
    if (!store_execute(db, sa_strcat(sql, start, " = '", voc_id, "';").c_str())) return false;
  }
  return true;
}

bool _delete_all(sqlite3 *db, const std::vector<int> &voc_ids, std::vector<int> *deleted) {
  if (!store_execute(db, "BEGIN IMMEDIATE;")) return false;
  for (const int voc_id : voc_ids) {
    if (_is_being_sent(db, voc_id)) continue;
    if (!_delete_whole(db, voc_id)) return false;
    deleted->push_back(voc_id);
  }
  return store_execute(db, "COMMIT;");
}

}  // namespace

void tavro_dbmgr_destroy_vocs() {
  _delete({"DELETE FROM ATTACHMENT;", "DELETE FROM TABLE_VOC;"});
}

void tavro_dbmgr_destroy_vocs_by_id(int voc_id) {
  for (const char *start : kOfReport) _delete_of_report(start, voc_id);
}

int tavro_dbmgr_destroy_vocs_by_ids(const std::vector<int> &voc_ids, std::vector<int> *destroyed) {
  destroyed->clear();
  const store_lock lock;
  const TavroDb db = store_open(open_failure::log_plainly);
  // What was begun and not committed ends with the connection.
  if (db && _delete_all(db.get(), voc_ids, destroyed)) return 0;
  destroyed->clear();
  return -1;
}

void store_remove_remains() {
  const int remains = [] {
    const store_session store;
    return store ? store_read_number(
                       store.db(),
                       "SELECT EXISTS(SELECT 1 FROM ATTACHMENT WHERE ATTACHMENT_SUGGESTION_ID = 0) OR "
                       "EXISTS(SELECT 1 FROM TABLE_VOC_EXTENDED WHERE VOC_ID = 0);",
                       -1)
                 : -1;
  }();
  if (remains > 0) tavro_dbmgr_destroy_vocs_by_id(0);
}

void tavro_dbmgr_destroy_attachments_by_filename(const char *file_path) {
  if (!file_path) {
    TAVRO_LOGD("Attachment Filepath NULL");
    return;
  }
  statement_text sql;
  sa_strcat(sql, "DELETE FROM ATTACHMENT WHERE ATTACHMENT_FILE_PATH = ", quoted(file_path), ";");
  _delete({sql.c_str()});
}

void tavro_dbmgr_destroy_suggestions() {
  _delete({"DELETE FROM TABLE_VOC WHERE VOC_TYPE = '" TAVRO_DBMGR_SUGGESTION "';"});
}

void tavro_dbmgr_destroy_bug_reports() {
  _delete({"DELETE FROM TABLE_VOC WHERE VOC_TYPE = '" TAVRO_DBMGR_BUG_REPORT "'"});
}
