// The crash service's lines in the platform log. Any thread.
#pragma once

#include <dlog.h>

#define CRASH_LOGI(...) dlog_print(DLOG_INFO, "TAVRO_CRASH", __VA_ARGS__)
#define CRASH_LOGE(...) dlog_print(DLOG_ERROR, "TAVRO_CRASH", __VA_ARGS__)
