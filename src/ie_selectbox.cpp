// What a crop box shows, and its life as an object of the canvas.
#include "ie_selectbox.h"

#include <Elementary.h>

#include <algorithm>

#include "ie_selectbox_data.h"
#include "tavro_memory.h"
#include "tavro_theme.h"

namespace {

constexpr double kHandleUnits = 10.0;  // half its side
constexpr double kMinimumUnits = 50.0;
constexpr int kDotUnits = 16, kLineUnits = 2;
constexpr int kDimStrength = 140;  // of 255

int _pixels(double units) {
  return static_cast<int>(elm_config_scale_get() * units / elm_app_base_scale_get());
}

template <typename Act>
void _each_member(Smart_Data *data, Act act) {
  for (Evas_Object *dim : data->crop_dim_rect) act(dim);
  for (Evas_Object *line : data->crop_line) act(line);
  act(data->m_event);
  for (Evas_Object *dot : data->crop_dot) act(dot);
}

void _show_as_is(Smart_Data *data) {
  const auto show = [data](Evas_Object *member, bool is_wanted) {
    (is_wanted && data->bShow ? evas_object_show : evas_object_hide)(member);
  };
  for (Evas_Object *dim : data->crop_dim_rect) show(dim, data->bDim);
  for (Evas_Object *line : data->crop_line) show(line, true);
  for (Evas_Object *dot : data->crop_dot) show(dot, data->bActive);
  show(data->m_event, data->bActive);
}

Evas_Object *_rectangle_add(Smart_Data *data, int red, int green, int blue, int alpha) {
  Evas_Object *rectangle = evas_object_rectangle_add(evas_object_evas_get(data->obj));
  evas_object_color_set(rectangle, red, green, blue, alpha);
  evas_object_smart_member_add(rectangle, data->obj);
  return rectangle;
}

Evas_Object *_dot_add(const Smart_Data *data) {
  Evas_Object *dot = edje_object_add(evas_object_evas_get(data->obj));
  edje_object_file_set(dot, tavro_theme_file(), "tavro/editor/dot");
  evas_object_pass_events_set(dot, EINA_TRUE);
  evas_object_smart_member_add(dot, data->obj);
  return dot;
}

// ---- The object's life ----

void _add(Evas_Object *obj) {
  Smart_Data *data = TAVRO_ZALLOC(Smart_Data);
  data->obj = obj;
  data->bActive = data->bDim = true;
  data->minimum_units = kMinimumUnits;
  evas_object_smart_data_set(obj, data);
  for (Evas_Object *&dim : data->crop_dim_rect) {
    dim = _rectangle_add(data, 0, 0, 0, kDimStrength);
    evas_object_pass_events_set(dim, EINA_TRUE);
  }
  for (Evas_Object *&line : data->crop_line) {
    line = _rectangle_add(data, 255, 255, 255, 255);
    evas_object_pass_events_set(line, EINA_TRUE);
  }
  data->m_event = _rectangle_add(data, 0, 0, 0, 0);
  for (Evas_Object *&dot : data->crop_dot) dot = _dot_add(data);
  ie_selectbox_listen(data);
}

void _target_changed_cb(void *data, Evas *, Evas_Object *, void *) {
  evas_object_smart_changed(static_cast<Smart_Data *>(data)->obj);
}

void _target_deleted_cb(void *data, Evas *, Evas_Object *, void *) {
  static_cast<Smart_Data *>(data)->target = nullptr;
}

void _leave_target(Smart_Data *data) {
  if (!data->target) return;
  evas_object_event_callback_del_full(data->target, EVAS_CALLBACK_DEL, _target_deleted_cb, data);
  for (Evas_Callback_Type change : {EVAS_CALLBACK_MOVE, EVAS_CALLBACK_RESIZE})
    evas_object_event_callback_del_full(data->target, change, _target_changed_cb, data);
  data->target = nullptr;
}

void _del(Evas_Object *obj) {
  Smart_Data *data = ie_selectbox_data(obj);
  _leave_target(data);
  _each_member(data, evas_object_del);
  evas_object_smart_data_set(obj, nullptr);
  TAVRO_FREE(data);
}

void _move(Evas_Object *obj, Evas_Coord, Evas_Coord) {
  evas_object_smart_changed(obj);
}

void _resize(Evas_Object *obj, Evas_Coord, Evas_Coord) {
  evas_object_smart_changed(obj);
}

void _show(Evas_Object *obj) {
  Smart_Data *data = ie_selectbox_data(obj);
  data->bShow = true;
  _show_as_is(data);
}

void _hide(Evas_Object *obj) {
  Smart_Data *data = ie_selectbox_data(obj);
  data->bShow = false;
  _show_as_is(data);
}

void _color_set(Evas_Object *obj, int red, int green, int blue, int alpha) {
  for (Evas_Object *line : ie_selectbox_data(obj)->crop_line)
    evas_object_color_set(line, red, green, blue, alpha);
}

void _clip_set(Evas_Object *obj, Evas_Object *clip) {
  _each_member(ie_selectbox_data(obj), [clip](Evas_Object *member) { evas_object_clip_set(member, clip); });
}

void _clip_unset(Evas_Object *obj) {
  _each_member(ie_selectbox_data(obj), evas_object_clip_unset);
}

// ---- What it shows ----

void _lay(Evas_Object *member, int left, int top, int right, int bottom) {
  evas_object_geometry_set(member, left, top, std::max(0, right - left), std::max(0, bottom - top));
}

void _lay_dim(Smart_Data *data, const ie::CRect &box, const ie::CRect &all) {
  _lay(data->crop_dim_rect[0], all.Left(), all.Top(), all.Right(), box.Top());
  _lay(data->crop_dim_rect[1], all.Left(), box.Bottom(), all.Right(), all.Bottom());
  _lay(data->crop_dim_rect[2], all.Left(), box.Top(), box.Left(), box.Bottom());
  _lay(data->crop_dim_rect[3], box.Right(), box.Top(), all.Right(), box.Bottom());
}

void _lay_lines(Smart_Data *data, const ie::CRect &box) {
  const int thick = std::max(1, _pixels(kLineUnits));
  _lay(data->crop_line[0], box.Left(), box.Top(), box.Right(), box.Top() + thick);
  _lay(data->crop_line[1], box.Left(), box.Bottom() - thick, box.Right(), box.Bottom());
  _lay(data->crop_line[2], box.Left(), box.Top() + thick, box.Left() + thick, box.Bottom() - thick);
  _lay(data->crop_line[3], box.Right() - thick, box.Top() + thick, box.Right(), box.Bottom() - thick);
}

void _lay_dots(Smart_Data *data, const ie::CRect &box) {
  const int half = _pixels(kDotUnits) / 2;
  const int xs[] = {box.Left(), box.Left() + box.Width() / 2, box.Right()};
  const int ys[] = {box.Top(), box.Top() + box.Height() / 2, box.Bottom()};
  int next = 0;
  for (int row = 0; row < 3; ++row)
    for (int column = 0; column < 3; ++column) {
      if (row == 1 && column == 1) continue;
      _lay(data->crop_dot[next++], xs[column] - half, ys[row] - half, xs[column] + half, ys[row] + half);
    }
}

void _calculate(Evas_Object *obj) {
  Smart_Data *data = ie_selectbox_data(obj);
  if (!data->target) return;
  int x = 0, y = 0, width = 0, height = 0;
  evas_object_geometry_get(data->target, &x, &y, &width, &height);
  const ie::CRect box = ie_selectbox_rect(data);
  const int half = ie_selectbox_handle_half();
  _lay_dim(data, box, {x, y, x + width, y + height});
  _lay_lines(data, box);
  _lay_dots(data, box);
  _lay(data->m_event, box.Left() - half, box.Top() - half, box.Right() + half, box.Bottom() + half);
}

Evas_Smart *_smart() {
  static Evas_Smart *smart = nullptr;
  if (smart) return smart;
  static Evas_Smart_Class own = EVAS_SMART_CLASS_INIT_NAME_VERSION("ie_selectbox");
  own.add = _add;
  own.del = _del;
  own.move = _move;
  own.resize = _resize;
  own.show = _show;
  own.hide = _hide;
  own.calculate = _calculate;
  own.color_set = _color_set;
  own.clip_set = _clip_set;
  own.clip_unset = _clip_unset;
  return smart = evas_smart_class_new(&own);
}

}  // namespace

Smart_Data *ie_selectbox_data(const Evas_Object *box) {
  return static_cast<Smart_Data *>(evas_object_smart_data_get(box));
}

int ie_selectbox_handle_half() {
  return _pixels(kHandleUnits);
}

ie::CRect ie_selectbox_rect(const Smart_Data *data) {
  const auto &box = data->cRect;
  return {box.x, box.y, box.x + box.w, box.y + box.h};
}

void ie_selectbox_place(Smart_Data *data, const ie::CRect &rect) {
  data->cRect = {rect.Left(), rect.Top(), rect.Width(), rect.Height()};
  evas_object_smart_changed(data->obj);
}

ie_box_rules ie_selectbox_rules(Smart_Data *data) {
  int x = 0, y = 0, width = 0, height = 0, view_x = 0, view_y = 0, view_width = 0, view_height = 0;
  evas_object_geometry_get(data->target, &x, &y, &width, &height);
  // The canvas has the size of the window as it is held.
  evas_output_viewport_get(evas_object_evas_get(data->obj), &view_x, &view_y, &view_width, &view_height);
  data->tRect = ie_allowed_area({x, y, x + width, y + height}, {0, 0, view_width, view_height});
  ie_box_rules rules{data->tRect, _pixels(data->minimum_units), 0, 0};
  if (data->bset_ratio) {
    rules.numerator = data->nNumer;
    rules.denominator = data->nDenom;
  } else if (data->bKeep_current_ratio_set) {
    rules.numerator = data->sRect.Width();
    rules.denominator = data->sRect.Height();
  }
  return rules;
}

Evas_Object *ie_selectbox_add(Evas_Object *parent) {
  return evas_object_smart_add(evas_object_evas_get(parent), _smart());
}

void ie_selectbox_attach(Evas_Object *box, Evas_Object *image) {
  Smart_Data *data = ie_selectbox_data(box);
  _leave_target(data);
  data->target = image;
  evas_object_event_callback_add(image, EVAS_CALLBACK_DEL, _target_deleted_cb, data);
  for (Evas_Callback_Type change : {EVAS_CALLBACK_MOVE, EVAS_CALLBACK_RESIZE})
    evas_object_event_callback_add(image, change, _target_changed_cb, data);
  ie_selectbox_place(data, ie_selectbox_rules(data).area);
}

void ie_selectbox_set_ratio(Evas_Object *box, int numerator, int denominator) {
  Smart_Data *data = ie_selectbox_data(box);
  data->bset_ratio = numerator > 0 && denominator > 0;
  data->nNumer = numerator;
  data->nDenom = denominator;
  if (data->target)
    ie_selectbox_place(data, ie_box_fitted(ie_selectbox_rect(data), ie_selectbox_rules(data)));
}

void ie_selectbox_get_region(const Evas_Object *box, int *x, int *y, int *w, int *h) {
  const Smart_Data *data = ie_selectbox_data(box);
  *x = data->cRect.x;
  *y = data->cRect.y;
  *w = data->cRect.w;
  *h = data->cRect.h;
}

void ie_selectbox_set_region(Evas_Object *box, int x, int y, int w, int h) {
  Smart_Data *data = ie_selectbox_data(box);
  if (!data->target) return;
  ie_box_rules rules = ie_selectbox_rules(data);
  rules.minimum = 1;  // it was drawn at another size of the window, or by other hands
  ie_selectbox_place(data, ie_box_fitted({x, y, x + w, y + h}, rules));
}

void ie_selectbox_drag(Evas_Object *box, ie_grasp grasp, int dx, int dy) {
  Smart_Data *data = ie_selectbox_data(box);
  if (!data->target) return;
  const ie_box_rules rules = ie_selectbox_rules(data);
  ie_selectbox_place(data, ie_box_dragged(ie_selectbox_rect(data), grasp, dx, dy, rules));
}

void ie_selectbox_set_active(Evas_Object *box, bool is_active) {
  Smart_Data *data = ie_selectbox_data(box);
  data->bActive = is_active;
  if (!is_active) data->m_grasp = IE_GRASP_NONE;
  _show_as_is(data);
}

void ie_selectbox_set_dim(Evas_Object *box, bool is_dimming) {
  Smart_Data *data = ie_selectbox_data(box);
  data->bDim = is_dimming;
  _show_as_is(data);
}

void ie_selectbox_set_dim_strength(Evas_Object *box, int strength) {
  for (Evas_Object *dim : ie_selectbox_data(box)->crop_dim_rect)
    evas_object_color_set(dim, 0, 0, 0, strength);
}

void ie_selectbox_set_minimum(Evas_Object *box, double units) {
  ie_selectbox_data(box)->minimum_units = units;
}
