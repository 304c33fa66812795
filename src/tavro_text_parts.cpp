#include "tavro_text_parts.h"

namespace {

bool _is_inside_character(char byte) {
  return (static_cast<unsigned char>(byte) & 0xC0) == 0x80;
}

// Where the part that begins at `start` ends.
size_t _part_end(const std::string &text, size_t start, size_t limit) {
  if (text.size() - start <= limit) return text.size();
  const size_t line_end = text.rfind('\n', start + limit - 1);
  if (line_end != std::string::npos && line_end >= start) return line_end + 1;
  size_t end = start + limit;
  // A character is four bytes at most: more of these are no text, and are cut anywhere.
  for (int i = 0; i < 3 && _is_inside_character(text[end]); ++i) --end;
  return end;
}

}  // namespace

std::vector<std::string> tavro_text_parts(const std::string &text, size_t limit) {
  std::vector<std::string> parts;
  size_t start = 0;
  do {
    const size_t end = _part_end(text, start, limit);
    parts.push_back(text.substr(start, end - start));
    start = end;
  } while (start < text.size());
  return parts;
}
