// The crash service's object on the phone's bus: the one-way calls "dump_log" and "delete_dump" become jobs.
// Main loop only.
#pragma once

#include "crash_jobs.h"

// Register the object for the life of the process; `jobs` outlives it. False after a log line. To be called
// before the service asks for its name: the bus delivers what it has queued the moment the name is taken.
bool register_crash_object(CrashJobs *jobs);
