// Makes the store fit for use at the client's start: its tables exist, and a report whose saving was cut off
// by the end of an earlier process is completed and, when it was being sent, handed to the upload service.
// Main loop only.
#pragma once

struct appdata;

// Once per process, before anything reads the store; later calls do nothing.
void tavro_prepare_store();

// Complete the save that a process left unfinished, and have the report sent if it was being sent. Also
// before each save, since there is one note only. The report's id; below 1 when there was none, or it cannot
// be completed yet.
int tavro_finish_interrupted_save();

// Tell the person that the stored reports could not be read and were set aside. Once, and only when it
// happened and a window is there.
void tavro_tell_store_was_replaced(appdata *ad);
