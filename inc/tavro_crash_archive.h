// The archives of crash dumps that the collector leaves in TAVRO_CRASH_ARCHIVE_FOLDER, one for each crash
// folder. An archive stays for as long as a report needs it: a draft, one that is being sent, one on the open
// compose screen, or one that is kept of an earlier run.
#pragma once

#include <cstddef>
#include <string>

constexpr char TAVRO_CRASH_ARCHIVE_FOLDER[] = "/opt/usr/media/Orbel/";

// Delete an archive that no such report needs; anything that is no file in the folder stays. Main loop only,
// reads the store and what is kept.
void tavro_crash_archive_delete_unneeded(const std::string &path);

// Delete the archives of more than a week ago that no such report needs: what a killed client left. Main loop
// only, reads the store and what is kept.
void tavro_crash_archive_prune();

// What a person can read of an archive: its files with their sizes, and the summary of the crash, of which
// `limit` bytes at most. Valid UTF-8. False when the file is not there or is no archive. Any thread.
bool tavro_crash_archive_read(const char *path, size_t limit, std::string *text);
