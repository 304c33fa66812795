#define EFL_BETA_API_SUPPORT
#define EFL_ACCESS_OBJECT_PROTECTED
#include "elm_atspi.h"

#include <efl_access_object.eo.h>

namespace {

constexpr Efl_Access_State_Set bit(Efl_Access_State_Type state) {
  return Efl_Access_State_Set{1} << state;
}

// The desktop's toolkit keeps quiet about the focus of a control that has widgets inside, such as a row with
// an icon, and a screen reader would not follow it.
Efl_Access_State_Set states_of(Eo *control, void *) {
  Efl_Access_State_Set states =
      efl_access_object_state_set_get(efl_super(control, EFL_OBJECT_OVERRIDE_CLASS));
  const bool is_container = efl_access_object_role_get(control) == EFL_ACCESS_ROLE_FILLER;
  if (is_container || !elm_object_focus_allow_get(control)) return states;
  if (!elm_object_disabled_get(control)) states |= bit(EFL_ACCESS_STATE_TYPE_FOCUSABLE);
  if (elm_object_focus_get(control)) states |= bit(EFL_ACCESS_STATE_TYPE_FOCUSED);
  return states;
}

// Once an object: the toolkit never frees an override that another replaces.
void tell_states(Evas_Object *obj) {
  constexpr char kIsTold[] = "tavro_states_told";
  if (efl_key_data_get(obj, kIsTold)) return;
  EFL_OPS_DEFINE(overrides, EFL_OBJECT_OP_FUNC(efl_access_object_state_set_get, states_of));
  if (efl_object_override(obj, &overrides)) efl_key_data_set(obj, kIsTold, obj);
}

}  // namespace

void elm_atspi_accessible_name_set(Evas_Object *obj, const char *name) {
  const bool is_widget =
      efl_isa(obj, EFL_CANVAS_OBJECT_CLASS);  // else an item, which tells its states itself
  if (is_widget) tell_states(obj);
  efl_access_object_i18n_name_set(obj, name);
}

void elm_atspi_accessible_description_set(Evas_Object *obj, const char *description) {
  efl_access_object_description_set(obj, description);
}

void elm_atspi_accessible_role_set(Evas_Object *obj, Elm_Atspi_Role role) {
  static_assert(static_cast<int>(ELM_ATSPI_ROLE_ALERT) == static_cast<int>(EFL_ACCESS_ROLE_ALERT));
  efl_access_object_role_set(obj, static_cast<Efl_Access_Role>(role));
}
