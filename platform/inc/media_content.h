/* The media database's ear for new files. This machine keeps no such database, whose viewers look at the
 * folders themselves: a scan is a line in the platform's log. Any thread. */
#pragma once

#include <tizen_error.h>

#ifdef __cplusplus
extern "C" {
#endif

typedef enum {
  MEDIA_CONTENT_ERROR_NONE = TIZEN_ERROR_NONE,
  MEDIA_CONTENT_ERROR_INVALID_PARAMETER = TIZEN_ERROR_INVALID_PARAMETER,
  MEDIA_CONTENT_ERROR_INVALID_OPERATION = TIZEN_ERROR_INVALID_OPERATION,
} media_content_error_e;

/* Connections are counted; each wants its disconnect. */
int media_content_connect(void);
/* Invalid operation without a connection. */
int media_content_disconnect(void);
/* Take notice of a file that is new, changed or gone. Wants a connection. */
int media_content_scan_file(const char *path);

#ifdef __cplusplus
}
#endif
