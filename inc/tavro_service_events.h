// What the upload service reports about the person's reports: the result of an upload, the desk's answers, a
// newer client. Each kind has its key in the request; they are examined in a fixed order. A client without a
// window ends itself after an upload that went well and after a reply. Main loop only.
#pragma once

#include <app_control.h>

struct appdata;

constexpr char TAVRO_COMM_PUSH[] = "TAVRO_COMM_PUSH";
constexpr char TAVRO_PUSH_NUM_REPLIES[] = "TAVRO_PUSH_NUM_REPLIES";
constexpr char TAVRO_APP_UPDATE_STATUS[] = "TAVRO_APP_UPDATE_STATUS";
constexpr char TAVRO_SERVER_UPLOAD_STATUS[] = "TAVRO_SERVER_UPLOAD_STATUS";
constexpr char TAVRO_SERVER_UPLOAD_SUCCESS[] = "TAVRO_SERVER_UPLOAD_SUCCESS";
constexpr char TAVRO_SERVER_UPLOAD_FAIL[] = "TAVRO_SERVER_UPLOAD_FAIL";
constexpr char TAVRO_SERVER_PUSH_NOTI_VOC_ID[] = "TAVRO_SERVER_PUSH_NOTI_VOC_ID";
constexpr char TAVRO_SERVER_PUSH_NOTI_STATUS[] = "TAVRO_SERVER_PUSH_NOTI_STATUS";
constexpr char TAVRO_SERVER_PUSH_NOTI_UPDATED[] = "TAVRO_SERVER_PUSH_NOTI_UPDATED";
constexpr char TAVRO_SERVER_PUSH_NOTI_VOC_COMMENTS[] = "TAVRO_SERVER_PUSH_NOTI_VOC_COMMENTS";

void tavro_handle_service_updates(app_control_h service, appdata *ad);
void tavro_handle_upload_status(app_control_h service, appdata *ad, const char *upload_status);
void tavro_handle_badge_notifications(app_control_h service, appdata *ad);
