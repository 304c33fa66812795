// Looking for a text inside others, whatever the case of either: full case folding of Unicode, without regard
// to language ("STRASSE" finds "Straße"). Every character of the text looked for stands for itself. Bytes
// that are no UTF-8 are compared as they are. Any thread; one finder is used by one thread at a time.
#pragma once

#include <string>
#include <string_view>

#include "tavro_dbmgr_fold.h"

class store_text_finder {
 public:
  // Null or empty is found everywhere.
  explicit store_text_finder(const char *wanted);
  bool finds_all() const { return wanted_.empty(); }
  // In a plain text; null holds nothing.
  bool is_in(const char *text);
  // In one of the replies of a report: markup joined by "#", where "none" stands for none. Looked for in what
  // is shown of them.
  bool is_in_replies(const char *replies);

 private:
  bool is_in_text(std::string_view text);
  bool is_in_reply(std::string_view markup);

  store_case_folder folder_;
  std::string wanted_;  // folded
  std::string folded_;  // kept, so that a search in many texts needs no memory for each
  std::string shown_;
};
