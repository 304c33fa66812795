/* What a running application knows about itself, and the events that the platform reports to it. The
 * application's folder is the one above the folder of its program: <folder>/bin/<id>, <folder>/res. Strings
 * are the caller's to free(). Main loop only. */
#pragma once

#include <stdbool.h>
#include <tizen_error.h>

#ifdef __cplusplus
extern "C" {
#endif

typedef enum {
  APP_ERROR_NONE = TIZEN_ERROR_NONE,
  APP_ERROR_INVALID_PARAMETER = TIZEN_ERROR_INVALID_PARAMETER,
  APP_ERROR_OUT_OF_MEMORY = TIZEN_ERROR_OUT_OF_MEMORY,
  APP_ERROR_INVALID_CONTEXT = TIZEN_ERROR_APPLICATION | 0x01,
  APP_ERROR_NO_SUCH_FILE = TIZEN_ERROR_NO_SUCH_FILE,
  APP_ERROR_NOT_SUPPORTED = TIZEN_ERROR_NOT_SUPPORTED,
  APP_ERROR_ALREADY_RUNNING = TIZEN_ERROR_ALREADY_IN_PROGRESS,
  APP_ERROR_PERMISSION_DENIED = TIZEN_ERROR_PERMISSION_DENIED,
} app_error_e;

typedef enum {
  APP_EVENT_LOW_MEMORY,
  APP_EVENT_LOW_BATTERY,
  APP_EVENT_LANGUAGE_CHANGED,
  APP_EVENT_DEVICE_ORIENTATION_CHANGED,
  APP_EVENT_REGION_FORMAT_CHANGED,
} app_event_type_e;

typedef struct app_event_handler *app_event_handler_h;
typedef struct app_event_info *app_event_info_h;
typedef void (*app_event_cb)(app_event_info_h event_info, void *user_data);

int app_get_id(char **id);
/* Version of the application's own package; APP_ERROR_INVALID_CONTEXT when it has no desktop entry. */
int app_get_version(char **version);
/* Folders, each with a slash at the end; null when the process is no application. */
char *app_get_resource_path(void);
char *app_get_data_path(void);
char *app_get_shared_data_path(void);

#ifdef __cplusplus
}
#endif
