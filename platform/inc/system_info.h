/* Facts about the machine. A fact that the machine does not tell has a truthful fallback ("unknown", the size
 * of the phone's window); a key that is not listed is INVALID_PARAMETER. Any thread, except the screen size,
 * which is read from the display on the main loop. */
#pragma once

#include <tizen_error.h>

#ifdef __cplusplus
extern "C" {
#endif

typedef enum {
  SYSTEM_INFO_ERROR_NONE = TIZEN_ERROR_NONE,
  SYSTEM_INFO_ERROR_INVALID_PARAMETER = TIZEN_ERROR_INVALID_PARAMETER,
  SYSTEM_INFO_ERROR_OUT_OF_MEMORY = TIZEN_ERROR_OUT_OF_MEMORY,
  SYSTEM_INFO_ERROR_IO_ERROR = TIZEN_ERROR_IO_ERROR,
  SYSTEM_INFO_ERROR_NOT_SUPPORTED = TIZEN_ERROR_NOT_SUPPORTED,
} system_info_error_e;

/* Keys of system_info_get_platform_int, in pixels. */
#define SYSTEM_INFO_KEY_SCREEN_WIDTH "http://tizen.org/feature/screen.width"
#define SYSTEM_INFO_KEY_SCREEN_HEIGHT "http://tizen.org/feature/screen.height"
/* Keys of system_info_get_platform_string. */
#define SYSTEM_INFO_KEY_BUILD_STRING "http://tizen.org/system/build.string"
#define SYSTEM_INFO_KEY_BUILD_DATE "http://tizen.org/system/build.date"
#define SYSTEM_INFO_KEY_BUILD_TIME "http://tizen.org/system/build.time"
#define SYSTEM_INFO_KEY_MODEL_NAME "http://tizen.org/system/model_name"
#define SYSTEM_INFO_KEY_PLATFORM_NAME "http://tizen.org/system/platform.name"
#define SYSTEM_INFO_KEY_PLATFORM_VERSION "http://tizen.org/feature/platform.version"

int system_info_get_platform_int(const char *key, int *value);
/* The caller frees the text. */
int system_info_get_platform_string(const char *key, char **value);

#ifdef __cplusplus
}
#endif
