// Automatic save of an open compose screen when the battery runs low or the application is ended from
// outside. A compose screen starts the watch when it opens and stops it when it ends; the Done and draft
// actions stop it themselves. Main loop only.
#pragma once

#include <device/callback.h>

#include <string>

struct appdata;

// `end_unchanged` ends the open screen unless that would lose something, and tells whether it has.
using tavro_end_unchanged = bool (*)(appdata *ad);
void tavro_autosave_start(appdata *ad, tavro_end_unchanged end_unchanged);
void tavro_autosave_stop();

// The screenshot that is being edited for the open screen, empty for none. It is no attachment yet, and all
// of it, also what has been hidden in it by now, goes into what is saved automatically or as a draft; who is
// asked whether to keep a draft is told so.
void tavro_autosave_set_screenshot(const std::string &path);
std::string tavro_autosave_screenshot();
// Attach it as it was captured, rather than lose it: its path; empty when there is none, or it is refused.
std::string tavro_autosave_attach_screenshot(appdata *ad);
// The editor goes on: what it makes of the screenshot is attached later. Nothing for an empty path.
void tavro_autosave_detach_screenshot(appdata *ad, const std::string &path);

// The application ends and nobody can be asked: what would be lost of an open compose screen becomes a draft.
// False when there was nothing to lose, or the store refused it: then the keeper's file goes on keeping it.
bool tavro_autosave_at_end(appdata *ad);

// The platform's report of a new battery capacity; `value` carries the percentage, `user_data` is the
// appdata.
void __tavro_app_battery_capacity_changed_cb(device_callback_e type, void *value, void *user_data);
