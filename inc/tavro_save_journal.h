// Save journal: makes a save survive the end of the process at any moment. A save is several commits, so a
// process killed between them would lose the title or attachments of what the user wrote.
//
// Life cycle: tavro_journal_write before the store's save, tavro_journal_clear after it, and once at the
// client's start, behind tavro_dbmgr_ensure_schema, tavro_journal_recover. Main loop only; one save at a
// time. On disk: ".tavro.save" in the store's folder, readable by the owner alone, made whole under another
// name.
#pragma once

struct tavro_dbmgr_bug_report_info;
struct tavro_dbmgr_suggestion_info;

// Note the report that is about to be saved; replaces an earlier note. 0, or -1 with a log line: the save may
// go on, unprotected.
int tavro_journal_write(const tavro_dbmgr_bug_report_info *report);
int tavro_journal_write(const tavro_dbmgr_suggestion_info *suggestion);

// The save is over. With the id that the save returned the note is only removed when that report is complete
// in the store, so that a save which failed (full disk) is tried again at the next start; without an id it is
// removed in any case.
void tavro_journal_clear();
void tavro_journal_clear(int voc_id);

// Complete the save that was interrupted, once. Returns the id of the report, which is now complete in the
// store with the status that it was saved with; 0 when there was none, or it cannot be completed yet.
int tavro_journal_recover();
