// What the phone has logged within the last hour: the machine's journal, where there is one that this user
// may read, and the platform log, to which the phone's own applications write. Blocks; any thread, one at a
// time.
#pragma once

#include <gio/gio.h>

#include <string>

// Whole lines, the newest, at most 1 MiB of each source, under a heading each; empty when neither has
// anything to say. When `stop` is cancelled the journal counts as far as it was read.
std::string collect_log(GCancellable *stop);
