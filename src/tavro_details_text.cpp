#include "tavro_details_text.h"

#include <cstdlib>
#include <cstring>

#include "tavro_dbmgr.h"
#include "tavro_handles.h"
#include "tavro_history_text.h"
#include "tavro_memory.h"
#include "tavro_type.h"

namespace {

constexpr char kNoReply[] = "none";

std::vector<std::string> _tokens(const char *text) {
  std::vector<std::string> tokens;
  if (!text) return tokens;
  const TavroStrv split(g_strsplit(text, "#", -1));
  for (char **token = split.get(); *token; ++token) tokens.emplace_back(*token);
  return tokens;
}

std::string _shown_time(const char *milliseconds) {
  const unsigned long long time = std::strtoull(milliseconds, nullptr, 10);
  if (time == 0) return {};
  const struct tm when = _tavro_get_date_time(time);
  const TavroText text(tavro_get_time_string(&when));
  return text ? text.get() : "";
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

}  // namespace

tavro_status_line tavro_details_status_line(const char *submitted) {
  const int status = tavro_current_status(submitted);
  tavro_status_line line{{TAVRO_STEP_OPEN, TAVRO_STEP_OPEN, TAVRO_STEP_OPEN, TAVRO_STEP_OPEN},
                         {"IDS_OB_BODY_SENT", "Submitted", "In process", "IDS_OB_SBODY_COMPLETED_ABB"}};
  const int step = _step_of(status);
  for (int i = 0; i < step; ++i) line.steps[i] = TAVRO_STEP_DONE;
  line.steps[step] = TAVRO_STEP_NOW;
  if (status == TAVRO_STATUS_DECLINED) {
    line.steps[step] = TAVRO_STEP_STOPPED;
    line.labels[step] = "Dropped";
  }
  if (tavro_details_can_resend(submitted)) {
    line.steps[0] = TAVRO_STEP_STOPPED;
    line.labels[0] = "IDS_OB_SBODY_SENDING_FAILED";
  } else if (step == 0) {
    line.labels[0] = "IDS_OB_SBODY_SENDING_ING_ABB_SWA";
  }
  return line;
}

std::vector<tavro_reply> tavro_details_replies(const svc_voc_data *voc) {
  std::vector<tavro_reply> replies;
  const std::vector<std::string> texts = _tokens(voc->push_comments);
  const std::vector<std::string> times = _tokens(voc->date_of_updation);
  // Entry 0 only starts the column; entry i came with the i-th answer. Times run the other way.
  for (size_t i = 1; i < texts.size(); ++i) {
    if (texts[i] == kNoReply || texts[i].empty()) continue;
    const size_t answers_after = texts.size() - 1 - i;
    replies.push_back(
        {texts[i], answers_after < times.size() ? _shown_time(times[answers_after].c_str()) : ""});
  }
  return replies;
}

std::string tavro_details_created(const svc_voc_data *voc) {
  return voc->date_of_creation ? _shown_time(voc->date_of_creation) : "";
}

bool tavro_details_can_resend(const char *submitted) {
  const int status = tavro_current_status(submitted);
  return status == TAVRO_STATUS_SENDING_FAILED || status == TAVRO_STATUS_SENDING_FAILED_NO_NETWORK;
}
