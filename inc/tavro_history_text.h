// What the history shows about a stored report, as plain values: status, times and the texts of a row. No
// widget is touched here.
//
// Statuses are decimal texts of tavro_status_e joined by "#", oldest first; times are milliseconds since the
// epoch joined by "#", newest first. Texts of a report may come from the desk or from another program: what
// is no number reads as 0.
#pragma once

#include <ctime>
#include <string>

struct svc_voc_data;

// Split at "#". `count` gets the number of "#" in the text, so the last token is tokens[count]; the array is
// freed with g_strfreev. The empty text has no token: tokens[0] is null. A null text gives the count 0 and
// leaves the array as it was.
void tavro_parse_status_string(const char *text, char ***tokens, int *count);

// The number of "#" in the text, 0 for null.
int get_count_of_updates(const char *text);

// The current status of a report: the last token of `submitted` that is not empty, for an answer may come
// without a status. -1 for null and for a number that is none of an int.
int tavro_current_status(const char *submitted);

// Local time of milliseconds since the epoch; zeroes for what is too large for a date.
struct tm _tavro_get_date_time(unsigned long long milliseconds);

// How a row shows a time, compared with now: the clock for today, else the date. A new tracked text.
char *tavro_get_time_string(const struct tm *when);
// The same with the comparison given. `clock_format` is 1 for the 12-hour clock.
char *tavro_get_time_string_at(const struct tm *when, const struct tm *now, int clock_format);

// The time at the start of a stored text as tavro_get_time_string shows it; empty for null, for what is no
// number and for what is no date before the year 10000.
std::string tavro_shown_time(const char *milliseconds);

// The text of one status token, translated; not to be freed.
void _tavro_get_status(const char *token, const char **text);

// The text of a history row's part, markup where the part shows markup ("elm.text.main.left.top",
// "elm.text.sub.left.bottom", "elm.text.sub.right.bottom"). `index` -1 is the "select all" row. The text is
// malloc'ed and not tracked, since the toolkit frees it; null where the part shows nothing.
char *tavro_history_row_text(int index, const svc_voc_data *voc, const char *part);
