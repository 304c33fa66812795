/* What a widget is called for assistive technology. The phone's toolkit declares these beside its widgets;
 * the desktop's offers the same under other names. Main loop only; texts are copied. */
#pragma once

#include <Elementary.h>

#ifdef __cplusplus
extern "C" {
#endif

void elm_atspi_accessible_name_set(Evas_Object *obj, const char *name);
void elm_atspi_accessible_description_set(Evas_Object *obj, const char *description);

#ifdef __cplusplus
}
#endif
