#define EFL_BETA_API_SUPPORT
#include "elm_atspi.h"

#include <efl_access_object.eo.h>

void elm_atspi_accessible_name_set(Evas_Object *obj, const char *name) {
  efl_access_object_i18n_name_set(obj, name);
}

void elm_atspi_accessible_description_set(Evas_Object *obj, const char *description) {
  efl_access_object_description_set(obj, description);
}
