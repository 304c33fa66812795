// Small files in which the client notes what must outlive its end at any moment: key files with texts of any
// bytes, written whole or not at all. Main loop only; writing waits for the disk.
#pragma once

#include <glib.h>

// A text under a key; null leaves the key out, and a key that is missing reads as null. The text that is read
// is tracked: TAVRO_FREE.
void tavro_note_set_text(GKeyFile *file, const char *group, const char *key, const char *text);
char *tavro_note_text(GKeyFile *file, const char *group, const char *key);

// A list of tavro_dbmgr_attachment_info: their number in `group`, each in a group of its own. The list that
// is read is freed with _tavro_free_attachement_list.
void tavro_note_set_attachments(GKeyFile *file, const char *group, const GSList *attachments);
GSList *tavro_note_attachments(GKeyFile *file, const char *group);

// Replace the file by these bytes, readable by the owner alone and safe on the disk. 0; or -1 with errno set,
// and what was there before stays, unless only its folder could not be made safe.
int tavro_note_write(const char *path, const char *data, gsize size);
