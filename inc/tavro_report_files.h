// Files that belong to a stored report and are no longer needed once the desk holds them. Main loop only.
#pragma once

// Delete the file that the store names for the report. Nothing when it names none, or names something that is
// no regular file; the store is left as it is.
void tavro_delete_dump_file(int voc_id);
void tavro_delete_syslog_file(int voc_id);
