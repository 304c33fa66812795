// Notifications that are not about a report, and the user's profile.
#include "tavro_dbmgr_catalogue_internal.h"
#include "tavro_log.h"

namespace {

constexpr char kTable[] = TAVRO_DBMGR_TABLE_NTFCTN;

std::string _notification(long ntfctn_id) {
  return catalogue_where("NTFCTN_ID", ntfctn_id);
}

// A new profile knows no more of the user than the name.
void _insert_profile(sqlite3 *db, const char *user, int status) {
  const TavroText name(TAVRO_STRDUP(user));
  tavro_dbmgr_user_profile_info profile = {};
  profile.user_id = name.get();
  profile.user_name = name.get();
  profile.user_beta_tester_status = status;
  _tavro_dbmgr_insert_new_record(db, TAVRO_DBMGR_TABLE_USER_PROFILE, &profile);
}

}  // namespace

int tavro_dbmgr_update_non_voc_ntfctn_deatils(const tavro_dbmgr_notification_details *details) {
  if (!details) {
    TAVRO_LOGD("notification details are NULL");
    return -1;
  }
  return catalogue_run([details](sqlite3 *db) {
    catalogue_upsert(db, catalogue_notification_layout(), details, _notification(details->ntfctn_id).c_str(),
                     {"NTFCTN_TYPE", "NTFCTN_SENT_TIME", "NTFCTN_EXPIRY_TIME", "NTFCTN_READ_STATUS"});
    return 0;
  });
}

int tavro_dbmgr_mark_nonvoc_notification_as_read(long id, tavro_dbmgr_ntfctn_key key) {
  return catalogue_run([id, key](sqlite3 *db) {
    const char *column = key == TAVRO_NTFCTN_KEY_TYPE_ID ? "NTFCTN_TYPE_ID" : "NTFCTN_ID";
    const std::string where = catalogue_where(column, id);
    return _tavro_dbmgr_update_record(db, kTable, "NTFCTN_READ_STATUS", "1", where.c_str());
  });
}

int tavro_dbmgr_get_banner_info(GSList **notifications) {
  return catalogue_read_list(kTable, nullptr, "ORDER BY NTFCTN_SENT_TIME DESC, NTFCTN_ID DESC",
                             TAVRO_RECORD_LIST_TYPE_NTFCTNS, notifications);
}

int tavro_dbmgr_get_ntfctn_type(long ntfctn_id) {
  return catalogue_read_number(kTable, "NTFCTN_TYPE", _notification(ntfctn_id));
}

unsigned long long tavro_dbmgr_get_non_voc_ntfctn_sent_time(long ntfctn_id) {
  return catalogue_read_time(kTable, "NTFCTN_SENT_TIME", _notification(ntfctn_id));
}

unsigned long long tavro_dbmgr_get_non_voc_ntfctn_expiry_time(long ntfctn_id) {
  return catalogue_read_time(kTable, "NTFCTN_EXPIRY_TIME", _notification(ntfctn_id));
}

tavro_dbmgr_notification_details *tavro_dbmgr_get_non_voc_ntfctn_details(long ntfctn_id) {
  GSList *list = nullptr;
  catalogue_read_list(kTable, _notification(ntfctn_id).c_str(), nullptr, TAVRO_RECORD_LIST_TYPE_NTFCTNS,
                      &list);
  if (!list) return nullptr;
  // The id is the table's key: there is no second one.
  auto *details = static_cast<tavro_dbmgr_notification_details *>(list->data);
  g_slist_free(list);
  return details;
}

int tavro_dbmgr_update_user_beta_tester_status(sqlite3 *db, const char *user, int status) {
  if (!db || !user) {
    TAVRO_LOGD("%s", user ? "db handle is NULL" : "user name NULL");
    return -1;
  }
  const std::string where = catalogue_where("USER_ID", user);
  const int count = _tavro_dbmgr_get_matching_record_count(db, TAVRO_DBMGR_TABLE_USER_PROFILE, where.c_str());
  if (count == 0) _insert_profile(db, user, status);
  if (count > 0)
    catalogue_write_change(db, TAVRO_DBMGR_TABLE_USER_PROFILE, "USER_BETA_TESTER_STATUS",
                           std::to_string(status).c_str(), where.c_str());
  return 0;
}

int tavro_dbmgr_get_user_beta_tester_status(const char *user) {
  if (!user) {
    TAVRO_LOGD("user name NULL");
    return -1;
  }
  return catalogue_read_number(TAVRO_DBMGR_TABLE_USER_PROFILE, "USER_BETA_TESTER_STATUS",
                               catalogue_where("USER_ID", user));
}
