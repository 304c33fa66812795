// Full case folding of Unicode, without regard to language: "STRASSE" and "Straße" fold to the same text.
// Bytes that are no UTF-8 stay as they are. Quick for many texts: what a character folds to is asked of GLib
// once for each row of 64 characters. Any thread; one folder is used by one thread at a time.
#pragma once

#include <cstdint>
#include <string>
#include <string_view>
#include <unordered_map>
#include <vector>

class store_case_folder {
 public:
  // Replace `folded` by the folded text.
  void fold(std::string_view text, std::string *folded);

 private:
  // The characters whose UTF-8 differs in the last byte alone.
  struct row {
    bool is_read = false;
    std::vector<std::string> folded;  // empty: each is as it is
  };
  // Length of the character at the start of the text, whose folded form is appended.
  std::size_t append_character(std::string_view text, std::string *folded);
  static row read_row(std::string_view prefix);

  std::unordered_map<std::uint32_t, row> rows_;  // by the bytes before the last
  std::uint32_t last_prefix_ = 0;
  const row *last_row_ = nullptr;
};
