// Beta programmes and where the user stands with them.
#include "tavro_dbmgr_catalogue_internal.h"
#include "tavro_log.h"

namespace {

constexpr char kTable[] = TAVRO_DBMGR_TABLE_BETA;

std::string _programme(long beta_id) {
  return catalogue_where("BETA_ID", beta_id);
}

// As much of the details as a list tells. The texts stay the list's.
tavro_dbmgr_beta_details _as_details(const tavro_dbmgr_beta_info &info) {
  tavro_dbmgr_beta_details details = {};
  details.betaId = info.betaId;
  details.betaType = info.betaType;
  details.betaName = info.betaName;
  details.betaVersion = info.betaVersion;
  details.betaDate = info.betaDate;
  details.discussionUrl = info.discussionUrl;
  details.user_name = info.user_name;
  details.userStatus = info.userStatus;
  return details;
}

void _upsert(sqlite3 *db, const tavro_dbmgr_beta_details &details,
             const std::vector<const char *> &tracked_columns) {
  catalogue_upsert(db, catalogue_beta_details_layout(), &details, _programme(details.betaId).c_str(),
                   tracked_columns);
}

}  // namespace

int tavro_dbmgr_update_beta_list(const GSList *programmes) {
  if (!programmes) {
    TAVRO_LOGD("beta list is NULL");
    return -1;
  }
  return catalogue_run([programmes](sqlite3 *db) {
    for (const void *element : catalogue_last_to_first(programmes)) {
      if (element)
        _upsert(db, _as_details(*static_cast<const tavro_dbmgr_beta_info *>(element)),
                {"BETA_TYPE", "BETA_NAME", "BETA_VERSION", "BETA_USER_NAME", "BETA_DATE",
                 "BETA_DISCUSSION_URL", "BETA_USER_STATUS"});
      else
        TAVRO_LOGD("beta_info is NULL");
    }
    return 0;
  });
}

int tavro_dbmgr_update_beta_details(const tavro_dbmgr_beta_details *details) {
  if (!details) {
    TAVRO_LOGD("beta details are NULL");
    return -1;
  }
  return catalogue_run([details](sqlite3 *db) {
    _upsert(db, *details,
            {"BETA_TYPE", "BETA_NAME", "BETA_VERSION", "BETA_USER_NAME", "BETA_DATE", "BETA_DISCUSSION_URL",
             "BETA_USER_STATUS", "BETA_START_DATE", "BETA_END_DATE", "BETA_URL"});
    return 0;
  });
}

int tavro_dbmgr_update_beta_user_status(long beta_id, int status) {
  return catalogue_run([beta_id, status](sqlite3 *db) {
    const std::string where = _programme(beta_id);
    const int count = _tavro_dbmgr_get_matching_record_count(db, kTable, where.c_str());
    if (count == 0) TAVRO_LOGD("No records found with betaId:%ld", beta_id);
    if (count < 1) return 0;
    const char *text = catalogue_beta_status_text(status);
    TAVRO_LOGD("betaId [%ld] userStatus =%s", beta_id, text);
    catalogue_write_change(db, kTable, "BETA_USER_STATUS", text, where.c_str());
    return 0;
  });
}

int tavro_dbmgr_get_beta_list(sqlite3 *db, tavro_dbmgr_beta_list_type type, GSList **programmes) {
  const bool is_available = type == TAVRO_BETA_LIST_TYPE_AVAILABLE;
  TAVRO_LOGD("Requested beta list type is: %s", is_available ? "AVAILABLE" : "OPTED");
  statement_text where;
  sa_strcat(where, "BETA_USER_STATUS ", is_available ? "= " : "!= ",
            quoted(catalogue_beta_status_text(TAVRO_BETA_USER_STATUS_AVAILABLE)));
  return _tavro_dbmgr_get_matching_record_list(
      db, kTable, where.c_str(), "ORDER BY BETA_ID",
      is_available ? TAVRO_RECORD_LIST_TYPE_BETA_AVAILABLE : TAVRO_RECORD_LIST_TYPE_BETA_OPTED, programmes);
}

char *tavro_dbmgr_get_beta_name(long beta_id) {
  return catalogue_read_text(kTable, "BETA_NAME", _programme(beta_id));
}

char *tavro_dbmgr_get_beta_type(long beta_id) {
  return catalogue_read_text(kTable, "BETA_TYPE", _programme(beta_id));
}

char *tavro_dbmgr_get_beta_version(long beta_id) {
  return catalogue_read_text(kTable, "BETA_VERSION", _programme(beta_id));
}

char *tavro_dbmgr_get_beta_url(long beta_id) {
  return catalogue_read_text(kTable, "BETA_URL", _programme(beta_id));
}

char *tavro_dbmgr_get_beta_discussion_url(long beta_id) {
  return catalogue_read_text(kTable, "BETA_DISCUSSION_URL", _programme(beta_id));
}

int tavro_dbmgr_get_beta_user_status(long beta_id) {
  TavroText text;
  if (catalogue_read_column(kTable, "BETA_USER_STATUS", _programme(beta_id), text) == -1) return -1;
  return catalogue_beta_status_of(text.get());
}

unsigned long long tavro_dbmgr_get_beta_date(long beta_id, tavro_dbmgr_beta_date which) {
  const char *column = which == TAVRO_BETA_DATE_START ? "BETA_START_DATE"
                       : which == TAVRO_BETA_DATE_END ? "BETA_END_DATE"
                                                      : "BETA_DATE";
  return catalogue_read_time(kTable, column, _programme(beta_id));
}

tavro_dbmgr_beta_details *tavro_dbmgr_init_beta_details() {
  return TAVRO_ZALLOC(tavro_dbmgr_beta_details);
}
