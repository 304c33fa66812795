#include <algorithm>
#include <cstring>

#include "tavro_dbmgr_internal.h"

namespace {

constexpr std::size_t kInitialStatementBytes = 4000;

}  // namespace

statement_text::statement_text()
    : text_(TAVRO_ADOPT(static_cast<char *>(g_malloc0(kInitialStatementBytes)))),
      capacity_(kInitialStatementBytes) {}

statement_text::~statement_text() {
  TAVRO_FREE(text_);
}

void statement_text::append(const char *text) {
  const std::size_t added = std::strlen(text);
  if (length_ + added + 1 > capacity_) {
    capacity_ = std::max(capacity_ * 2, length_ + added + 1);
    char *grown = TAVRO_ADOPT(static_cast<char *>(g_malloc0(capacity_)));
    std::memcpy(grown, text_, length_);
    TAVRO_FREE(text_);
    text_ = grown;
  }
  std::memcpy(text_ + length_, text, added + 1);
  length_ += added;
}

statement_text &sa_strcat(statement_text &destination, const char *source) {
  if (source) destination.append(source);
  return destination;
}

statement_text &sa_strcat(statement_text &destination, int source) {
  return sa_strcat(destination, std::to_string(source).c_str());
}

statement_text &sa_strcat(statement_text &destination, quoted_text source) {
  const TavroText escaped(tavro_insert_escape_character(source.text));
  return sa_strcat(destination, "'", static_cast<const char *>(escaped.get()), "'");
}

statement_text &sa_strcat_values(statement_text &destination, std::initializer_list<const char *> values) {
  const char *separator = nullptr;
  for (const char *value : values) {
    sa_strcat(destination, separator, quoted(value));
    separator = ", ";
  }
  return destination;
}

char *tavro_insert_escape_character(const char *text) {
  if (!text) return nullptr;
  char *escaped = TAVRO_ADOPT(static_cast<char *>(g_malloc0(2 * std::strlen(text) + 1)));
  char *end = escaped;
  for (; *text; text++) {
    if (*text == '\'') *end++ = '\'';
    *end++ = *text;
  }
  return escaped;
}
