/* The number on an application's icon. The desktop's launcher is told by signal; the number itself is kept in
 * the phone, so that it can be read back, also by another process. Main loop only. */
#pragma once

#include <tizen_error.h>

#ifdef __cplusplus
extern "C" {
#endif

typedef enum {
  BADGE_ERROR_NONE = TIZEN_ERROR_NONE,
  BADGE_ERROR_INVALID_PARAMETER = TIZEN_ERROR_INVALID_PARAMETER,
  BADGE_ERROR_IO_ERROR = TIZEN_ERROR_IO_ERROR,
  BADGE_ERROR_ALREADY_EXIST = TIZEN_ERROR_BADGE | 0x02,
  BADGE_ERROR_NOT_EXIST = TIZEN_ERROR_BADGE | 0x04,
} badge_error_e;

/* A badge is added with the count 0, which shows nothing. */
int badge_add(const char *app_id);
int badge_remove(const char *app_id);
int badge_set_count(const char *app_id, unsigned int count);
int badge_get_count(const char *app_id, unsigned int *count);

#ifdef __cplusplus
}
#endif
