/* A small control of an application that the phone shows in its notification panel. A desktop has no such
 * panel: the control is a window of its own above all others, at the top of the screen, where its application
 * may move it. Main loop only. */
#pragma once

#include <Evas.h>
#include <tizen_error.h>

#ifdef __cplusplus
extern "C" {
#endif

typedef enum {
  MINICONTROL_ERROR_NONE = TIZEN_ERROR_NONE,
  MINICONTROL_ERROR_INVALID_PARAMETER = TIZEN_ERROR_INVALID_PARAMETER,
  MINICONTROL_ERROR_OUT_OF_MEMORY = TIZEN_ERROR_OUT_OF_MEMORY,
} minicontrol_error_e;

typedef enum {
  MINICONTROL_TARGET_VIEWER_QUICK_PANEL = 0,
  MINICONTROL_TARGET_VIEWER_STOCK_TRAY = 1,
} minicontrol_target_viewer_e;

/* What an application asks of the panel. */
typedef enum {
  MINICONTROL_PROVIDER_EVENT_REQUEST_HIDE = 100,
} minicontrol_provider_event_e;

/* What the panel tells the application. */
typedef enum {
  MINICONTROL_VIEWER_EVENT_HIDDEN = 100,
} minicontrol_viewer_event_e;

/* Key-value data that may come with an event; here there never are any. */
typedef struct _bundle_t bundle;

typedef void (*minicontrol_event_cb)(Evas_Object *minicontrol, minicontrol_viewer_event_e event_type,
                                     bundle *event_arg);

/* A window that is not shown yet; null without a display. It belongs to the caller. */
Evas_Object *minicontrol_create_window(const char *name, minicontrol_target_viewer_e target_viewer,
                                       minicontrol_event_cb callback);

/* REQUEST_HIDE hides the window. Later, from the main loop, the callback gets HIDDEN; and once the screen has
 * been painted without it, all windows of the application get the client message ECORE_X_ATOM_E_ILLUME_
 * QUICKPANEL_STATE with the value ..._QUICKPANEL_OFF. Neither comes when the window is deleted before. A
 * person who closes the window causes the same. */
int minicontrol_send_event(Evas_Object *minicontrol, minicontrol_provider_event_e event, bundle *event_arg);

#ifdef __cplusplus
}
#endif
