// System logs as zip archives in the platform's log folder, "SystemLog_<date>_<time>.zip", readable by their
// owner alone. An archive gets its name when it is whole and on the disk; it holds one file, "system.log".
// The client deletes them: it alone knows which ones its reports need. Blocks; any thread, one at a time.
#pragma once

#include <string>

// The name of the new archive in TAVRO_LOG_DUMP_FOLDER; empty, with the reason, when none could be written.
std::string write_log_archive(const std::string &log, std::string *reason);
