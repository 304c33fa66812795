#include "tavro_dbmgr_fold.h"

#include <glib.h>

#include <cstring>

#include "tavro_handles.h"

namespace {

constexpr std::uint64_t kEachByte = 0x0101010101010101;
constexpr std::uint64_t kHighBits = 0x80 * kEachByte;

bool _is_ascii(char byte) {
  return static_cast<unsigned char>(byte) < 0x80;
}

char _ascii_lower(char byte) {
  return byte >= 'A' && byte <= 'Z' ? static_cast<char>(byte + ('a' - 'A')) : byte;
}

// Eight ASCII characters at once. With their high bits free, additions do not reach over from one to the
// next: the high bit of each sum says whether a byte is at least "A", or above "Z".
std::uint64_t _ascii_lower_eight(std::uint64_t eight) {
  const std::uint64_t from_a = eight + (0x80 - 'A') * kEachByte;
  const std::uint64_t above_z = eight + (0x7f - 'Z') * kEachByte;
  const std::uint64_t is_upper = (from_a & ~above_z) & kHighBits;
  return eight | (is_upper >> 2);  // 0x20, by which the small letters differ
}

// As far as it is ASCII, in steps of eight; the length that was done.
std::size_t _lower_ascii(std::string_view text, char *lowered) {
  std::size_t at = 0;
  for (std::uint64_t eight; at + sizeof eight <= text.size(); at += sizeof eight) {
    std::memcpy(&eight, text.data() + at, sizeof eight);
    if (eight & kHighBits) break;
    eight = _ascii_lower_eight(eight);
    std::memcpy(lowered + at, &eight, sizeof eight);
  }
  for (; at < text.size() && _is_ascii(text[at]); at++) lowered[at] = _ascii_lower(text[at]);
  return at;
}

// The number of bytes that the first one announces and that are there; 1 when it begins no character.
std::size_t _length(std::string_view text) {
  const auto first = static_cast<unsigned char>(text.front());
  const std::size_t length = first >= 0xf0 && first < 0xf8 ? 4 : first >= 0xe0 ? 3 : first >= 0xc2 ? 2 : 1;
  if (first >= 0xf8 || length > text.size()) return 1;
  for (std::size_t i = 1; i < length; i++)
    if ((static_cast<unsigned char>(text[i]) & 0xc0) != 0x80) return 1;
  return length;
}

}  // namespace

store_case_folder::row store_case_folder::read_row(std::string_view prefix) {
  row read;
  read.is_read = true;
  std::vector<std::string> folded;
  bool has_case = false;
  for (int last = 0x80; last <= 0xbf; last++) {
    const std::string character = std::string(prefix) + static_cast<char>(last);
    // Overlong forms and surrogates are no characters.
    const bool is_character = g_utf8_validate(character.c_str(), -1, nullptr);
    folded.push_back(is_character ? TavroGText(g_utf8_casefold(character.c_str(), -1)).get() : character);
    has_case = has_case || folded.back() != character;
  }
  if (has_case) read.folded = std::move(folded);
  return read;
}

std::size_t store_case_folder::append_character(std::string_view text, std::string *folded) {
  const std::size_t length = _length(text);
  if (length == 1) {
    *folded += text.front();
    return 1;
  }
  std::uint32_t prefix = 0;
  for (std::size_t i = 0; i + 1 < length; i++) prefix = prefix << 8 | static_cast<unsigned char>(text[i]);
  if (prefix != last_prefix_) {
    row &found = rows_[prefix];
    if (!found.is_read) found = read_row(text.substr(0, length - 1));
    last_prefix_ = prefix;
    last_row_ = &found;
  }
  if (last_row_->folded.empty())
    folded->append(text, 0, length);
  else
    *folded += last_row_->folded[static_cast<unsigned char>(text[length - 1]) & 0x3f];
  return length;
}

void store_case_folder::fold(std::string_view text, std::string *folded) {
  folded->resize(text.size());
  std::size_t at = _lower_ascii(text, folded->data());
  if (at == text.size()) return;
  folded->resize(at);
  while (at < text.size()) {
    if (_is_ascii(text[at]))
      *folded += _ascii_lower(text[at++]);
    else
      at += append_character(text.substr(at), folded);
  }
}
