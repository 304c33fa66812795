// The crash folders, <program>_<pid>_<yyyymmddHHMMSS> in TAVRO_CRASH_DUMP_FOLDER: the core (*.coredump.gz),
// the log (*.log.gz) and the summary (*.cs) of one crash. A folder is made beside the dump folder and moved
// in when it is whole; its last token is no other folder's, since archives are named after it. Private to
// their owner. Blocks; any thread, one at a time.
#pragma once

#include <gio/gio.h>

#include <string>

#include "crash_record.h"

// What the client is told of.
struct CrashFolder {
  std::string name;  // in the dump folder; empty when there is none, after a log line
  std::string app_id, app_name;
  int64_t time_ms = 0;  // since the epoch
};

// Makes the dump folder and removes what a killed service left half-made. False after a log line.
bool prepare_crash_folders();

// Makes the folder of a crash, or finds the one that a killed service did not get to tell of. `uncounted`
// crashes of the same program before this one have no folder.
CrashFolder make_crash_folder(const Crash &crash, int uncounted, GCancellable *stop);

// Removes the oldest folders beyond 20 and beyond 500 MB; the newest stays, whatever its size.
void keep_newest_crash_folders();
