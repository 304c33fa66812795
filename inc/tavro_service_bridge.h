// What the client asks of other programs: the upload service, the platform's crash service, the application
// store and the browser.
//
// Every call hands one message over and returns; answers, where there are any, arrive later as launch
// requests of their own. A platform call that fails is logged with its code, the rest of the message still
// goes out, nothing is tried again. Main loop only.
#pragma once

constexpr char TAVRO_SVC_APP_ID[] = "corvane.tavro-svc";

// Operations of the upload service; it matches these texts.
constexpr char TAVRO_SEND_FAILED_VOC[] = "TAVRO_SEND_FAILED_VOC";
constexpr char TAVRO_OPERATION_TYPE_UI[] = "TAVRO_OPERATION_TYPE_UI";
constexpr char TAVRO_OPERATION_TYPE_APP_UPDATE[] = "TAVRO_OPERATION_TYPE_APP_UPDATE";
constexpr char TAVRO_OPERATION_TYPE_GET_BANNERS[] = "TAVRO_OPERATION_TYPE_GET_BANNERS";
constexpr char TAVRO_OPERATION_TYPE_GET_BETA_DETAILS[] = "TAVRO_OPERATION_TYPE_GET_BETA_DETAILS";
constexpr char TAVRO_OPERATION_TYPE_GET_BETA_LIST[] = "TAVRO_OPERATION_TYPE_GET_BETA_LIST";
constexpr char TAVRO_OPERATION_TYPE_GET_BETA_URLS[] = "TAVRO_OPERATION_TYPE_GET_BETA_URLS";
constexpr char TAVRO_OPERATION_TYPE_GET_BOARDS_URL[] = "TAVRO_OPERATION_TYPE_GET_BOARDS_URL";
constexpr char TAVRO_OPERATION_TYPE_GET_MAX_LIMIT[] = "TAVRO_OPERATION_TYPE_GET_MAX_LIMIT";
constexpr char TAVRO_OPERATION_TYPE_GET_MODEL_ALIAS_STATUS[] = "TAVRO_OPERATION_TYPE_GET_MODEL_ALIAS_STATUS";
constexpr char TAVRO_OPERATION_TYPE_GET_USER_BETA_STATUS[] = "TAVRO_OPERATION_TYPE_GET_USER_BETA_STATUS";
constexpr char TAVRO_OPERATION_TYPE_OPT_IN_BETA[] = "TAVRO_OPERATION_TYPE_OPT_IN_BETA";
constexpr char TAVRO_OPERATION_TYPE_OPT_OUT_BETA[] = "TAVRO_OPERATION_TYPE_OPT_OUT_BETA";
constexpr char TAVRO_OPERATION_TYPE_REGISTER_USER_CLICK[] = "TAVRO_OPERATION_TYPE_REGISTER_USER_CLICK";

// Send one request to the upload service. `value` is a report's id, a beta id or a switch, as the operation
// needs it; operations that need nothing ignore it. A null operation sends an empty operation type.
void _tavro_launch_upload_mgr_svc(const char *operation, int value);

// Tell the service that the person touched an item of the beta pages: kind "general" or "banner".
void _tavro_send_beta_click_event_to_svc(const char *item_kind, long item_id);

// Open a page of the application store, or a page in the phone's browser. False when the phone has none that
// would take it: the caller tells the person.
bool _tavro_launch_app_store(const char *uri);
bool tavro_launch_browser(const char *uri);

// Send a one-way message on the system bus. `signature` is "(iss)" for the method "dump_log" and "(is)" for
// any other, or null for a message without a body; `parameters` holds its values as text, a number in
// decimal. 0 once the message was built and handed over, also when the bus then refuses it; -1 when the bus
// or the message cannot be had.
int _tavro_dbus_method_sync(const char *destination, const char *path, const char *interface,
                            const char *method, const char *signature, const char *const parameters[]);
