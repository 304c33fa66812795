// Report drafts: turns what was typed and attached on a compose screen into a stored report, and hands a
// report that is to be sent to the upload service.
//
// The compose screens own their records (problem_view, idea_view of appdata) while they are open; a save ends
// them, unless an automatic save is under way (auto_saved_id is not 0), which keeps the screen open. All of
// it runs on the main loop. On disk: rows of the store, the device status file of a sent problem report.
#pragma once

#include <Elementary.h>
#include <glib.h>

struct appdata;
struct tavro_dbmgr_bug_report_info;
struct tavro_dbmgr_suggestion_info;

// What the two compose screens have in common. Texts and lists belong to the record (tracked blocks).
struct compose_view_win {
  Evas_Object *layout;
  Evas_Object *entry;  // description
  Evas_Object *title_entry;
  Evas_Object *menu_popup;
  Elm_Object_Item *nf_it;
  GSList *attachments;  // file paths, each a tracked char *
  char *description;    // UTF-8 copies of the entries, filled when the report is saved
  char *title_description;
  char *app_name;  // target: an application's name or the string id of a fixed category
  char *app_icon;  // path of the target's icon, may be null
  gint64 buffer;   // total size of the attachments in bytes, kept by the screen

  // What is being captured for this report: the file that is to come, and "jpg" or "mp4". Null: nothing is.
  char *filename;
  char *file_type;

  // The screen's other widgets; the saver does not look at them.
  Evas_Object *target_button;
  Evas_Object *strip;    // box of the attachments' thumbnails
  Evas_Object *bottom;   // size shown against the limit
  Evas_Object *log_row;  // system log of a problem; null on the idea screen
};

// The problem report screen.
struct problem_view_win : compose_view_win {
  Evas_Object *collectBtn;  // shown while a log can be collected
  Evas_Object *dump_row;    // crash dump of the report, or why it has none; null when there is nothing to say
  char *dump_filename;
  char *dump_filepath;
  char *syslog_filename;
  char *syslog_filepath;
  bool server_size_error;         // the last check found the report larger than the limit
  bool is_device_status_removed;  // the person took the device status off what is sent
};

// The idea screen.
struct idea_view_win : compose_view_win {};

// Longest path tavro_generate_filename writes, with its ending null.
constexpr size_t kGeneratedFilenameSize = 4096;

// Store the open problem report or idea with `status` (TAVRO_STATUS_SENDING or TAVRO_STATUS_DRAFT_SAVED) and,
// when it is to be sent, post the sending notification and tell the upload service. Return the new record id
// (1 or more), a value below 1 when storing failed, 0 when no such screen is open.
int tavro_save_problem_compose_data(appdata *ad, int status);
int tavro_save_idea_compose_data(appdata *ad, int status);

// Store a problem report that no screen holds and have it sent, with the sending notification. The record
// stays the caller's. Returns its id; below 1: nothing was stored and nothing is sent.
int tavro_send_report(appdata *ad, tavro_dbmgr_bug_report_info *report);

// The Done action and the "save as draft" entry, from either compose screen: save, and when the new record is
// stored remove the draft that the screen was opened from and an automatically saved copy, so that neither a
// full disk nor an end in between loses what was stored before. `type` decides which saver runs. Below 1:
// nothing was stored and the screen is as it was; -1 with a toast when a problem report is above the size
// limit.
int tavro_send_compose_data(appdata *ad);
int tavro_save_compose_draft(appdata *ad);

// The largest total of attachments in bytes that may be sent, from the preference
// "TAVRO_PREF_MAX_SIZE_ATTACHMENT" (kilobytes; 30 MB when it is unset or not above 0, 1 GB at most).
gint64 tavro_attachment_size_limit();

// Write into `filename` the path of a new file in the client's media folder, named after the local time; the
// buffer is left untouched when the folder cannot be made.
void tavro_generate_filename(char (&filename)[kGeneratedFilenameSize], const char *extension);

// A new list of tavro_dbmgr_attachment_info, one per path and in the same order; free it with
// _tavro_free_attachement_list.
GSList *tavro_populate_attachment_info(const GSList *paths);

// Write the device status file and put its name into the record, also when the file could not be written.
void tavro_add_extra_data_file(tavro_dbmgr_bug_report_info *report);

// Whether a problem with this target (application name or string id of a category) must carry the system log.
bool isLogMandatory(const char *appname);

// Free what a record owns and the record's lists; tolerate absent members. The view functions leave the
// record itself to the caller, who clears its field of appdata.
void tavro_free_bug_report(tavro_dbmgr_bug_report_info *report);
void tavro_free_suggestion_info(tavro_dbmgr_suggestion_info *suggestion);
void tavro_free_problem_view(problem_view_win *view);
void tavro_free_idea_view(idea_view_win *view);

// End the open compose record, whichever it is, with its menu: free it and clear its field of appdata.
void tavro_free_compose_view(appdata *ad);
