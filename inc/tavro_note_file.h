// Small files in which the client notes what must outlive its end at any moment: key files with texts of any
// bytes, written whole or not at all. Main loop only; writing waits for the disk.
#pragma once

#include <glib.h>

#include "tavro_handles.h"

// A text under a key; null leaves the key out, and a key that is missing reads as null. The text that is read
// is tracked: TAVRO_FREE.
void tavro_note_set_text(GKeyFile *file, const char *group, const char *key, const char *text);
char *tavro_note_text(GKeyFile *file, const char *group, const char *key);

// A list of tavro_dbmgr_attachment_info: their number in `group`, each in a group of its own. One
// without a path is passed over. The list that is read is freed with _tavro_free_attachement_list.
void tavro_note_set_attachments(GKeyFile *file, const char *group, const GSList *attachments);
GSList *tavro_note_attachments(GKeyFile *file, const char *group);

// The file, set aside where it is no key file. Null then, when there is none, and when it cannot be read now
// (no memory, a failing disk; with a log line): it stays for a later time.
TavroKeyFile tavro_note_load(const char *path, const char *damaged_path);
// Rename a file with a log line to `damaged_path`, or to that with `.2`, `.3` … when the name is taken.
void tavro_note_set_aside(const char *path, const char *damaged_path, const char *reason);

// Replace the file by these bytes, readable by the owner alone and safe on the disk. 0; or -1 with errno set,
// and what was there before stays, unless only its folder could not be made safe.
int tavro_note_write(const char *path, const char *data, gsize size);
// The two halves of it. After the first alone, a power cut may bring the earlier content back.
int tavro_note_replace(const char *path, const char *data, gsize size);
int tavro_note_sync_folder(const char *path);
