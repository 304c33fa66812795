// The one public function of each screen, and what the launch dispatch calls to keep open screens in step
// with the store. Main loop only. None of them takes ownership of its arguments.
#pragma once

#include <app_control.h>
#include <glib.h>

struct appdata;
struct svc_voc_data;

// Landing page, pushed as the first page of the naviframe.
void tavro_create_landing_page(appdata *ad);
// Show push_noti_count at the "My Reports" row; nothing when the landing page is not built.
void tavro_update_landing_page_history_badge(appdata *ad);

// Welcome and account choice, shown until an account is stored in "tavro_username".
void tavro_create_account_page(appdata *ad);
// Say something on it in place of its greeting, plain text; nothing when the page is not open.
void tavro_account_page_say(appdata *ad, const char *text);
// Read the phone's accounts anew; nothing when the page is not open.
void tavro_refresh_account_page_items(appdata *ad);

// Make room for another compose page: true when none is open, or the open one held nothing to lose and is
// gone. Otherwise it is brought before the person with the question what to do with it.
bool tavro_leave_compose_page(appdata *ad);

// What an earlier run left of a compose screen, offered in a popup (go on writing, keep as a draft, discard)
// once for each landing page, and again when a compose screen came up under it. Nothing when there is none,
// when another page is in front, or without a window.
void tavro_compose_keeper_offer(appdata *ad);

// Compose screens. A non-null draft fills the screen and sets id_to_delete.
void tavro_create_problem_page(appdata *ad, const svc_voc_data *draft);
void tavro_create_idea_page(appdata *ad, const svc_voc_data *draft);

// A new problem report about an application that crashed. Asks for the system log.
struct tavro_crash_report {
  const char *app_name;
  const char *app_icon;  // path, may be null
  const char *archive;   // of the dump; null: none was found or, when it has_failed, collecting failed
  bool has_failed;
};
void tavro_create_crash_page(appdata *ad, const tavro_crash_report &report);

// Pickers, which report once through their callback and pop themselves.
// `name` is an application's name or the string id of a fixed category; `icon` a path, may be null.
using tavro_target_chosen = void (*)(appdata *ad, const char *name, const char *icon);
void tavro_create_target_picker(appdata *ad, tavro_target_chosen chosen);
// `paths` is a list of const char *, valid during the call only, in the order of choosing.
using tavro_pictures_chosen = void (*)(appdata *ad, const GSList *paths);
void tavro_create_gallery_picker(appdata *ad, tavro_pictures_chosen chosen);

// What will be sent: text, every file with its size, the device status as it will be written, the log, the
// account. Each can be opened; files, log and device status can be removed, which changes the open compose
// screen. `send` is called once when the person sends from there; null shows the page without a send button.
using tavro_review_send = void (*)(appdata *ad);
void tavro_create_review_page(appdata *ad, tavro_review_send send);

// One picture or video of the phone, as large as the screen. One plain text, scrolled, in parts when it is
// long; a log keeps its columns. The end of a system log, from the archive it lies in; a popup says so when
// it cannot be read. All arguments are copied. `can_save` offers a copy among the phone's pictures.
void tavro_create_picture_page(appdata *ad, const char *path, bool can_save = false);
void tavro_create_log_page(appdata *ad, const char *title, const char *path);
void tavro_create_text_page(appdata *ad, const char *title, const char *text, bool is_log = false);

// History list "My Reports", and its refresh after a message of the upload service (does nothing when the
// page is not open). The request may be null.
void tavro_create_history_page(appdata *ad);
void tavro_update_history_page(app_control_h service, appdata *ad);

// Details of one stored report. Opening it marks its replies as read and clears the badge.
void tavro_create_history_details_page(appdata *ad, int voc_id);
// Reload an open details page; does nothing when another report, or none, is shown.
void tavro_update_history_details_page(appdata *ad, int voc_id);
