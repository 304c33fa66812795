/* The life cycle of a window application: create, the first launch request, resume; pause when its windows
 * are out of sight and resume when they are back; terminate, always, also on SIGTERM. Its bus name is its
 * application id (the program's file name). A program that was started by hand while another instance runs
 * passes its start on to that one and ends. Main loop only. */
#pragma once

#include <app_common.h>
#include <app_control.h>

#ifdef __cplusplus
extern "C" {
#endif

typedef bool (*app_create_cb)(void *user_data);
typedef void (*app_terminate_cb)(void *user_data);
typedef void (*app_pause_cb)(void *user_data);
typedef void (*app_resume_cb)(void *user_data);
typedef void (*app_control_cb)(app_control_h app_control, void *user_data);

typedef struct {
  app_create_cb create; /* false: do not start */
  app_terminate_cb terminate;
  app_pause_cb pause;
  app_resume_cb resume;
  app_control_cb app_control;
} ui_app_lifecycle_callback_s;

/* Runs the application until ui_app_exit; 0 or an app_error_e. */
int ui_app_main(int argc, char **argv, ui_app_lifecycle_callback_s *callback, void *user_data);
/* Ask the loop to end; the caller goes on. */
void ui_app_exit(void);

int ui_app_add_event_handler(app_event_handler_h *handler, app_event_type_e event_type, app_event_cb callback,
                             void *user_data);
int ui_app_remove_event_handler(app_event_handler_h handler);

#ifdef __cplusplus
}
#endif
