/* Who sent a launch request. */
#pragma once

#include <app_control.h>

#ifdef __cplusplus
extern "C" {
#endif

/* The sender of a received request that is not answered yet: a name of the phone's bus, which lasts as long
 * as that program stays on the bus. The caller frees it. INVALID_PARAMETER for other requests. */
int app_control_get_caller(app_control_h app_control, char **name);

#ifdef __cplusplus
}
#endif
