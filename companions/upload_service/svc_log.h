// The upload service's lines in the platform log. Any thread.
#pragma once

#include <dlog.h>

#define SVC_LOGI(...) dlog_print(DLOG_INFO, "TAVRO_SVC", __VA_ARGS__)
#define SVC_LOGE(...) dlog_print(DLOG_ERROR, "TAVRO_SVC", __VA_ARGS__)
