// Copies one core into a crash folder, gzip level 1, and unpacked beside it for the debugger. Takes cores
// that are plain or gzip, and those of zstd, lz4 and xz where the machine has the tool. Streams: memory does
// not grow with the core. Blocks; any thread.
#pragma once

#include <gio/gio.h>

#include <string>

#include "tavro_handles.h"

struct CoreCopy {
  bool is_kept = false;      // there is a core now; else `note` says why there is none
  bool is_unpacked = false;  // `plain_path` holds it all
  std::string note;          // also of a core that was kept, but not whole
};

// `packed_path` and `plain_path` must not exist. `packed_path` is gone again unless the core was kept.
// A disk that does not take the core gets a log line.
CoreCopy copy_core(int source, const std::string &packed_path, const std::string &plain_path,
                   GCancellable *stop);

// A text as a gzip file, readable by its owner alone; false with errno.
bool write_packed_text(const std::string &path, const std::string &text);

// Opens a new file of our own; empty with errno.
TavroFd create_private_file(const std::string &path);
