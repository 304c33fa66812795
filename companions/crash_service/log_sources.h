// What the phone has logged within the last hour: the machine's journal, where there is one that this user
// may read, and the platform log, to which the phone's own applications write. Blocks; any thread, one at a
// time.
#pragma once

#include <gio/gio.h>

#include <string>

#include "crash_record.h"

// Whole lines, the newest, at most 1 MiB of each source, under a heading each; empty when neither has
// anything to say. When `stop` is cancelled the journal counts as far as it was read.
std::string collect_log(GCancellable *stop);

// The end of what a crashed program has logged before, under the same headings: the journal's lines of its
// executable, and, of a program of the phone, its lines in the platform log.
std::string collect_program_log(const Crash &crash, bool is_of_phone, GCancellable *stop);
