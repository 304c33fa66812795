// The local store: every report the user wrote, its attachments, the server's answers, installed applications
// and crash times, in one SQLite file that the client shares with the upload service.
//
// Life cycle: the client calls tavro_dbmgr_init_semaphore and the service tavro_dbmgr_open_semaphore, then
// either calls tavro_dbmgr_ensure_schema before its first read or write. After that every operation is one
// critical section: take the lock, open the file, run the statements, close, give the lock back; nothing is
// kept open between calls. Operations block while another process works on the store and are called on the
// main loop only. Opening the store limits the memory of SQLite's pages for the whole process, other
// databases included: sqlite3_soft_heap_limit64.
//
// On disk: the file below, SQLite's journal and, when damage was met, empty marks beside it
// (".tavro.db.suspect", ".tavro.db.replaced"), readable by the owner alone. A save is several
// commits; the extension row is written last and marks the report as complete.
//
// Unless said otherwise operations return 0, or -1 when the file cannot be opened; a statement that fails is
// logged and does not change the result. Texts and records that are returned are tracked: the caller frees
// texts with TAVRO_FREE and records with the functions at the end. Lists hold pointers to records.
#pragma once

#include <glib.h>
#include <sqlite3.h>

#include <string>
#include <vector>

#define TAVRO_DBMGR_FOLDER "/opt/usr/apps/corvane.tavro-lite/shared/data"
#define TAVRO_DBMGR_FILE TAVRO_DBMGR_FOLDER "/.tavro.db"

// VOC_TYPE of a problem report and of an idea. Stored: never change them.
#define TAVRO_DBMGR_BUG_REPORT "TAVRO_DBMGR_BUG_REPORT"
#define TAVRO_DBMGR_SUGGESTION "TAVRO_DBMGR_SUGGESTION"

struct tavro_dbmgr_attachment_info {
  int id;
  char *file_path;
  double file_size;   // bytes
  char *file_type;    // "jpg", "png", "mp4"
  int suggestion_id;  // VOC_ID of the owning report, whatever its kind
};

// A problem report to be saved.
struct tavro_dbmgr_bug_report_info {
  char *type;  // set by the store
  int id;
  char *description;
  char *title_description;
  char *app_name;
  char *severity;
  char *dump_file;         // path
  char *date_of_creation;  // milliseconds since the epoch as decimal text; a new report gets the store's
  char *date_of_updation;
  GSList *attachments;  // of tavro_dbmgr_attachment_info
  char *dump_name;
  char *syslog_file;  // path
  char *syslog_name;
  char *device_data_filepath;
  int submitted;  // first status, a tavro_status_e
  char *app_icon;
  char *user_name;
  int server_voc_id;
  int retry_count;
  char *push_comments;
  int isSending;
  int follow_up_of;         // server id of the report that this one is a follow-up to; 0 for none
  char *follow_up_verdict;  // of a follow-up
};

// An idea to be saved.
struct tavro_dbmgr_suggestion_info {
  char *type;  // set by the store
  int id;
  char *suggestion;
  char *title_description;
  char *app_name;
  char *severity;
  char *date_of_creation;
  char *date_of_updation;
  GSList *attachments;  // of tavro_dbmgr_attachment_info
  int submitted;
  char *app_icon;
  char *user_name;
  char *syslog_file;
  char *syslog_name;
  int server_voc_id;
  int retry_count;
  char *push_comments;
  int isSending;
};

// A stored report of either kind. A column that is NULL leaves its field null, or 0.
struct svc_voc_data {
  int id;
  char *description;
  char *title_description;
  char *app_name;
  char *severity;
  char *dump_file;  // null also for the empty text
  char *date_of_creation;
  char *date_of_updation;  // after server answers: times joined by "#", newest first
  GSList *attachments;     // of tavro_dbmgr_attachment_info
  char *dump_name;
  char *syslog_file;
  char *device_data_filepath;  // not read: see tavro_dbmgr_get_device_data_file_by_id
  char *submitted;             // statuses joined by "#", oldest first
  char *app_icon;
  char *user_name;
  char *type;
  int server_voc_id;
  int retry_count;
  int push_read;        // 0: a server answer was not seen yet, or there is none
  char *push_comments;  // replies as markup joined by "#", oldest first, "none" where there was none
};

// An installed application.
struct tavro_pkg_info {
  int is_downloaded;  // 1: installed by the user, 0: built in
  char *pkg_id;
  char *app_id;
  char *pkg_name;
  char *pkg_icon;
};

// ---- Lock and connection ----

// The lock's semaphore set; -1 before it is opened.
extern int dbmgr_semid;

// Create or open the lock and set it free, whatever state it was in; an operation that another process is in
// the middle of is given half a second to finish first. For the client's start. 0 or -1.
int tavro_dbmgr_init_semaphore();

// Create or open the lock without touching the state of an existing one. For the upload service. 0 or -1.
int tavro_dbmgr_open_semaphore();

// Take the lock; blocks. The kernel gives it back if the process dies. Never take it twice. 0 or -1: then the
// operation proceeds unlocked, and when the semaphore was removed the next wait opens it anew.
int tavro_dbmgr_sem_wait();
int tavro_dbmgr_sem_signal();

// Take the lock, then open; -1 leaves the lock free and *db null. End with tavro_dbmgr_db_close, which closes
// and gives the lock back (-1 for null).
int tavro_dbmgr_db_open(sqlite3 **db, const char *db_path);
int tavro_dbmgr_db_close(sqlite3 *db);

// ---- Schema ----

enum tavro_dbmgr_store_state {
  TAVRO_STORE_UNUSABLE = -1,  // logged; the store may come back (full disk, read-only)
  TAVRO_STORE_READY = 0,
  // What was there is damaged, or a database of something else: kept beside it under a dated name, new one
  // made.
  TAVRO_STORE_REPLACED = 1,
};

// Make folder, file, tables and indexes as far as they are missing. Harmless when two processes do it at
// once. Reads the whole file only after damage was met in it, and heals what is not damage of a table.
tavro_dbmgr_store_state tavro_dbmgr_ensure_schema();

// Whether a store was set aside, by this program or the other, and the person does not know yet.
bool tavro_dbmgr_is_replacement_untold();
void tavro_dbmgr_set_replacement_told();

// Create the tables and the built-in banner without taking the lock. Returns -1 only when the file cannot be
// opened; on an existing store it stops at the banner with a log line and returns 0.
int tavro_dbmgr_init();

// Delete every row of a table. `table` is one of ours, never a text from outside.
int _tavro_dbmgr_clear_db(const char *table);

// ---- Pieces on an open connection (no lock of their own); table and column are names of ours ----

// A new text with every single quote doubled; null for null.
char *tavro_insert_escape_character(const char *text);

// Write one column of the rows that `where` selects. -1 when connection, table or column is null, else 0.
int _tavro_dbmgr_update_record(sqlite3 *db, const char *table, const char *column, const char *value,
                               const char *where);

// First value of the column as a new text; null when there is none.
char *_tavro_dbmgr_get_col_data(sqlite3 *db, const char *table, const char *column, const char *where);

// ---- Saving reports ----

// Store a new report with status `submitted`: row, attachments in list order, extension row. Sets `type`.
// Returns the new VOC_ID; below 1 when the report was not stored (-1: null record or file not opened). When
// the row is refused, attachments and extension row are stored under id 0 all the same, unless another
// program has locked the file: each statement waits 5 seconds for that, and these would wait in vain.
int tavro_dbmgr_update_bug_report(tavro_dbmgr_bug_report_info *report);
int tavro_dbmgr_update_suggestion(tavro_dbmgr_suggestion_info *suggestion);

// Store a report that the server already knows: with its own dates (a missing last change is the creation),
// server id and replies, marked as read.
int tavro_dbmgr_update_bug_report_with_server_voc_id(tavro_dbmgr_bug_report_info *report);
int tavro_dbmgr_update_suggestion_with_server_voc_id(tavro_dbmgr_suggestion_info *suggestion);

// Steps of a save. The attachment's step runs while its caller holds the lock.
void tavro_dbmgr_update_bug_report_extended(const tavro_dbmgr_bug_report_info *report, int voc_id);
void tavro_dbmgr_update_suggestion_extended(const tavro_dbmgr_suggestion_info *suggestion, int voc_id);
void tavro_dbmgr_update_attachment(const tavro_dbmgr_attachment_info *attachment, int voc_id);

void tavro_dbmgr_update_dump_file_bug_report(const char *old_name, const char *new_name);

// ---- Reading reports ----

// The user's reports changed last, newest first, at most 100. Null for none and on failure.
GSList *tavro_dbmgr_get_vocs_for_history(const char *user_name);

// Which reports a search wants. A text is found in title, description and replies, whatever its case; null or
// empty finds all.
enum tavro_voc_stage {
  TAVRO_VOC_STAGE_ANY,
  TAVRO_VOC_STAGE_DRAFT,    // 6
  TAVRO_VOC_STAGE_SENDING,  // 10 and what is shown as sending
  TAVRO_VOC_STAGE_FAILED,   // 0, 11
  TAVRO_VOC_STAGE_OPEN,     // 1, 2
  TAVRO_VOC_STAGE_CLOSED,   // 3, 4, 5
};
enum tavro_voc_kind { TAVRO_VOC_KIND_ANY, TAVRO_VOC_KIND_PROBLEM, TAVRO_VOC_KIND_IDEA, TAVRO_VOC_KIND_CRASH };
struct tavro_voc_filter {
  const char *text;  // plain UTF-8
  tavro_voc_stage stage;
  tavro_voc_kind kind;
  bool is_unread;  // only those with a reply that was not seen yet
};
// The user's reports that match, out of all that are stored, newest change first, at most 100; else as above.
GSList *tavro_dbmgr_search_vocs(const char *user_name, const tavro_voc_filter &filter);

// Follow-ups: a report of its own by which the person says whether an answered one is settled. It names the
// first report by the desk's id for it. The verdicts are stored and sent: never change them.
#define TAVRO_DBMGR_STILL_HAPPENS "still_happens"
#define TAVRO_DBMGR_WORKS_NOW "works_now"

// Server id of the report that this one is a follow-up to, 0 when it is none, -1 when the store cannot be
// read. A non-null `verdict` gets the stored one as a new text, or null.
int tavro_dbmgr_get_follow_up(int voc_id, char **verdict);
// Ids (GPOINTER_TO_INT; g_slist_free) of the newest 100 follow-ups to the report with this server id, oldest
// first.
GSList *tavro_dbmgr_get_follow_ups(int server_id);

svc_voc_data *tavro_dbmgr_get_voc_by_id(int voc_id);
svc_voc_data *tavro_dbmgr_get_voc_by_server_id(int server_id);
GSList *tavro_dbmgr_get_attachments(int voc_id, sqlite3 *db);

// Ids (GPOINTER_TO_INT; g_slist_free) of the complete reports whose current status is sending or failed for
// want of network, oldest first. Reads the whole table: for the service's start and retries.
GSList *tavro_dbmgr_get_vocs_to_send();

// Number of the user's reports; -1 on failure.
int tavro_dbmgr_get_voc_count(const char *user_name);
// 1 when a report has this server id, else 0; -1 when the file cannot be opened.
int tavro_dbmgr_is_voc_present(int server_id);
// Number of reports with this server id; -1 on failure, so that 0 says that there is none.
int tavro_dbmgr_get_server_voc_count(int server_id);
// 1 when the lookup ran, whether or not it found the name; -1 for null and on failure.
int tavro_dbmgr_check_if_dump_file_is_uploaded(const char *dump_name);
// 1 when a report of whichever user has this system log, 0 when none has; -1 for null and on failure.
int tavro_dbmgr_is_syslog_file_stored(const char *path);

// The files that stored reports name, as far as a name is not empty. `voc_ids` null: of all reports, which
// reads the whole store. 0, or -1 on failure; `files` then has those that were read.
enum tavro_voc_file_kind {
  TAVRO_VOC_FILE_ATTACHMENT,
  TAVRO_VOC_FILE_DEVICE_DATA,
  TAVRO_VOC_FILE_SYSLOG,
  TAVRO_VOC_FILE_DUMP,
};
struct tavro_voc_file {
  tavro_voc_file_kind kind;
  std::string path;
  int voc_id;
};
int tavro_dbmgr_get_voc_files(const std::vector<int> *voc_ids, std::vector<tavro_voc_file> *files);

// One column of one row as a new text; null when there is no row or no value.
char *tavro_dbmgr_get_voc_title_description_by_id(int voc_id);
char *tavro_dbmgr_get_voc_syslog_file_by_id(int voc_id);
char *tavro_dbmgr_get_device_data_file_by_id(int voc_id);
char *tavro_dbmgr_get_voc_description_by_id(int voc_id);
char *tavro_dbmgr_get_voc_comments_by_id(int voc_id);
char *tavro_dbmgr_get_dump_file_by_id(int voc_id);
char *tavro_dbmgr_get_app_crash_time_by_id(const char *app_id);
char *tavro_dbmgr_get_app_id_by_name(const char *app_name);

// ---- Deleting ----

// All reports and attachments; extension rows stay.
void tavro_dbmgr_destroy_vocs();
// One report with its attachments and its extension row: three critical sections in this order, the report's
// row last, so an end of the process in between leaves a report without title and attachments, to be deleted
// again.
void tavro_dbmgr_destroy_vocs_by_id(int voc_id);
// Reports with their attachments and extension rows, in one transaction: all or, on failure, none. Left alone
// is one that is being sent now. `destroyed` gets the others, those that were not there any more included. 0,
// or -1 when the store refused.
int tavro_dbmgr_destroy_vocs_by_ids(const std::vector<int> &voc_ids, std::vector<int> *destroyed);
void tavro_dbmgr_destroy_attachments_by_filename(const char *file_path);
// All reports of one kind, without their attachments and extension rows.
void tavro_dbmgr_destroy_suggestions();
void tavro_dbmgr_destroy_bug_reports();

// ---- State of a report ----

int tavro_dbmgr_set_voc_submitted_to_server(int voc_id, int status);
int tavro_dbmgr_update_sending_state(int voc_id, int status);
int tavro_dbmgr_set_voc_updated_time(int voc_id);
// Every report of the user that is being sent becomes "failed for want of network".
int tavro_dbmgr_set_voc_network_status(const char *user_name);
int tavro_dbmgr_set_voc_data_submitted_to_server(int voc_id, int server_id, int status);
int tavro_dbmgr_update_server_voc_id(int voc_id, int server_id);
int tavro_dbmgr_update_voc_retry_count(int voc_id, int count);
// Upload attempts, -1 on failure.
int tavro_dbmgr_get_voc_retry_count(int voc_id);
// The current one of stored states: the text from the last entry that is not empty to the end, for an answer
// may come without a status. Borrowed; null for null.
const char *tavro_dbmgr_current_state(const char *states);
int tavro_dbmgr_update_read_push_notifications(int voc_id, int is_read);
// Reports of all users with an answer that was not seen yet; -1 on failure. The user is not looked at.
int tavro_dbmgr_get_unread_push_notification_count(const char *user_name);

// Append a server answer to the report's histories and mark it unread. The reply is plain text and is stored
// as markup; status and reply may be null. An unknown server id changes nothing.
int _tavro_dbmgr_update_push_status_comments(const char *server_id, const char *status, const char *comments);

// ---- Installed applications and crash times ----

// Add one application; one that is listed already is refused by the store with a log line only.
void tavro_dbmgr_update_app_list(const tavro_pkg_info *app);
void tavro_dbmgr_delete_uninstalled_app(const char *pkg_id);
GSList *tavro_dbmgr_get_downloaded_app_list();  // of tavro_pkg_info
GSList *tavro_dbmgr_get_native_app_list();
void tavro_dbmgr_update_app_crash(const char *app_id);
void tavro_dbmgr_set_app_crash_time(const char *app_id);

// ---- Freeing records: every owned text, lists, then the record. Null is skipped. ----

void tavro_db_free_attachment(tavro_dbmgr_attachment_info *attachment);
void _tavro_free_attachement_list(GSList *attachments);
GSList *_tavro_copy_attachment_list(const GSList *attachments);
void tavro_dbmgr_free_voc_data(svc_voc_data *voc);
void tavro_dbmgr_free_bug_report_data(tavro_dbmgr_bug_report_info *report);
void tavro_dbmgr_free_suggestion_data(tavro_dbmgr_suggestion_info *suggestion);
// A tracked record that owns nothing.
void tavro_db_free_data(void *record);
void tavro_db_free_app_info(tavro_pkg_info *app);
