/* The phone's preference store, shared by its applications: typed values under text keys in
 * /opt/usr/dbspace/preference.db. A set is on the disk when it returns. Opened at the first call and kept
 * open; any thread. A file that is no database is set aside under a dated name and a new one begun. Other
 * processes hear of a change by the signal Changed(s key) of org.tavro.Preference1 on the bus. */
#pragma once

#include <stdbool.h>
#include <tizen_error.h>

#ifdef __cplusplus
extern "C" {
#endif

typedef enum {
  PREFERENCE_ERROR_NONE = TIZEN_ERROR_NONE,
  PREFERENCE_ERROR_INVALID_PARAMETER = TIZEN_ERROR_INVALID_PARAMETER,
  PREFERENCE_ERROR_OUT_OF_MEMORY = TIZEN_ERROR_OUT_OF_MEMORY,
  PREFERENCE_ERROR_NO_KEY = TIZEN_ERROR_PREFERENCE | 0x30,
  PREFERENCE_ERROR_IO_ERROR = TIZEN_ERROR_IO_ERROR,
} preference_error_e;

/* Stored in the file: append only. */
typedef enum {
  PREFERENCE_TYPE_STRING = 1,
  PREFERENCE_TYPE_INT,
  PREFERENCE_TYPE_DOUBLE,
  PREFERENCE_TYPE_BOOLEAN,
} preference_type_e;

typedef bool (*preference_item_cb)(const char *key, void *user_data);
typedef void (*preference_changed_cb)(const char *key, void *user_data);

/* A get leaves the value alone when it fails: NO_KEY when the key is absent, INVALID_PARAMETER when the value
 * is of another type. A string is the caller's to free(). A set replaces also a value of another type. */
int preference_set_int(const char *key, int value);
int preference_get_int(const char *key, int *value);
int preference_set_double(const char *key, double value);
int preference_get_double(const char *key, double *value);
int preference_set_string(const char *key, const char *value);
int preference_get_string(const char *key, char **value);
int preference_set_boolean(const char *key, bool value);
int preference_get_boolean(const char *key, bool *value);

int preference_is_existing(const char *key, bool *existing);
int preference_get_type(const char *key, preference_type_e *type);
int preference_remove(const char *key);
int preference_foreach_item(preference_item_cb callback, void *user_data);

/* Called on the main loop after a change of the key by any process of the phone, this one included. One
 * callback a key. */
int preference_set_changed_cb(const char *key, preference_changed_cb callback, void *user_data);
int preference_unset_changed_cb(const char *key);

#ifdef __cplusplus
}
#endif
