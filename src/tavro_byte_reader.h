// Reads the bytes of a picture file, of which nothing is believed: past their end there are zeroes. Holds no
// bytes of its own; what it reads must live longer. Plain value; any thread.
#pragma once

#include <algorithm>
#include <cstddef>
#include <cstring>
#include <initializer_list>
#include <string_view>
#include <vector>

class tavro_byte_reader {
 public:
  tavro_byte_reader(const unsigned char *bytes, size_t size) : bytes_(bytes), size_(size) {}
  tavro_byte_reader(const std::vector<unsigned char> &bytes)
      : tavro_byte_reader(bytes.data(), bytes.size()) {}

  unsigned int at(size_t place) const { return place < size_ ? bytes_[place] : 0; }
  unsigned int big16(size_t place) const { return at(place) << 8 | at(place + 1); }
  unsigned int big32(size_t place) const { return big16(place) << 16 | big16(place + 2); }
  unsigned int little16(size_t place) const { return at(place + 1) << 8 | at(place); }
  unsigned int little32(size_t place) const { return little16(place + 2) << 16 | little16(place); }
  bool has(size_t place, std::string_view text) const {
    return place + text.size() <= size_ && std::memcmp(bytes_ + place, text.data(), text.size()) == 0;
  }
  bool has_any(size_t place, std::initializer_list<std::string_view> texts) const {
    return std::any_of(texts.begin(), texts.end(), [&](std::string_view text) { return has(place, text); });
  }
  const unsigned char *data(size_t place) const { return bytes_ + place; }
  size_t size() const { return size_; }

 private:
  const unsigned char *bytes_;
  size_t size_;
};
