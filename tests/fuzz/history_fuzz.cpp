// Whatever a stored report says of its statuses, times, texts and replies: a sane row, nothing lost, and a
// search that finds what is shown.
//
// An input is texts, each ended by a zero byte: statuses, replies, times of change, time of creation, title,
// description, target, and a text that is looked for; texts that are missing are null. Touches no store. Runs
// in a fresh phone (tests/support/in_phone): under libFuzzer in the preset "fuzz", over the seeds alone in
// every other build.
#include <Elementary.h>

#include <algorithm>
#include <cstdint>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <string>

#include "dbmgr/tavro_dbmgr_text_match.h"
#include "fuzz_input.h"
#include "tavro_dbmgr.h"
#include "tavro_details_text.h"
#include "tavro_handles.h"
#include "tavro_history_text.h"
#include "tavro_memory.h"

namespace {

using text_owner = TavroHandle<char, std::free>;

constexpr std::size_t kLongestTime = sizeof "23/12/9999";
constexpr std::size_t kLongestTimeline = 20;

bool is_text(const char *text) {
  return text && g_utf8_validate(text, -1, nullptr);
}

// The toolkit's markup gives every text back but these two characters.
bool comes_back(const char *text) {
  return is_text(text) && !std::strpbrk(text, "\r") && !std::strstr(text, "\u21d0");
}

void expect_statuses(const char *submitted) {
  char **tokens = nullptr;
  int count = -1;
  tavro_parse_status_string(submitted, &tokens, &count);
  const TavroStrv owner(tokens);
  expect(count == static_cast<int>(separators(submitted)) && count == get_count_of_updates(submitted),
         "number of entries");
  expect(!submitted == !tokens, "tokens of a text");
  if (tokens) expect(std::strcmp(TavroGText(g_strjoinv("#", tokens)).get(), submitted) == 0, "entries");
  const char *text = nullptr;
  for (int i = 0; tokens && tokens[i]; i++) {
    _tavro_get_status(tokens[i], &text);
    expect(text && *text, "every status has a text");
  }
  tavro_details_status_line(submitted);
  expect(!tavro_details_can_resend(submitted) || tavro_current_status(submitted) >= 0, "resend of nothing");
}

std::string row(const svc_voc_data &voc, const char *part) {
  const text_owner text(tavro_history_row_text(0, &voc, part));
  expect(text != nullptr, "a part of a row has a text");
  return text.get();
}

// Between the tags of the row there is what was written, and no markup of its own.
void expect_row(const svc_voc_data &voc) {
  const std::string title = row(voc, "elm.text.sub.left.bottom"), start = "<font_size=32>", end = "</></>";
  expect(title.size() >= start.size() + end.size() && title.compare(0, start.size(), start) == 0 &&
             title.compare(title.size() - end.size(), end.size(), end) == 0,
         "the title's tags");
  const bool has_title = voc.title_description && *voc.title_description;
  const char *written = has_title ? voc.title_description : voc.description;
  const std::string inner = title.substr(start.size(), title.size() - start.size() - end.size());
  const text_owner shown(elm_entry_markup_to_utf8(inner.c_str()));
  if (comes_back(written)) expect(std::strcmp(shown.get(), written) == 0, "the title is what was written");
  row(voc, "elm.text.main.left.top");
  expect(row(voc, "elm.text.sub.right.top").size() < kLongestTime, "a time is short");
  expect(!row(voc, "elm.text.sub.right.bottom").empty(), "a row has a status");
}

void expect_details(const svc_voc_data &voc) {
  const tavro_timeline timeline = tavro_details_timeline(&voc, kLongestTimeline);
  expect(timeline.states.size() == std::min(timeline.count, kLongestTimeline), "length of the timeline");
  expect(timeline.count <= separators(voc.submitted) + 1, "no more states than are stored");
  expect(tavro_details_replies(&voc).size() <= separators(voc.push_comments) + 1, "number of replies");
  for (const tavro_message &message : tavro_details_messages(&voc, {})) {
    expect(is_text(message.text.c_str()), "a message is text");
    expect(message.time.size() < kLongestTime, "a message's time is short");
    expect(tavro_details_beginning(message.text, 50).size() <= 50, "the beginning of a message is short");
  }
  expect(tavro_details_created(&voc).size() < kLongestTime, "a time is short");
  tavro_details_can_follow_up(&voc, tavro_details_time(voc.date_of_updation ? voc.date_of_updation : ""));
}

// The description as a reply is stored, and every piece of it that somebody might look for.
void expect_found(const char *description, const char *wanted, const char *replies) {
  store_text_finder(wanted).is_in_replies(replies);
  std::string folded_text;
  store_case_folder().fold(description ? description : "", &folded_text);
  if (is_text(description))
    expect(folded_text == TavroGText(g_utf8_casefold(description, -1)).get(),
           "a text is folded as GLib does");
  if (!comes_back(description) || std::strpbrk(description, "#") || std::strcmp(description, "none") == 0 ||
      std::strstr(description, "\xef\xbf\xbc"))
    return;
  const text_owner markup(elm_entry_utf8_to_markup(description));
  const std::string stored = "none#" + std::string(markup.get()) + "#none";
  const glong length = g_utf8_strlen(description, -1);
  for (glong from = 0; from < length; from += 1 + length / 8) {
    const TavroGText piece(g_utf8_substring(description, from, std::min(from + 5, length)));
    const TavroGText raised(g_utf8_strup(piece.get(), -1));
    expect(store_text_finder(piece.get()).is_in(description), "a piece of a text is found in it");
    expect(store_text_finder(piece.get()).is_in_replies(stored.c_str()), "a piece of a reply is found in it");
    const TavroGText folded(g_utf8_casefold(piece.get(), -1)),
        raised_folded(g_utf8_casefold(raised.get(), -1));
    if (std::strcmp(folded.get(), raised_folded.get()) == 0)
      expect(store_text_finder(raised.get()).is_in_replies(stored.c_str()), "and so it is in capitals");
  }
  if (wanted && is_text(wanted) && !std::strchr(wanted, '#'))
    expect(store_text_finder(wanted).is_in(description) ==
               store_text_finder(wanted).is_in_replies(stored.c_str()),
           "a text is found in a reply as in a description");
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t *data, std::size_t size) {
  static const bool is_prepared = elm_init(0, nullptr) > 0;
  expect(is_prepared, "no toolkit");
  texts input(data, size);
  {
    const voc_owner voc(TAVRO_ZALLOC(svc_voc_data));
    for (char **member : {&voc->submitted, &voc->push_comments, &voc->date_of_updation,
                          &voc->date_of_creation, &voc->title_description, &voc->description, &voc->app_name})
      *member = input.next_copy();
    const TavroText wanted(input.next_copy());
    expect_statuses(voc->submitted);
    expect_row(*voc);
    expect_details(*voc);
    expect_found(voc->description, wanted.get(), voc->push_comments);
  }
  expect_nothing_held();
  return 0;
}
