// Shared by the two compose screens: which record is open, what still stands in the way of sending, which
// files can be attached, and what they add up to. The screens themselves are opened through tavro_screens.h.
// Main loop only; asks the disk about single files.
#pragma once

#include <Elementary.h>
#include <glib.h>

#include <string>
#include <vector>

#include "tavro_drafts.h"

struct appdata;

// The open compose record, null when neither screen is open; there is one at most.
compose_view_win *tavro_compose_view(appdata *ad);

// The page to be shown of the open screen: its own, or that of an image editor above it in which something
// would be lost. Null when no screen is open.
Elm_Object_Item *tavro_compose_front_page(appdata *ad);

// The open screen has come up, or come back from below a page or window: for half a second touches do
// nothing, as the second tap of a double one was meant for what was there before. Keys and screen readers do
// not wait.
void tavro_compose_rest(appdata *ad);

// What keeps a report from being sent, first things first.
enum tavro_compose_gap {
  TAVRO_COMPOSE_COMPLETE = 0,
  TAVRO_COMPOSE_NO_TARGET,
  TAVRO_COMPOSE_NO_CONTENT,  // neither title, description, attachment nor crash dump
  TAVRO_COMPOSE_TOO_LARGE,
};
tavro_compose_gap tavro_compose_check(const appdata *ad, gint64 limit);

// Whether the open screen holds anything that tells support something by itself: text, attachment, crash
// dump. A log alone does not. False when no screen is open.
bool tavro_compose_has_content(const appdata *ad);

// Size of a file that can be attached, in bytes; -1 when it is gone, not a plain file or not readable.
gint64 tavro_attachment_size(const char *path);

// A report takes 32 files on its way to support; device status, system log and crash dump may be three of
// them.
constexpr unsigned kMostAttachments = 29;

// Why a file cannot be attached. Pictures (JPEG, PNG, WebP) and videos (MP4) are told by what they hold.
enum tavro_attachment_fault {
  TAVRO_ATTACHMENT_GOOD = 0,
  TAVRO_ATTACHMENT_UNREADABLE,  // gone, not a plain file, or not readable
  TAVRO_ATTACHMENT_EMPTY,
  TAVRO_ATTACHMENT_TOO_LARGE,  // by itself larger than the limit of a whole report
  TAVRO_ATTACHMENT_OTHER_KIND,
  TAVRO_ATTACHMENT_TOO_MANY,  // kMostAttachments are attached
};
tavro_attachment_fault tavro_attachment_check(const compose_view_win *view, const char *path);

// Whether the file is a picture that goes as a copy in another format: tavro_compose_convert. Reads its
// header.
bool tavro_compose_wants_conversion(const char *path);

// Attach a file unless it is attached already; false when it cannot be attached. Keeps `buffer`.
bool tavro_compose_attach(compose_view_win *view, const char *path);
void tavro_compose_detach(compose_view_win *view, const char *path);
// What the open screen has attached; nothing when none is open.
std::vector<std::string> tavro_compose_attached(const appdata *ad);
// Move an attachment by `steps` places, as far as there are places.
void tavro_compose_move(compose_view_win *view, const char *path, int steps);
// Add `buffer` up anew: files change while they are attached.
void tavro_compose_count(compose_view_win *view);
// The attachments of which nothing can be sent any more: gone, unreadable or empty.
std::vector<std::string> tavro_compose_lost_attachments(const compose_view_win *view);

// The last part of a path.
std::string tavro_file_name(const char *path);

// All that would be sent, in bytes: attachments, system log and crash dump.
gint64 tavro_compose_total(const appdata *ad);
