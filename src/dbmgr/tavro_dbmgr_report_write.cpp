#include "tavro_dbmgr_internal.h"
#include "tavro_log.h"

namespace {

// A save's first part: the report's row, then its attachments under the same hold of the lock, each through a
// connection of its own. Returns the new id; 0 when the row was refused.
int _insert_report(const statement_text &sql, const GSList *attachments, bool *is_locked_out) {
  const store_lock lock;
  TavroDb db = store_open();
  if (!db) return -1;
  // SQLite also remembers the id of a row whose commit failed on a full disk.
  const bool is_stored = store_execute_logged(db.get(), sql);
  *is_locked_out = !is_stored && sqlite3_errcode(db.get()) == SQLITE_BUSY;
  const int id = is_stored ? static_cast<int>(sqlite3_last_insert_rowid(db.get())) : 0;
  TAVRO_LOGD("Inserted Row ID: %d", id);
  db.reset();
  // Kept: a refused report's attachments, and its extension row, are stored under id 0 all the same. The
  // client removes them. But a person would wait for each of them while another program has locked the file.
  if (!*is_locked_out) store_add_attachments(attachments, id);
  return id;
}

void _save_extension(const tavro_dbmgr_bug_report_info *report, int id) {
  tavro_dbmgr_update_bug_report_extended(report, id);
}

void _save_extension(const tavro_dbmgr_suggestion_info *suggestion, int id) {
  tavro_dbmgr_update_suggestion_extended(suggestion, id);
}

template <typename Report>
int _save(const statement_text &sql, const Report *report) {
  bool is_locked_out = false;
  const int id = _insert_report(sql, report->attachments, &is_locked_out);
  if (id >= 0 && !is_locked_out) _save_extension(report, id);
  return id;
}

void _set_kind(char *&type, const char *kind) {
  TAVRO_FREE(type);
  type = TAVRO_STRDUP(kind);
}

template <typename Report>
void _fill_last_change(Report *report) {
  if (!report->date_of_updation) report->date_of_updation = TAVRO_STRDUP(report->date_of_creation);
}

std::string _creation_time() {
  const std::string now = store_now();
  TAVRO_LOGD("Creation Date/time: %s", now.c_str());
  return now;
}

}  // namespace

int tavro_dbmgr_update_bug_report(tavro_dbmgr_bug_report_info *report) {
  if (!report) return -1;
  _set_kind(report->type, TAVRO_DBMGR_BUG_REPORT);
  const std::string now = _creation_time();
  statement_text sql;
  sa_strcat(sql, "INSERT INTO TABLE_VOC(",
            "VOC_TYPE, VOC_TEXT, VOC_APP_NAME, VOC_APP_ICON, VOC_SEVERITY, VOC_DUMP_PATH, VOC_STATE, "
            "VOC_FILE_NAME",
            ", VOC_USER_NAME, VOC_DATE_OF_CREATION, VOC_DATE_OF_UPDATION, VOC_RETRY_COUNT) VALUES(");
  sa_strcat_values(sql, {report->type, report->description, report->app_name, report->app_icon,
                         report->severity, report->dump_file, std::to_string(report->submitted).c_str(),
                         report->dump_name, report->user_name, now.c_str(), now.c_str(), "0"});
  return _save(sa_strcat(sql, ");"), report);
}

int tavro_dbmgr_update_suggestion(tavro_dbmgr_suggestion_info *suggestion) {
  if (!suggestion) return -1;
  _set_kind(suggestion->type, TAVRO_DBMGR_SUGGESTION);
  const std::string now = _creation_time();
  statement_text sql;
  sa_strcat(sql, "INSERT INTO TABLE_VOC(",
            "VOC_TYPE, VOC_TEXT, VOC_APP_NAME, VOC_APP_ICON, VOC_SEVERITY, VOC_STATE, VOC_USER_NAME",
            ", VOC_DATE_OF_CREATION, VOC_DATE_OF_UPDATION, VOC_RETRY_COUNT", ") VALUES(");
  sa_strcat_values(sql, {suggestion->type, suggestion->suggestion, suggestion->app_name, suggestion->app_icon,
                         suggestion->severity, std::to_string(suggestion->submitted).c_str(),
                         suggestion->user_name, now.c_str(), now.c_str(), "0"});
  return _save(sa_strcat(sql, ");"), suggestion);
}

int tavro_dbmgr_update_bug_report_with_server_voc_id(tavro_dbmgr_bug_report_info *report) {
  if (!report) return -1;
  _set_kind(report->type, TAVRO_DBMGR_BUG_REPORT);
  _fill_last_change(report);
  statement_text sql;
  sa_strcat(sql, "INSERT INTO TABLE_VOC(",
            "VOC_TYPE, VOC_TEXT, VOC_APP_NAME, VOC_APP_ICON, VOC_SEVERITY, VOC_DUMP_PATH, VOC_STATE, "
            "VOC_PUSH_COMMENTS, VOC_PUSH_READ, VOC_FILE_NAME, VOC_USER_NAME",
            ", VOC_DATE_OF_CREATION, VOC_DATE_OF_UPDATION, VOC_ID_SERVER", ") VALUES(");
  sa_strcat_values(sql,
                   {report->type, report->description, report->app_name, report->app_icon, report->severity,
                    report->dump_file, std::to_string(report->submitted).c_str(), report->push_comments, "1",
                    report->dump_name, report->user_name, report->date_of_creation, report->date_of_updation,
                    std::to_string(report->server_voc_id).c_str()});
  return _save(sa_strcat(sql, ");"), report);
}

int tavro_dbmgr_update_suggestion_with_server_voc_id(tavro_dbmgr_suggestion_info *suggestion) {
  if (!suggestion) return -1;
  _set_kind(suggestion->type, TAVRO_DBMGR_SUGGESTION);
  _fill_last_change(suggestion);
  statement_text sql;
  sa_strcat(sql, "INSERT INTO TABLE_VOC(",
            "VOC_TYPE, VOC_TEXT, VOC_APP_NAME, VOC_APP_ICON, VOC_SEVERITY, VOC_STATE, VOC_PUSH_COMMENTS, "
            "VOC_PUSH_READ, VOC_USER_NAME",
            ", VOC_DATE_OF_CREATION, VOC_DATE_OF_UPDATION, VOC_ID_SERVER", ") VALUES(");
  sa_strcat_values(sql, {suggestion->type, suggestion->suggestion, suggestion->app_name, suggestion->app_icon,
                         suggestion->severity, std::to_string(suggestion->submitted).c_str(),
                         suggestion->push_comments, "1", suggestion->user_name, suggestion->date_of_creation,
                         suggestion->date_of_updation, std::to_string(suggestion->server_voc_id).c_str()});
  return _save(sa_strcat(sql, ");"), suggestion);
}

void tavro_dbmgr_update_bug_report_extended(const tavro_dbmgr_bug_report_info *report, int voc_id) {
  if (!report) {
    TAVRO_LOGD("No Bug data");
    return;
  }
  if (report->follow_up_of > 0) {
    store_add_follow_up_extension(report, voc_id);
    return;
  }
  statement_text sql;
  sa_strcat(sql, "INSERT INTO TABLE_VOC_EXTENDED(VOC_ID, VOC_TITLE_TEXT, REF_2, REF_3) VALUES(");
  sa_strcat_values(sql, {std::to_string(voc_id).c_str(), report->title_description, report->syslog_file,
                         report->device_data_filepath});
  store_run(sa_strcat(sql, ");"));
}

void tavro_dbmgr_update_suggestion_extended(const tavro_dbmgr_suggestion_info *suggestion, int voc_id) {
  if (!suggestion) {
    TAVRO_LOGD("No Suggestion data");
    return;
  }
  statement_text sql;
  sa_strcat(sql, "INSERT INTO TABLE_VOC_EXTENDED(VOC_ID, VOC_TITLE_TEXT, REF_2) VALUES(");
  sa_strcat_values(sql,
                   {std::to_string(voc_id).c_str(), suggestion->title_description, suggestion->syslog_file});
  store_run(sa_strcat(sql, ");"));
}

void tavro_dbmgr_update_attachment(const tavro_dbmgr_attachment_info *attachment, int voc_id) {
  if (!attachment) {
    TAVRO_LOGD("NO attachment data");
    return;
  }
  const TavroDb db = store_open();
  if (!db) return;
  // "%lf" as the C locale prints it: the user's locale may put a comma there.
  char size[G_ASCII_DTOSTR_BUF_SIZE * 10];
  g_ascii_formatd(size, sizeof size, "%f", attachment->file_size);
  statement_text sql;
  sa_strcat(sql,
            "INSERT INTO ATTACHMENT(ATTACHMENT_FILE_PATH, ATTACHMENT_FILE_SIZE, ATTACHMENT_FILE_TYPE, "
            "ATTACHMENT_SUGGESTION_ID) VALUES(");
  sa_strcat_values(sql, {attachment->file_path, size, attachment->file_type, std::to_string(voc_id).c_str()});
  store_execute_logged(db.get(), sa_strcat(sql, ");"));
}

void store_add_attachments(const GSList *attachments, int voc_id) {
  for (; attachments; attachments = attachments->next)
    tavro_dbmgr_update_attachment(static_cast<const tavro_dbmgr_attachment_info *>(attachments->data),
                                  voc_id);
}

void store_replace_attachments(const GSList *attachments, int voc_id) {
  const store_lock lock;
  TavroDb db = store_open();
  if (!db) return;
  statement_text sql;
  sa_strcat(sql, "DELETE FROM ATTACHMENT WHERE ATTACHMENT_SUGGESTION_ID = '", voc_id, "';");
  const bool is_deleted = store_execute_logged(db.get(), sql);
  db.reset();
  if (is_deleted) store_add_attachments(attachments, voc_id);
}

void tavro_dbmgr_update_dump_file_bug_report(const char *old_name, const char *new_name) {
  if (!old_name || !new_name) {
    TAVRO_LOGD("Dump file name NULL");
    return;
  }
  statement_text sql;
  store_run(sa_strcat(sql, "UPDATE TABLE_VOC SET VOC_FILE_NAME=", quoted(new_name),
                      " WHERE VOC_FILE_NAME=", quoted(old_name), ";"));
}
