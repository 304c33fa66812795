// What makes a report a follow-up: two columns of its extension row, the desk's id of the first report and
// the person's verdict. They are written with the row that completes the report, so no follow-up is ever
// taken for a report of its own.
#include "tavro_dbmgr_internal.h"

void store_add_follow_up_extension(const tavro_dbmgr_bug_report_info *report, int voc_id) {
  statement_text sql;
  sa_strcat(sql,
            "INSERT INTO TABLE_VOC_EXTENDED(VOC_ID, VOC_TITLE_TEXT, REF_2, REF_3, REF_4, REF_5) VALUES(");
  sa_strcat_values(sql, {std::to_string(voc_id).c_str(), report->title_description, report->syslog_file,
                         report->device_data_filepath, std::to_string(report->follow_up_of).c_str(),
                         report->follow_up_verdict});
  store_run(sa_strcat(sql, ");"));
}

int tavro_dbmgr_get_follow_up(int voc_id, char **verdict) {
  if (verdict) *verdict = nullptr;
  const store_session store;
  if (!store) return -1;
  statement_text sql;
  // Always one row, so that none means a failure.
  sa_strcat(
      sql,
      "SELECT ifnull(max(CAST(REF_4 AS INTEGER)), 0), max(REF_5) FROM TABLE_VOC_EXTENDED WHERE VOC_ID = ",
      voc_id, " AND CAST(REF_4 AS INTEGER) BETWEEN 1 AND 2147483647;");
  const TavroStmt statement = store_prepare(store.db(), sql.c_str());
  if (!statement || !store_next_row(statement.get())) return -1;
  if (verdict) *verdict = store_column_text(statement.get(), 1);
  return store_column_number(statement.get(), 0);
}

GSList *tavro_dbmgr_get_follow_ups(int server_id) {
  const store_session store;
  if (!store || server_id < 1) return nullptr;
  statement_text sql;
  sa_strcat(sql, "SELECT DISTINCT VOC_ID FROM TABLE_VOC_EXTENDED WHERE REF_4 = '", server_id,
            "' AND VOC_ID IN (SELECT VOC_ID FROM TABLE_VOC) ORDER BY VOC_ID DESC LIMIT 100;");
  const TavroStmt statement = store_prepare(store.db(), sql.c_str());
  if (!statement) return nullptr;
  GSList *ids = nullptr;
  while (store_next_row(statement.get()))
    ids = g_slist_prepend(ids, GINT_TO_POINTER(store_column_number(statement.get(), 0)));
  return ids;
}
