/* A status message (toast): shown for a moment, not kept. Main loop only; does not block. */
#pragma once

#ifdef __cplusplus
extern "C" {
#endif

/* 0 or a notification_error_e. */
int notification_status_message_post(const char *message);

#ifdef __cplusplus
}
#endif
