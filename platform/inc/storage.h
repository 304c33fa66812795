/* The phone's storages: one internal storage, the folder /opt/usr. Sizes in bytes. Any thread. */
#pragma once

#include <stdbool.h>
#include <tizen_error.h>

#ifdef __cplusplus
extern "C" {
#endif

typedef enum {
  STORAGE_ERROR_NONE = TIZEN_ERROR_NONE,
  STORAGE_ERROR_INVALID_PARAMETER = TIZEN_ERROR_INVALID_PARAMETER,
  STORAGE_ERROR_OUT_OF_MEMORY = TIZEN_ERROR_OUT_OF_MEMORY,
  STORAGE_ERROR_NOT_SUPPORTED = TIZEN_ERROR_STORAGE | 0x12,
  STORAGE_ERROR_OPERATION_FAILED = TIZEN_ERROR_STORAGE | 0x13,
} storage_error_e;

typedef enum {
  STORAGE_TYPE_INTERNAL = 0,
  STORAGE_TYPE_EXTERNAL,
} storage_type_e;

typedef enum {
  STORAGE_STATE_UNMOUNTABLE = -2,
  STORAGE_STATE_REMOVED = -1,
  STORAGE_STATE_MOUNTED = 0,
  STORAGE_STATE_MOUNTED_READ_ONLY,
} storage_state_e;

typedef enum {
  STORAGE_DIRECTORY_IMAGES = 0,
  STORAGE_DIRECTORY_SOUNDS,
  STORAGE_DIRECTORY_VIDEOS,
  STORAGE_DIRECTORY_CAMERA,
  STORAGE_DIRECTORY_DOWNLOADS,
  STORAGE_DIRECTORY_MUSIC,
  STORAGE_DIRECTORY_DOCUMENTS,
  STORAGE_DIRECTORY_OTHERS,
} storage_directory_e;

/* Return false to stop the walk. */
typedef bool (*storage_device_supported_cb)(int storage_id, storage_type_e type, storage_state_e state,
                                            const char *path, void *user_data);

int storage_foreach_device_supported(storage_device_supported_cb callback, void *user_data);
int storage_get_total_space(int storage_id, unsigned long long *bytes);
/* What this user can still write. */
int storage_get_available_space(int storage_id, unsigned long long *bytes);
/* The machine user's own folder of that kind where there is one, else a folder under /opt/usr/media, made on
 * demand. The caller frees the path. */
int storage_get_directory(int storage_id, storage_directory_e type, char **path);

#ifdef __cplusplus
}
#endif
