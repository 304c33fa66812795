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

// Note what the client itself put into its media folder, captured or made of others: pictures of these paths,
// which need not be there yet, and pictures and videos that these reports have attached. A video of no report
// may be one that was promised to the person (tavro_deleted_files_keep) and attached from the gallery.
void tavro_deleted_files_note_copies(const std::vector<int> &voc_ids, const std::vector<std::string> &paths);

// The file that a capture is making, empty for none any more: it is noted, so that one that is cut off leaves
// nothing, and stays as long as it is made; noted it stays until a stored report names it.
void tavro_deleted_files_set_unfinished(const std::string &path);

// It is the person's: not noted any more.
void tavro_deleted_files_keep(const std::string &path);

// Delete what is noted and named by no stored report any more. What the open compose screen or a kept writing
// names stays and stays noted, and so does what the disk refuses to delete, or all of it when the store or
// what is kept cannot be read. At the client's start, and behind every deletion.
void tavro_deleted_files_remove();
