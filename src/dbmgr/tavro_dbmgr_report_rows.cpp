// Reading reports with what belongs to them.
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

}  // namespace

GSList *store_read_reports(sqlite3 *db, const statement_text &selection) {
  GSList *reports = _read_report_rows(db, selection);
  if (!reports) return nullptr;
  _add_extensions(db, selection, reports);
  _add_attachments(db, selection, reports);
  return reports;
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
