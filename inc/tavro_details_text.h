// What the details page says about a report, as plain values. No widget is touched here.
#pragma once

#include <string>
#include <vector>

struct svc_voc_data;

// The line of four steps: 1 sent, 2 submitted, 3 in process, 4 completed.
enum tavro_step_state { TAVRO_STEP_OPEN, TAVRO_STEP_DONE, TAVRO_STEP_NOW, TAVRO_STEP_STOPPED };
struct tavro_status_line {
  tavro_step_state steps[4];
  const char *labels[4];  // string ids, or texts that are fixed
};
tavro_status_line tavro_details_status_line(const char *submitted);

// A reply of the maker, oldest first. `markup` is display markup as stored.
struct tavro_reply {
  std::string markup;
  std::string time;  // as the history shows times; empty when it is not known
};
std::vector<tavro_reply> tavro_details_replies(const svc_voc_data *voc);

// When the report was made, as the history shows times.
std::string tavro_details_created(const svc_voc_data *voc);

// Whether "send again" is offered: the last attempt failed.
bool tavro_details_can_resend(const char *submitted);
