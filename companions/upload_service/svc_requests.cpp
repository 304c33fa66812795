#include "svc_requests.h"

#include <cstring>

#include "svc_log.h"
#include "svc_report.h"

namespace {

constexpr char kOperationKey[] = "TAVRO_OPERATION_TYPE";
constexpr char kVocIdKey[] = "TAVRO_VOC_ID";
constexpr int kShownBytes = 60;  // of a text that somebody else chose

std::string _extra_data(app_control_h request, const char *key) {
  char *value = nullptr;
  if (app_control_get_extra_data(request, key, &value) != APP_CONTROL_ERROR_NONE || !value) return {};
  std::string text = value;
  free(value);
  return text;
}

void _take_report(app_control_h request, const char *operation, SvcRequestKind kind, SvcUploader &uploader) {
  const std::string text = _extra_data(request, kVocIdKey);
  const int voc_id = svc_parse_voc_id(text.c_str());
  if (voc_id == 0) {
    SVC_LOGE("%s without a record id: \"%.*s\"", operation, kShownBytes, text.c_str());
    return;
  }
  uploader.request(voc_id, kind);
}

void _send_report(app_control_h request, const char *operation, SvcUploader &uploader) {
  _take_report(request, operation, SvcRequestKind::kFirst, uploader);
}

void _send_again(app_control_h request, const char *operation, SvcUploader &uploader) {
  _take_report(request, operation, SvcRequestKind::kAgain, uploader);
}

void _say_no_catalogue(app_control_h, const char *operation, SvcUploader &) {
  SVC_LOGI("%s: the desk has no such catalogue yet", operation);
}

struct Operation {
  const char *name;
  void (*handle)(app_control_h request, const char *operation, SvcUploader &uploader);
};

const Operation kOperations[] = {
    {"TAVRO_OPERATION_TYPE_UI", _send_report},
    {"TAVRO_SEND_FAILED_VOC", _send_again},
    {"TAVRO_OPERATION_TYPE_APP_UPDATE", _say_no_catalogue},
    {"TAVRO_OPERATION_TYPE_GET_BANNERS", _say_no_catalogue},
    {"TAVRO_OPERATION_TYPE_GET_BETA_DETAILS", _say_no_catalogue},
    {"TAVRO_OPERATION_TYPE_GET_BETA_LIST", _say_no_catalogue},
    {"TAVRO_OPERATION_TYPE_GET_BETA_URLS", _say_no_catalogue},
    {"TAVRO_OPERATION_TYPE_GET_BOARDS_URL", _say_no_catalogue},
    {"TAVRO_OPERATION_TYPE_GET_MAX_LIMIT", _say_no_catalogue},
    {"TAVRO_OPERATION_TYPE_GET_MODEL_ALIAS_STATUS", _say_no_catalogue},
    {"TAVRO_OPERATION_TYPE_GET_USER_BETA_STATUS", _say_no_catalogue},
    {"TAVRO_OPERATION_TYPE_OPT_IN_BETA", _say_no_catalogue},
    {"TAVRO_OPERATION_TYPE_OPT_OUT_BETA", _say_no_catalogue},
    {"TAVRO_OPERATION_TYPE_REGISTER_USER_CLICK", _say_no_catalogue},
};

}  // namespace

void svc_handle_request(app_control_h request, SvcUploader &uploader) {
  const std::string operation = _extra_data(request, kOperationKey);
  for (const auto &known : kOperations)
    if (operation == known.name) return known.handle(request, known.name, uploader);
  SVC_LOGE("a request for the unknown operation \"%.*s\"", kShownBytes, operation.c_str());
}
