#include "tavro_picture_info.h"

#include <fcntl.h>
#include <sys/stat.h>

#include <cstdint>
#include <cstring>
#include <vector>

#include "tavro_handles.h"

namespace {

// Bytes of a file; reading past the end gives zeroes, so that no length in the file is believed.
class header_bytes {
 public:
  explicit header_bytes(std::vector<unsigned char> bytes) : bytes_(std::move(bytes)) {}
  unsigned int at(size_t place) const { return place < bytes_.size() ? bytes_[place] : 0; }
  unsigned int big16(size_t place) const { return at(place) << 8 | at(place + 1); }
  unsigned int big32(size_t place) const { return big16(place) << 16 | big16(place + 2); }
  unsigned int number16(size_t place, bool is_big) const {
    return is_big ? big16(place) : at(place + 1) << 8 | at(place);
  }
  unsigned int number32(size_t place, bool is_big) const {
    return is_big ? big32(place) : number16(place + 2, false) << 16 | number16(place, false);
  }
  bool starts_with(size_t place, const char *text, size_t length) const {
    return place + length <= bytes_.size() && std::memcmp(bytes_.data() + place, text, length) == 0;
  }
  size_t size() const { return bytes_.size(); }

 private:
  std::vector<unsigned char> bytes_;
};

header_bytes _read_at(int fd, off_t place, size_t length) {
  std::vector<unsigned char> bytes(length);
  const ssize_t count = pread(fd, bytes.data(), length, place);
  bytes.resize(count > 0 ? static_cast<size_t>(count) : 0);
  return header_bytes(std::move(bytes));
}

// `exif` is the body of an EXIF segment behind its name.
int _orientation(const header_bytes &exif) {
  constexpr unsigned int kOrientationTag = 0x0112;
  constexpr size_t kEntrySize = 12;
  const bool is_big = exif.at(0) == 'M';
  const size_t directory = exif.number32(4, is_big);
  const size_t count = exif.number16(directory, is_big);
  for (size_t i = 0; i < count; ++i) {
    const size_t entry = directory + 2 + i * kEntrySize;
    if (entry + kEntrySize > exif.size()) break;
    if (exif.number16(entry, is_big) != kOrientationTag) continue;
    const unsigned int value = exif.number16(entry + 8, is_big);
    return value >= 1 && value <= 8 ? static_cast<int>(value) : 1;
  }
  return 1;
}

bool _is_frame(unsigned int marker) {
  // The markers in this range that do not start a frame: tables and an extension.
  return marker >= 0xC0 && marker <= 0xCF && marker != 0xC4 && marker != 0xC8 && marker != 0xCC;
}

// Walk the segments up to the one that has the size.
bool _read_jpeg(int fd, tavro_picture_info *info) {
  constexpr int kMostSegments = 512;  // a colour profile takes up to 255 of them
  constexpr size_t kSegmentHead = 10;
  constexpr size_t kExifName = 6;
  *info = {TAVRO_PICTURE_JPEG, 0, 0, false, 1};
  off_t place = 2;
  for (int i = 0; i < kMostSegments; ++i) {
    const header_bytes head = _read_at(fd, place, kSegmentHead);
    const unsigned int marker = head.at(1), length = head.big16(2);
    if (head.at(0) != 0xFF) return false;
    if (marker == 0xFF) {  // padding
      ++place;
      continue;
    }
    if (length < 2) return false;
    if (_is_frame(marker)) {
      info->height = static_cast<int>(head.big16(5));
      info->width = static_cast<int>(head.big16(7));
      info->is_progressive = marker == 0xC2;
      return info->width > 0 && info->height > 0;
    }
    if (marker == 0xE1 && length > 2 + kExifName && head.starts_with(4, "Exif\0\0", kExifName))
      info->orientation =
          _orientation(_read_at(fd, place + 4 + static_cast<off_t>(kExifName), length - 2 - kExifName));
    place += 2 + static_cast<off_t>(length);
  }
  return false;
}

bool _read_png(const header_bytes &head, tavro_picture_info *info) {
  constexpr unsigned int kLargestSide = 1 << 20;
  const unsigned int width = head.big32(16), height = head.big32(20);
  *info = {TAVRO_PICTURE_PNG, static_cast<int>(width), static_cast<int>(height), false, 1};
  return width > 0 && height > 0 && width <= kLargestSide && height <= kLargestSide;
}

}  // namespace

bool tavro_picture_info_read(const char *path, tavro_picture_info *info) {
  // Without O_NONBLOCK a pipe would wait for its writer.
  const TavroFd fd(open(path, O_RDONLY | O_CLOEXEC | O_NONBLOCK));
  struct stat file {};
  if (!fd || fstat(fd.get(), &file) != 0 || !S_ISREG(file.st_mode)) return false;
  constexpr size_t kPngHead = 24;
  const header_bytes head = _read_at(fd.get(), 0, kPngHead);
  if (head.starts_with(0, "\xFF\xD8", 2)) return _read_jpeg(fd.get(), info);
  return head.starts_with(0, "\x89PNG\r\n\x1A\n", 8) && _read_png(head, info);
}
