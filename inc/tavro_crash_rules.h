// The rules of asking about crashes, as plain functions: what is believed of what the crash service tells,
// how often an application crashed, whether it was asked about lately, and the list of applications that are
// never asked about. The texts come from the bus and from the preference store and may hold anything. Any
// thread.
#pragma once

#include <glib.h>

#include <optional>
#include <string>

// Milliseconds since the epoch here and below.
struct tavro_crash {
  std::string app_id;    // one line, never empty
  std::string app_name;  // one line, as people know it; never empty
  std::string folder;    // name of its crash folder; empty: not known
  gint64 time;           // within the last week
};

// Texts may be null. A name without an id serves as the id and the other way round; nothing without both. A
// time that cannot be is taken for now, a folder name that is none is left out.
std::optional<tavro_crash> tavro_crash_read(const char *app_id, const char *app_name, const char *time,
                                            const char *folder, gint64 now);

// The name as it fits into a question.
std::string tavro_crash_short_name(const std::string &app_name);

// Whether an application whose last question stands in the store as `asked` (null: never) may not be asked
// about now. A time that is still to come is of a clock that was set back: it does not count.
bool tavro_crash_was_asked_lately(const char *asked, gint64 now);

// Note the crash in `times`, which remembers the last week of some dozen applications, a line each. Returns
// how often the application crashed in that week, 1 to 99; the same crash counts once.
int tavro_crash_count(std::string *times, const tavro_crash &crash, gint64 now);

// A list of application ids, one a line, newest last; it forgets the oldest of very many.
bool tavro_crash_list_has(const std::string &list, const std::string &app_id);
std::string tavro_crash_list_with(const std::string &list, const std::string &app_id);
std::string tavro_crash_list_without(const std::string &list, const std::string &app_id);

// What the collector calls the archive of a crash folder.
std::string tavro_crash_archive_name(const std::string &folder);
