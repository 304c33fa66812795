#include "tavro_dbmgr_internal.h"
#include "tavro_log.h"

namespace {

constexpr store_column<svc_voc_data> kReportColumns[] = {
    {"VOC_ID", nullptr, &svc_voc_data::id},
    {"VOC_TYPE", &svc_voc_data::type, nullptr},
    {"VOC_TEXT", &svc_voc_data::description, nullptr},
    {"VOC_APP_NAME", &svc_voc_data::app_name, nullptr},
    {"VOC_APP_ICON", &svc_voc_data::app_icon, nullptr},
    {"VOC_SEVERITY", &svc_voc_data::severity, nullptr},
    {"VOC_DUMP_PATH", &svc_voc_data::dump_file, nullptr},
    {"VOC_STATE", &svc_voc_data::submitted, nullptr},
    {"VOC_PUSH_COMMENTS", &svc_voc_data::push_comments, nullptr},
    {"VOC_PUSH_READ", nullptr, &svc_voc_data::push_read},
    {"VOC_FILE_NAME", &svc_voc_data::dump_name, nullptr},
    {"VOC_USER_NAME", &svc_voc_data::user_name, nullptr},
    {"VOC_DATE_OF_CREATION", &svc_voc_data::date_of_creation, nullptr},
    {"VOC_DATE_OF_UPDATION", &svc_voc_data::date_of_updation, nullptr},
    {"VOC_RETRY_COUNT", nullptr, &svc_voc_data::retry_count},
    {"VOC_ID_SERVER", nullptr, &svc_voc_data::server_voc_id},
};

constexpr store_column<svc_voc_data> kExtensionKey[] = {{"VOC_ID", nullptr, &svc_voc_data::id}};
constexpr store_column<svc_voc_data> kExtensionColumns[] = {
    {"VOC_TITLE_TEXT", &svc_voc_data::title_description, nullptr},
    {"REF_2", &svc_voc_data::syslog_file, nullptr},
};

constexpr store_column<tavro_dbmgr_attachment_info> kAttachmentColumns[] = {
    {"ATTACHMENT_ID", nullptr, &tavro_dbmgr_attachment_info::id},
    {"ATTACHMENT_FILE_PATH", &tavro_dbmgr_attachment_info::file_path, nullptr},
    {"ATTACHMENT_FILE_SIZE", nullptr, nullptr, &tavro_dbmgr_attachment_info::file_size},
    {"ATTACHMENT_FILE_TYPE", &tavro_dbmgr_attachment_info::file_type, nullptr},
    {"ATTACHMENT_SUGGESTION_ID", nullptr, &tavro_dbmgr_attachment_info::suggestion_id},
};

// Hands each attachment that a statement selects to `take`, which then owns it.
template <typename Take>
void _read_attachments(sqlite3 *db, const statement_text &sql, Take take) {
  const TavroStmt statement = store_prepare(db, sql.c_str());
  if (!statement) return;
  const store_row_reader<tavro_dbmgr_attachment_info> reader(statement.get(), kAttachmentColumns);
  while (store_next_row(statement.get())) {
    auto *attachment = TAVRO_ZALLOC(tavro_dbmgr_attachment_info);
    reader.read(attachment);
    take(attachment);
  }
}

// Finds reports of a list by VOC_ID. What belongs to them is asked for in the order of the list, so a search
// goes on where the last one ended.
class report_finder {
 public:
  explicit report_finder(GSList *reports) : reports_(reports), last_(reports) {}
  // Null for a report that is not in the list.
  svc_voc_data *find(int voc_id) {
    for (GSList *start : {last_, reports_})
      for (GSList *item = start; item; item = item->next) {
        auto *voc = static_cast<svc_voc_data *>(item->data);
        if (voc->id != voc_id) continue;
        last_ = item;
        return voc;
      }
    return nullptr;
  }

 private:
  GSList *reports_;
  GSList *last_;
};

// What belongs to the selected reports is read by one statement for all: one for each report would make the
// history three times as slow, and a list of their ids takes longer to parse than to select them again. The
// join is CROSS so that the reports stay the outer loop and their order is kept.
constexpr char kExtensions[] = "SELECT TABLE_VOC_EXTENDED.* FROM (SELECT VOC_ID ";
constexpr char kOfSelected[] =
    ") AS SELECTED CROSS JOIN TABLE_VOC_EXTENDED ON TABLE_VOC_EXTENDED.VOC_ID = SELECTED.VOC_ID;";
constexpr char kAttachments[] = "SELECT ATTACHMENT.* FROM (SELECT VOC_ID ";
constexpr char kAttachedToSelected[] =
    ") AS SELECTED CROSS JOIN ATTACHMENT ON ATTACHMENT_SUGGESTION_ID = SELECTED.VOC_ID;";

void _add_extensions(sqlite3 *db, const statement_text &selection, GSList *reports) {
  statement_text sql;
  sa_strcat(sql, kExtensions, selection.c_str(), kOfSelected);
  const TavroStmt statement = store_prepare(db, sql.c_str());
  if (!statement) return;
  const store_row_reader<svc_voc_data> key(statement.get(), kExtensionKey);
  const store_row_reader<svc_voc_data> reader(statement.get(), kExtensionColumns);
  report_finder owners(reports);
  while (store_next_row(statement.get())) {
    svc_voc_data row = {};
    key.read(&row);
    svc_voc_data *voc = owners.find(row.id);
    if (voc && !voc->title_description && !voc->syslog_file) reader.read(voc);
  }
}

void _add_attachments(sqlite3 *db, const statement_text &selection, GSList *reports) {
  statement_text sql;
  sa_strcat(sql, kAttachments, selection.c_str(), kAttachedToSelected);
  report_finder owners(reports);
  _read_attachments(db, sql, [&owners](tavro_dbmgr_attachment_info *attachment) {
    svc_voc_data *voc = owners.find(attachment->suggestion_id);
    if (voc)
      voc->attachments = g_slist_prepend(voc->attachments, attachment);
    else
      tavro_db_free_attachment(attachment);
  });
  for (GSList *item = reports; item; item = item->next) {
    auto *voc = static_cast<svc_voc_data *>(item->data);
    voc->attachments = g_slist_reverse(voc->attachments);
  }
}

GSList *_read_report_rows(sqlite3 *db, const statement_text &selection) {
  statement_text sql;
  const TavroStmt statement = store_prepare(db, sa_strcat(sql, "SELECT * ", selection.c_str(), ";").c_str());
  if (!statement) return nullptr;
  const store_row_reader<svc_voc_data> reader(statement.get(), kReportColumns);
  GSList *list = nullptr;
  while (store_next_row(statement.get())) {
    auto *voc = TAVRO_ZALLOC(svc_voc_data);
    reader.read(voc);
    if (voc->dump_file && !*voc->dump_file) TAVRO_FREE(voc->dump_file);
    list = g_slist_prepend(list, voc);
  }
  return g_slist_reverse(list);
}

// The reports that `selection`, from FROM on, picks from TABLE_VOC, in its order.
GSList *_read_reports(const statement_text &selection) {
  const store_session store;
  if (!store) return nullptr;
  GSList *reports = _read_report_rows(store.db(), selection);
  if (!reports) return nullptr;
  _add_extensions(store.db(), selection, reports);
  _add_attachments(store.db(), selection, reports);
  return reports;
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

GSList *tavro_dbmgr_get_attachments(int voc_id, sqlite3 *db) {
  statement_text sql;
  sa_strcat(sql, "SELECT * FROM ATTACHMENT WHERE ATTACHMENT_SUGGESTION_ID = ", voc_id, ";");
  GSList *attachments = nullptr;
  _read_attachments(db, sql, [&attachments](tavro_dbmgr_attachment_info *attachment) {
    attachments = g_slist_prepend(attachments, attachment);
  });
  return g_slist_reverse(attachments);
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
