// What of a file is sent: a picture goes without its metadata, anything else as it is. The file itself is
// left alone.
#pragma once

#include <functional>
#include <memory>
#include <string>

#include "handles.h"

struct SvcContent {
  std::shared_ptr<UniqueFd> fd;  // null: it cannot be sent
  int64_t size = 0;              // bytes; what is written behind later is not sent
  std::string sha256;
  const char *why = nullptr;  // it cannot be sent
};

// Makes the content of an open file on a worker thread and hands it to the main loop. The same file makes the
// same content, so that an upload can be resumed. A file that `may_be_picture` and is one is
// held in memory until its content is let go.
void svc_make_content(std::shared_ptr<UniqueFd> fd, int64_t size, bool may_be_picture,
                      std::function<void(const SvcContent &)> then);
