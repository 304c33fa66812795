// The parts of the compose screens among themselves: how a screen ends, the road of "Send", the system log's
// row. Main loop only; what they remember is that of the one open screen.
#pragma once

#include <Elementary.h>

#include <initializer_list>

struct appdata;
struct problem_view_win;
struct tavro_popup_button;

// ---- How a screen ends (tavro_compose_end.cpp) ----

// What the open screen holds now is what leaving it unchanged would keep.
void tavro_compose_remember_opened(appdata *ad);
// Nothing of what the open screen holds is stored: leaving it always asks.
void tavro_compose_forget_opened();
// End the open screen unless that would lose something; whether it has ended. Its automatic copy and a log
// that came by itself go with it, a draft that it was opened from stays.
bool tavro_compose_end_unchanged(appdata *ad);
// Ask before the pushed page is left with something to lose, by whatever road.
void tavro_compose_guard(appdata *ad);
void tavro_compose_save_draft(appdata *ad);
// "Discard" of the menu: asks when there is something to lose, be it only the draft that the screen was
// opened from.
void tavro_compose_discard(appdata *ad);
// Store the open screen with `save`, which ends it; when the store refuses, the person is told.
void tavro_compose_finish(appdata *ad, int (*save)(appdata *ad));

// ---- Send (tavro_compose_send.cpp) ----

// The person wants the open screen's report to be sent. Nothing when its page is not in front.
void tavro_compose_send(appdata *ad);
// "What is sent" of the menu: the page, from which the report can be sent.
void tavro_compose_review(appdata *ad);
// Send from the page of what is sent, where the person has just seen it.
void tavro_compose_send_from_review(appdata *ad);
// The system log has changed: a report that waits for it goes on.
void tavro_compose_send_log_changed(appdata *ad);
// A picture has been converted, or cannot be: what waits for pictures goes on when it was the last.
void tavro_compose_send_files_changed(appdata *ad);
// The screen ends: nothing waits any more.
void tavro_compose_send_end();

// Name the attachments that cannot be sent any more in a popup with these buttons; false when there are none.
bool tavro_compose_tell_lost_files(appdata *ad, std::initializer_list<tavro_popup_button> buttons);

// ---- The system log (tavro_compose_log.cpp) ----

// Build the log's row into the box. A screen that was opened with a log wants to keep it; otherwise the
// person's setting says whether a log is wanted.
void tavro_compose_log_build(appdata *ad, problem_view_win *view, Evas_Object *box);
// The person's report wants a log, whatever the setting says.
void tavro_compose_log_want(appdata *ad);
// Collect a log that is wanted or that the target asks for, drop one that is neither, and show how it stands.
void tavro_compose_log_update(appdata *ad);
// What was put off until the screen was painted is done now.
void tavro_compose_log_hurry(appdata *ad);
// Go on without a log.
void tavro_compose_log_give_up(appdata *ad);
// Whether the person, and not the setting or the target, has switched the log.
bool tavro_compose_log_was_switched();
// The screen ends.
void tavro_compose_log_end();

// ---- The crash dump (tavro_compose_dump.cpp) ----

// Ask what to do about a dump that puts the report above the limit; `go_on` is called once the person has
// left it out. False when there is nothing to ask, also where leaving it out would not be enough.
bool tavro_compose_dump_is_too_large(appdata *ad, void (*go_on)(appdata *ad));

enum class log_stand {
  settled,  // there, or not asked for
  awaited,
  failed,
};
log_stand tavro_compose_log_stand(const appdata *ad);
