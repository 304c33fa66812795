// Search in the user's reports. Rows are read in the order of the history and looked at here, until there are
// as many as the list shows: SQLite's own LIKE knows the case of ASCII alone and would see the markup of the
// replies.
#include <cstdlib>

#include "tavro_dbmgr_internal.h"
#include "tavro_dbmgr_text_match.h"
#include "tavro_type.h"

namespace {

constexpr std::size_t kMostReports = 100;

// The title is a look-up of its own, which is made only when there is a text to find. ?1: user name, ?2:
// whether there is a text, ?3: whether only reports with an unread reply are wanted.
constexpr char kCandidates[] =
    "SELECT VOC_ID, VOC_STATE, VOC_TYPE, VOC_DUMP_PATH, VOC_TEXT, VOC_PUSH_COMMENTS, "
    "CASE WHEN ?2 THEN (SELECT VOC_TITLE_TEXT FROM TABLE_VOC_EXTENDED "
    "WHERE TABLE_VOC_EXTENDED.VOC_ID = TABLE_VOC.VOC_ID ORDER BY ID LIMIT 1) END "
    "FROM TABLE_VOC WHERE VOC_USER_NAME = ?1 AND (NOT ?3 OR VOC_PUSH_READ = 0) "
    "ORDER BY VOC_DATE_OF_UPDATION DESC, VOC_ID DESC;";
enum candidate_column { kId, kState, kType, kDumpPath, kText, kReplies, kTitle };

const char *_text(sqlite3_stmt *row, candidate_column column) {
  return reinterpret_cast<const char *>(sqlite3_column_text(row, column));
}

tavro_voc_stage _stage(const char *states) {
  const char *current = tavro_dbmgr_current_state(states);
  switch (current ? std::strtol(current, nullptr, 10) : -1) {
    case TAVRO_STATUS_DRAFT_SAVED:
      return TAVRO_VOC_STAGE_DRAFT;
    case TAVRO_STATUS_SENDING_FAILED:
    case TAVRO_STATUS_SENDING_FAILED_NO_NETWORK:
      return TAVRO_VOC_STAGE_FAILED;
    case TAVRO_STATUS_UNDER_REVIEW:
    case TAVRO_STATUS_IN_PROCESS:
      return TAVRO_VOC_STAGE_OPEN;
    case TAVRO_STATUS_SOLVED:
    case TAVRO_STATUS_COMPLETED:
    case TAVRO_STATUS_DECLINED:
      return TAVRO_VOC_STAGE_CLOSED;
    default:
      return TAVRO_VOC_STAGE_SENDING;
  }
}

tavro_voc_kind _kind(sqlite3_stmt *row) {
  const char *type = _text(row, kType);
  if (type && std::strcmp(type, TAVRO_DBMGR_SUGGESTION) == 0) return TAVRO_VOC_KIND_IDEA;
  const char *dump = _text(row, kDumpPath);
  return dump && *dump ? TAVRO_VOC_KIND_CRASH : TAVRO_VOC_KIND_PROBLEM;
}

bool _matches(sqlite3_stmt *row, const tavro_voc_filter &filter, store_text_finder &finder) {
  if (filter.stage != TAVRO_VOC_STAGE_ANY && _stage(_text(row, kState)) != filter.stage) return false;
  if (filter.kind != TAVRO_VOC_KIND_ANY && _kind(row) != filter.kind) return false;
  return finder.finds_all() || finder.is_in(_text(row, kTitle)) || finder.is_in(_text(row, kText)) ||
         finder.is_in_replies(_text(row, kReplies));
}

std::vector<int> _find(sqlite3 *db, const char *user_name, const tavro_voc_filter &filter) {
  std::vector<int> ids;
  store_text_finder finder(filter.text);
  const TavroStmt statement = store_prepare(db, kCandidates);
  if (!statement) return ids;
  sqlite3_bind_text(statement.get(), 1, user_name ? user_name : "", -1, SQLITE_STATIC);
  sqlite3_bind_int(statement.get(), 2, !finder.finds_all());
  sqlite3_bind_int(statement.get(), 3, filter.is_unread);
  while (ids.size() < kMostReports && store_next_row(statement.get()))
    if (_matches(statement.get(), filter, finder)) ids.push_back(store_column_number(statement.get(), kId));
  return ids;
}

}  // namespace

GSList *tavro_dbmgr_search_vocs(const char *user_name, const tavro_voc_filter &filter) {
  const store_session store;
  if (!store) return nullptr;
  const std::vector<int> ids = _find(store.db(), user_name, filter);
  if (ids.empty()) return nullptr;
  statement_text selection;
  sa_strcat(selection, "FROM TABLE_VOC WHERE VOC_ID IN (", ids.front());
  for (std::size_t i = 1; i < ids.size(); i++) sa_strcat(selection, ",", ids[i]);
  sa_strcat(selection, ") ORDER BY VOC_DATE_OF_UPDATION DESC, VOC_ID DESC");
  return store_read_reports(store.db(), selection);
}
