// Handlers of the launch dispatch for news that is not the fate of an upload: replies to reports, beta
// programmes, banners, log-out, shared files and touched notifications. Each reads the service's
// answer from the preferences or the request and brings the screen concerned in step. Main loop only.
#pragma once

#include <app_control.h>

struct appdata;

// Replies and status changes of reports; the store holds them already.
void tavro_handle_push_notifications(app_control_h service, appdata *ad);
void tavro_handle_community_replies(appdata *ad);

void tavro_handle_banner_info(app_control_h service, appdata *ad);
void tavro_handle_beta_join(app_control_h service, appdata *ad);
void tavro_handle_beta_details(app_control_h service, appdata *ad);
void tavro_handle_quit_beta(app_control_h service, appdata *ad);
void tavro_handle_opt_in_beta(app_control_h service, appdata *ad);
void tavro_handle_opt_out_beta(app_control_h service, appdata *ad);
void tavro_handle_user_beta_status(app_control_h service, appdata *ad);
void tavro_handle_user_logout(app_control_h service, appdata *ad);
void tavro_handle_non_voc_push_noti(app_control_h service, appdata *ad);
void tavro_handle_beta_push_noti(app_control_h service, appdata *ad);

void tavro_handle_log_dump_event(app_control_h service, appdata *ad);
void tavro_handle_share_event(app_control_h service, appdata *ad);

// A touched notification. A report's one opens the history, and the report when the request names it; all
// others bring the window up. `type`, `beta_id` and `noti_id` may be null.
void tavro_handle_notification_event(app_control_h request, appdata *ad, const char *type,
                                     const char *beta_id, const char *noti_id);

// The popup that says that a report could not be sent and will go out by itself later.
void tavro_create_server_connection_fail_popup(appdata *ad);
