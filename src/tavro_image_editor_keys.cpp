// The editor by keyboard: arrows, Enter and Delete while the picture has the focus, undo and redo everywhere.
#include <cstring>

#include "tavro-main.h"
#include "tavro_image_editor_parts.h"

namespace {

constexpr double kStepUnits = 4;

// A step of the keyboard for what is chosen: with shift its right or lower side moves, else all of it.
bool _drag(image_editor *editor, const char *key, bool is_resize) {
  const int step = static_cast<int>(kStepUnits * elm_config_scale_get());
  const struct {
    const char *key;
    ie_grasp resized;
    int dx, dy;
  } kArrows[] = {{"Left", IE_GRASP_RIGHT, -step, 0},
                 {"Right", IE_GRASP_RIGHT, step, 0},
                 {"Up", IE_GRASP_BOTTOM, 0, -step},
                 {"Down", IE_GRASP_BOTTOM, 0, step}};
  for (const auto &arrow : kArrows) {
    if (std::strcmp(key, arrow.key) != 0) continue;
    editor_drag(editor, is_resize ? arrow.resized : IE_GRASP_CENTER, arrow.dx, arrow.dy);
    return true;
  }
  return false;
}

bool _choose_next(image_editor *editor, int step) {
  const int count = static_cast<int>(editor->edit.areas.size());
  if (count == 0 || editor->tool == EDITOR_BOX) return false;
  const int from = editor->chosen < 0 ? (step > 0 ? -1 : 0) : editor->chosen;
  editor_choose(editor, (from + step + count) % count);
  return true;
}

bool _stage_key(image_editor *editor, const char *key, bool is_shift) {
  if (_drag(editor, key, is_shift)) return true;
  if (std::strcmp(key, "Prior") == 0) return _choose_next(editor, -1);
  if (std::strcmp(key, "Next") == 0) return _choose_next(editor, 1);
  if (std::strcmp(key, "Delete") != 0 && std::strcmp(key, "BackSpace") != 0) return false;
  editor_remove_area(editor);
  return true;
}

bool _undo_key(image_editor *editor, const char *key, bool is_shift) {
  const bool is_redo = std::strcmp(key, "y") == 0;
  if (!is_redo && std::strcmp(key, "z") != 0) return false;
  if (is_redo || is_shift)
    editor_redo(editor);
  else
    editor_undo(editor);
  return true;
}

Eina_Bool _key_cb(void *data, Evas_Object *, Evas_Object *, Evas_Callback_Type type, void *event_info) {
  auto *editor = static_cast<image_editor *>(data);
  if (type != EVAS_CALLBACK_KEY_DOWN || editor_is_busy(editor) || editor->is_touched) return EINA_FALSE;
  const auto *key = static_cast<Evas_Event_Key_Down *>(event_info);
  const bool is_shift = evas_key_modifier_is_set(key->modifiers, "Shift");
  if (evas_key_modifier_is_set(key->modifiers, "Control")) return _undo_key(editor, key->keyname, is_shift);
  return elm_object_focus_get(editor->stage) && _stage_key(editor, key->keyname, is_shift);
}

}  // namespace

void editor_keys_listen(image_editor *editor) {
  elm_object_event_callback_add(editor->ad->crop_layout, _key_cb, editor);
}
