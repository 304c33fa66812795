// Touches of a crop box. While several fingers are on it, none of them moves it.
#include <Elementary.h>

#include "ie_selectbox_data.h"

namespace {

ie_grasp _get_grasp_type(const Smart_Data *data, int x, int y) {
  return ie_grasp_at(ie_selectbox_rect(data), ie_selectbox_handle_half(), x, y);
}

void _mouse_down_cb(void *data_of, Evas *, Evas_Object *, void *event_info) {
  auto *data = static_cast<Smart_Data *>(data_of);
  const auto *touch = static_cast<Evas_Event_Mouse_Down *>(event_info);
  if (touch->button != 1 || !data->target) return;
  data->sRect = ie_selectbox_rect(data);
  data->bResized = false;
  data->m_grasp = _get_grasp_type(data, touch->canvas.x, touch->canvas.y);
}

void _mouse_move_cb(void *data_of, Evas *, Evas_Object *, void *event_info) {
  auto *data = static_cast<Smart_Data *>(data_of);
  if (data->bMultiTouch || data->m_grasp == IE_GRASP_NONE || !data->target) return;
  const auto *touch = static_cast<Evas_Event_Mouse_Move *>(event_info);
  const int dx = touch->cur.canvas.x - touch->prev.canvas.x;
  const int dy = touch->cur.canvas.y - touch->prev.canvas.y;
  data->bKeep_current_ratio_set =
      data->m_grasp >= IE_GRASP_TOP_LEFT && evas_key_modifier_is_set(touch->modifiers, "Shift");
  const ie_box_rules rules = ie_selectbox_rules(data);
  ie_selectbox_place(data, ie_box_dragged(ie_selectbox_rect(data), data->m_grasp, dx, dy, rules));
  data->bResized = true;
  evas_object_smart_callback_call(data->obj, "moved", nullptr);
}

void _mouse_up_cb(void *data_of, Evas *, Evas_Object *, void *event_info) {
  auto *data = static_cast<Smart_Data *>(data_of);
  if (static_cast<Evas_Event_Mouse_Up *>(event_info)->button != 1) return;
  data->m_grasp = IE_GRASP_NONE;
  data->bMultiTouch = data->bKeep_current_ratio_set = false;
  if (!data->bResized) return;
  data->bResized = false;
  evas_object_smart_callback_call(data->obj, "changed", nullptr);
}

void _multi_down_cb(void *data, Evas *, Evas_Object *, void *) {
  static_cast<Smart_Data *>(data)->bMultiTouch = true;
}

void _multi_up_cb(void *data, Evas *, Evas_Object *, void *) {
  static_cast<Smart_Data *>(data)->bMultiTouch = false;
}

}  // namespace

void ie_selectbox_listen(Smart_Data *data) {
  const struct {
    Evas_Callback_Type type;
    Evas_Object_Event_Cb called;
  } kTouches[] = {{EVAS_CALLBACK_MOUSE_DOWN, _mouse_down_cb},
                  {EVAS_CALLBACK_MOUSE_MOVE, _mouse_move_cb},
                  {EVAS_CALLBACK_MOUSE_UP, _mouse_up_cb},
                  {EVAS_CALLBACK_MULTI_DOWN, _multi_down_cb},
                  {EVAS_CALLBACK_MULTI_UP, _multi_up_cb}};
  for (const auto &touch : kTouches)
    evas_object_event_callback_add(data->m_event, touch.type, touch.called, data);
}
