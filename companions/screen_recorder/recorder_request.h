// A launch request that the recorder has taken, and its answer: "handle" while there is a session, nothing
// but the result when a capture has ended; with a failure on a full disk the "reason" "storage_full". Main
// loop only.
#pragma once

#include <string>

#include "tavro_handles.h"

class RecorderRequest {
 public:
  explicit RecorderRequest(app_control_h request);
  RecorderRequest(RecorderRequest &&) = default;
  RecorderRequest &operator=(RecorderRequest &&) = default;
  // Whoever was never answered is told that it failed.
  ~RecorderRequest();

  // Empty when it is missing.
  std::string text(const char *key) const;
  // A decimal number between the two; `otherwise` for anything else.
  int number(const char *key, int least, int most, int otherwise) const;
  // Name on the bus of the program that asks; empty when that is not known.
  std::string caller() const;

  void answer_session(int handle);
  void answer_end(bool is_succeeded);

 private:
  void answer(app_control_result_e result, const char *handle);

  TavroAppControl request_;  // null once answered
};
