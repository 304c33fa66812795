/* Error codes that every native interface shares, and their texts. Values are the documented ones: codes of
 * the operating system are negative errno values, the rest count from a base per interface. Any thread. */
#pragma once

#include <errno.h>

#ifdef __cplusplus
extern "C" {
#endif

enum {
  TIZEN_ERROR_NONE = 0,
  TIZEN_ERROR_NOT_PERMITTED = -EPERM,
  TIZEN_ERROR_NO_SUCH_FILE = -ENOENT,
  TIZEN_ERROR_IO_ERROR = -EIO,
  TIZEN_ERROR_OUT_OF_MEMORY = -ENOMEM,
  TIZEN_ERROR_PERMISSION_DENIED = -EACCES,
  TIZEN_ERROR_RESOURCE_BUSY = -EBUSY,
  TIZEN_ERROR_INVALID_PARAMETER = -EINVAL,
  TIZEN_ERROR_ALREADY_IN_PROGRESS = -EALREADY,
  TIZEN_ERROR_INVALID_OPERATION = -ENOSYS,
  TIZEN_ERROR_KEY_NOT_AVAILABLE = -ENOKEY,
  TIZEN_ERROR_KEY_REJECTED = -EKEYREJECTED,
  TIZEN_ERROR_UNKNOWN = -0x40000000,
  TIZEN_ERROR_TIMED_OUT = TIZEN_ERROR_UNKNOWN + 1,
  TIZEN_ERROR_NOT_SUPPORTED = TIZEN_ERROR_UNKNOWN + 2,
};

#define TIZEN_ERROR_ACCOUNT -0x01000000
#define TIZEN_ERROR_APPLICATION -0x01100000
#define TIZEN_ERROR_APP_MANAGER -0x01110000
#define TIZEN_ERROR_BADGE -0x01120000
#define TIZEN_ERROR_PREFERENCE -0x01130000
#define TIZEN_ERROR_NOTIFICATION -0x01140000
#define TIZEN_ERROR_PACKAGE_MANAGER -0x01150000
#define TIZEN_ERROR_STORAGE -0x01160000
#define TIZEN_ERROR_DEVICE -0x02400000
#define TIZEN_ERROR_IMAGE_UTIL -0x02550000
#define TIZEN_ERROR_TELEPHONY -0x02600000

/* The text of a code of any interface; never null, not to be freed. */
const char *get_error_message(int error);

#ifdef __cplusplus
}
#endif
