/* Handles of the phone's modems, from the machine's modem service. A machine without one answers
 * NOT_SUPPORTED and an empty list. Every call may wait for the service, at most half a second. Main loop
 * only. */
#pragma once

#include <stdbool.h>
#include <tizen_error.h>

#ifdef __cplusplus
extern "C" {
#endif

typedef struct telephony_handle_s *telephony_h;

typedef struct {
  unsigned int count;
  telephony_h *handle;
} telephony_handle_list_s;

typedef enum {
  TELEPHONY_ERROR_NONE = TIZEN_ERROR_NONE,
  TELEPHONY_ERROR_INVALID_PARAMETER = TIZEN_ERROR_INVALID_PARAMETER,
  TELEPHONY_ERROR_OUT_OF_MEMORY = TIZEN_ERROR_OUT_OF_MEMORY,
  TELEPHONY_ERROR_NOT_SUPPORTED = TIZEN_ERROR_NOT_SUPPORTED,
  TELEPHONY_ERROR_OPERATION_FAILED = TIZEN_ERROR_TELEPHONY | 0x0001,
} telephony_error_e;

/* One handle a modem, in the order of their object paths; freed by telephony_deinit. */
int telephony_init(telephony_handle_list_s *list);
int telephony_deinit(telephony_handle_list_s *list);

#ifdef __cplusplus
}
#endif
