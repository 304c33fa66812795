/* Launch requests: what one application asks of another, and the answer. A request is a handle that its
 * creator destroys; the one that app_control callbacks receive belongs to the platform and is cloned by
 * whoever wants to answer later. Requests of one sender arrive in order; extra data keep the order of their
 * addition. Main loop only, except that create, clone, setters and getters may be used anywhere on an own
 * handle. Strings that getters return are freed with free(). */
#pragma once

#include <stdbool.h>
#include <tizen_error.h>

#ifdef __cplusplus
extern "C" {
#endif

typedef struct app_control_s *app_control_h;

typedef enum {
  APP_CONTROL_ERROR_NONE = TIZEN_ERROR_NONE,
  APP_CONTROL_ERROR_INVALID_PARAMETER = TIZEN_ERROR_INVALID_PARAMETER,
  APP_CONTROL_ERROR_OUT_OF_MEMORY = TIZEN_ERROR_OUT_OF_MEMORY,
  APP_CONTROL_ERROR_APP_NOT_FOUND = TIZEN_ERROR_APPLICATION | 0x21,
  APP_CONTROL_ERROR_KEY_NOT_FOUND = TIZEN_ERROR_KEY_NOT_AVAILABLE,
  APP_CONTROL_ERROR_KEY_REJECTED = TIZEN_ERROR_KEY_REJECTED,
  APP_CONTROL_ERROR_INVALID_DATA_TYPE = TIZEN_ERROR_APPLICATION | 0x22,
  APP_CONTROL_ERROR_LAUNCH_REJECTED = TIZEN_ERROR_APPLICATION | 0x23,
  APP_CONTROL_ERROR_PERMISSION_DENIED = TIZEN_ERROR_PERMISSION_DENIED,
  APP_CONTROL_ERROR_LAUNCH_FAILED = TIZEN_ERROR_APPLICATION | 0x24,
  APP_CONTROL_ERROR_TIMED_OUT = TIZEN_ERROR_TIMED_OUT,
} app_control_error_e;

typedef enum {
  APP_CONTROL_RESULT_APP_STARTED = 1,
  APP_CONTROL_RESULT_SUCCEEDED = 0,
  APP_CONTROL_RESULT_FAILED = -1,
  APP_CONTROL_RESULT_CANCELED = -2,
} app_control_result_e;

#define APP_CONTROL_OPERATION_DEFAULT "http://tizen.org/appcontrol/operation/default"
#define APP_CONTROL_OPERATION_VIEW "http://tizen.org/appcontrol/operation/view"
#define APP_CONTROL_OPERATION_PICK "http://tizen.org/appcontrol/operation/pick"
#define APP_CONTROL_OPERATION_SHARE "http://tizen.org/appcontrol/operation/share"
#define APP_CONTROL_OPERATION_MULTI_SHARE "http://tizen.org/appcontrol/operation/multi_share"
#define APP_CONTROL_DATA_PATH "http://tizen.org/appcontrol/data/path"
#define APP_CONTROL_DATA_SELECTED "http://tizen.org/appcontrol/data/selected"
#define APP_CONTROL_DATA_TEXT "http://tizen.org/appcontrol/data/text"

/* Return false to stop the walk. */
typedef bool (*app_control_extra_data_cb)(app_control_h app_control, const char *key, void *user_data);

/* `reply` is null when no answer can come any more (result FAILED) or the receiver sent none. Both handles
 * belong to the platform. */
typedef void (*app_control_reply_cb)(app_control_h request, app_control_h reply, app_control_result_e result,
                                     void *user_data);

int app_control_create(app_control_h *app_control);
int app_control_destroy(app_control_h app_control);
int app_control_clone(app_control_h *clone, app_control_h app_control);

/* A null value unsets; a getter of an unset value gives null and no error. */
int app_control_set_operation(app_control_h app_control, const char *operation);
int app_control_get_operation(app_control_h app_control, char **operation);
int app_control_set_uri(app_control_h app_control, const char *uri);
int app_control_get_uri(app_control_h app_control, char **uri);
int app_control_set_mime(app_control_h app_control, const char *mime);
int app_control_get_mime(app_control_h app_control, char **mime);
int app_control_set_app_id(app_control_h app_control, const char *app_id);
int app_control_get_app_id(app_control_h app_control, char **app_id);

/* Adding a key again replaces its value and keeps its place. Texts must be valid UTF-8. */
int app_control_add_extra_data(app_control_h app_control, const char *key, const char *value);
int app_control_remove_extra_data(app_control_h app_control, const char *key);
int app_control_get_extra_data(app_control_h app_control, const char *key, char **value);
/* Called once for each key. */
int app_control_foreach_extra_data(app_control_h app_control, app_control_extra_data_cb callback,
                                   void *user_data);

/* Several values under one key, in order. On the bus each is a pair of its own under the repeated key, so an
 * array of a single value arrives as a plain one. The getter for the other kind of value fails with
 * INVALID_DATA_TYPE. Each text of the array that is got, and the array itself, are freed with free(). */
int app_control_add_extra_data_array(app_control_h app_control, const char *key, const char *value[],
                                     int length);
int app_control_get_extra_data_array(app_control_h app_control, const char *key, char ***value, int *length);
int app_control_is_extra_data_array(app_control_h app_control, const char *key, bool *array);

/* Hand the request to the application that its app id names; the phone starts it if need be. The request is
 * copied: the handle may be destroyed right after. With a callback, that is called once, whatever happens and
 * however long it takes; without one, nothing comes back, but an unknown application is still an error here.
 * A view request without an application goes to the one that the machine has for the uri's type, one to the
 * phone's browser or application store, where there is none, to the machine's for the uri's scheme; these
 * take no callback. */
int app_control_send_launch_request(app_control_h app_control, app_control_reply_cb callback,
                                    void *user_data);

/* Answer a received request, once. A request that nobody answers is answered SUCCEEDED without data when its
 * last handle is destroyed. */
int app_control_reply_to_launch_request(app_control_h reply, app_control_h request,
                                        app_control_result_e result);

#ifdef __cplusplus
}
#endif
