// The files that go with deleted reports. Which those are is noted on the disk before the reports' rows go,
// and the note is done with after them, so that an end of the process at any moment leaves neither a stored
// report whose files are gone nor, beyond the next start, files that nobody needs.
//
// What goes: a plain file that the client made in its media folder, and a system log or crash dump outside
// the gallery. A file that a stored report still names stays, and so does anything that is reached through a
// link. Main loop only; waits for the disk. On disk: ".tavro.delete" in the store's folder, readable by the
// owner alone.
#pragma once

#include <string>
#include <vector>

// Note the files of these reports, which are about to go. False when the store cannot be read; a note that
// cannot be written (full disk) is logged and is no reason not to delete.
bool tavro_deleted_files_note(const std::vector<int> &voc_ids);

// Delete what is noted and named by no stored report any more. What the open compose screen or a kept writing
// names stays and stays noted, and so does what the disk refuses to delete, or all of it when the store or
// what is kept cannot be read. At the client's start, and behind every deletion.
void tavro_deleted_files_remove();
