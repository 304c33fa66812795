// Shared by the two compose screens: which record is open, what still stands in the way of sending, and what
// the attachments add up to. The screens themselves are opened through tavro_screens.h. Main loop only.
#pragma once

#include <glib.h>

#include "tavro_drafts.h"

struct appdata;

// The open compose record, null when neither screen is open; there is one at most.
compose_view_win *tavro_compose_view(appdata *ad);

// What keeps a report from being sent, first things first.
enum tavro_compose_gap {
  TAVRO_COMPOSE_COMPLETE = 0,
  TAVRO_COMPOSE_NO_TARGET,
  TAVRO_COMPOSE_NO_CONTENT,  // neither title, description nor attachment
  TAVRO_COMPOSE_TOO_LARGE,
};
tavro_compose_gap tavro_compose_check(const compose_view_win *view, gint64 limit);

// Whether there is anything that leaving the screen would lose.
bool tavro_compose_has_content(const compose_view_win *view);

// Size of a file that can be attached, in bytes; -1 when it is gone, not a plain file or not readable.
gint64 tavro_attachment_size(const char *path);

// Attach a file unless it is attached already; false when it cannot be attached. Keeps `buffer`.
bool tavro_compose_attach(compose_view_win *view, const char *path);
void tavro_compose_detach(compose_view_win *view, const char *path);
