#include "svc_updates.h"

#include "json_fields.h"
#include "svc_log.h"
#include "svc_report.h"
#include "tavro_type.h"

namespace {

constexpr int kWaitSeconds = 25;
// A desk that answers at once without news would keep both of us busy.
constexpr guint kPauseMs = 50;

}  // namespace

void SvcUpdates::poll() {
  DeskCall call;
  call.method = "GET";
  call.path = "/updates?since=" + std::to_string(state_.cursor()) + "&wait=" + std::to_string(kWaitSeconds);
  desk_.call(std::move(call), [this](const DeskReply &reply) { on_reply(reply); });
}

void SvcUpdates::on_reply(const DeskReply &reply) {
  const auto events = reply.body.find("events");
  if (!reply.is_ok() || events == reply.body.end() || !events->is_array()) {
    was_unreachable_ = true;
    return retry_.later();
  }
  if (std::exchange(was_unreachable_, false)) uploader_.wake();
  for (const auto &event : *events)
    if (!apply(event)) return retry_.later();
  retry_.reset();
  auto again = +[](gpointer self) -> gboolean {
    static_cast<SvcUpdates *>(self)->poll();
    return G_SOURCE_REMOVE;
  };
  g_timeout_add(events->empty() ? kPauseMs : 0, again, this);
}

// False: try again later, from the same place.
bool SvcUpdates::apply(const nlohmann::json &event) {
  const int64_t cursor = number_field(event, "cursor");
  if (cursor <= state_.cursor()) {
    SVC_LOGE("the desk sent an event without a new cursor");
    return false;
  }
  if (text_field(event, "type") == "status") return apply_status(event, cursor);
  SVC_LOGI("an event of the kind \"%.40s\" is not known here", text_field(event, "type").c_str());
  return state_.finish_event(cursor, std::nullopt);
}

bool SvcUpdates::apply_status(const nlohmann::json &event, int64_t cursor) {
  const int64_t status = number_field(event, "status");
  const int voc_id = report_of(event);
  const bool is_status = status >= TAVRO_STATUS_UNDER_REVIEW && status <= TAVRO_STATUS_DECLINED;
  if (voc_id == 0 || !is_status) {
    SVC_LOGI("an answer for the report %lld of the desk has no place in the store",
             static_cast<long long>(number_field(event, "report")));
    return state_.finish_event(cursor, std::nullopt);
  }
  const std::string reply = text_field(event, "reply");
  if (!write_once(voc_id, cursor, static_cast<int>(status), reply)) return false;
  if (!state_.finish_event(cursor, SvcMessage{0, SVC_MESSAGE_ANSWERED, voc_id, reply})) return false;
  messages_.deliver();
  return true;
}

// The record that an answer is for; 0 when there is none any more. An answer can be here before the end of
// the upload was stored (this process died in between): its key then names the record.
int SvcUpdates::report_of(const nlohmann::json &event) {
  const int64_t server_id = number_field(event, "report");
  if (server_id <= 0 || server_id > G_MAXINT) return 0;
  const SvcVoc known(tavro_dbmgr_get_voc_by_server_id(static_cast<int>(server_id)));
  if (known) return known->id;
  const int voc_id = svc_voc_id_of_key(text_field(event, "key"), state_.phone());
  if (voc_id) uploader_.record_sent(voc_id, static_cast<int>(server_id));
  const SvcVoc adopted(voc_id ? tavro_dbmgr_get_voc_by_server_id(static_cast<int>(server_id)) : nullptr);
  return adopted ? adopted->id : 0;
}

bool SvcUpdates::write_once(int voc_id, int64_t cursor, int status, const std::string &reply) {
  const SvcVoc before(tavro_dbmgr_get_voc_by_id(voc_id));
  if (!before) return false;
  const auto intent = state_.intent();
  const bool was_begun = intent && intent->cursor == cursor;
  const int statuses_before = was_begun ? intent->statuses_before : svc_status_count(*before);
  if (svc_status_count(*before) > statuses_before) return true;  // written before this process began
  if (!was_begun && !state_.set_intent({cursor, statuses_before})) return false;
  _tavro_dbmgr_update_push_status_comments(std::to_string(before->server_voc_id).c_str(),
                                           std::to_string(status).c_str(),
                                           reply.empty() ? nullptr : reply.c_str());
  const SvcVoc after(tavro_dbmgr_get_voc_by_id(voc_id));
  return after && svc_status_count(*after) > statuses_before;
}
