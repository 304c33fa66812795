// The catalogue's records: which field stands in which column, as what, and how a record is read and freed.
#include <algorithm>
#include <type_traits>

#include "tavro_dbmgr_catalogue_internal.h"

namespace {

// The kind of a field follows from its type, so that a layout cannot name the wrong one.
template <typename Field>
constexpr catalogue_field _field_of() {
  if constexpr (std::is_same_v<Field, char *>) return catalogue_field::text;
  if constexpr (std::is_same_v<Field, int>) return catalogue_field::number;
  if constexpr (std::is_same_v<Field, long>) return catalogue_field::id;
  if constexpr (std::is_same_v<Field, unsigned long long>) return catalogue_field::time;
}

#define TAVRO_COLUMN(column, Record, member) \
  { column, _field_of<decltype(Record::member)>(), offsetof(Record, member) }

template <typename Field>
const Field &_get(const void *record, const catalogue_column &column) {
  return *static_cast<const Field *>(
      static_cast<const void *>(static_cast<const char *>(record) + column.offset));
}

template <typename Field>
Field &_at(void *record, const catalogue_column &column) {
  return *static_cast<Field *>(static_cast<void *>(static_cast<char *>(record) + column.offset));
}

void _read_field(const catalogue_column &column, void *record, sqlite3_stmt *statement, int index) {
  switch (column.field) {
    case catalogue_field::text:
      _at<char *>(record, column) = store_column_text(statement, index);
      break;
    case catalogue_field::number:
      _at<int>(record, column) = sqlite3_column_int(statement, index);
      break;
    case catalogue_field::id:
      _at<long>(record, column) = sqlite3_column_int64(statement, index);
      break;
    case catalogue_field::time:
      _at<unsigned long long>(record, column) = catalogue_time_of(sqlite3_column_int64(statement, index));
      break;
    case catalogue_field::beta_status:
      _at<int>(record, column) =
          catalogue_beta_status_of(reinterpret_cast<const char *>(sqlite3_column_text(statement, index)));
      break;
  }
}

struct beta_status_text {
  int status;
  const char *text;
};
// Stored: never change one.
constexpr beta_status_text kReadableStatuses[] = {
    {TAVRO_BETA_USER_STATUS_AVAILABLE, "Available"},
    {TAVRO_BETA_USER_STATUS_OPT_IN_RQSTD, "OPT In Requested"},
    {TAVRO_BETA_USER_STATUS_OPT_IN_APPROVED, "OPT In Approved"},
    {TAVRO_BETA_USER_STATUS_OPTED_IN_AVAILABLE, "OPTED In Available"},
};
// Kept: who opted out stands outside the programme, so these are written but read as NA.
constexpr int kOptOutRequested = 7;
constexpr beta_status_text kWrittenStatuses[] = {
    {TAVRO_BETA_USER_STATUS_NA, "OPT Out Approved"},
    {kOptOutRequested, "OPT Out Requested"},
};

}  // namespace

const char *catalogue_beta_status_text(int status) {
  for (const beta_status_text &each : kReadableStatuses)
    if (each.status == status) return each.text;
  for (const beta_status_text &each : kWrittenStatuses)
    if (each.status == status) return each.text;
  return "NA";
}

int catalogue_beta_status_of(const char *text) {
  for (const beta_status_text &each : kReadableStatuses)
    if (text && std::strcmp(each.text, text) == 0) return each.status;
  return TAVRO_BETA_USER_STATUS_NA;
}

const catalogue_layout &catalogue_beta_info_layout() {
  using record = tavro_dbmgr_beta_info;
  static const catalogue_layout layout = {
      TAVRO_DBMGR_TABLE_BETA,
      sizeof(record),
      {TAVRO_COLUMN("BETA_ID", record, betaId),
       TAVRO_COLUMN("BETA_TYPE", record, betaType),
       TAVRO_COLUMN("BETA_NAME", record, betaName),
       TAVRO_COLUMN("BETA_VERSION", record, betaVersion),
       TAVRO_COLUMN("BETA_DATE", record, betaDate),
       TAVRO_COLUMN("BETA_DISCUSSION_URL", record, discussionUrl),
       TAVRO_COLUMN("BETA_USER_NAME", record, user_name),
       {"BETA_USER_STATUS", catalogue_field::beta_status, offsetof(record, userStatus)}},
      0};
  return layout;
}

const catalogue_layout &catalogue_beta_details_layout() {
  using record = tavro_dbmgr_beta_details;
  static const catalogue_layout layout = {
      TAVRO_DBMGR_TABLE_BETA,
      sizeof(record),
      {TAVRO_COLUMN("BETA_ID", record, betaId),
       TAVRO_COLUMN("BETA_TYPE", record, betaType),
       TAVRO_COLUMN("BETA_NAME", record, betaName),
       TAVRO_COLUMN("BETA_USER_NAME", record, user_name),
       {"BETA_USER_STATUS", catalogue_field::beta_status, offsetof(record, userStatus)},
       TAVRO_COLUMN("BETA_VERSION", record, betaVersion),
       TAVRO_COLUMN("BETA_DATE", record, betaDate),
       TAVRO_COLUMN("BETA_START_DATE", record, betaStartDate),
       TAVRO_COLUMN("BETA_END_DATE", record, betaEndDate),
       TAVRO_COLUMN("BETA_URL", record, betaUrl),
       TAVRO_COLUMN("BETA_LANGUAGE", record, language),
       TAVRO_COLUMN("BETA_DESCRIPTION", record, description),
       TAVRO_COLUMN("BETA_WHATS_NEW", record, whatsNew),
       TAVRO_COLUMN("BETA_DISCUSSION_URL", record, discussionUrl)},
      14};
  return layout;
}

const catalogue_layout &catalogue_banner_layout() {
  using record = tavro_dbmgr_banner_info;
  static const catalogue_layout layout = {
      TAVRO_DBMGR_TABLE_BANNER,
      sizeof(record),
      {TAVRO_COLUMN("BANNER_ID", record, bannerId), TAVRO_COLUMN("BANNER_TYPE", record, bannerType),
       TAVRO_COLUMN("BANNER_ACTION", record, bannerAction),
       TAVRO_COLUMN("BANNER_ACTION_DATA", record, bannerActionData),
       TAVRO_COLUMN("BANNER_IMAGE_URL", record, bannerUrl), TAVRO_COLUMN("BANNER_SEQ_NO", record, seqNo),
       TAVRO_COLUMN("BANNER_UPDATE_FLAG", record, bannerUpdateFlag),
       TAVRO_COLUMN("BANNER_IMAGE_PATH", record, bannerImagePath)},
      7};
  return layout;
}

const catalogue_layout &catalogue_notification_layout() {
  using record = tavro_dbmgr_notification_details;
  static const catalogue_layout layout = {
      TAVRO_DBMGR_TABLE_NTFCTN,
      sizeof(record),
      {TAVRO_COLUMN("NTFCTN_ID", record, ntfctn_id), TAVRO_COLUMN("NTFCTN_TYPE", record, ntfctn_type),
       TAVRO_COLUMN("NTFCTN_TYPE_ID", record, ntfctn_type_id),
       TAVRO_COLUMN("NTFCTN_TYPE_STATUS", record, ntfctn_type_status),
       TAVRO_COLUMN("NTFCTN_TITLE", record, ntfctn_title),
       TAVRO_COLUMN("NTFCTN_MESSAGE", record, ntfctn_message),
       TAVRO_COLUMN("NTFCTN_ACTION", record, ntfctn_action),
       TAVRO_COLUMN("NTFCTN_ACTION_DATA", record, ntfctn_action_data),
       TAVRO_COLUMN("NTFCTN_SENT_TIME", record, ntfctn_sent_time),
       TAVRO_COLUMN("NTFCTN_EXPIRY_TIME", record, ntfctn_expiry_time),
       TAVRO_COLUMN("NTFCTN_READ_STATUS", record, ntfctn_read_status)},
      11};
  return layout;
}

const catalogue_layout &catalogue_user_profile_layout() {
  using record = tavro_dbmgr_user_profile_info;
  static const catalogue_layout layout = {
      TAVRO_DBMGR_TABLE_USER_PROFILE,
      sizeof(record),
      {TAVRO_COLUMN("USER_ID", record, user_id), TAVRO_COLUMN("USER_NAME", record, user_name),
       TAVRO_COLUMN("PROFILE_PIC", record, profile_pic), TAVRO_COLUMN("EMAIL_ID", record, email_id),
       TAVRO_COLUMN("MOBILE_NUMBER", record, mobile_number),
       TAVRO_COLUMN("TEL_NUMBER", record, telephone_number),
       TAVRO_COLUMN("USER_BETA_TESTER_STATUS", record, user_beta_tester_status)},
      7};
  return layout;
}

std::optional<std::string> catalogue_value(const catalogue_column &column, const void *record) {
  switch (column.field) {
    case catalogue_field::text: {
      const char *text = _get<char *>(record, column);
      return text ? std::optional<std::string>(text) : std::nullopt;
    }
    case catalogue_field::number:
      return std::to_string(_get<int>(record, column));
    case catalogue_field::id:
      return std::to_string(_get<long>(record, column));
    case catalogue_field::time:
      // The highest that the column holds as a whole number.
      return std::to_string(
          std::min<unsigned long long>(_get<unsigned long long>(record, column), G_MAXINT64));
    case catalogue_field::beta_status:
      return catalogue_beta_status_text(_get<int>(record, column));
  }
  return std::nullopt;
}

void *catalogue_read_record(const catalogue_layout &layout, sqlite3_stmt *statement) {
  void *record = TAVRO_ADOPT(g_malloc0(layout.record_bytes));
  const int column_count = sqlite3_column_count(statement);
  for (int i = 0; i < column_count; i++)
    for (const catalogue_column &column : layout.columns)
      if (std::strcmp(column.name, sqlite3_column_name(statement, i)) == 0)
        _read_field(column, record, statement, i);
  return record;
}

void catalogue_free_record(const catalogue_layout &layout, void *record) {
  if (!record) return;
  for (const catalogue_column &column : layout.columns)
    if (column.field == catalogue_field::text) TAVRO_FREE(_at<char *>(record, column));
  TAVRO_FREE(record);
}

void catalogue_free_list(const catalogue_layout &layout, GSList *records) {
  for (const GSList *item = records; item; item = item->next) catalogue_free_record(layout, item->data);
  g_slist_free(records);
}

void tavro_dbmgr_free_beta_list(GSList *programmes) {
  catalogue_free_list(catalogue_beta_info_layout(), programmes);
}

void tavro_dbmgr_free_beta_details(tavro_dbmgr_beta_details *details) {
  catalogue_free_record(catalogue_beta_details_layout(), details);
}

void tavro_dbmgr_free_banner_list(GSList *banners) {
  catalogue_free_list(catalogue_banner_layout(), banners);
}

void tavro_dbmgr_free_ntfctn_list(GSList *notifications) {
  catalogue_free_list(catalogue_notification_layout(), notifications);
}

void tavro_dbmgr_free_non_voc_ntfctn_details(tavro_dbmgr_notification_details *details) {
  catalogue_free_record(catalogue_notification_layout(), details);
}
