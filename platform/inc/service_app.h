/* The life cycle of an application without windows: create, launch requests, terminate, on a GLib main loop.
 * Otherwise as in app.h. */
#pragma once

#include <app_common.h>
#include <app_control.h>

#ifdef __cplusplus
extern "C" {
#endif

typedef bool (*service_app_create_cb)(void *user_data);
typedef void (*service_app_terminate_cb)(void *user_data);
typedef void (*service_app_control_cb)(app_control_h app_control, void *user_data);

typedef struct {
  service_app_create_cb create; /* false: do not start */
  service_app_terminate_cb terminate;
  service_app_control_cb app_control;
} service_app_lifecycle_callback_s;

int service_app_main(int argc, char **argv, service_app_lifecycle_callback_s *callback, void *user_data);
void service_app_exit(void);

#ifdef __cplusplus
}
#endif
