// Whether a newer client must or may be installed, from the upload service's last answer in the preferences.
//
// The person is told by one popup. A popup that falls due while the client has no window waits until the
// launch request in hand has been served; it counts as shown for everything else. Main loop only.
#pragma once

struct appdata;

enum tavro_update_result {
  TAVRO_UPDATE_UNKNOWN = -1,  // the service has not answered yet
  TAVRO_UPDATE_NOT_NEEDED = 0,
  TAVRO_UPDATE_MANDATORY = 1,
  TAVRO_UPDATE_OPTIONAL = 2,  // an answer that speaks of an update was dealt with
};

// One of tavro_update_result. A minor update is offered once, and then at most once a day.
int check_version_update(appdata *ad);

// Offer the update: kind "MAJOR" (update or leave) or "MINOR" (update or later).
void tavro_create_version_update_popup(appdata *ad, const char *kind);

// Whether the popup is shown or waits for a window; and show one that waits, over the first page if there is
// no window yet.
bool tavro_version_popup_is_up(const appdata *ad);
void tavro_show_due_version_popup(appdata *ad);

// The client ends: an offer that still waits was never seen, so the next start makes it again.
void tavro_forget_due_version_popup();
