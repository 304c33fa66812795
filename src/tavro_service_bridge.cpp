#include "tavro_service_bridge.h"

#include <cerrno>
#include <cstdio>
#include <cstring>

#include "tavro-common.h"
#include "tavro_app_control_handle.h"
#include "tavro_launch_tables.h"
#include "tavro_log.h"

namespace {

constexpr char kAppStoreId[] = "org.tizen.tizenstore";
constexpr char kBrowserId[] = "corvane.browser";
constexpr size_t kNumberSize = 100;
constexpr size_t kMostExtras = 3;

// How a request's value is written under a key.
enum class form { number, long_number, flag, fixed };

struct extra_data {
  const char *key;
  form written_as;
  const char *fixed_text;
};

struct operation_extras {
  const char *operation;
  extra_data extras[kMostExtras];  // in the order of sending, a null key ends them
};

// The upload service reads these keys; an operation that is not listed carries none.
constexpr operation_extras kOperations[] = {
    {TAVRO_SEND_FAILED_VOC, {{"TAVRO_VOC_ID", form::number, nullptr}}},
    {TAVRO_OPERATION_TYPE_UI, {{"TAVRO_VOC_ID", form::number, nullptr}}},
    {TAVRO_OPERATION_TYPE_GET_BETA_LIST,
     {{"TAVRO_BETA_LIST_TYPE", form::flag, nullptr},
      {"TAVRO_BETA_PAGE_NO", form::fixed, "1"},
      {"TAVRO_BETA_PAGE_SIZE", form::fixed, "10"}}},
    {TAVRO_OPERATION_TYPE_GET_BETA_DETAILS, {{"TAVRO_BETA_ID", form::long_number, nullptr}}},
    {TAVRO_OPERATION_TYPE_OPT_IN_BETA,
     {{"TAVRO_BETA_ID", form::long_number, nullptr}, {"TAVRO_BETA_TYPE", form::fixed, "app"}}},
    {TAVRO_OPERATION_TYPE_OPT_OUT_BETA,
     {{"TAVRO_BETA_ID", form::long_number, nullptr}, {"TAVRO_BETA_TYPE", form::fixed, "app"}}},
    {TAVRO_OPERATION_TYPE_REGISTER_USER_CLICK,
     {{"TAVRO_CLICK_ITEM_ID", form::number, nullptr}, {"TAVRO_CLICK_ITEM_TYPE", form::fixed, "banner"}}},
    {TAVRO_OPERATION_TYPE_APP_UPDATE, {}},
    {TAVRO_OPERATION_TYPE_GET_BANNERS, {}},
    {TAVRO_OPERATION_TYPE_GET_BETA_URLS, {}},
    {TAVRO_OPERATION_TYPE_GET_BOARDS_URL, {}},
    {TAVRO_OPERATION_TYPE_GET_MAX_LIMIT, {}},
    {TAVRO_OPERATION_TYPE_GET_MODEL_ALIAS_STATUS, {}},
    {TAVRO_OPERATION_TYPE_GET_USER_BETA_STATUS, {}},
};

void _add_extra(app_control_h request, const char *key, const char *value) {
  const int ret = app_control_add_extra_data(request, key, value);
  if (ret != APP_CONTROL_ERROR_NONE) {
    TAVRO_LOGD("app_control_add_extra_data failed: %d, %s", ret, get_error_message(ret));
  }
}

void _add_value(app_control_h request, const extra_data &extra, int value) {
  char text[kNumberSize] = {};
  switch (extra.written_as) {
    case form::number:
      std::snprintf(text, sizeof text, "%d", value);
      break;
    case form::long_number:
      std::snprintf(text, sizeof text, "%ld", static_cast<long>(value));
      break;
    case form::flag:
      std::snprintf(text, sizeof text, "%s", value ? "true" : "false");
      break;
    case form::fixed:
      std::snprintf(text, sizeof text, "%s", extra.fixed_text);
      break;
  }
  _add_extra(request, extra.key, text);
}

void _add_operation_extras(app_control_h request, const char *operation, int value) {
  for (const operation_extras &entry : kOperations) {
    if (std::strcmp(operation, entry.operation) != 0) continue;
    for (const extra_data &extra : entry.extras) {
      if (extra.key) _add_value(request, extra, value);
    }
    return;
  }
}

TavroRequest _create_request() {
  int ret = APP_CONTROL_ERROR_NONE;
  TavroRequest request = tavro_request_create(&ret);
  if (!request) TAVRO_LOGD("app_control_create failed: %d, %s", ret, get_error_message(ret));
  return request;
}

// A step that fails is logged and the next one still made: the platform refuses what cannot be sent.
bool _address_and_send(app_control_h request, const char *operation, const char *app_id,
                       const char *sent_message) {
  int ret = app_control_set_operation(request, operation);
  if (ret != APP_CONTROL_ERROR_NONE) {
    TAVRO_LOGD("app_control_set_operation failed: %d, %s", ret, get_error_message(ret));
  }
  ret = app_control_set_app_id(request, app_id);
  if (ret != APP_CONTROL_ERROR_NONE) {
    TAVRO_LOGD("app_control_set_app_id failed: %d, %s", ret, get_error_message(ret));
  }
  ret = app_control_send_launch_request(request, nullptr, nullptr);
  if (ret != APP_CONTROL_ERROR_NONE) {
    TAVRO_LOGD("app_control_send_launch_request failed: %d, %s", ret, get_error_message(ret));
    return false;
  }
  TAVRO_LOGD("%s", sent_message);
  return true;
}

void _set_uri(app_control_h request, const char *uri) {
  const int ret = app_control_set_uri(request, uri);
  if (ret != APP_CONTROL_ERROR_NONE) {
    TAVRO_LOGD("app_control_set_uri failed: %d, %s", ret, get_error_message(ret));
  }
}

// The service writes texts for the person (notifications of its own), so it is told in the current language.
TavroRequest _begin_service_request(const char *operation) {
  TAVRO_LOGD("key:%s", operation ? operation : "(null)");
  if (tavro_bind_locale() != 0) TAVRO_LOGD("tavro_bind_locale failed:%s", std::strerror(errno));
  TavroRequest request = _create_request();
  if (request) _add_extra(request.get(), "TAVRO_OPERATION_TYPE", operation ? operation : "");
  return request;
}

}  // namespace

void _tavro_launch_upload_mgr_svc(const char *operation, int value) {
  const TavroRequest request = _begin_service_request(operation);
  if (!request) return;
  if (operation) _add_operation_extras(request.get(), operation, value);
  _address_and_send(request.get(), APP_CONTROL_OPERATION_DEFAULT, TAVRO_SVC_APP_ID, "Upload Mgr launched");
}

void _tavro_send_beta_click_event_to_svc(const char *item_kind, long item_id) {
  const TavroRequest request = _begin_service_request(TAVRO_OPERATION_TYPE_REGISTER_USER_CLICK);
  if (!request) return;
  if (item_kind && (std::strcmp(item_kind, "general") == 0 || std::strcmp(item_kind, "banner") == 0)) {
    char id_text[kNumberSize] = {};
    std::snprintf(id_text, sizeof id_text, "%ld", item_id);
    _add_extra(request.get(), "TAVRO_CLICK_ITEM_ID", id_text);
    _add_extra(request.get(), "TAVRO_CLICK_ITEM_TYPE", item_kind);
  }
  _address_and_send(request.get(), APP_CONTROL_OPERATION_DEFAULT, TAVRO_SVC_APP_ID,
                    "Service launched for beta click event");
}

bool _tavro_launch_app_store(const char *uri) {
  const TavroRequest request = _create_request();
  if (!request) return false;
  _set_uri(request.get(), uri);
  return _address_and_send(request.get(), APP_CONTROL_OPERATION_VIEW, kAppStoreId, "App Store launched");
}

bool tavro_launch_browser(const char *uri) {
  int ret = APP_CONTROL_ERROR_NONE;
  const TavroRequest request = tavro_request_create(&ret);
  if (!request) {
    TAVRO_LOGD("Failed to create appcontrol");
    return false;
  }
  app_control_set_operation(request.get(), APP_CONTROL_OPERATION_VIEW);
  app_control_set_app_id(request.get(), kBrowserId);
  _set_uri(request.get(), uri);
  ret = app_control_send_launch_request(request.get(), nullptr, nullptr);
  if (ret != APP_CONTROL_ERROR_NONE) TAVRO_LOGD("Failed to launch request");
  return ret == APP_CONTROL_ERROR_NONE;
}

std::vector<tavro_sent_operation> tavro_sent_operations() {
  std::vector<tavro_sent_operation> all;
  for (const operation_extras &entry : kOperations) {
    all.push_back({entry.operation, {}});
    for (const extra_data &extra : entry.extras) {
      if (extra.key) all.back().keys.push_back(extra.key);
    }
  }
  return all;
}
