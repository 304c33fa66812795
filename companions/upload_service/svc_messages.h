// Messages to the client: launch requests about the fate of reports, in order, each until the client has
// answered it: one that cannot be reached is tried again, at the slowest every 30 seconds. They lie in the
// service's state, so none is lost when either program dies. Main loop only.
#pragma once

#include "svc_retry.h"
#include "svc_state.h"

class SvcMessages {
 public:
  explicit SvcMessages(SvcState &state) : state_(state), retry_([this] { deliver(); }) {}

  // Sends what waits, oldest first; harmless at any time.
  void deliver();

 private:
  void on_delivered(bool has_answered, bool is_accepted);

  SvcState &state_;
  Retry retry_;
  bool is_sending_ = false;
  bool is_unreachable_ = false;  // the client, at the last attempt; logged once
};
