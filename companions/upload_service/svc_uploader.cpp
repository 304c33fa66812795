#include "svc_uploader.h"

#include <algorithm>
#include <set>

#include "svc_log.h"
#include "svc_report.h"
#include "tavro_type.h"

namespace {

bool _waits_to_be_sent(int status) {
  return status == TAVRO_STATUS_SENDING || status == TAVRO_STATUS_SENDING_FAILED_NO_NETWORK ||
         status == TAVRO_STATUS_DRAFT_SAVED || status == TAVRO_STATUS_SENDING_FAILED;
}

bool _is_store_ready() {
  static bool is_ready = false;
  if (!is_ready) is_ready = tavro_dbmgr_ensure_schema() != TAVRO_STORE_UNUSABLE;
  return is_ready;
}

}  // namespace

void SvcUploader::request(int voc_id, SvcRequestKind kind) {
  const SvcVoc voc(_is_store_ready() ? tavro_dbmgr_get_voc_by_id(voc_id) : nullptr);
  if (!voc) return SVC_LOGE("report %d is not in the store", voc_id), void();
  if (!_waits_to_be_sent(svc_last_status(*voc)))
    return SVC_LOGI("report %d is at the desk already", voc_id), void();
  state_.add_requested(voc_id, kind);
  wake();
}

void SvcUploader::wake() {
  if (is_busy_) {
    is_wanted_ = true;
    return;
  }
  retry_.cancel();
  begin_pass();
}

std::vector<int> SvcUploader::work() const {
  const auto requested = state_.requested();
  std::set<int> ids;
  // A report that is still being written waits; one that is gone is found and forgotten when its turn comes.
  for (int voc_id : requested)
    if (svc_is_complete(voc_id) || !SvcVoc(tavro_dbmgr_get_voc_by_id(voc_id))) ids.insert(voc_id);
  GSList *stored = tavro_dbmgr_get_vocs_to_send();
  for (GSList *item = stored; item; item = item->next) ids.insert(GPOINTER_TO_INT(item->data));
  g_slist_free(stored);
  return {ids.upper_bound(last_id_), ids.end()};
}

void SvcUploader::begin_pass() {
  if (is_busy_) return;
  last_id_ = 0;
  has_failed_ = is_wanted_ = false;
  if (!_is_store_ready()) return retry_.later();
  next();
}

void SvcUploader::next() {
  const auto ids = work();
  if (ids.empty()) return end_pass();
  last_id_ = ids.front();
  auto report = svc_read_report(last_id_, state_.phone());
  if (!report) {  // deleted meanwhile
    state_.remove_requested(last_id_);
    return next();
  }
  if (!report->is_whole) {
    SVC_LOGE("report %d cannot be read now", last_id_);
    has_failed_ = true;
    return next();
  }
  is_busy_ = true;
  tavro_dbmgr_update_voc_retry_count(last_id_, std::max(tavro_dbmgr_get_voc_retry_count(last_id_), 0) + 1);
  SvcUpload::start(desk_, std::move(*report),
                   [this, voc_id = last_id_](const SvcUploadEnd &end) { on_end(voc_id, end); });
}

void SvcUploader::on_end(int voc_id, const SvcUploadEnd &end) {
  is_busy_ = false;
  switch (end.kind) {
    case SvcUploadEnd::Kind::kSent:
      record_sent(voc_id, end.server_id);
      break;
    case SvcUploadEnd::Kind::kRefused:
      tell_failure(voc_id, TAVRO_STATUS_SENDING_FAILED);
      state_.remove_requested(voc_id);
      break;
    case SvcUploadEnd::Kind::kFailed:
      has_failed_ = true;
      tell_failure(voc_id, TAVRO_STATUS_SENDING_FAILED_NO_NETWORK);
      break;
  }
  if (end.kind != SvcUploadEnd::Kind::kFailed) retry_.reset();
  if (end.kind == SvcUploadEnd::Kind::kFailed && !end.has_desk_answered) {
    // The others would fail alike: say so now, try later.
    for (int waiting : work()) tell_failure(waiting, TAVRO_STATUS_SENDING_FAILED_NO_NETWORK);
    return end_pass();
  }
  next();
}

void SvcUploader::end_pass() {
  if (is_wanted_ && !has_failed_) return begin_pass();
  if (has_failed_) retry_.later();
}

void SvcUploader::tell_failure(int voc_id, int status) {
  const SvcVoc voc(tavro_dbmgr_get_voc_by_id(voc_id));
  if (!voc) return;
  if (!state_.is_announced(voc_id)) state_.announce_failure(voc_id);
  const int shown = svc_last_status(*voc);
  // A draft stays one until it is at the desk; that it is to be sent is kept in the service's own state.
  if (shown != status && shown != TAVRO_STATUS_DRAFT_SAVED) tavro_dbmgr_update_sending_state(voc_id, status);
  messages_.deliver();
}

void SvcUploader::record_sent(int voc_id, int server_id) {
  const SvcVoc before(tavro_dbmgr_get_voc_by_id(voc_id));
  if (before && (before->server_voc_id != server_id || _waits_to_be_sent(svc_last_status(*before)))) {
    // The message first: if it were lost between the two, nobody would send the report again.
    state_.add_message({0, SVC_MESSAGE_SENT, voc_id, ""});
    tavro_dbmgr_set_voc_data_submitted_to_server(voc_id, server_id, TAVRO_STATUS_UNDER_REVIEW);
    const SvcVoc after(tavro_dbmgr_get_voc_by_id(voc_id));
    if (after && after->server_voc_id != server_id) {
      SVC_LOGE("report %d is at the desk, but the store does not take its id %d", voc_id, server_id);
      tavro_dbmgr_update_sending_state(voc_id, TAVRO_STATUS_SENDING_SUCCESS);
    }
  }
  state_.remove_requested(voc_id);
  messages_.deliver();
}
