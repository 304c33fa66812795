// The application state record and the enumerations that every part of the client shares.
//
// One appdata lives for the whole process, in main's frame, zeroed, and is the user data of every life cycle
// callback. It is read and written on the main loop only; voc_list_lock is its one mutex. Widgets belong to
// the window, the texts and lists to the record (released by tavro_dealloc_memory).
#pragma once

#include <Elementary.h>
#include <glib.h>
#include <notification.h>

#include "tavro_type.h"

// The community page to open next; TAVRO_COMMUNITY_MAX also means that none is chosen.
enum Community_url_type {
  TAVRO_COMMUNITY_LICENSE = 0,
  TAVRO_COMMUNITY_QA = 1,
  TAVRO_COMMUNITY_MYPOSTS = 2,
  TAVRO_COMMUNITY_NEWPOST = 3,
  TAVRO_FORUM_URL = 4,
  TAVRO_COMMUNITY_MYPOSTS_UNREAD = 5,
  TAVRO_BETA_FAQ_URL = 6,
  TAVRO_BETA_TNC_URL = 7,
  TAVRO_BETA_OPT_IN_STEPS_URL = 8,
  TAVRO_BETA_OPT_OUT_APP_URL = 9,
  TAVRO_BETA_OPT_OUT_OS_URL = 10,
  TAVRO_BETA_DISCUSSION_URL = 11,
  TAVRO_BETA_NON_VOC_URL = 12,
  TAVRO_COMMUNITY_MAX = 13,
};

// What the floating capture control takes.
enum captureType {
  UNDEFINED = 0,
  IMAGE = 1,
  VIDEO = 2,
};

// Whether the user takes part in a beta programme.
enum betaUserType {
  UNKNOWN_STATUS = 0,
  BETA = 1,
  NON_BETA = 2,
};

// Answer of the capture service.
enum cpMgrResponseType {
  INITIAL = 0,
  RESPONSE = 1,
  NO_RESPONSE = 2,
};

// What the user is composing.
enum reportType {
  NONE = 0,
  PROBLEM = 1,
  IDEA = 2,
  HISTORY = 3,
  CRASH = 4,
};

// Kind of a stored report.
enum historyType {
  NIL = 0,
  BUG = 1,
  SUGGESTION = 2,
  ERROR = 3,
};

// Which list of the beta centre a programme was opened from.
enum betaLaunchType {
  BETA_OPTED_FOR = 0,
  BETA_AVAILABLE = 1,
  BETA_TYPE_NA = 2,
};

using betaType = betaLaunchType;

// Records of the screens and of the store, each defined by its owner.
struct history_app_data_s;
struct problem_view_win;
struct category_view_win;
struct apps_view_win;
struct idea_view_win;
struct vantor_forum_view_win;
struct cb_data_b;
struct tabbar_view_win;
struct beta_details_win;
struct beta_notification_view_win;
struct beta_center_view_win;
struct performance_category_view_win;
struct tavro_dbmgr_beta_details_s;
struct banner_info_s;

struct appdata {
  // Window and navigation.
  Evas_Object *win;
  Evas_Object *layout;
  Evas_Object *conform;
  Evas_Object *nf;
  Evas_Object *genlist;
  Elm_Object_Item *tnc_nf_it;
  Elm_Object_Item *landing_nf_it;
  history_app_data_s *history_ad;
  Eina_Lock voc_list_lock;
  bool history_scroll_status;

  // Accounts.
  Evas_Object *account_genlist;
  Evas_Object *account_layout;
  Elm_Object_Item *corvane_list_item;

  // Image editor and attachments.
  GSList *image_list;
  char *ie_app_name;
  char *ie_app_id;
  char *ie_app_icon;
  Evas_Object *settings_layout;
  Evas_Object *about_layout;
  Evas_Object *crop_layout;
  Evas_Object *select_box;
  Evas_Object *main_image;
  char *main_image_file;
  Ecore_Idler *handler;
  GSList *ie_select_box_list;

  // Screen recording and the floating capture control.
  int video_timer_count;  // seconds
  Ecore_Timer *video_timer;
  Evas_Object *video_time_win;
  Evas_Object *video_timer_layout;
  Evas_Object *minicontrol_win;
  Evas_Object *minicontrol_layout;
  Evas_Object *minicontrol_indi_win;
  Evas_Object *minicontrol_indi_layout;
  int add_video_to_tavro;  // 1: attach the finished recording to the report
  int cancel_video_recording;
  int cpmgr_handle;
  Ecore_Event_Handler *quickpanel_event_handler;
  Ecore_Event_Handler *orientation_change_handler;
  int device_orientation;
  int recording_status;           // 0: not recording
  int screen_recorder_is_latest;  // 1: the capture service speaks the current protocol
  int is_attachment_open;
  Evas_Object *flash_win_1;
  Evas_Object *flash_win_2;
  Evas_Object *flash_win_3;
  Evas_Object *flash_win_4;
  Evas_Object *flash_win_5;
  Evas_Object *flash_win_6;
  Evas_Object *flash_layout_1;
  Evas_Object *flash_layout_2;
  Evas_Object *flash_layout_3;
  Evas_Object *flash_layout_4;
  Evas_Object *flash_layout_5;
  Evas_Object *flash_layout_6;

  // Popups, each null when it is not shown.
  Evas_Object *version_popup;
  Evas_Object *delete_fd_popup;
  Evas_Object *delete_popup;
  Evas_Object *history_edit_popup;
  Evas_Object *history_file_popup;
  Evas_Object *settings_popup;
  Evas_Object *imgedit_popup;
  Evas_Object *cancel_popup;
  Evas_Object *connection_popup;
  Evas_Object *crash_popup;
  Evas_Object *signout_popup;
  Evas_Object *crashpopup_win;
  Evas_Object *cpmgr_popup;
  Evas_Object *quit_beta_popup;
  Evas_Object *next_steps_popup;
  Evas_Object *corvane_account_optin_popup;
  Evas_Object *opt_out_popup;

  // Community web view.
  Evas_Object *webview;
  Evas_Object *browser_layout;
  Evas_Object *browser_progressbar;
  int cookie_set;
  int load_urls_to_webview;          // 1 once the forum's addresses are known and may be loaded
  Community_url_type comm_url_type;  // TAVRO_COMMUNITY_MAX when no page is chosen

  // Theme.
  GSList *color_table;
  GSList *font_table;

  // Screens, each null when the screen is not built.
  problem_view_win *problem_view;
  category_view_win *category_view;
  apps_view_win *apps_view;
  idea_view_win *idea_view;
  int auto_saved_id;  // 0: none, -1: an automatic save is under way, else the draft's id
  vantor_forum_view_win *vantor_forum_view;
  cb_data_b *index_cb_data;
  tabbar_view_win *tabbar_view;
  beta_details_win *beta_details_view;
  beta_notification_view_win *beta_notification_view;
  beta_center_view_win *beta_center_view;

  // Catalogue data.
  tavro_dbmgr_beta_details_s *beta_details;
  banner_info_s *banner_info;
  GSList *banner_list;
  GSList *available_beta_list;
  GSList *opted_beta_list;

  // Crash and report context.
  char *attachment_name;
  char *crashed_appname;
  char *crashed_appId;
  int push_noti_count;
  int id_to_delete;  // store id of the draft that the open compose screen came from; 1 and more are valid
  double gengrid_item_height;
  double gengrid_item_width;
  Elm_Object_Item *view_discussions_nf_it;
  Elm_Object_Item *start_discussions_nf_it;
  Elm_Object_Item *vantor_forum_nf_it;
  Elm_Object_Item *new_replies_nf_it;
  notification_h noti;
  bool badge_status;
  bool IsJoinClicked;
  betaUserType bType;
  cpMgrResponseType rType;
  reportType type;
  captureType cType;
  historyType hType;
  betaType betaLType;
  int handle;
  bool pause_on_lock;
  bool video_paused;
  bool isPerformanceApp;  // the report's target is a performance category
  performance_category_view_win *performance_category_view;
};
using appdata_s = appdata;
