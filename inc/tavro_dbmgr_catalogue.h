// The catalogue: what the server pushes and the client keeps between runs. Beta programmes, banners of the
// landing page, notifications that are not about a report, and whether the user is a beta tester.
//
// To be written by the upload service as the desk's answers come in, and to be read by the landing page
// (banners), the beta centre (programmes) and its notifications view. None of them calls it yet.
//
// Writing is an upsert: a record whose key has no row is inserted whole; else only the columns that differ
// are written, one UPDATE each, so that what is received again writes nothing. A text that is null says
// nothing about its column: the stored text stays (in a new row it becomes ''). Lists are worked through from
// their last element to the first: of two elements with one key, the first stays.
//
// Life cycle, thread, lock and the ownership of what is returned are as in tavro_dbmgr.h. An operation that
// takes a connection runs inside its caller's hold of the lock and wants one of tavro_dbmgr_db_open; any
// other takes the lock itself and, called while its caller holds it, would wait for ever.
//
// Results are 0, or -1 when an input is null or the file cannot be opened, each with a log line; a statement
// that fails is logged and does not change the result. Times are milliseconds since the epoch; one of 2^63
// and more is stored as 2^63 - 1.
#pragma once

#include <glib.h>
#include <sqlite3.h>

// Names of the tables, for the machinery below.
#define TAVRO_DBMGR_TABLE_BETA "TABLE_BETA_PROGRAM"
#define TAVRO_DBMGR_TABLE_BANNER "TABLE_BANNER"
#define TAVRO_DBMGR_TABLE_NTFCTN "TABLE_NOTIFICATIONS"
#define TAVRO_DBMGR_TABLE_USER_PROFILE "TABLE_USER_PROFILE"

// Where the user stands with a beta programme. Comes from the server and is stored as a text of its own, by
// which the lists are chosen: append-only. The way back is narrower: 5 is stored as "OPT Out Approved", 7 as
// "OPT Out Requested", any other number as "NA", and each of these three is read as NA.
enum tavro_dbmgr_beta_user_status {
  TAVRO_BETA_USER_STATUS_AVAILABLE = 1,
  TAVRO_BETA_USER_STATUS_OPT_IN_RQSTD = 2,
  TAVRO_BETA_USER_STATUS_OPT_IN_APPROVED = 3,
  TAVRO_BETA_USER_STATUS_OPTED_IN_AVAILABLE = 4,
  TAVRO_BETA_USER_STATUS_NA = 5,
};

// The records that a list is made of.
enum tavro_dbmgr_record_list_type {
  TAVRO_RECORD_LIST_TYPE_BETA_AVAILABLE = 0,  // tavro_dbmgr_beta_info
  TAVRO_RECORD_LIST_TYPE_BETA_OPTED = 1,      // tavro_dbmgr_beta_info
  TAVRO_RECORD_LIST_TYPE_BANNERS = 2,         // tavro_dbmgr_banner_info
  TAVRO_RECORD_LIST_TYPE_NTFCTNS = 3,         // tavro_dbmgr_notification_details
  TAVRO_RECORD_LIST_TYPE_NA = 4,              // refused
};

enum tavro_dbmgr_beta_list_type {
  TAVRO_BETA_LIST_TYPE_AVAILABLE = 0,
  TAVRO_BETA_LIST_TYPE_OPTED = 1,  // whatever is not "Available", "NA" included
};

enum tavro_dbmgr_beta_date {
  TAVRO_BETA_DATE_DATE = 0,
  TAVRO_BETA_DATE_START = 1,
  TAVRO_BETA_DATE_END = 2,
};

// What the id that marks notifications as read is the id of.
enum tavro_dbmgr_ntfctn_key {
  TAVRO_NTFCTN_KEY_ID = 0,       // one notification
  TAVRO_NTFCTN_KEY_TYPE_ID = 1,  // what notifications are about, a beta programme: all of these
};

// A beta programme as a list shows it.
struct tavro_dbmgr_beta_info {
  long betaId;
  char *betaType;
  char *betaName;
  char *betaVersion;
  unsigned long long betaDate;
  char *discussionUrl;
  char *user_name;
  int userStatus;  // tavro_dbmgr_beta_user_status
};

// A beta programme with everything that its page shows.
struct tavro_dbmgr_beta_details_s {
  long betaId;
  char *betaType;
  char *betaName;
  char *betaVersion;
  unsigned long long betaDate;
  unsigned long long betaStartDate;
  unsigned long long betaEndDate;
  char *betaUrl;
  char *language;
  char *description;
  char *whatsNew;
  char *discussionUrl;
  char *user_name;
  int userStatus;  // tavro_dbmgr_beta_user_status
};
using tavro_dbmgr_beta_details = tavro_dbmgr_beta_details_s;

struct tavro_dbmgr_banner_info {
  long bannerId;
  char *bannerType;
  char *bannerAction;
  char *bannerActionData;
  char *bannerUrl;        // of the image
  int seqNo;              // place on the landing page; 0 is the built-in banner's
  int bannerUpdateFlag;   // 1: the image is to be fetched again
  char *bannerImagePath;  // of the image that was fetched
};

// A notification that is not about a report.
struct tavro_dbmgr_notification_details {
  long ntfctn_id;
  int ntfctn_type;
  long ntfctn_type_id;
  int ntfctn_type_status;
  char *ntfctn_title;
  char *ntfctn_message;
  char *ntfctn_action;
  char *ntfctn_action_data;
  unsigned long long ntfctn_sent_time;
  unsigned long long ntfctn_expiry_time;
  int ntfctn_read_status;  // 1: read
};

struct tavro_dbmgr_user_profile_info {
  char *user_id;
  char *user_name;
  char *profile_pic;
  char *email_id;
  char *mobile_number;
  char *telephone_number;
  int user_beta_tester_status;
};

// ---- Beta programmes ----

// Upsert programmes, tavro_dbmgr_beta_info. What the record lacks is '' or 0 in a new row.
int tavro_dbmgr_update_beta_list(const GSList *programmes);
// Upsert one. Language, description and what is new are stored with a new programme and not compared later.
int tavro_dbmgr_update_beta_details(const tavro_dbmgr_beta_details *details);
// A programme that is not stored is logged; the result is 0.
int tavro_dbmgr_update_beta_user_status(long beta_id, int status);

// Programmes in the order of their ids; tavro_dbmgr_free_beta_list. *programmes is null for none.
int tavro_dbmgr_get_beta_list(sqlite3 *db, tavro_dbmgr_beta_list_type type, GSList **programmes);

// One column of one programme as a new text; null when there is no row or no value.
char *tavro_dbmgr_get_beta_name(long beta_id);
char *tavro_dbmgr_get_beta_type(long beta_id);
char *tavro_dbmgr_get_beta_version(long beta_id);
char *tavro_dbmgr_get_beta_url(long beta_id);
char *tavro_dbmgr_get_beta_discussion_url(long beta_id);
// NA for a programme that is not stored; -1 when the file cannot be opened.
int tavro_dbmgr_get_beta_user_status(long beta_id);
// 0 when there is none.
unsigned long long tavro_dbmgr_get_beta_date(long beta_id, tavro_dbmgr_beta_date which);

// A tracked record of zeroes and nulls; tavro_dbmgr_free_beta_details.
tavro_dbmgr_beta_details *tavro_dbmgr_init_beta_details();

// ---- Banners ----

// Upsert banners, tavro_dbmgr_banner_info, by their place. Another banner at a place, or another image, sets
// the update flag. The image's path is written only for a new row at place 0: it belongs to who fetches.
int tavro_dbmgr_update_banner_list(const GSList *banners);
// Banners in the order of their places; tavro_dbmgr_free_banner_list.
int tavro_dbmgr_get_banner_list(GSList **banners);
// Whatever the name says, the notifications, newest first; tavro_dbmgr_free_ntfctn_list.
int tavro_dbmgr_get_banner_info(GSList **notifications);

// ---- Notifications ----

// Upsert one. Of a stored one only type, both times and the read status are compared.
int tavro_dbmgr_update_non_voc_ntfctn_deatils(const tavro_dbmgr_notification_details *details);
int tavro_dbmgr_mark_nonvoc_notification_as_read(long id, tavro_dbmgr_ntfctn_key key);
// -1 when there is no such notification.
int tavro_dbmgr_get_ntfctn_type(long ntfctn_id);
// 0 when there is none.
unsigned long long tavro_dbmgr_get_non_voc_ntfctn_sent_time(long ntfctn_id);
unsigned long long tavro_dbmgr_get_non_voc_ntfctn_expiry_time(long ntfctn_id);
// Null when there is no such notification; tavro_dbmgr_free_non_voc_ntfctn_details.
tavro_dbmgr_notification_details *tavro_dbmgr_get_non_voc_ntfctn_details(long ntfctn_id);

// ---- The user ----

// A user without a profile gets one, with the user as its id and name.
int tavro_dbmgr_update_user_beta_tester_status(sqlite3 *db, const char *user, int status);
// -1 for a user without a profile and on failure.
int tavro_dbmgr_get_user_beta_tester_status(const char *user);

// ---- Freeing: every text, every record, the list. Null is skipped. ----

void tavro_dbmgr_free_beta_list(GSList *programmes);
void tavro_dbmgr_free_beta_details(tavro_dbmgr_beta_details *details);
void tavro_dbmgr_free_banner_list(GSList *banners);
void tavro_dbmgr_free_ntfctn_list(GSList *notifications);
void tavro_dbmgr_free_non_voc_ntfctn_details(tavro_dbmgr_notification_details *details);

// ---- Machinery, on an open connection ----
//
// Table and column are names of ours; where-clause and order are statement text, in which the caller has
// doubled the quotes of every text that is not ours.

// Insert a record of the table: tavro_dbmgr_beta_details, _banner_info, _notification_details or
// _user_profile_info.
int _tavro_dbmgr_insert_new_record(sqlite3 *db, const char *table, const void *record);
// Number of rows that `where` selects, all for null; -1 on failure.
int _tavro_dbmgr_get_matching_record_count(sqlite3 *db, const char *table, const char *where);
// The rows that `where` selects, all for null, in the order of `order` ("ORDER BY ...", or null).
int _tavro_dbmgr_get_matching_record_list(sqlite3 *db, const char *table, const char *where,
                                          const char *order, tavro_dbmgr_record_list_type type,
                                          GSList **list);
// 1 when the stored text differs, a stored NULL from every text; 0 when it does not, or when an input is
// null.
int _tavro_dbmgr_is_data_changed(sqlite3 *db, const char *table, const char *column, const char *value,
                                 const char *where);
// Delete the rows that `where` selects, all for null.
int _tavro_dbmgr_delete_record(sqlite3 *db, const char *table, const char *where);
