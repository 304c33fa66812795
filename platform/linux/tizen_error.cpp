#include "tizen_error.h"

#include <account.h>
#include <app_common.h>
#include <app_control.h>
#include <app_manager_error.h>
#include <app_preference.h>
#include <badge.h>
#include <device/device-error.h>
#include <image_util.h>
#include <notification.h>
#include <package_manager_error.h>
#include <storage.h>
#include <telephony_common.h>

namespace {

struct ErrorText {
  int code;
  const char *text;
};

constexpr ErrorText kTexts[] = {
    {TIZEN_ERROR_NONE, "Successful"},
    {TIZEN_ERROR_NOT_PERMITTED, "Operation not permitted"},
    {TIZEN_ERROR_NO_SUCH_FILE, "No such file or directory"},
    {TIZEN_ERROR_IO_ERROR, "I/O error"},
    {TIZEN_ERROR_OUT_OF_MEMORY, "Out of memory"},
    {TIZEN_ERROR_PERMISSION_DENIED, "Permission denied"},
    {TIZEN_ERROR_RESOURCE_BUSY, "Device or resource busy"},
    {TIZEN_ERROR_INVALID_PARAMETER, "Invalid parameter"},
    {TIZEN_ERROR_ALREADY_IN_PROGRESS, "Operation already in progress"},
    {TIZEN_ERROR_INVALID_OPERATION, "Function not implemented"},
    {TIZEN_ERROR_KEY_NOT_AVAILABLE, "Required key not available"},
    {TIZEN_ERROR_KEY_REJECTED, "Key was rejected by service"},
    {TIZEN_ERROR_UNKNOWN, "Unknown error"},
    {TIZEN_ERROR_TIMED_OUT, "Time out"},
    {TIZEN_ERROR_NOT_SUPPORTED, "Not supported"},
    {APP_ERROR_INVALID_CONTEXT, "Invalid context of the application"},
    {APP_CONTROL_ERROR_APP_NOT_FOUND, "Application not found"},
    {APP_CONTROL_ERROR_INVALID_DATA_TYPE, "Invalid data type"},
    {APP_CONTROL_ERROR_LAUNCH_REJECTED, "Launch rejected"},
    {APP_CONTROL_ERROR_LAUNCH_FAILED, "Launch failed"},
    {PREFERENCE_ERROR_NO_KEY, "No such preference key"},
    {BADGE_ERROR_ALREADY_EXIST, "Badge exists already"},
    {BADGE_ERROR_NOT_EXIST, "Badge does not exist"},
    {NOTIFICATION_ERROR_NOT_EXIST_ID, "Notification was not posted"},
    {NOTIFICATION_ERROR_SERVICE_NOT_READY, "Notification service is not ready"},
    {APP_MANAGER_ERROR_NO_SUCH_APP, "No such application"},
    {APP_MANAGER_ERROR_DB_FAILED, "Application database failed"},
    {PACKAGE_MANAGER_ERROR_NO_SUCH_PACKAGE, "No such package"},
    {STORAGE_ERROR_NOT_SUPPORTED, "Storage not supported"},
    {STORAGE_ERROR_OPERATION_FAILED, "Storage operation failed"},
    {DEVICE_ERROR_OPERATION_FAILED, "Device operation failed"},
    {IMAGE_UTIL_ERROR_NOT_SUPPORTED_FORMAT, "Picture format not supported"},
    {TELEPHONY_ERROR_OPERATION_FAILED, "Telephony operation failed"},
    {ACCOUNT_ERROR_DUPLICATED, "Account exists already"},
    {ACCOUNT_ERROR_NO_DATA, "No account data"},
    {ACCOUNT_ERROR_RECORD_NOT_FOUND, "Account not found"},
    {ACCOUNT_ERROR_DB_FAILED, "Account database failed"},
    {ACCOUNT_ERROR_DB_NOT_OPENED, "Account database is not open"},
};

}  // namespace

const char *get_error_message(int error) {
  for (const ErrorText &entry : kTexts) {
    if (entry.code == error) return entry.text;
  }
  return "Unknown error";
}
