/* Notifications on the desktop's notification service, the phone's own where the machine has no desktop. A
 * handle is a form that its owner fills, posts, updates and frees; the posted notification outlives the
 * handle and the process. Nothing here waits for the service: a failure there is a log line. Touching a
 * notification sends its launch request, also when the process that posted it has ended. Texts are plain,
 * never markup. Main loop only. */
#pragma once

#include <app_control.h>
#include <notification_status.h>
#include <stdbool.h>
#include <tizen_error.h>

#ifdef __cplusplus
extern "C" {
#endif

typedef struct _notification *notification_h;

typedef enum {
  NOTIFICATION_ERROR_NONE = TIZEN_ERROR_NONE,
  NOTIFICATION_ERROR_INVALID_PARAMETER = TIZEN_ERROR_INVALID_PARAMETER,
  NOTIFICATION_ERROR_OUT_OF_MEMORY = TIZEN_ERROR_OUT_OF_MEMORY,
  NOTIFICATION_ERROR_IO_ERROR = TIZEN_ERROR_IO_ERROR,
  NOTIFICATION_ERROR_NOT_EXIST_ID = TIZEN_ERROR_NOTIFICATION | 0x04,
  NOTIFICATION_ERROR_SERVICE_NOT_READY = TIZEN_ERROR_NOTIFICATION | 0x05,
} notification_error_e;

typedef enum {
  NOTIFICATION_TYPE_NONE = -1,
  NOTIFICATION_TYPE_NOTI = 0,
  NOTIFICATION_TYPE_ONGOING,
  NOTIFICATION_TYPE_MAX,
} notification_type_e;

typedef enum {
  NOTIFICATION_TEXT_TYPE_NONE = -1,
  NOTIFICATION_TEXT_TYPE_TITLE = 0,
  NOTIFICATION_TEXT_TYPE_CONTENT,
} notification_text_type_e;

typedef enum {
  NOTIFICATION_IMAGE_TYPE_NONE = -1,
  NOTIFICATION_IMAGE_TYPE_ICON = 0,
} notification_image_type_e;

typedef enum {
  NOTIFICATION_VARIABLE_TYPE_NONE = -1,
} notification_variable_type_e;

typedef enum {
  NOTIFICATION_LAUNCH_OPTION_APP_CONTROL = 1,
} notification_launch_option_type;

/* Null when the type is unknown. */
notification_h notification_create(notification_type_e type);
int notification_free(notification_h noti);

/* `key` (a text id) is not looked up here: `text` is shown as it is; formatted arguments are not taken, the
 * last argument is always NOTIFICATION_VARIABLE_TYPE_NONE. Null removes the text. */
int notification_set_text(notification_h noti, notification_text_type_e type, const char *text,
                          const char *key, int args_type, ...);
/* `image_path`: absolute path of an image file. */
int notification_set_image(notification_h noti, notification_image_type_e type, const char *image_path);
/* `option` is an app_control_h, copied. */
int notification_set_launch_option(notification_h noti, notification_launch_option_type type, void *option);
/* Progress of an ongoing notification, 0.0 to 1.0. */
int notification_set_progress(notification_h noti, double percentage);

/* A name under which a later handle, also of another process, finds the notification. */
int notification_set_tag(notification_h noti, const char *tag);
/* A handle for what this application has posted under the tag and nobody has closed since; null when there is
 * none. It has type and tag; texts, image and launch option are to be set anew before an update. */
notification_h notification_load_by_tag(const char *tag);

int notification_post(notification_h noti);
/* Replace what this handle posted; posts when it posted nothing yet. */
int notification_update(notification_h noti);
/* What is deleted just before another one is posted is replaced by it, without a gap between the two. */
int notification_delete(notification_h noti);
/* Remove all notifications of this application and type, also those that an earlier process posted. */
int notification_delete_all(notification_type_e type);

#ifdef __cplusplus
}
#endif
