// Keys of the phone's preference store that the client and the upload service share, and safe reads of them.
//
// The keys are an interface between two programs: append-only, never renamed. A key that is absent, or that
// somebody stored with another type, reads as "no value"; the caller goes on. Main loop only.
#pragma once

#include <app_preference.h>

#include "tavro_memory.h"

// Settings of the person.
constexpr char TAVRO_PREF_NOTIFY[] = "tavro_notify";            // boolean: show push notifications
constexpr char TAVRO_PREF_FEEDBACK[] = "tavro_feedback";        // boolean: send over mobile data
constexpr char TAVRO_PREF_ATTACH_LOGS[] = "tavro_attach_logs";  // boolean: attach system logs by default
constexpr char TAVRO_PREF_THEME[] = "tavro_theme";              // "light" (when absent) or "dark"

// State of the client.
constexpr char TAVRO_PREF_SYSLOGS[] = "tavro_syslogs";  // boolean: a log collection is requested
constexpr char TAVRO_PREF_MAX_SIZE_ATTACHMENT[] = "TAVRO_PREF_MAX_SIZE_ATTACHMENT";   // int, kilobytes
constexpr char TAVRO_PREF_FLASH_WINDOWS[] = "tavro_flash_windows";                    // int: borders shown
constexpr char TAVRO_PREF_QUALITY[] = "tavro_quality";                                // int: recording
constexpr char TAVRO_PREF_PREFERENCE[] = "tavro_preference";                          // int: first run
constexpr char TAVRO_PREF_NEW_WELCOME_PREFERENCE[] = "tavro_new_welcome_preference";  // int
constexpr char TAVRO_PREF_SENT_PAGE_SEEN[] = "tavro_sent_page_seen";  // boolean: "What is sent" was shown
// Crashes: the ids of applications that are never asked about, one a line, and when which crashed last.
constexpr char TAVRO_PREF_CRASH_NEVER[] = "tavro_crash_never";
constexpr char TAVRO_PREF_CRASH_TIMES[] = "tavro_crash_times";
constexpr char TAVRO_PREF_UPDATE[] = "tavro_update";  // string: "updated" once a minor update was offered

// The account; all but the maker's user name are removed at log-out.
constexpr char TAVRO_PREF_USERNAME[] = "tavro_username";
constexpr char TAVRO_PREF_PASSWORD[] = "tavro_password";
constexpr char TAVRO_PREF_ACCOUNT_DOMAIN[] = "tavro_account_domain";
constexpr char TAVRO_PREF_CORVANE_USER_NAME[] = "tavro_corvane_user_name";

// Written by the upload service. Strings, unless a line says otherwise.
constexpr char TAVRO_PREF_DOMAIN[] = "tavro_domain";
constexpr char TAVRO_PREF_COOKIE_VAL[] = "tavro_cookie_val";
constexpr char TAVRO_PREF_COOKIE_NAME[] = "tavro_cookie_name";
constexpr char TAVRO_PREF_COOKIE_EXPIRY_TIME[] = "tavro_cookie_expiry_time";  // int, seconds since the epoch
constexpr char TAVRO_PREF_COMM_SESSION_KEY[] = "tavro_comm_sessionKey";
constexpr char TAVRO_PREF_DEVICE_UID[] = "tavro_deviceUid";
constexpr char TAVRO_PREF_AUTH_SECRET[] = "tavro_auth_secret";
constexpr char TAVRO_PREF_COMM_NUM_REPLIES[] = "tavro_comm_num_replies";
constexpr char TAVRO_PREF_LICENCE_URL[] = "tavro_licence_url";
constexpr char TAVRO_PREF_QA_URL[] = "tavro_qa_url";
constexpr char TAVRO_PREF_MY_POSTS_URL[] = "tavro_my_posts_url";
constexpr char TAVRO_PREF_CREATE_POST_URL[] = "tavro_create_post_url";
constexpr char TAVRO_PREF_BETA_FAQ_URL[] = "tavro_beta_faq_url";
constexpr char TAVRO_PREF_BETA_TERMS_URL[] = "tavro_beta_terms_url";
constexpr char TAVRO_PREF_BETA_OPTIN_OS_HELP_URL[] = "tavro_beta_optin_os_help_url";
constexpr char TAVRO_PREF_BETA_OPTOUT_APP_HELP_URL[] = "tavro_beta_optout_app_help_url";
constexpr char TAVRO_PREF_BETA_OPTOUT_OS_HELP_URL[] = "tavro_beta_optout_os_help_url";
constexpr char TAVRO_PREF_BETA_TESTING_URL[] = "tavro_beta_testing_url";
constexpr char TAVRO_PREF_APP_RESULT_CODE[] = "tavro_app_result_code";  // decimal text
constexpr char TAVRO_PREF_APP_VERSION[] = "tavro_app_version";
constexpr char TAVRO_PREF_APP_VERSION_CHANGE[] = "tavro_app_version_change";  // "major" or "minor"
constexpr char TAVRO_PREF_APP_UPDATE_TIME[] = "tavro_app_update_time";        // milliseconds, decimal text
constexpr char TAVRO_PREF_BETA_USER_STATUS_CODE[] = "tavro_get_beta_user_status_code";  // int
constexpr char TAVRO_PREF_BETA_USER_STATUS_MSG[] = "tavro_get_beta_user_status_msg";
constexpr char TAVRO_PREF_JOIN_BETA_STATUS_CODE[] = "tavro_join_beta_program_status_code";  // int
constexpr char TAVRO_PREF_JOIN_BETA_STATUS_MSG[] = "tavro_join_beta_program_status_msg";
constexpr char TAVRO_PREF_QUIT_BETA_STATUS_CODE[] = "tavro_quit_beta_program_status_code";  // int
constexpr char TAVRO_PREF_QUIT_BETA_STATUS_MSG[] = "tavro_quit_beta_program_status_msg";
constexpr char TAVRO_PREF_OPT_IN_STATUS_CODE[] = "tavro_opt_in_status_code";    // int
constexpr char TAVRO_PREF_OPT_OUT_STATUS_CODE[] = "tavro_opt_out_status_code";  // int
constexpr char TAVRO_PREF_OPT_OUT_STATUS_MSG[] = "tavro_opt_out_status_msg";
constexpr char TAVRO_PREF_LOG_OUT_STATUS_CODE[] = "tavro_user_log_out_status_code";  // int
constexpr char TAVRO_PREF_LOG_OUT_STATUS_MSG[] = "tavro_user_log_out_status_msg";

// The text under a key; null when there is none. `error` (may be null) gets the platform's code.
TavroText tavro_preference_text(const char *key, int *error = nullptr);

// The number under a key, `fallback` when there is none.
int tavro_preference_int(const char *key, int fallback);

// The switch under a key, `fallback` when there is none.
bool tavro_preference_flag(const char *key, bool fallback);

// The signed-in account's user name; null before an account was chosen.
TavroText tavro_get_username_from_preference();

// Whether the person who is signed in may see what is stored for this user: it is their own, or, with a null
// or empty name, nobody's.
bool tavro_is_for_signed_in_user(const char *user_name);
