/* The phone's settings database, as far as it is read: whole numbers. Any thread. */
#pragma once

#ifdef __cplusplus
extern "C" {
#endif

/* 1: the 12-hour clock, 2: the 24-hour clock. */
#define VCONFKEY_REGIONFORMAT_TIME1224 "db/menu_widget/regionformat_time1224"
#define VCONFKEY_TIME_FORMAT_12 1
#define VCONFKEY_TIME_FORMAT_24 2

/* 0, or -1 when the setting is unknown; the value is then left alone. */
int vconf_get_int(const char *key, int *value);

#ifdef __cplusplus
}
#endif
