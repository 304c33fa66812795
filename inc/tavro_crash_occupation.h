// What a person is busy with that a question about a crash must not interrupt, and waiting for its end. Main
// loop only.
#pragma once

#include <Elementary.h>

struct appdata;

// A report that is being written, another question, a field that is typed in; null when there is nothing.
Evas_Object *tavro_crash_occupation(appdata *ad);

// `ended` is called once when the occupation's widget has gone or, of a field, has lost the focus; in place
// of whatever was waited for before. False when this widget is waited for already.
bool tavro_crash_wait_for(appdata *ad, Evas_Object *occupation, void (*ended)(appdata *ad));
