// News of the desk: one call that the desk holds back until there is some, over and over.
//
// Each answer of support staff is written into the store exactly once, whenever this process dies: before the
// write the service notes how many statuses the report had, after it the cursor moves on together with the
// message to the client. Main loop only.
#pragma once

#include "svc_desk_link.h"
#include "svc_messages.h"
#include "svc_retry.h"
#include "svc_state.h"
#include "svc_uploader.h"

class SvcUpdates {
 public:
  SvcUpdates(SvcState &state, DeskLink &desk, SvcUploader &uploader, SvcMessages &messages)
      : state_(state), desk_(desk), uploader_(uploader), messages_(messages), retry_([this] { poll(); }) {}

  void poll();

 private:
  void on_reply(const DeskReply &reply);
  bool apply(const nlohmann::json &event);
  bool apply_status(const nlohmann::json &event, int64_t cursor);
  int report_of(const nlohmann::json &event);
  bool write_once(int voc_id, int64_t cursor, int status, const std::string &reply);

  SvcState &state_;
  DeskLink &desk_;
  SvcUploader &uploader_;
  SvcMessages &messages_;
  Retry retry_;
  bool was_unreachable_ = false;
};
