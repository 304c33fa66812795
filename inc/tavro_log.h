// The client's messages in the platform log: tag "TAVRO", behind "<file>: <function>(<line>) > ".
// May be called on any thread; one call is one line.
#pragma once

#include <dlog.h>

#include <cstring>

#define TAVRO_LOG_TAG "TAVRO"

inline const char *tavro_log_file_name(const char *path) {
  const char *slash = std::strrchr(path, '/');
  return slash ? slash + 1 : path;
}

#define TAVRO_LOG_AT(priority, format, ...)                                                            \
  dlog_print(priority, TAVRO_LOG_TAG, "%s: %s(%d) > " format, tavro_log_file_name(__FILE__), __func__, \
             __LINE__, ##__VA_ARGS__)
#define TAVRO_LOGD(format, ...) TAVRO_LOG_AT(DLOG_DEBUG, format, ##__VA_ARGS__)
#define TAVRO_LOGE(format, ...) TAVRO_LOG_AT(DLOG_ERROR, format, ##__VA_ARGS__)
