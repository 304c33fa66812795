// What a person sees between a crash and the problem screen, all in crash_popup of appdata: the question, the
// progress, and what "never" means. Back, Escape and the buttons without an action just close a popup. Null
// without a display. Main loop only.
#pragma once

#include <Elementary.h>

#include <string>

struct appdata;

using tavro_crash_action = void (*)(appdata *ad);

struct tavro_crash_question {
  std::string app_name;
  std::string icon;  // path of a picture; empty: none
  int count;         // crashes of the application within a week
};
Evas_Object *tavro_crash_popup_ask(appdata *ad, const tavro_crash_question &question,
                                   tavro_crash_action report, tavro_crash_action never);
// Show another count in the question that is up.
void tavro_crash_popup_count(appdata *ad, int count);

Evas_Object *tavro_crash_popup_progress(appdata *ad, const std::string &app_name);

Evas_Object *tavro_crash_popup_never(appdata *ad, const std::string &app_name, tavro_crash_action undo);

// What lies behind the popups in a window without a page; nothing in one with a page.
void tavro_crash_ground_show(appdata *ad);
void tavro_crash_ground_hide();
