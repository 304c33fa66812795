#include "tavro_history_text.h"

#include <Ecore.h>
#include <Elementary.h>
#include <glib.h>
#include <vconf.h>

#include <algorithm>
#include <cctype>
#include <cerrno>
#include <climits>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <string>

#include "tavro-common.h"
#include "tavro_dbmgr.h"
#include "tavro_handles.h"
#include "tavro_memory.h"
#include "tavro_targets.h"
#include "tavro_type.h"

namespace {

constexpr unsigned long long kMillisecondsPerSecond = 1000;
constexpr int kTwelveHourClock = 1;
constexpr int kNoon = 12;
constexpr int kNoStatus = -1;
constexpr int kLastYear = 9999;
constexpr size_t kTimeTextSize = 32;

std::string _to_markup(const char *text) {
  const TavroHandle<char, std::free> markup(elm_entry_utf8_to_markup(text));
  return markup ? markup.get() : "";
}

std::string _target_text(const svc_voc_data *voc) {
  return voc->app_name ? _to_markup(tavro_target_text(voc->app_name)) : "";
}

std::string _title_text(const svc_voc_data *voc) {
  const bool has_title = voc->title_description && *voc->title_description;
  const char *text = has_title ? voc->title_description : voc->description;
  return "<font_size=32>" + _to_markup(text ? text : "") + "</></>";
}

std::string _time_text(const svc_voc_data *voc) {
  return tavro_shown_time(voc->date_of_updation);  // the newest comes first
}

// A number that no status has, for one that is too large, rather than one that its last digits make.
int _status_value(const char *token) {
  const long value = token ? std::strtol(token, nullptr, 10) : kNoStatus;
  return value < INT_MIN || value > INT_MAX ? kNoStatus : static_cast<int>(value);
}

std::string _status_text(const svc_voc_data *voc) {
  const char *text = "";
  _tavro_get_status(tavro_dbmgr_current_state(voc->submitted), &text);
  switch (tavro_current_status(voc->submitted)) {
    case TAVRO_STATUS_SENDING_FAILED:
    case TAVRO_STATUS_SENDING_FAILED_NO_NETWORK:
      return std::string("<font_size=29><color=#ff0000>") + text + "</></>";
    case TAVRO_STATUS_DRAFT_SAVED:
    case TAVRO_STATUS_SENDING:
      return std::string("<color=#ff0000>") + text + "</></>";
    default:
      return text;
  }
}

// The setting is read from the desktop or from the disk, which takes longer than all the rest of a row; what
// is read holds until the main loop goes round, so that a list asks once for all its rows.
struct known_clock {
  int format;
  Ecore_Job *end;  // null: not known
} _clock = {};

void _forget_clock_cb(void *) {
  _clock = {};
}

int _clock_format() {
  if (_clock.end) return _clock.format;
  int format = kTwelveHourClock;
  vconf_get_int(VCONFKEY_REGIONFORMAT_TIME1224, &format);
  _clock = {format, ecore_job_add(_forget_clock_cb, nullptr)};
  return format;
}

struct row_part {
  const char *name;
  std::string (*text)(const svc_voc_data *voc);
};

constexpr row_part kRowParts[] = {
    {"elm.text.main.left.top", _target_text},
    {"elm.text.sub.left.bottom", _title_text},
    {"elm.text.sub.right.top", _time_text},
    {"elm.text.sub.right.bottom", _status_text},
};

}  // namespace

int get_count_of_updates(const char *text) {
  return text ? static_cast<int>(std::count(text, text + std::strlen(text), '#')) : 0;
}

void tavro_parse_status_string(const char *text, char ***tokens, int *count) {
  *count = get_count_of_updates(text);
  if (text) *tokens = g_strsplit(text, "#", *count + 1);
}

int tavro_current_status(const char *submitted) {
  return _status_value(tavro_dbmgr_current_state(submitted));
}

struct tm _tavro_get_date_time(unsigned long long milliseconds) {
  const time_t seconds = static_cast<time_t>(milliseconds / kMillisecondsPerSecond);
  struct tm when = {};
  // A number too large for a date leaves the zeroed record.
  localtime_r(&seconds, &when);
  return when;
}

char *tavro_get_time_string_at(const struct tm *when, const struct tm *now, int clock_format) {
  char text[kTimeTextSize] = {};
  if (when->tm_year != now->tm_year) {
    std::snprintf(text, sizeof text, "%02d/%02d/%02d", when->tm_mday, when->tm_mon + 1, when->tm_year + 1900);
  } else if (when->tm_yday != now->tm_yday) {
    std::snprintf(text, sizeof text, "%02d/%02d", when->tm_mday, when->tm_mon + 1);
  } else if (when->tm_hour < kNoon) {
    std::snprintf(text, sizeof text, "%d:%02d %s", when->tm_hour, when->tm_min, "AM");
  } else {
    // Kept: the 24-hour clock shows "PM" too, and midnight is 0 AM.
    const bool as_it_is = when->tm_hour == kNoon || clock_format != kTwelveHourClock;
    std::snprintf(text, sizeof text, "%d:%02d %s", as_it_is ? when->tm_hour : when->tm_hour - kNoon,
                  when->tm_min, "PM");
  }
  return TAVRO_STRDUP(text);
}

char *tavro_get_time_string(const struct tm *when) {
  const time_t now_seconds = std::time(nullptr);
  struct tm now = {};
  localtime_r(&now_seconds, &now);
  return tavro_get_time_string_at(when, &now, _clock_format());
}

std::string tavro_shown_time(const char *milliseconds) {
  if (!milliseconds || !std::isdigit(static_cast<unsigned char>(*milliseconds))) return "";
  errno = 0;
  const unsigned long long time = std::strtoull(milliseconds, nullptr, 10);
  const struct tm when = _tavro_get_date_time(time);
  if (errno != 0 || when.tm_mday == 0 || when.tm_year + 1900 > kLastYear) return "";
  const TavroText text(tavro_get_time_string(&when));
  return text.get();
}

void _tavro_get_status(const char *token, const char **text) {
  switch (_status_value(token)) {
    case TAVRO_STATUS_SENDING_FAILED:
    case TAVRO_STATUS_SENDING_FAILED_NO_NETWORK:
      *text = tavro_text("IDS_OB_SBODY_SENDING_FAILED");
      break;
    case TAVRO_STATUS_UNDER_REVIEW:
      *text = "Submitted";
      break;
    case TAVRO_STATUS_IN_PROCESS:
      *text = "In process";
      break;
    case TAVRO_STATUS_SOLVED:
    case TAVRO_STATUS_COMPLETED:
      *text = tavro_text("IDS_OB_SBODY_COMPLETED_ABB");
      break;
    case TAVRO_STATUS_DECLINED:
      *text = "Dropped";
      break;
    case TAVRO_STATUS_DRAFT_SAVED:
      *text = tavro_text("IDS_OB_SBODY_DRAFT_SAVED_ABB");
      break;
    default:
      // Kept: a report that was sent and not yet looked at reads as sending.
      *text = tavro_text("IDS_OB_SBODY_SENDING_ING_ABB_SWA");
      break;
  }
}

char *tavro_history_row_text(int index, const svc_voc_data *voc, const char *part) {
  if (index == -1) {
    return std::strcmp(part, "elm.text.main.left") == 0 ? strdup(tavro_text("IDS_OB_BODY_SELECT_ALL"))
                                                        : nullptr;
  }
  if (!voc) return nullptr;
  for (const row_part &entry : kRowParts) {
    if (std::strcmp(part, entry.name) == 0) return strdup(entry.text(voc).c_str());
  }
  return nullptr;
}
