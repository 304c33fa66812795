// The strip of attachments of a compose screen, its crash dump's row, and the size shown against the limit.
// Main loop only.
#pragma once

#include <Elementary.h>
#include <glib.h>

#include <string>

struct appdata;
struct compose_view_win;

// Build an empty strip into the screen's box.
void tavro_compose_strip_build(appdata *ad, compose_view_win *view, Evas_Object *box);
// Build the row of the crash dump, when the screen holds one.
void tavro_compose_dump_build(appdata *ad, Evas_Object *box);
// Take the dump off the open screen, and off the phone unless a stored report needs it.
void tavro_compose_dump_remove(appdata *ad);
// Show what the open screen's dump holds.
void tavro_compose_dump_open(appdata *ad);

// Show the open screen's attachments, dump and size as they are now.
void tavro_compose_strip_refresh(appdata *ad);
// Give the focus to an attachment's picture; to the button that attaches when there is none of this path.
void tavro_compose_strip_focus(appdata *ad, const char *path);
// Take an attachment off the open screen; the focus goes to what takes its place.
void tavro_compose_strip_remove(appdata *ad, const char *path);
// A file is attached no more: when it is a copy that the client made, and nothing else needs it, it goes.
void tavro_compose_strip_dropped(const std::string &path);
// The size alone.
void tavro_compose_size_refresh(appdata *ad);

// Attach files to the open screen; those that cannot be attached are named in a popup, each with the reason.
// `paths` is a list of const char *; `left_out` is shown with them, for what could not even be tried.
void tavro_compose_attach_files(appdata *ad, const GSList *paths, const std::string &left_out = "");

// Attach a file in the place of another, at the end when that is not attached; one that is refused, with the
// reason in a popup, leaves all as it was. Whether it is attached.
bool tavro_compose_replace(appdata *ad, const std::string &old_path, const std::string &path);

// Attach a file that was captured for the open problem report or idea.
void tavro_show_problem_capture_data(appdata *ad, const char *path);
void tavro_show_idea_capture_data(appdata *ad, const char *path);

// What can be attached, and what can be done with one attachment, as menus at the foot of the screen.
void tavro_compose_show_sources(appdata *ad);
void tavro_compose_show_attachment_menu(appdata *ad, const char *path);
