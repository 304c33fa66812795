// Files of the reports on disk: reports/<report>/<number>, and "<number>.part" while one is arriving.
//
// A part grows as bytes arrive and is checked and renamed when it is whole, so a file under its own number is
// always complete. A part that a crash left behind is where the sender goes on. Main loop only.
#pragma once

#include <cstdint>
#include <string>

#include "handles.h"

class DeskFiles {
 public:
  bool open(const std::string &folder);

  bool is_whole(int64_t report, int64_t number) const;
  // Bytes of the file that arrived so far, whole or part.
  int64_t received(int64_t report, int64_t number) const;
  // The part, opened to go on at `offset` (what lies behind it is dropped). Empty on failure.
  UniqueFd open_part(int64_t report, int64_t number, int64_t offset) const;
  bool drop_part(int64_t report, int64_t number) const;
  // The check of a part that has all its bytes; it gets its own number only when the checksum is right.
  enum class Finish { kDone, kWrongChecksum, kFailed };
  Finish finish(int64_t report, int64_t number, int64_t size, const std::string &sha256) const;
  std::string path(int64_t report, int64_t number) const;

 private:
  std::string folder_of(int64_t report) const;
  std::string root_;
};

// What a file is, from its first bytes and never from its name: "image/png", "image/jpeg", "image/gif",
// "image/webp", "video/mp4", or "application/octet-stream" for everything else.
const char *content_type_of(const void *bytes, size_t size);
