#include "tavro_dbmgr_internal.h"
#include "tavro_log.h"

namespace {

GSList *_read_reports(const statement_text &selection) {
  const store_session store;
  return store ? store_read_reports(store.db(), selection) : nullptr;
}

// The first report of a list; the others, which a unique key does not have, are freed.
svc_voc_data *_take_single(GSList *reports) {
  if (!reports) return nullptr;
  auto *voc = static_cast<svc_voc_data *>(reports->data);
  reports = g_slist_delete_link(reports, reports);
  g_slist_free_full(reports,
                    [](gpointer other) { tavro_dbmgr_free_voc_data(static_cast<svc_voc_data *>(other)); });
  return voc;
}

// First column of the first row, when it is the column that was asked for.
char *_read_single_text(const statement_text &sql, const char *column) {
  const store_session store;
  if (!store) return nullptr;
  const TavroStmt statement = store_prepare(store.db(), sql.c_str());
  if (!statement || !store_next_row(statement.get())) return nullptr;
  if (std::strcmp(sqlite3_column_name(statement.get(), 0), column) != 0) return nullptr;
  return store_column_text(statement.get(), 0);
}

char *_read_text_of_report(const char *table, const char *column, int voc_id) {
  statement_text sql;
  sa_strcat(sql, "SELECT ", column, " FROM ", table, " WHERE VOC_ID = ", voc_id, ";");
  return _read_single_text(sql, column);
}

struct file_source {
  tavro_voc_file_kind kind;
  const char *sql;  // id and path
  const char *id_column;
};
// Rows of no report, which a refused save leaves, name nothing.
constexpr file_source kFileSources[] = {
    {TAVRO_VOC_FILE_ATTACHMENT,
     "SELECT ATTACHMENT_SUGGESTION_ID, ATTACHMENT_FILE_PATH FROM ATTACHMENT WHERE EXISTS "
     "(SELECT 1 FROM TABLE_VOC WHERE VOC_ID = ATTACHMENT_SUGGESTION_ID)",
     "ATTACHMENT_SUGGESTION_ID"},
    {TAVRO_VOC_FILE_DEVICE_DATA,
     "SELECT VOC_ID, REF_3 FROM TABLE_VOC_EXTENDED JOIN TABLE_VOC USING (VOC_ID) WHERE REF_3 <> ''",
     "VOC_ID"},
    {TAVRO_VOC_FILE_SYSLOG,
     "SELECT VOC_ID, REF_2 FROM TABLE_VOC_EXTENDED JOIN TABLE_VOC USING (VOC_ID) WHERE REF_2 <> ''",
     "VOC_ID"},
    {TAVRO_VOC_FILE_DUMP, "SELECT VOC_ID, VOC_DUMP_PATH FROM TABLE_VOC WHERE VOC_DUMP_PATH <> ''", "VOC_ID"},
};

void _append_ids(statement_text &sql, const std::vector<int> &ids) {
  sa_strcat(sql, " IN (");
  for (std::size_t i = 0; i < ids.size(); i++) sa_strcat(sql, i > 0 ? "," : "", ids[i]);
  sa_strcat(sql, ")");
}

bool _read_files(sqlite3 *db, const file_source &source, const std::vector<int> *voc_ids,
                 std::vector<tavro_voc_file> *files) {
  statement_text sql;
  sa_strcat(sql, source.sql);
  if (voc_ids) _append_ids(sa_strcat(sql, " AND ", source.id_column), *voc_ids);
  const TavroStmt statement = store_prepare(db, sql.c_str());
  if (!statement) return false;
  while (store_next_row(statement.get())) {
    const auto *path = reinterpret_cast<const char *>(sqlite3_column_text(statement.get(), 1));
    if (path && *path) files->push_back({source.kind, path, store_column_number(statement.get(), 0)});
  }
  return sqlite3_errcode(db) == SQLITE_DONE;
}

}  // namespace

GSList *tavro_dbmgr_get_vocs_for_history(const char *user_name) {
  statement_text selection;
  return _read_reports(sa_strcat(selection, "FROM TABLE_VOC WHERE VOC_USER_NAME = ", quoted(user_name),
                                 " ORDER BY VOC_DATE_OF_UPDATION DESC LIMIT 100"));
}

svc_voc_data *tavro_dbmgr_get_voc_by_id(int voc_id) {
  statement_text selection;
  return _take_single(_read_reports(sa_strcat(selection, "FROM TABLE_VOC WHERE VOC_ID = ", voc_id)));
}

svc_voc_data *tavro_dbmgr_get_voc_by_server_id(int server_id) {
  statement_text selection;
  return _take_single(
      _read_reports(sa_strcat(selection, "FROM TABLE_VOC WHERE VOC_ID_SERVER = ", server_id)));
}

GSList *tavro_dbmgr_get_vocs_to_send() {
  const store_session store;
  if (!store) return nullptr;
  // The current status is the last of those joined by "#".
  const TavroStmt statement = store_prepare(
      store.db(),
      "SELECT VOC_ID FROM TABLE_VOC WHERE (VOC_STATE IN ('10', '11') OR VOC_STATE LIKE '%#10' OR "
      "VOC_STATE LIKE '%#11') AND EXISTS (SELECT 1 FROM TABLE_VOC_EXTENDED WHERE "
      "TABLE_VOC_EXTENDED.VOC_ID = TABLE_VOC.VOC_ID) ORDER BY VOC_ID;");
  if (!statement) return nullptr;
  GSList *ids = nullptr;
  while (store_next_row(statement.get()))
    ids = g_slist_prepend(ids, GINT_TO_POINTER(store_column_number(statement.get(), 0)));
  return g_slist_reverse(ids);
}

int tavro_dbmgr_get_voc_count(const char *user_name) {
  const store_session store;
  if (!store) return -1;
  statement_text sql;
  // Left empty for a null name, which selects no row.
  if (user_name)
    sa_strcat(sql, "SELECT count(*) FROM TABLE_VOC WHERE VOC_USER_NAME = ", quoted(user_name), ";");
  const int count = store_read_number(store.db(), sql.c_str(), -1);
  TAVRO_LOGD("count: %d", count);
  return count;
}

int tavro_dbmgr_get_server_voc_count(int server_id) {
  const store_session store;
  if (!store) return -1;
  statement_text sql;
  sa_strcat(sql, "SELECT count(*) FROM TABLE_VOC WHERE VOC_ID_SERVER = ", server_id, ";");
  return store_read_number(store.db(), sql.c_str(), -1);
}

int tavro_dbmgr_is_voc_present(int server_id) {
  const store_session store;
  if (!store) return -1;
  statement_text sql;
  sa_strcat(sql, "SELECT * FROM TABLE_VOC WHERE VOC_ID_SERVER = ", server_id, ";");
  const TavroStmt statement = store_prepare(store.db(), sql.c_str());
  return statement && store_next_row(statement.get()) ? 1 : 0;
}

int tavro_dbmgr_check_if_dump_file_is_uploaded(const char *dump_name) {
  if (!dump_name) return -1;
  const store_session store;
  if (!store) return -1;
  statement_text sql;
  sa_strcat(sql, "SELECT * FROM TABLE_VOC WHERE VOC_FILE_NAME = ", quoted(dump_name), ";");
  const TavroStmt statement = store_prepare(store.db(), sql.c_str());
  if (!statement) return -1;
  // A match and no match are not told apart here: callers only ask whether the lookup ran.
  if (store_next_row(statement.get())) return 1;
  return sqlite3_errcode(store.db()) == SQLITE_DONE ? 1 : -1;
}

int tavro_dbmgr_is_syslog_file_stored(const char *path) {
  if (!path) return -1;
  const store_session store;
  if (!store) return -1;
  statement_text sql;
  sa_strcat(sql, "SELECT VOC_ID FROM TABLE_VOC_EXTENDED WHERE REF_2 = ", quoted(path),
            " AND VOC_ID IN (SELECT VOC_ID FROM TABLE_VOC);");
  const TavroStmt statement = store_prepare(store.db(), sql.c_str());
  if (!statement) return -1;
  if (store_next_row(statement.get())) return 1;
  return sqlite3_errcode(store.db()) == SQLITE_DONE ? 0 : -1;
}

int tavro_dbmgr_get_voc_files(const std::vector<int> *voc_ids, std::vector<tavro_voc_file> *files) {
  const store_session store;
  if (!store) return -1;
  for (const file_source &source : kFileSources)
    if (!_read_files(store.db(), source, voc_ids, files)) return -1;
  return 0;
}

char *tavro_dbmgr_get_voc_title_description_by_id(int voc_id) {
  return _read_text_of_report("TABLE_VOC_EXTENDED", "VOC_TITLE_TEXT", voc_id);
}

char *tavro_dbmgr_get_voc_syslog_file_by_id(int voc_id) {
  return _read_text_of_report("TABLE_VOC_EXTENDED", "REF_2", voc_id);
}

char *tavro_dbmgr_get_device_data_file_by_id(int voc_id) {
  return _read_text_of_report("TABLE_VOC_EXTENDED", "REF_3", voc_id);
}

char *tavro_dbmgr_get_voc_description_by_id(int voc_id) {
  return _read_text_of_report("TABLE_VOC", "VOC_TEXT", voc_id);
}

char *tavro_dbmgr_get_voc_comments_by_id(int voc_id) {
  return _read_text_of_report("TABLE_VOC", "VOC_PUSH_COMMENTS", voc_id);
}

char *tavro_dbmgr_get_dump_file_by_id(int voc_id) {
  return _read_text_of_report("TABLE_VOC", "VOC_DUMP_PATH", voc_id);
}

char *tavro_dbmgr_get_app_crash_time_by_id(const char *app_id) {
  if (!app_id) return nullptr;
  statement_text sql;
  return _read_single_text(
      sa_strcat(sql, "SELECT APP_CRASH_REPORTED_TIME FROM APP_CRASH WHERE APP_ID = ", quoted(app_id), ";"),
      "APP_CRASH_REPORTED_TIME");
}

char *tavro_dbmgr_get_app_id_by_name(const char *app_name) {
  statement_text sql;
  return _read_single_text(
      sa_strcat(sql, "SELECT APP_ID FROM APP_DATA WHERE APP_NAME = ", quoted(app_name), ";"), "APP_ID");
}

int store_last_voc_id() {
  const store_session store;
  if (!store) return -1;
  return store_read_number(
      store.db(), "SELECT ifnull((SELECT seq FROM sqlite_sequence WHERE name = 'TABLE_VOC'), 0);", -1);
}

int store_find_voc_above(int voc_id, const char *type, const char *user_name, const char *description) {
  const store_session store;
  if (!store) return -1;
  statement_text sql;
  sa_strcat(sql, "SELECT ifnull(min(VOC_ID), 0) FROM TABLE_VOC WHERE VOC_ID > ", voc_id,
            " AND VOC_TYPE = ", quoted(type), " AND VOC_USER_NAME = ", quoted(user_name), " AND VOC_TEXT = ");
  return store_read_number(store.db(), sa_strcat(sql, quoted(description), ";").c_str(), -1);
}

bool store_is_voc_complete(int voc_id) {
  const store_session store;
  if (!store || voc_id < 1) return false;
  statement_text sql;
  sa_strcat(sql, "SELECT count(*) FROM TABLE_VOC_EXTENDED WHERE VOC_ID = ", voc_id, ";");
  return store_read_number(store.db(), sql.c_str(), 0) > 0;
}

bool store_has_attachments(int voc_id, unsigned int count) {
  const store_session store;
  if (!store) return false;
  statement_text sql;
  sa_strcat(sql, "SELECT count(*) FROM ATTACHMENT WHERE ATTACHMENT_SUGGESTION_ID = ", voc_id, ";");
  return store_read_number(store.db(), sql.c_str(), -1) == static_cast<int>(count);
}
