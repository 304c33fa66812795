#include "svc_messages.h"

#include <app_control.h>

#include <memory>
#include <type_traits>
#include <utility>

#include "svc_log.h"
#include "svc_report.h"
#include "tavro_type.h"

namespace {

constexpr char kClient[] = "corvane.tavro-lite";
constexpr char kOperation[] = "TAVRO_UPDATE_HISTORY";

struct RequestDeleter {
  void operator()(app_control_h request) const { app_control_destroy(request); }
};
using Request = std::unique_ptr<std::remove_pointer_t<app_control_h>, RequestDeleter>;

// A success that the store does not show was interrupted before it was stored: the report is sent again and
// then told again. A failure that was overcome before the client could be told of it is none.
bool _is_still_true(const SvcMessage &message) {
  const SvcVoc voc(tavro_dbmgr_get_voc_by_id(message.voc_id));
  if (!voc) return false;
  if (message.kind == SVC_MESSAGE_ANSWERED) return true;
  const int status = svc_last_status(*voc);
  const bool is_waiting = status == TAVRO_STATUS_SENDING ||
                          status == TAVRO_STATUS_SENDING_FAILED_NO_NETWORK ||
                          status == TAVRO_STATUS_DRAFT_SAVED;
  if (message.kind == SVC_MESSAGE_SENT) return !is_waiting;
  return is_waiting || status == TAVRO_STATUS_SENDING_FAILED;
}

// The keys and texts are the client's: it matches them.
Request _request_of(const SvcMessage &message) {
  app_control_h handle = nullptr;
  if (app_control_create(&handle) != APP_CONTROL_ERROR_NONE) return nullptr;
  Request request(handle);
  app_control_set_app_id(handle, kClient);
  app_control_set_operation(handle, kOperation);
  if (message.kind == SVC_MESSAGE_ANSWERED)
    app_control_add_extra_data(handle, "TAVRO_SERVER_PUSH_NOTI_STATUS", "TAVRO_SERVER_PUSH_NOTI_UPDATED");
  else
    app_control_add_extra_data(
        handle, "TAVRO_SERVER_UPLOAD_STATUS",
        message.kind == SVC_MESSAGE_SENT ? "TAVRO_SERVER_UPLOAD_SUCCESS" : "TAVRO_SERVER_UPLOAD_FAIL");
  app_control_add_extra_data(handle, "TAVRO_SERVER_PUSH_NOTI_VOC_ID", std::to_string(message.voc_id).c_str());
  if (!message.reply.empty())
    app_control_add_extra_data(handle, "TAVRO_SERVER_PUSH_NOTI_VOC_COMMENTS", message.reply.c_str());
  return request;
}

}  // namespace

void SvcMessages::deliver() {
  if (is_sending_ || retry_.is_waiting()) return;
  auto message = state_.first_message();
  while (message && !_is_still_true(*message)) {
    if (!state_.remove_message(message->id)) return retry_.later();
    message = state_.first_message();
  }
  if (!message) return;
  const Request request = _request_of(*message);
  if (!request) return retry_.later();
  auto handled = +[](app_control_h, app_control_h reply, app_control_result_e result, void *data) {
    static_cast<SvcMessages *>(data)->on_delivered(reply, result == APP_CONTROL_RESULT_SUCCEEDED);
  };
  is_sending_ = true;
  const int error = app_control_send_launch_request(request.get(), handled, this);
  if (error != APP_CONTROL_ERROR_NONE) on_delivered(false, false);
}

void SvcMessages::on_delivered(bool has_answered, bool is_accepted) {
  is_sending_ = false;
  const auto message = state_.first_message();
  if (!message) return;
  if (!has_answered && !is_accepted) {
    if (!std::exchange(is_unreachable_, true))
      SVC_LOGE("the client cannot be told of report %d yet", message->voc_id);
    return retry_.later();
  }
  is_unreachable_ = false;
  if (!is_accepted) SVC_LOGE("the client refused to hear what became of report %d", message->voc_id);
  retry_.reset();
  if (state_.remove_message(message->id))
    deliver();
  else
    retry_.later();
}
