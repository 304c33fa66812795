// What the client posts outside its own window: notifications about reports, and the number on its icon.
//
// While a report is being sent one ongoing notification is up; the next notification about a result takes its
// place, also when another process of the client posted it. There is one about the desk's answers per report,
// the newest. Touching a notification brings the client up where it belongs, whether it runs or not. Nothing
// here waits for the notification service, and no text is markup. Main loop only.
#pragma once

struct appdata;

constexpr char TAVRO_APP_ID[] = "corvane.tavro-lite";

// Extra data of the launch request that a touched notification sends.
constexpr char TAVRO_NOTIFICATION_EVENT[] = "TAVRO_NOTIFICATION_EVENT";
constexpr char TAVRO_NOTIFICATION_CLICKED[] = "TAVRO_NOTIFICATION_CLICKED";
constexpr char TAVRO_NOTIFICATION_TYPE[] = "TAVRO_NOTIFICATION_TYPE";
constexpr char TAVRO_NOTIFICATION_VOC[] = "TAVRO_NOTIFICATION_VOC";        // about a report
constexpr char TAVRO_NOTIFICATION_NONVOC[] = "TAVRO_NOTIFICATION_NONVOC";  // beta programmes and other news
constexpr char TAVRO_NOTIFICATION_BETA_ID[] = "TAVRO_NOTIFICATION_BETA_ID";
constexpr char TAVRO_NOTIFICATION_NOTI_ID[] = "TAVRO_NOTIFICATION_NOTI_ID";
constexpr char TAVRO_NOTIFICATION_VOC_ID[] =
    "TAVRO_NOTIFICATION_VOC_ID";  // record id, only when one is meant

// Post a notification about the person's own action. The title says what happened (translated); the title
// "sending" makes it the ongoing one. `content` is the report's text and may be null.
void tavro_create_notification(const char *title, const char *content, appdata *ad);

// Take the ongoing notification away, for a report that was not sent after all.
void tavro_remove_sending_notification(appdata *ad);

// Post a notification about the desk's answer to a report, unless the person switched these off. `reply` may
// be null (only the status changed); `voc_id` is 0 when the report is not known.
void tavro_create_push_notification(const char *reply, int voc_id);

// Take the notification about answers to this report away, because its owner reads them now.
void tavro_remove_reply_notification(int voc_id);

// Post a notification that is not about a report, unless the person switched these off. `title` is what the
// notification says first, the client's name when it is null or empty; `content`, `beta_id` and `noti_id` may
// be null and travel as they are with the touch. A newer one of the same `noti_id` replaces the older.
void tavro_create_non_voc_notification(const char *title, const char *content, const char *beta_id,
                                       const char *noti_id);

// The number on the application's icon.
void tavro_create_noti_badge_on_appicon(int count);
void tavro_remove_noti_badge_on_appicon();

// Count the reports with unread replies anew, into push_noti_count, and show that number on the icon.
void tavro_refresh_unread_count(appdata *ad, const char *user_name);
