/* The accounts of the phone's user, kept in /opt/usr/dbspace/account.db; no passwords. A new phone begins
 * with the machine's user. A connection is opened by account_connect or account_connect_readonly and shared
 * by the process; the calls on the store fail without it. Texts are the caller's to free(). Main loop only.
 */
#pragma once

#include <stdbool.h>
#include <tizen_error.h>

#ifdef __cplusplus
extern "C" {
#endif

typedef struct account_s *account_h;

typedef enum {
  ACCOUNT_ERROR_NONE = TIZEN_ERROR_NONE,
  ACCOUNT_ERROR_OUT_OF_MEMORY = TIZEN_ERROR_OUT_OF_MEMORY,
  ACCOUNT_ERROR_INVALID_PARAMETER = TIZEN_ERROR_INVALID_PARAMETER,
  ACCOUNT_ERROR_PERMISSION_DENIED = TIZEN_ERROR_PERMISSION_DENIED,
  ACCOUNT_ERROR_DUPLICATED = TIZEN_ERROR_ACCOUNT | 0x01,
  ACCOUNT_ERROR_NO_DATA = TIZEN_ERROR_ACCOUNT | 0x02,
  ACCOUNT_ERROR_RECORD_NOT_FOUND = TIZEN_ERROR_ACCOUNT | 0x03,
  ACCOUNT_ERROR_DB_FAILED = TIZEN_ERROR_ACCOUNT | 0x04,
  ACCOUNT_ERROR_DB_NOT_OPENED = TIZEN_ERROR_ACCOUNT | 0x05,
} account_error_e;

/* Return false to stop the walk; the handle belongs to the walk. */
typedef bool (*account_cb)(account_h account, void *user_data);

int account_connect(void);
int account_disconnect(void);
int account_connect_readonly(void);
int account_disconnect_readonly(void);

int account_create(account_h *account);
int account_destroy(account_h account);
int account_get_account_id(account_h account, int *account_id);
/* A getter of an unset text gives null and no error. */
int account_set_user_name(account_h account, const char *user_name);
int account_get_user_name(account_h account, char **user_name);
int account_set_display_name(account_h account, const char *display_name);
int account_get_display_name(account_h account, char **display_name);
int account_set_email_address(account_h account, const char *email_address);
int account_get_email_address(account_h account, char **email_address);
int account_set_package_name(account_h account, const char *package_name);
int account_get_package_name(account_h account, char **package_name);
int account_set_domain_name(account_h account, const char *domain_name);
int account_get_domain_name(account_h account, char **domain_name);
int account_set_icon_path(account_h account, const char *icon_path);
int account_get_icon_path(account_h account, char **icon_path);

/* DUPLICATED when the package already has an account with that user name. */
int account_insert_to_db(account_h account, int *account_id);
int account_delete_from_db_by_id(int account_id);
/* In the order of their insertion; NO_DATA or RECORD_NOT_FOUND when there is none. */
int account_foreach_account_from_db(account_cb callback, void *user_data);
int account_query_account_by_package_name(account_cb callback, const char *package_name, void *user_data);

#ifdef __cplusplus
}
#endif
