#include "tavro_picture_info.h"

#include <fcntl.h>
#include <sys/stat.h>

#include <algorithm>
#include <cstdint>
#include <string_view>
#include <vector>

#include "tavro_byte_reader.h"
#include "tavro_handles.h"

namespace {

using bytes = std::vector<unsigned char>;

bytes _read_at(int fd, off_t place, size_t length) {
  bytes read(length);
  const ssize_t count = pread(fd, read.data(), length, place);
  read.resize(count > 0 ? static_cast<size_t>(count) : 0);
  return read;
}

// `exif` is the body of an EXIF segment behind its name.
int _orientation(const tavro_byte_reader &exif) {
  constexpr unsigned int kOrientationTag = 0x0112;
  constexpr size_t kEntrySize = 12;
  const bool is_big = exif.at(0) == 'M';
  const auto number = [&](size_t place) { return is_big ? exif.big16(place) : exif.little16(place); };
  const size_t directory = is_big ? exif.big32(4) : exif.little32(4), count = number(directory);
  for (size_t i = 0; i < count; ++i) {
    const size_t entry = directory + 2 + i * kEntrySize;
    if (entry + kEntrySize > exif.size()) break;
    if (number(entry) != kOrientationTag) continue;
    const unsigned int value = number(entry + 8);
    return value >= 1 && value <= 8 ? static_cast<int>(value) : 1;
  }
  return 1;
}

bool _is_frame(unsigned int marker) {
  // The markers in this range that do not start a frame: tables and an extension.
  return marker >= 0xC0 && marker <= 0xCF && marker != 0xC4 && marker != 0xC8 && marker != 0xCC;
}

// Walk the segments up to the first scan.
bool _read_jpeg(int fd, tavro_picture_info *info) {
  constexpr int kMostSegments = 512;  // a colour profile takes up to 255 of them
  constexpr size_t kSegmentHead = 10;
  constexpr std::string_view kExifName("Exif\0\0", 6);
  unsigned int components = 0;
  *info = {TAVRO_PICTURE_JPEG, 0, 0, false, 1};
  off_t place = 2;
  for (int i = 0; i < kMostSegments; ++i) {
    const bytes segment = _read_at(fd, place, kSegmentHead);
    const tavro_byte_reader head(segment);
    const unsigned int marker = head.at(1), length = head.big16(2);
    if (head.at(0) != 0xFF || marker == 0xFF) {  // padding, or a few bytes that belong to nothing
      ++place;
      continue;
    }
    if (length < 2) return false;
    if (_is_frame(marker)) {
      info->height = static_cast<int>(head.big16(5));
      info->width = static_cast<int>(head.big16(7));
      info->is_progressive = marker == 0xC2 || marker == 0xCA;
      components = head.at(9);
    }
    if (marker == 0xDA) {
      info->is_progressive = info->is_progressive || head.at(4) < components;
      return info->width > 0 && info->height > 0;
    }
    if (marker == 0xE1 && info->orientation == 1 && length > 2 + kExifName.size() && head.has(4, kExifName))
      info->orientation = _orientation(
          _read_at(fd, place + 4 + static_cast<off_t>(kExifName.size()), length - 2 - kExifName.size()));
    place += 2 + static_cast<off_t>(length);
  }
  return false;
}

bool _read_png(const tavro_byte_reader &head, tavro_picture_info *info) {
  constexpr unsigned int kLargestSide = 1 << 20;
  const unsigned int width = head.big32(16), height = head.big32(20);
  *info = {TAVRO_PICTURE_PNG, static_cast<int>(width), static_cast<int>(height), false, 1};
  return width > 0 && height > 0 && width <= kLargestSide && height <= kLargestSide;
}

// The size that a WebP's first chunk says, as each kind of it packs it.
bool _read_webp_size(const tavro_byte_reader &head, tavro_picture_info *info) {
  if (head.has(12, "VP8X")) {
    info->width = static_cast<int>((head.little32(24) & 0xFFFFFF) + 1);
    info->height = static_cast<int>((head.little32(27) & 0xFFFFFF) + 1);
  } else if (head.has(12, "VP8L")) {
    info->width = static_cast<int>((head.little32(21) & 0x3FFF) + 1);
    info->height = static_cast<int>((head.little32(21) >> 14 & 0x3FFF) + 1);
  } else if (head.has(12, "VP8 ")) {
    info->width = static_cast<int>(head.little32(26) & 0x3FFF);
    info->height = static_cast<int>(head.little32(28) & 0x3FFF);
  }
  return info->width > 0 && info->height > 0;
}

bool _read_webp(int fd, const tavro_byte_reader &head, tavro_picture_info *info) {
  constexpr int kMostChunks = 64;
  constexpr size_t kChunkHead = 8, kMostExif = 64 * 1024;
  *info = {TAVRO_PICTURE_WEBP, 0, 0, false, 1};
  if (!_read_webp_size(head, info)) return false;
  off_t place = 12;
  for (int i = 0; i < kMostChunks; ++i) {
    const bytes chunk_head = _read_at(fd, place, kChunkHead);
    if (chunk_head.size() < kChunkHead) break;
    const tavro_byte_reader chunk(chunk_head);
    const size_t length = chunk.little32(4);
    if (chunk.has(0, "EXIF"))
      info->orientation =
          _orientation(_read_at(fd, place + static_cast<off_t>(kChunkHead), std::min(length, kMostExif)));
    place += static_cast<off_t>(kChunkHead + length + length % 2);
  }
  return true;
}

}  // namespace

int tavro_exif_orientation(const unsigned char *exif, size_t size) {
  return _orientation({exif, size});
}

bool tavro_picture_info_read(const char *path, tavro_picture_info *info) {
  // Without O_NONBLOCK a pipe would wait for its writer.
  const TavroFd fd(open(path, O_RDONLY | O_CLOEXEC | O_NONBLOCK));
  struct stat file {};
  if (!fd || fstat(fd.get(), &file) != 0 || !S_ISREG(file.st_mode)) return false;
  constexpr size_t kLongestHead = 32;
  const bytes beginning = _read_at(fd.get(), 0, kLongestHead);
  const tavro_byte_reader head(beginning);
  if (head.has(0, "\xFF\xD8")) return _read_jpeg(fd.get(), info);
  if (head.has(0, "RIFF") && head.has(8, "WEBP")) return _read_webp(fd.get(), head, info);
  return head.has(0, "\x89PNG\r\n\x1A\n") && _read_png(head, info);
}
