// The strip of attachments of a compose screen and the size shown against the limit. Main loop only.
#pragma once

#include <Elementary.h>

struct appdata;
struct compose_view_win;

// Build an empty strip into the screen's box.
void tavro_compose_strip_build(appdata *ad, compose_view_win *view, Evas_Object *box);

// Show the open screen's attachments and their size as they are now.
void tavro_compose_strip_refresh(appdata *ad);
