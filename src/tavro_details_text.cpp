#include "tavro_details_text.h"

#include <Elementary.h>

#include <algorithm>
#include <cstdlib>
#include <cstring>

#include "tavro-common.h"
#include "tavro_dbmgr.h"
#include "tavro_handles.h"
#include "tavro_history_text.h"
#include "tavro_memory.h"
#include "tavro_type.h"

namespace {

constexpr char kNoReply[] = "none";
constexpr unsigned long long kLastShownMs = 253402300799999;  // the year 9999
constexpr size_t kWordBytes = 40;                             // how far back a text is cut for a whole word
constexpr int kLongestStatus = 3;                             // digits

std::vector<std::string> _tokens(const char *text) {
  std::vector<std::string> tokens;
  if (!text) return tokens;
  const TavroStrv split(g_strsplit(text, "#", -1));
  for (char **token = split.get(); *token; ++token) tokens.emplace_back(*token);
  return tokens;
}

// A text that is digits up to its end or the next "#".
bool _starts_with_number(const char *text) {
  const size_t digits = std::strspn(text, "0123456789");
  return digits > 0 && (text[digits] == '\0' || text[digits] == '#');
}

std::string _shown_time(unsigned long long time_ms) {
  if (time_ms == 0) return {};
  const struct tm when = _tavro_get_date_time(time_ms);
  const TavroText text(tavro_get_time_string(&when));
  return text ? text.get() : "";
}

// -1 for what is no status that this version knows.
int _status_of(const std::string &token) {
  if (!_starts_with_number(token.c_str()) || token.size() > kLongestStatus) return -1;
  const int status = std::atoi(token.c_str());
  const bool is_known = status <= TAVRO_STATUS_DRAFT_SAVED ||
                        (status >= TAVRO_STATUS_SENDING && status <= TAVRO_STATUS_SENDING_SUCCESS);
  return is_known ? status : -1;
}

// Steps that are done before the current one, counted from the start.
int _step_of(int status) {
  switch (status) {
    case TAVRO_STATUS_UNDER_REVIEW:
      return 1;
    case TAVRO_STATUS_IN_PROCESS:
      return 2;
    case TAVRO_STATUS_SOLVED:
    case TAVRO_STATUS_COMPLETED:
    case TAVRO_STATUS_DECLINED:
      return 3;
    default:
      return 0;
  }
}

bool _had_status(const char *submitted, int status) {
  const std::vector<std::string> states = _tokens(submitted);
  return std::any_of(states.begin(), states.end(),
                     [status](const std::string &token) { return _status_of(token) == status; });
}

// What is said in one record, oldest first.
void _add_messages(std::vector<tavro_message> *messages, const svc_voc_data *voc, tavro_message first) {
  first.time_ms = voc->date_of_creation ? tavro_details_time(voc->date_of_creation) : 0;
  first.time = _shown_time(first.time_ms);
  first.voc_id = voc->id;
  first.text = tavro_details_text(voc->description);
  unsigned long long last_ms = first.time_ms;
  messages->push_back(std::move(first));
  for (const tavro_reply &reply : tavro_details_replies(voc)) {
    last_ms = std::max(last_ms, reply.time_ms);
    const TavroText plain(TAVRO_ADOPT(elm_entry_markup_to_utf8(reply.markup.c_str())));
    messages->push_back(
        {TAVRO_MESSAGE_REPLY, tavro_details_text(plain.get()), reply.time, last_ms, voc->id, {}, 0});
  }
}

}  // namespace

tavro_status_line tavro_details_status_line(const char *submitted) {
  const int status = tavro_current_status(submitted);
  tavro_status_line line{{TAVRO_STEP_OPEN, TAVRO_STEP_OPEN, TAVRO_STEP_OPEN, TAVRO_STEP_OPEN},
                         {"IDS_OB_BODY_SENT", "Submitted", "In process", "IDS_OB_SBODY_COMPLETED_ABB"}};
  const int step = _step_of(status);
  for (int i = 0; i < step; ++i) line.steps[i] = TAVRO_STEP_DONE;
  // What support answered was sent and submitted, but it may be closed without having been in process.
  if (step == 3 && !_had_status(submitted, TAVRO_STATUS_IN_PROCESS)) line.steps[2] = TAVRO_STEP_OPEN;
  line.steps[step] = TAVRO_STEP_NOW;
  if (status == TAVRO_STATUS_DECLINED) {
    line.steps[step] = TAVRO_STEP_STOPPED;
    line.labels[step] = "Dropped";
  }
  if (tavro_details_can_resend(submitted)) {
    line.steps[0] = TAVRO_STEP_STOPPED;
    line.labels[0] = "IDS_OB_SBODY_NOT_SENT_ABB";
  } else if (step == 0) {
    line.labels[0] = "IDS_OB_OPT_SENDING";
  }
  return line;
}

tavro_timeline tavro_details_timeline(const svc_voc_data *voc, size_t most) {
  tavro_timeline timeline{{}, 0};
  const std::vector<std::string> states = _tokens(voc->submitted);
  const std::vector<std::string> times = _tokens(voc->date_of_updation);
  for (size_t age = 0; age < states.size(); ++age) {
    const std::string &token = states[states.size() - 1 - age];
    const int status = _status_of(token);
    if (status < 0) continue;
    if (++timeline.count > most) continue;
    const char *text = "";
    _tavro_get_status(token.c_str(), &text);
    unsigned long long time_ms = age < times.size() ? tavro_details_time(times[age].c_str()) : 0;
    if (time_ms == 0 && age + 1 == states.size() && voc->date_of_creation)
      time_ms = tavro_details_time(voc->date_of_creation);
    timeline.states.push_back({status, text, _shown_time(time_ms)});
  }
  return timeline;
}

std::vector<tavro_reply> tavro_details_replies(const svc_voc_data *voc) {
  std::vector<tavro_reply> replies;
  const std::vector<std::string> texts = _tokens(voc->push_comments);
  const std::vector<std::string> times = _tokens(voc->date_of_updation);
  // Entry 0 only starts the column; entry i came with the i-th answer. Times run the other way.
  for (size_t i = 1; i < texts.size(); ++i) {
    if (texts[i] == kNoReply || texts[i].empty()) continue;
    const size_t age = texts.size() - 1 - i;
    const unsigned long long time_ms = age < times.size() ? tavro_details_time(times[age].c_str()) : 0;
    replies.push_back({texts[i], _shown_time(time_ms), time_ms});
  }
  return replies;
}

std::vector<tavro_message> tavro_details_messages(const svc_voc_data *voc,
                                                  const std::vector<tavro_follow_up_record> &follow_ups) {
  std::vector<tavro_message> messages;
  _add_messages(&messages, voc, {TAVRO_MESSAGE_REPORT, {}, {}, 0, 0, {}, 0});
  const bool is_idea = g_strcmp0(voc->type, TAVRO_DBMGR_SUGGESTION) == 0;
  for (const tavro_follow_up_record &follow_up : follow_ups)
    _add_messages(&messages, follow_up.voc,
                  {TAVRO_MESSAGE_FOLLOW_UP,
                   {},
                   {},
                   0,
                   0,
                   tavro_details_verdict(follow_up.verdict.c_str(), is_idea),
                   tavro_current_status(follow_up.voc->submitted)});
  // What the report itself says stays first, whatever its clock said.
  std::stable_sort(messages.begin() + 1, messages.end(),
                   [](const auto &left, const auto &right) { return left.time_ms < right.time_ms; });
  return messages;
}

const char *tavro_details_verdict(const char *verdict, bool is_idea) {
  if (g_strcmp0(verdict, TAVRO_DBMGR_WORKS_NOW) == 0) return tavro_text("IDS_OB_BUTTON_WORKS_NOW");
  return tavro_text(is_idea ? "IDS_OB_BUTTON_STILL_MISSING" : "IDS_OB_BUTTON_STILL_HAPPENS");
}

std::string tavro_details_beginning(const std::string &text, size_t most_bytes) {
  if (text.size() <= most_bytes) return text;
  size_t end = most_bytes;
  while (end > 0 && (text[end] & 0xC0) == 0x80) --end;
  const size_t blank = text.find_last_of(" \n", end);
  if (blank != std::string::npos && blank > 0 && end - blank < kWordBytes) end = blank;
  return text.substr(0, end);
}

std::string tavro_details_title(const svc_voc_data *voc, size_t most_bytes) {
  const bool has_title = voc->title_description && *voc->title_description;
  return tavro_details_beginning(tavro_details_text(has_title ? voc->title_description : voc->description),
                                 most_bytes);
}

std::string tavro_details_created(const svc_voc_data *voc) {
  return voc->date_of_creation ? _shown_time(tavro_details_time(voc->date_of_creation)) : "";
}

std::string tavro_details_text(const char *stored) {
  if (!stored) return {};
  const TavroGText valid(g_utf8_make_valid(stored, -1));
  return valid.get();
}

bool tavro_details_can_resend(const char *submitted) {
  const int status = tavro_current_status(submitted);
  return status == TAVRO_STATUS_SENDING_FAILED || status == TAVRO_STATUS_SENDING_FAILED_NO_NETWORK;
}

bool tavro_details_can_follow_up(const svc_voc_data *voc, unsigned long long last_follow_up_ms) {
  if (voc->server_voc_id < 1 || _step_of(tavro_current_status(voc->submitted)) != 3) return false;
  const unsigned long long closed_ms = voc->date_of_updation ? tavro_details_time(voc->date_of_updation) : 0;
  return last_follow_up_ms == 0 || last_follow_up_ms < closed_ms;
}

unsigned long long tavro_details_time(const char *stored) {
  if (!_starts_with_number(stored)) return 0;
  const unsigned long long time_ms = std::strtoull(stored, nullptr, 10);
  return time_ms <= kLastShownMs ? time_ms : 0;
}
