#include "tavro_video_info.h"

#include <fcntl.h>
#include <sys/stat.h>

#include <cmath>
#include <cstdint>
#include <cstdio>
#include <cstring>

#include "tavro_handles.h"

namespace {

constexpr int kMostBoxes = 200;  // on one level; a file could name endlessly many
constexpr double kLongestSeconds = 24 * 3600;

uint64_t _number(const unsigned char *bytes, int count) {
  uint64_t value = 0;
  for (int i = 0; i < count; ++i) value = value << 8 | bytes[i];
  return value;
}

struct box_content {
  uint64_t begin, end;  // in the file; nothing in it when they are equal
};

bool _read_at(int file, uint64_t offset, void *buffer, size_t size) {
  return pread(file, buffer, size, static_cast<off_t>(offset)) == static_cast<ssize_t>(size);
}

// The first box of this name within another.
box_content _find_box(int file, box_content within, const char *name) {
  for (int i = 0; i < kMostBoxes && within.begin + 8 <= within.end; ++i) {
    unsigned char head[16] = {};
    if (!_read_at(file, within.begin, head, 8)) break;
    uint64_t size = _number(head, 4), head_size = 8;
    if (size == 1 && _read_at(file, within.begin, head, 16)) {
      size = _number(head + 8, 8);
      head_size = 16;
    }
    if (size < head_size || size > within.end - within.begin) break;
    if (std::memcmp(head + 4, name, 4) == 0) return {within.begin + head_size, within.begin + size};
    within.begin += size;
  }
  return {0, 0};
}

// The file, and all that is in it; nothing when it cannot be read.
TavroFd _open_video(const char *path, box_content *all) {
  TavroFd file(open(path, O_RDONLY | O_NONBLOCK | O_CLOEXEC));
  struct stat info {};
  if (!file || fstat(file.get(), &info) != 0 || !S_ISREG(info.st_mode)) return TavroFd();
  *all = {0, static_cast<uint64_t>(info.st_size)};
  return file;
}

}  // namespace

bool tavro_video_is_playable(const char *path) {
  if (tavro_video_seconds(path) > 0) return true;
  box_content all = {0, 0};
  const TavroFd file = _open_video(path, &all);
  const auto has = [&](const char *name) { return _find_box(file.get(), all, name).end != 0; };
  return file && has("moov") && has("moof");
}

double tavro_video_seconds(const char *path) {
  box_content all = {0, 0};
  const TavroFd file = _open_video(path, &all);
  if (!file) return 0;
  const box_content movie = _find_box(file.get(), all, "moov");
  const box_content header = _find_box(file.get(), movie, "mvhd");
  unsigned char fields[32] = {};
  if (header.end - header.begin < sizeof fields || !_read_at(file.get(), header.begin, fields, sizeof fields))
    return 0;
  const bool is_wide = fields[0] == 1;  // version 1 has times of 8 bytes
  const uint64_t scale = _number(fields + (is_wide ? 20 : 12), 4);
  const uint64_t duration = is_wide ? _number(fields + 24, 8) : _number(fields + 16, 4);
  const double seconds = scale ? static_cast<double>(duration) / static_cast<double>(scale) : 0;
  return seconds <= kLongestSeconds ? seconds : 0;
}

std::string tavro_video_picture_path(const std::string &video_path) {
  const size_t name = video_path.rfind('/') + 1;
  return video_path.substr(0, name) + tavro_video_picture_name(video_path.substr(name));
}

std::string tavro_video_length_text(double seconds) {
  if (seconds <= 0) return "";
  const auto whole = static_cast<unsigned>(std::lround(seconds));
  char text[32];
  if (whole < 3600)
    std::snprintf(text, sizeof text, "%u:%02u", whole / 60, whole % 60);
  else
    std::snprintf(text, sizeof text, "%u:%02u:%02u", whole / 3600, whole / 60 % 60, whole % 60);
  return text;
}
