#include "tavro_dbmgr_text_match.h"

#include <Evas.h>

#include <cstring>

namespace {

constexpr std::string_view kNoReply = "none";
// Bytes from "&" to ";", more than any takes. Looking to the text's end at each "&" would be quadratic.
constexpr std::size_t kLongestEscape = 32;

struct written_as {
  std::string_view markup;
  std::string_view shown;
};
// What the toolkit writes for plain text most often; it has names for many more characters ("&szlig;"). Tags
// that are not here show nothing of their own.
constexpr written_as kMarkup[] = {
    {"&amp;", "&"},  {"&lt;", "<"},  {"&gt;", ">"},    {"&quot;", "\""},          {"&apos;", "'"},
    {"<br/>", "\n"}, {"<br>", "\n"}, {"<tab/>", "\t"}, {"<ps/>", "\xe2\x80\xa9"},
};

// What a piece of markup, which begins with "&" or "<", shows; `length` gets how much of it that is.
// `may_be_tag`: a ">" follows.
std::string_view _shown(std::string_view markup, bool may_be_tag, std::size_t &length) {
  for (const written_as &entry : kMarkup)
    if (markup.substr(0, entry.markup.size()) == entry.markup) {
      length = entry.markup.size();
      return entry.shown;
    }
  const bool is_tag = markup.front() == '<';
  const std::size_t end = !is_tag      ? markup.substr(0, kLongestEscape).find(';')
                          : may_be_tag ? markup.find('>')
                                       : std::string_view::npos;
  const char *named = is_tag || end == std::string_view::npos
                          ? nullptr
                          : evas_textblock_escape_string_range_get(markup.data(), markup.data() + end + 1);
  // What is neither a tag nor a name stands for itself.
  const bool is_shown_as_it_is = end == std::string_view::npos || (!is_tag && !named);
  length = is_shown_as_it_is ? 1 : end + 1;
  if (named) return named;
  return markup.substr(0, is_shown_as_it_is ? 1 : 0);
}

}  // namespace

store_text_finder::store_text_finder(const char *wanted) {
  if (wanted) folder_.fold(wanted, &wanted_);
}

bool store_text_finder::is_in(const char *text) {
  return text && is_in_text(text);
}

bool store_text_finder::is_in_text(std::string_view text) {
  folder_.fold(text, &folded_);
  return memmem(folded_.data(), folded_.size(), wanted_.data(), wanted_.size()) != nullptr;
}

bool store_text_finder::is_in_reply(std::string_view markup) {
  if (markup == kNoReply) return false;
  std::size_t at = markup.find_first_of("&<");
  if (at == std::string_view::npos) return is_in_text(markup);
  shown_.clear();
  const std::size_t last_end = markup.rfind('>');
  std::size_t from = 0;
  for (; at != std::string_view::npos; at = markup.find_first_of("&<", from)) {
    std::size_t length = 0;
    const bool may_be_tag = last_end != std::string_view::npos && at < last_end;
    const std::string_view shown = _shown(markup.substr(at), may_be_tag, length);
    shown_.append(markup, from, at - from).append(shown);
    from = at + length;
  }
  shown_.append(markup.substr(from));
  return is_in_text(shown_);
}

bool store_text_finder::is_in_replies(const char *replies) {
  if (!replies) return false;
  std::string_view rest = replies;
  for (std::size_t end; (end = rest.find('#')) != std::string_view::npos; rest.remove_prefix(end + 1))
    if (is_in_reply(rest.substr(0, end))) return true;
  return is_in_reply(rest);
}
