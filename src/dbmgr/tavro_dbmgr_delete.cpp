#include "tavro_dbmgr_internal.h"
#include "tavro_log.h"

namespace {

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

}  // namespace

void tavro_dbmgr_destroy_vocs() {
  _delete({"DELETE FROM ATTACHMENT;", "DELETE FROM TABLE_VOC;"});
}

void tavro_dbmgr_destroy_vocs_by_id(int voc_id) {
  _delete_of_report("DELETE FROM ATTACHMENT WHERE ATTACHMENT_SUGGESTION_ID", voc_id);
  _delete_of_report("DELETE FROM TABLE_VOC_EXTENDED WHERE VOC_ID", voc_id);
  _delete_of_report("DELETE FROM TABLE_VOC WHERE VOC_ID", voc_id);
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
