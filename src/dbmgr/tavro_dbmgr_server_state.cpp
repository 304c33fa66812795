// What happens to a report after it was saved: sending states, the server's id, and the server's answers,
// which accumulate in three columns. States and replies grow at the end, times at the front, so that the
// newest time decides the order of the history.
#include <Elementary.h>

#include <algorithm>

#include "tavro_dbmgr_internal.h"
#include "tavro_log.h"
#include "tavro_type.h"

namespace {

constexpr char kNoReply[] = "none";

int _set_column(int voc_id, const char *statement_start, int value) {
  statement_text sql;
  return store_run(sa_strcat(sql, statement_start, "'", value, "' WHERE VOC_ID='", voc_id, "';"));
}

// What a column holds now; an empty text counts as nothing.
std::string _existing(sqlite3 *db, const char *column, const statement_text &where, const char *added) {
  const TavroText value(_tavro_dbmgr_get_col_data(db, "TABLE_VOC", column, where.c_str()));
  TAVRO_LOGD("%s Existing = %s, New = %s", column, value ? value.get() : "", added ? added : "");
  return value ? value.get() : "";
}

std::string _logged(const char *column, std::string value) {
  TAVRO_LOGD("%s buf_size: %zu", column, value.size() + 1);
  TAVRO_LOGD("%s: %s", column, value.c_str());
  return value;
}

std::string _extended_states(sqlite3 *db, const statement_text &where, const char *status) {
  const std::string existing = _existing(db, "VOC_STATE", where, status);
  return _logged("VOC_STATE", (existing.empty() ? "" : existing + "#") + (status ? status : ""));
}

// The one character that the toolkit's markup spells with a "#" (as "&#xfffc;").
constexpr char kObjectReplacement[] = "\xef\xbf\xbc";

// As the history shows it. "#" separates entries, so none may stand inside one.
std::string _reply_as_markup(const char *comments) {
  std::string reply = comments && *comments ? comments : kNoReply;
  std::replace(reply.begin(), reply.end(), '#', ' ');
  std::string text;
  std::size_t from = 0;
  for (std::size_t at; (at = reply.find(kObjectReplacement, from)) != std::string::npos;
       from = at + sizeof kObjectReplacement - 1)
    text.append(reply, from, at - from) += ' ';
  text.append(reply, from);
  const TavroText markup(TAVRO_ADOPT(elm_entry_utf8_to_markup(text.c_str())));
  return markup ? markup.get() : "";
}

std::string _extended_comments(sqlite3 *db, const statement_text &where, const char *comments) {
  const std::string existing = _existing(db, "VOC_PUSH_COMMENTS", where, comments);
  return _logged("VOC_PUSH_COMMENTS",
                 (existing.empty() ? kNoReply : existing) + "#" + _reply_as_markup(comments));
}

std::string _extended_dates(sqlite3 *db, const statement_text &where, const std::string &now) {
  const std::string existing = _existing(db, "VOC_DATE_OF_UPDATION", where, now.c_str());
  return _logged("VOC_DATE_OF_UPDATION", existing.empty() ? now : now + "#" + existing);
}

}  // namespace

int tavro_dbmgr_set_voc_submitted_to_server(int voc_id, int status) {
  return _set_column(voc_id, "UPDATE TABLE_VOC SET VOC_STATE=", status);
}

int tavro_dbmgr_update_sending_state(int voc_id, int status) {
  return _set_column(voc_id, "UPDATE TABLE_VOC SET VOC_STATE=", status);
}

int tavro_dbmgr_set_voc_updated_time(int voc_id) {
  const std::string now = store_now();
  TAVRO_LOGD("Updation Date/time: %s", now.c_str());
  statement_text sql;
  return store_run(sa_strcat(sql, "UPDATE TABLE_VOC SET VOC_DATE_OF_UPDATION=", "'", now.c_str(),
                             "' WHERE VOC_ID='", voc_id, "';"));
}

int tavro_dbmgr_set_voc_network_status(const char *user_name) {
  statement_text sql;
  sa_strcat(sql, "UPDATE TABLE_VOC SET VOC_STATE=", "'", TAVRO_STATUS_SENDING_FAILED_NO_NETWORK,
            "' WHERE VOC_USER_NAME=", quoted(user_name), " AND VOC_STATE='", TAVRO_STATUS_SENDING, "';");
  return store_run(sql);
}

int tavro_dbmgr_set_voc_data_submitted_to_server(int voc_id, int server_id, int status) {
  statement_text sql;
  sa_strcat(sql, "UPDATE TABLE_VOC SET VOC_DATE_OF_UPDATION=", "'", store_now().c_str());
  sa_strcat(sql, "', VOC_ID_SERVER='", server_id, "', VOC_STATE='", status, "' WHERE VOC_ID='", voc_id, "';");
  return store_run(sql);
}

int tavro_dbmgr_update_server_voc_id(int voc_id, int server_id) {
  return _set_column(voc_id, "UPDATE TABLE_VOC SET VOC_ID_SERVER=", server_id);
}

int tavro_dbmgr_update_voc_retry_count(int voc_id, int count) {
  return _set_column(voc_id, "UPDATE TABLE_VOC SET VOC_RETRY_COUNT=", count);
}

int tavro_dbmgr_get_voc_retry_count(int voc_id) {
  const store_session store;
  if (!store) return -1;
  statement_text sql;
  sa_strcat(sql, "SELECT VOC_RETRY_COUNT FROM TABLE_VOC WHERE VOC_ID = ", voc_id, ";");
  return store_read_number(store.db(), sql.c_str(), -1);
}

const char *tavro_dbmgr_current_state(const char *states) {
  const char *current = states;
  for (const char *at = states; at && *at; ++at)
    if (*at == '#' && at[1] && at[1] != '#') current = at + 1;
  return current;
}

int tavro_dbmgr_update_read_push_notifications(int voc_id, int is_read) {
  return _set_column(voc_id, "UPDATE TABLE_VOC SET VOC_PUSH_READ=", is_read);
}

int tavro_dbmgr_get_unread_push_notification_count(const char * /*user_name*/) {
  const store_session store;
  if (!store) return -1;
  const int count =
      store_read_number(store.db(), "SELECT count(*) FROM TABLE_VOC WHERE VOC_PUSH_READ = 0;", -1);
  TAVRO_LOGD("count: %d", count);
  return count;
}

int _tavro_dbmgr_update_push_status_comments(const char *server_id, const char *status,
                                             const char *comments) {
  const store_session store;
  if (!store) return -1;
  // Quoted, unlike a number: the id is a text from outside.
  statement_text where;
  sa_strcat(where, "VOC_ID_SERVER = ", quoted(server_id));
  const std::string states = _extended_states(store.db(), where, status);
  const std::string replies = _extended_comments(store.db(), where, comments);
  const std::string dates = _extended_dates(store.db(), where, store_now());
  statement_text sql;
  sa_strcat(sql, "UPDATE TABLE_VOC SET VOC_STATE=", quoted(states.c_str()));
  sa_strcat(sql, ", VOC_PUSH_COMMENTS=", quoted(replies.c_str()), ", VOC_PUSH_READ='", "0", "'");
  sa_strcat(sql, ", VOC_DATE_OF_UPDATION=", quoted(dates.c_str()), " WHERE VOC_ID_SERVER=", quoted(server_id),
            ";");
  store_execute_logged(store.db(), sql);
  return 0;
}
