#include "recorder_request.h"

#include <app_control_caller.h>
#include <sys/statvfs.h>

namespace {

constexpr uint64_t kNothingLeftBytes = 2 * 1024 * 1024;  // what failed has been removed by now

bool is_storage_full() {
  struct statvfs status;
  return statvfs("/opt/usr/media", &status) == 0 &&
         uint64_t{status.f_bavail} * status.f_frsize < kNothingLeftBytes;
}

}  // namespace

RecorderRequest::RecorderRequest(app_control_h request) {
  app_control_clone(tavro_out(request_), request);
}

RecorderRequest::~RecorderRequest() {
  if (request_) answer_end(false);
}

std::string RecorderRequest::text(const char *key) const {
  TavroHandle<char, free> value;
  if (request_) app_control_get_extra_data(request_.get(), key, tavro_out(value));
  return value ? value.get() : "";
}

int RecorderRequest::number(const char *key, int least, int most, int otherwise) const {
  gint64 value = 0;
  return g_ascii_string_to_signed(text(key).c_str(), 10, least, most, &value, nullptr)
             ? static_cast<int>(value)
             : otherwise;
}

std::string RecorderRequest::caller() const {
  TavroHandle<char, free> name;
  if (request_) app_control_get_caller(request_.get(), tavro_out(name));
  return name ? name.get() : "";
}

void RecorderRequest::answer_session(int handle) {
  answer(APP_CONTROL_RESULT_SUCCEEDED, std::to_string(handle).c_str());
}

void RecorderRequest::answer_end(bool is_succeeded) {
  answer(is_succeeded ? APP_CONTROL_RESULT_SUCCEEDED : APP_CONTROL_RESULT_FAILED, nullptr);
}

void RecorderRequest::answer(app_control_result_e result, const char *handle) {
  const TavroAppControl request = std::move(request_);
  TavroAppControl reply;
  if (!request || app_control_create(tavro_out(reply)) != APP_CONTROL_ERROR_NONE) return;
  if (handle) app_control_add_extra_data(reply.get(), "handle", handle);
  if (result != APP_CONTROL_RESULT_SUCCEEDED && is_storage_full())
    app_control_add_extra_data(reply.get(), "reason", "storage_full");
  app_control_reply_to_launch_request(reply.get(), request.get(), result);
}
