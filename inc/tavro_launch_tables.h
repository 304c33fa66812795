// The launch requests that the client accepts and those that it sends to the upload service, as the code's
// own tables have them: docs/launch-requests.md is held against these. Any thread.
#pragma once

#include <vector>

struct tavro_accepted_operation {
  const char *operation;  // null: any other one, and none
  const char *log_line;   // null: none
};

struct tavro_sent_operation {
  const char *operation;           // value of "TAVRO_OPERATION_TYPE"
  std::vector<const char *> keys;  // of its further extra data
};

// In the order of the comparison; the first that matches decides.
std::vector<tavro_accepted_operation> tavro_accepted_operations();

// Keys in the order of sending.
std::vector<tavro_sent_operation> tavro_sent_operations();
