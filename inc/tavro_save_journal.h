// Save journal: makes a save survive the end of the process at any moment. A save is several commits, so a
// process killed between them would lose the title or attachments of what the user wrote.
//
// Life cycle: tavro_journal_write before the store's save and tavro_journal_clear after it; the file lock
// ".tavro.save.lock" is held in between, so that no other client takes the save for an interrupted one. What
// an earlier save left is finished by tavro_journal_recover: at the client's start, behind
// tavro_dbmgr_ensure_schema, and before the next save. Main loop only; one save at a time; waits up to two
// seconds for another client's save. On disk: ".tavro.save" in the store's folder, readable by the owner
// alone, made whole under another name; ".tavro.save.abandoned" while a half-stored report waits to be
// removed.
#pragma once

struct tavro_dbmgr_bug_report_info;
struct tavro_dbmgr_suggestion_info;

// Note the report that is about to be saved. 0, or -1 with a log line: it must not be saved now, because it
// could not be protected (no store, full disk, another client saving) or an earlier note still waits, which
// is never replaced.
int tavro_journal_write(const tavro_dbmgr_bug_report_info *report);
int tavro_journal_write(const tavro_dbmgr_suggestion_info *suggestion);

// The save is over. With the id that the save returned the note is only removed when that report is complete
// in the store, so that a save which failed (full disk) is tried again later; the result is the id then, else
// below 1. Without an id the note is removed in any case.
void tavro_journal_clear();
int tavro_journal_clear(int voc_id);

// The noted report is still on its screen and must not come back by itself: remove the note and what was
// stored of the report. What cannot be removed yet is removed before the next save.
void tavro_journal_abandon();

// Complete the save that was interrupted, once. Returns the id of the report, which is now complete in the
// store with the status that it was saved with; 0 when there was none, or it cannot be completed yet.
int tavro_journal_recover();
