/* The platform log: one line a message in /opt/usr/share/log/platform.log (rotated at 4 MiB to ".1", readable
 * by the owner alone), and on standard error where that is a terminal or TAVRO_LOG_STDERR is set. Any thread,
 * any number of processes: a line is written whole or not at all. Control characters are escaped, a message
 * above 16 KiB is cut with a mark. Without a usable folder the lines go to standard error. */
#pragma once

#ifdef __cplusplus
extern "C" {
#endif

typedef enum {
  DLOG_UNKNOWN = 0,
  DLOG_DEFAULT,
  DLOG_VERBOSE,
  DLOG_DEBUG,
  DLOG_INFO,
  DLOG_WARN,
  DLOG_ERROR,
  DLOG_FATAL,
  DLOG_SILENT,
} log_priority;

/* The number of bytes written, or a negative errno. Leaves errno as it was. */
int dlog_print(log_priority priority, const char *tag, const char *format, ...)
    __attribute__((format(printf, 3, 4)));

#ifdef __cplusplus
}
#endif
