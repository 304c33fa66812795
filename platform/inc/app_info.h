/* One installed application. Handles that a walk hands out belong to the walk; those from
 * app_manager_get_app_info are destroyed by the caller. Texts are the caller's to free(). Any thread. */
#pragma once

#include <app_manager_error.h>
#include <stdbool.h>

#ifdef __cplusplus
extern "C" {
#endif

typedef struct app_info_s *app_info_h;

int app_info_destroy(app_info_h app_info);
int app_info_get_app_id(app_info_h app_info, char **app_id);
int app_info_get_package(app_info_h app_info, char **package);
/* The name in the user's language. */
int app_info_get_label(app_info_h app_info, char **label);
/* Absolute path of an image file; null and no error when the application has none that can be read. */
int app_info_get_icon(app_info_h app_info, char **path);
int app_info_is_nodisplay(app_info_h app_info, bool *nodisplay);

#ifdef __cplusplus
}
#endif
