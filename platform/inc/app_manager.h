/* The applications installed on the machine (its desktop entries) and those that run on the phone. */
#pragma once

#include <app_info.h>
#include <app_manager_error.h>

#ifdef __cplusplus
extern "C" {
#endif

/* Return false to stop the walk. */
typedef bool (*app_manager_app_info_cb)(app_info_h app_info, void *user_data);

/* In the order of their labels. Entries that are no program or are hidden are left out. Any thread. */
int app_manager_foreach_app_info(app_manager_app_info_cb callback, void *user_data);
int app_manager_get_app_info(const char *app_id, app_info_h *app_info);
/* Whether an application of the phone runs. Asks the bus: ten seconds at most on a machine under load. */
int app_manager_is_running(const char *app_id, bool *running);

#ifdef __cplusplus
}
#endif
