// The picture of the editor with what is hidden in it as it will be saved, the crop box, and the box around
// the chosen area. The picture is scaled once; a change paints the hidden areas anew into a copy of that.
#include <algorithm>
#include <cstdlib>
#include <cstring>

#include "tavro-main.h"
#include "tavro_image_editor_parts.h"

namespace {

constexpr double kLeastAreaUnits = 8;
constexpr double kTouchSlackUnits = 6;  // a finger that moves less draws nothing
constexpr double kOutlineUnits = 0.5;
constexpr int kScreenshotDim = 56;  // of 255: all of it is kept

int _units(double units) {
  return static_cast<int>(units * elm_config_scale_get());
}

ie::CRect _shown_rect(const image_editor *editor) {
  int x = 0, y = 0, width = 0, height = 0;
  evas_object_geometry_get(editor->ad->main_image, &x, &y, &width, &height);
  return {x, y, x + width, y + height};
}

ie::CPoint _picture_size(const image_editor *editor) {
  return {editor->picture->pixels.width, editor->picture->pixels.height};
}

ie::CRect _to_picture(const image_editor *editor, const ie::CRect &rect) {
  return tavro_edit_to_picture(rect, _picture_size(editor), _shown_rect(editor));
}

ie::CRect _region(const Evas_Object *box) {
  int x = 0, y = 0, width = 0, height = 0;
  ie_selectbox_get_region(box, &x, &y, &width, &height);
  return {x, y, x + width, y + height};
}

void _place(const image_editor *editor, Evas_Object *box, const ie::CRect &rect) {
  const ie::CRect shown = tavro_edit_to_screen(rect, _picture_size(editor), _shown_rect(editor));
  ie_selectbox_set_region(box, shown.Left(), shown.Top(), shown.Width(), shown.Height());
}

ie::CRect _rect_of(const tavro_hidden_area &area) {
  return {area.x, area.y, area.x + area.width, area.y + area.height};
}

tavro_hidden_area *_chosen_area(image_editor *editor) {
  const auto chosen = static_cast<size_t>(editor->chosen);
  return editor->chosen >= 0 && chosen < editor->edit.areas.size() ? &editor->edit.areas[chosen] : nullptr;
}

// ---- Painting ----

void _repaint_cb(void *data) {
  auto *editor = static_cast<image_editor *>(data);
  editor->repaint = nullptr;
  const tavro_pixels &shown = editor->picture->shown;
  Evas_Object *image = editor->ad->main_image;
  void *canvas_pixels = evas_object_image_data_get(image, EINA_TRUE);
  if (canvas_pixels) {
    std::memcpy(canvas_pixels, shown.bytes.get(), shown.size());
    tavro_pixels lent;
    lent.width = shown.width;
    lent.height = shown.height;
    lent.bytes.reset(static_cast<unsigned char *>(canvas_pixels));
    tavro_edit_hide_in(lent, *editor->picture, editor->edit);
    const int shrunk = shown.width / std::max(1, _shown_rect(editor).Width());  // on the screen
    tavro_edit_outline_in(lent, *editor->picture, editor->edit,
                          std::max(1, _units(kOutlineUnits)) * std::max(1, shrunk));
    static_cast<void>(lent.bytes.release());  // the canvas's own
  }
  evas_object_image_data_set(image, canvas_pixels);
  evas_object_image_data_update_add(image, 0, 0, shown.width, shown.height);
}

// Once for all that happens before the next frame.
void _repaint_soon(image_editor *editor) {
  if (!editor->repaint) editor->repaint = ecore_job_add(_repaint_cb, editor);
}

// While areas are drawn, what was not marked is no box. One that was is seen as it will be: red in a
// screenshot, whose file keeps its outline.
void _show_box(const image_editor *editor) {
  Evas_Object *box = editor->ad->select_box;
  const bool is_in_use = editor->tool == EDITOR_BOX;
  const bool is_moved = tavro_edit_is_box_moved(*editor->picture, editor->edit);
  ie_selectbox_set_active(box, is_in_use);
  ie_selectbox_set_dim(box, is_in_use);
  if (!is_in_use && !is_moved)
    evas_object_color_set(box, 0, 0, 0, 0);
  else if (editor->is_screenshot && is_moved)
    evas_object_color_set(box, 198, 40, 40, 255);
  else
    evas_object_color_set(box, 255, 255, 255, 255);
}

void _place_boxes(image_editor *editor) {
  _show_box(editor);
  _place(editor, editor->ad->select_box, editor->edit.box);
  const tavro_hidden_area *area = _chosen_area(editor);
  elm_object_signal_emit(editor->ad->crop_layout, area ? "tavro,chosen" : "tavro,unchosen", "tavro");
  if (area) _place(editor, editor->area_box, _rect_of(*area));
}

void _image_resized_cb(void *data, Evas *, Evas_Object *, void *) {
  _place_boxes(static_cast<image_editor *>(data));
}

// ---- Moving and resizing ----

ie::CRect _redrawn(const image_editor *editor, const ie::CRect &before, const Evas_Object *box) {
  return tavro_edit_redrawn(before, _region(box), _picture_size(editor), _shown_rect(editor));
}

void _read_box(image_editor *editor) {
  editor->edit.box = _redrawn(editor, editor->steps.now().box, editor->ad->select_box);
}

void _set_area(image_editor *editor, const ie::CRect &rect) {
  tavro_hidden_area *area = _chosen_area(editor);
  if (!area) return;
  *area = {rect.Left(), rect.Top(), rect.Width(), rect.Height(), area->way};
  _repaint_soon(editor);
}

void _box_moved_cb(void *data, Evas_Object *, void *) {
  auto *editor = static_cast<image_editor *>(data);
  _read_box(editor);
  _show_box(editor);
}

void _area_moved_cb(void *data, Evas_Object *, void *) {
  auto *editor = static_cast<image_editor *>(data);
  const auto &areas = editor->steps.now().areas;
  const auto chosen = static_cast<size_t>(editor->chosen);
  if (chosen < areas.size()) _set_area(editor, _redrawn(editor, _rect_of(areas[chosen]), editor->area_box));
}

void _touch_ended_cb(void *data, Evas_Object *, void *) {
  auto *editor = static_cast<image_editor *>(data);
  editor_commit(editor);
  elm_object_focus_set(editor->stage, EINA_TRUE);
}

// ---- Drawing and choosing areas ----

void _picture_down_cb(void *data, Evas *, Evas_Object *, void *event_info) {
  auto *editor = static_cast<image_editor *>(data);
  const auto *touch = static_cast<Evas_Event_Mouse_Down *>(event_info);
  if (touch->button != 1 || editor->tool == EDITOR_BOX || editor_is_busy(editor)) return;
  editor->is_touched = true;
  editor->touched_x = touch->canvas.x;
  editor->touched_y = touch->canvas.y;
}

void _begin_area(image_editor *editor) {
  editor->is_drawing = true;
  const tavro_hide_way way = editor->tool == EDITOR_BLUR ? TAVRO_HIDE_PIXELATE : TAVRO_HIDE_FILL;
  editor->edit.areas.push_back({0, 0, 0, 0, way});
  editor->chosen = static_cast<int>(editor->edit.areas.size()) - 1;
}

void _picture_move_cb(void *data, Evas *, Evas_Object *, void *event_info) {
  auto *editor = static_cast<image_editor *>(data);
  if (!editor->is_touched) return;
  const auto &now = static_cast<Evas_Event_Mouse_Move *>(event_info)->cur.canvas;
  const int slack = _units(kTouchSlackUnits);
  if (!editor->is_drawing) {
    if (std::abs(now.x - editor->touched_x) < slack && std::abs(now.y - editor->touched_y) < slack) return;
    _begin_area(editor);
  }
  const int least = _units(kLeastAreaUnits);
  const int left = std::min(now.x, editor->touched_x), top = std::min(now.y, editor->touched_y);
  const int right = std::max({now.x, editor->touched_x, left + least});
  const int bottom = std::max({now.y, editor->touched_y, top + least});
  _set_area(editor, _to_picture(editor, {left, top, right, bottom}));
  _place_boxes(editor);
}

void _tap(image_editor *editor, int x, int y) {
  const ie::CRect point = _to_picture(editor, {x, y, x, y});
  editor_choose(editor, tavro_edit_area_at(editor->edit, point.Left(), point.Top()));
}

void _picture_up_cb(void *data, Evas *, Evas_Object *, void *event_info) {
  auto *editor = static_cast<image_editor *>(data);
  const auto *touch = static_cast<Evas_Event_Mouse_Up *>(event_info);
  if (touch->button != 1 || !editor->is_touched) return;
  editor->is_touched = false;
  if (editor->is_drawing)
    editor_commit(editor);
  else
    _tap(editor, touch->canvas.x, touch->canvas.y);
  editor->is_drawing = false;
  elm_object_focus_set(editor->stage, EINA_TRUE);
}

// A second finger: what the first one began is none.
void _picture_multi_down_cb(void *data, Evas *, Evas_Object *, void *) {
  auto *editor = static_cast<image_editor *>(data);
  if (!editor->is_touched) return;
  editor->is_touched = editor->is_drawing = false;
  editor->edit = editor->steps.now();
  editor_choose(editor, -1);
}

// ---- Building ----

Evas_Object *_image_add(image_editor *editor) {
  const tavro_pixels &shown = editor->picture->shown;
  Evas_Object *image = evas_object_image_filled_add(evas_object_evas_get(editor->ad->crop_layout));
  evas_object_image_alpha_set(image, EINA_FALSE);
  evas_object_image_size_set(image, shown.width, shown.height);
  evas_object_size_hint_aspect_set(image, EVAS_ASPECT_CONTROL_BOTH, shown.width, shown.height);
  evas_object_event_callback_add(image, EVAS_CALLBACK_RESIZE, _image_resized_cb, editor);
  evas_object_event_callback_add(image, EVAS_CALLBACK_MOVE, _image_resized_cb, editor);
  evas_object_event_callback_add(image, EVAS_CALLBACK_MOUSE_DOWN, _picture_down_cb, editor);
  evas_object_event_callback_add(image, EVAS_CALLBACK_MOUSE_MOVE, _picture_move_cb, editor);
  evas_object_event_callback_add(image, EVAS_CALLBACK_MOUSE_UP, _picture_up_cb, editor);
  evas_object_event_callback_add(image, EVAS_CALLBACK_MULTI_DOWN, _picture_multi_down_cb, editor);
  evas_object_show(image);
  return image;
}

Evas_Object *_box_add(image_editor *editor, const char *part, Evas_Smart_Cb moved) {
  Evas_Object *box = ie_selectbox_add(editor->ad->crop_layout);
  ie_selectbox_attach(box, editor->ad->main_image);
  evas_object_smart_callback_add(box, "moved", moved, editor);
  evas_object_smart_callback_add(box, "changed", _touch_ended_cb, editor);
  elm_object_part_content_set(editor->ad->crop_layout, part, box);
  return box;
}

}  // namespace

void editor_canvas_build(image_editor *editor) {
  appdata *ad = editor->ad;
  ad->main_image = _image_add(editor);
  ad->select_box = _box_add(editor, "tavro.swallow.box", _box_moved_cb);
  editor->area_box = _box_add(editor, "tavro.swallow.area", _area_moved_cb);
  if (editor->is_screenshot) ie_selectbox_set_dim_strength(ad->select_box, kScreenshotDim);
  ie_selectbox_set_dim(editor->area_box, false);
  // Nothing is dimmed around it, so its lines must show on light and on dark.
  evas_object_color_set(editor->area_box, 77, 128, 255, 255);
  ie_selectbox_set_minimum(editor->area_box, kLeastAreaUnits);
  elm_object_part_content_set(ad->crop_layout, "tavro.swallow.image", ad->main_image);
  editor_show(editor);
}

void editor_canvas_end(image_editor *editor) {
  if (editor->repaint) ecore_job_del(editor->repaint);
  editor->repaint = nullptr;
  // They go with the layout; the image may tell of its end after the editor's.
  if (Evas_Object *image = editor->ad->main_image)
    for (Evas_Callback_Type change : {EVAS_CALLBACK_RESIZE, EVAS_CALLBACK_MOVE})
      evas_object_event_callback_del_full(image, change, _image_resized_cb, editor);
}

void editor_show(image_editor *editor) {
  _place_boxes(editor);
  _repaint_soon(editor);
  editor_tools_show(editor);
}

void editor_commit(image_editor *editor, bool goes_on) {
  editor->steps.add(editor->edit, goes_on);
  editor_show(editor);
}

void editor_choose(image_editor *editor, int area) {
  editor->chosen = area;
  editor_show(editor);
}

void editor_drag(image_editor *editor, ie_grasp grasp, int dx, int dy) {
  if (editor->tool == EDITOR_BOX) {
    ie_selectbox_drag(editor->ad->select_box, grasp, dx, dy);
    _read_box(editor);
  } else if (_chosen_area(editor)) {
    ie_selectbox_drag(editor->area_box, grasp, dx, dy);
    _area_moved_cb(editor, nullptr, nullptr);
  }
  editor_commit(editor, true);
}

void editor_add_area(image_editor *editor) {
  const ie::CRect shown = _shown_rect(editor);
  const int left = shown.Left() + shown.Width() / 3, top = shown.Top() + shown.Height() * 2 / 5;
  _begin_area(editor);
  editor->is_drawing = false;
  _set_area(editor, _to_picture(editor, {left, top, left + shown.Width() / 3,
                                         top + std::max(1, shown.Height() / 5)}));
  editor_commit(editor);
}
