// The screen recorder's lines in the platform log. Any thread.
#pragma once

#include <dlog.h>

#define RECORDER_LOGI(...) dlog_print(DLOG_INFO, "TAVRO_RECORDER", __VA_ARGS__)
#define RECORDER_LOGE(...) dlog_print(DLOG_ERROR, "TAVRO_RECORDER", __VA_ARGS__)
