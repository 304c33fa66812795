// Looks into a system log, which the crash service writes as an archive with the log as its first file. Any
// thread; a long log is unpacked whole but only its end is kept.
#pragma once

#include <cstddef>
#include <string>

struct tavro_log_tail {
  std::string text;  // valid UTF-8 without nulls; begins with a whole line
  bool is_cut;       // the log begins before it
};

// The last `limit` bytes of the log at most. False when the file is not there or is no such archive.
bool tavro_log_archive_read(const char *path, size_t limit, tavro_log_tail *tail);
