// What the details page says about a report, as plain values: its steps, every state it had, and the
// conversation. No widget is touched here. Stored texts may come from the desk or from another program: what
// is no sane number or time is left out, and all texts given back are valid UTF-8. Main loop only.
#pragma once

#include <cstddef>
#include <string>
#include <vector>

struct svc_voc_data;

// The line of four steps: 1 sent, 2 submitted, 3 in process, 4 completed. Steps that a report left out stay
// open before its current one. The labels stand side by side: they are shorter than what a state reads as.
enum tavro_step_state { TAVRO_STEP_OPEN, TAVRO_STEP_DONE, TAVRO_STEP_NOW, TAVRO_STEP_STOPPED };
struct tavro_status_line {
  tavro_step_state steps[4];
  const char *labels[4];  // string ids, or texts that are fixed
};
tavro_status_line tavro_details_status_line(const char *submitted);

// A state that the report had. Times are paired with states from the newest back, since a writer that ended
// in between may have stored more of the one than of the other; the first state began at the latest when the
// report was written.
struct tavro_timeline_state {
  int status;        // a tavro_status_e
  std::string text;  // translated
  std::string time;  // as the history shows times; empty when it is not known
};
struct tavro_timeline {
  std::vector<tavro_timeline_state> states;  // newest first, at most as many as were asked for
  size_t count;                              // of all that are stored
};
tavro_timeline tavro_details_timeline(const svc_voc_data *voc, size_t most);

// A reply of the maker, oldest first. `markup` is display markup as stored.
struct tavro_reply {
  std::string markup;
  std::string time;            // as the history shows times; empty when it is not known
  unsigned long long time_ms;  // since the epoch; 0 when it is not known
};
std::vector<tavro_reply> tavro_details_replies(const svc_voc_data *voc);

// One bubble: the text of the report, a reply, or a follow-up. `text` is plain and whole.
enum tavro_message_kind { TAVRO_MESSAGE_REPORT, TAVRO_MESSAGE_REPLY, TAVRO_MESSAGE_FOLLOW_UP };
struct tavro_message {
  tavro_message_kind kind;
  std::string text;
  std::string time;
  unsigned long long time_ms;
  int voc_id;           // of the record that holds it
  std::string verdict;  // of a follow-up, translated
  int status;           // of a follow-up
};
struct tavro_follow_up_record {
  const svc_voc_data *voc;
  std::string verdict;  // as stored
};
// Everything that was said, in the order of its times; what has none stays behind what it was stored after.
std::vector<tavro_message> tavro_details_messages(const svc_voc_data *voc,
                                                  const std::vector<tavro_follow_up_record> &follow_ups);

// What a verdict reads as, for an idea or a problem.
const char *tavro_details_verdict(const char *verdict, bool is_idea);

// The beginning of a text, at most so many bytes, ended at a character and, where there is one near, at a
// blank.
std::string tavro_details_beginning(const std::string &text, size_t most_bytes);

// What a report is called: its title, or how its text begins. At most so many bytes.
std::string tavro_details_title(const svc_voc_data *voc, size_t most_bytes);

// When the report was made, as the history shows times.
std::string tavro_details_created(const svc_voc_data *voc);

// A stored text that may be null, as valid UTF-8.
std::string tavro_details_text(const char *stored);

// Whether "send again" is offered: the last attempt failed.
bool tavro_details_can_resend(const char *submitted);

// Whether the person is asked if it is settled now: support closed the report, which the desk knows, and the
// newest follow-up (written at `last_follow_up_ms`, 0 for none) is older than that.
bool tavro_details_can_follow_up(const svc_voc_data *voc, unsigned long long last_follow_up_ms);

// A stored time, milliseconds since the epoch; 0 for what is none. Reads the first of several.
unsigned long long tavro_details_time(const char *stored);
