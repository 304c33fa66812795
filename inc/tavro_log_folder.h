// The folder into which the crash service puts the phone's system logs. The client alone deletes them: it
// knows which of them its stored reports need. Main loop only.
#pragma once

#include <ctime>
#include <string>

// Whether the path is that of a plain file directly in the folder.
bool tavro_log_folder_has(const std::string &path);

void tavro_log_folder_delete(const std::string &path);

// Delete a log that nobody has waited for: one that was written at `since` or later and that no stored report
// needs. Anything else stays, for the path may come from another program.
void tavro_log_folder_delete_unwanted(const std::string &path, time_t since);

// Delete the logs that are not among the newest 20, are older than a week and that no stored report needs.
void tavro_log_folder_prune();
