// Page on which a person says what about the phone's performance a report is about. Main loop only.
#pragma once

#include <Elementary.h>

#include "tavro_screens.h"

// Reports once through `chosen` and then leaves every page above `below`.
void tavro_create_performance_page(appdata *ad, tavro_target_chosen chosen, Elm_Object_Item *below);
