/* What a widget is called for assistive technology. The phone's toolkit declares these beside its widgets;
 * the desktop's offers the same under other names. An item of a list or
 * grid can be named too. Main loop only; texts are copied. */
#pragma once

#include <Elementary.h>

#ifdef __cplusplus
extern "C" {
#endif

void elm_atspi_accessible_name_set(Evas_Object *obj, const char *name);
void elm_atspi_accessible_description_set(Evas_Object *obj, const char *description);

/* What kind of thing it is; a screen reader reads an alert as soon as it is shown. */
typedef enum { ELM_ATSPI_ROLE_ALERT = 2 } Elm_Atspi_Role;
void elm_atspi_accessible_role_set(Evas_Object *obj, Elm_Atspi_Role role);

#ifdef __cplusplus
}
#endif
