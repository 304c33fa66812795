// What is remembered of crashes from one start to the next: which applications are never asked about and how
// often each crashed (preferences), and when each was asked about last (the store). Main loop only.
#pragma once

#include <string>

#include "tavro_crash_rules.h"

gint64 tavro_crash_now();  // milliseconds since the epoch

// Note a crash; returns how often the application crashed within a week.
int tavro_crash_note(const tavro_crash &crash);

// Why a crash is not asked about; null when it may be.
const char *tavro_crash_silence(const std::string &app_id);

// The question is shown: not again within a day.
void tavro_crash_note_asked(const std::string &app_id);

void tavro_crash_set_never(const std::string &app_id, bool is_never);

// What the store's list of installed applications says of an id; the fields stay as they are when it is not
// listed. `icon` is the path of a picture that can be read.
void tavro_crash_look_up(const std::string &app_id, std::string *name, std::string *icon);
