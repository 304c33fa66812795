// Which report goes to the desk next, and what its end means for the store and the client.
//
// The store is the list of work: whatever it shows as to be sent is sent, one report at a time in the order
// of ids, whether or not a launch request named it. After a failure the list is tried again later, until it
// is empty. Main loop only.
#pragma once

#include "svc_desk_link.h"
#include "svc_messages.h"
#include "svc_retry.h"
#include "svc_state.h"
#include "svc_upload.h"

class SvcUploader {
 public:
  SvcUploader(SvcState &state, DeskLink &desk, SvcMessages &messages)
      : state_(state), desk_(desk), messages_(messages), retry_([this] { begin_pass(); }) {}

  // A launch request named this report.
  void request(int voc_id, SvcRequestKind kind);
  // There may be work, or the desk is back.
  void wake();
  // The report arrived at the desk under this id; harmless when that is known already.
  void record_sent(int voc_id, int server_id);

 private:
  void begin_pass();
  void next();
  void on_end(int voc_id, const SvcUploadEnd &end);
  void end_pass();
  void tell_failure(int voc_id, int status);
  std::vector<int> work() const;

  SvcState &state_;
  DeskLink &desk_;
  SvcMessages &messages_;
  Retry retry_;
  bool is_busy_ = false;
  bool has_failed_ = false;  // in this pass
  bool is_wanted_ = false;   // something was asked for while busy
  int last_id_ = 0;          // of this pass
};
