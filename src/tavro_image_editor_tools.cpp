// The row of tools at the editor's foot, and what a screen reader is told about the picture.
#include <elm_atspi.h>

#include <string>

#include "tavro-common.h"
#include "tavro-main.h"
#include "tavro_handles.h"
#include "tavro_image_editor_parts.h"
#include "tavro_widgets.h"

namespace {

constexpr int kFootUnits = 68;

image_editor *_editor(void *data) {
  return static_cast<image_editor *>(data);
}

void _box_clicked_cb(void *data, Evas_Object *, void *) {
  editor_use(_editor(data), EDITOR_BOX);
}

void _hide_clicked_cb(void *data, Evas_Object *, void *) {
  editor_use(_editor(data), EDITOR_HIDE);
}

void _blur_clicked_cb(void *data, Evas_Object *, void *) {
  editor_use(_editor(data), EDITOR_BLUR);
}

void _undo_clicked_cb(void *data, Evas_Object *, void *) {
  editor_undo(_editor(data));
}

void _redo_clicked_cb(void *data, Evas_Object *, void *) {
  editor_redo(_editor(data));
}

void _remove_clicked_cb(void *data, Evas_Object *, void *) {
  editor_remove_area(_editor(data));
}

Evas_Object *_tool_add(image_editor *editor, Evas_Object *row, const char *icon, const char *text,
                       Evas_Smart_Cb clicked) {
  Evas_Object *tool =
      tavro_button_add(row, "tavro_tool", tavro_text(text),
                       tavro_icon_add(row, (icon + std::string("/on")).c_str()), nullptr, clicked, editor);
  evas_object_size_hint_weight_set(tool, EVAS_HINT_EXPAND, EVAS_HINT_EXPAND);
  evas_object_size_hint_align_set(tool, EVAS_HINT_FILL, EVAS_HINT_FILL);
  elm_box_pack_end(row, tool);
  return tool;
}

bool _has_chosen(const image_editor *editor) {
  return editor->chosen >= 0 && static_cast<size_t>(editor->chosen) < editor->edit.areas.size();
}

void _step_shown(image_editor *editor) {
  editor->edit = editor->steps.now();
  editor->chosen = -1;
  editor_show(editor);
}

// ---- For a screen reader ----

std::string _place_of(int x, int y, int width, int height) {
  const TavroGText text(g_strdup_printf(tavro_text("IDS_OB_BODY_AREA_AT_PD_PD_PD_PD"), x, y, width, height));
  return text.get();
}

void _describe(const image_editor *editor, const std::string &name, const std::string &description) {
  elm_atspi_accessible_name_set(editor->stage, name.c_str());
  elm_atspi_accessible_description_set(editor->stage, description.c_str());
}

void _describe_stage(const image_editor *editor) {
  if (editor->tool == EDITOR_BOX) {
    const ie::CRect &box = editor->edit.box;
    const std::string place = _place_of(box.Left(), box.Top(), box.Width(), box.Height());
    return _describe(editor, tavro_text("IDS_OB_BODY_SELECTED_AREA"),
                     place + " " + tavro_text("IDS_OB_BODY_AREA_KEYS"));
  }
  if (!_has_chosen(editor))
    return _describe(editor, tavro_text("IDS_OB_BODY_NO_HIDDEN_AREA_CHOSEN"),
                     tavro_text("IDS_OB_BODY_NO_HIDDEN_AREA_KEYS"));
  const tavro_hidden_area &area = editor->edit.areas[static_cast<size_t>(editor->chosen)];
  const TavroGText name(g_strdup_printf(tavro_text("IDS_OB_BODY_HIDDEN_AREA_PD_OF_PD"), editor->chosen + 1,
                                        static_cast<int>(editor->edit.areas.size())));
  _describe(editor, name.get(),
            _place_of(area.x, area.y, area.width, area.height) + " " + tavro_text("IDS_OB_BODY_AREA_KEYS") +
                " " + tavro_text("IDS_OB_BODY_HIDDEN_AREA_KEYS"));
}

}  // namespace

void editor_tools_build(image_editor *editor) {
  Evas_Object *row = elm_box_add(editor->ad->crop_layout);
  elm_box_horizontal_set(row, EINA_TRUE);
  elm_box_homogeneous_set(row, EINA_TRUE);
  evas_object_size_hint_min_set(row, 0, static_cast<int>(kFootUnits * elm_config_scale_get()));
  const char *box = editor->is_screenshot ? "IDS_OB_BUTTON_SELECT_AREA" : "IDS_OB_BUTTON_CROP";
  editor->tools[EDITOR_BOX] = _tool_add(editor, row, "crop", box, _box_clicked_cb);
  editor->tools[EDITOR_HIDE] = _tool_add(editor, row, "hide", "IDS_OB_BUTTON_HIDE", _hide_clicked_cb);
  editor->tools[EDITOR_BLUR] = _tool_add(editor, row, "blur", "IDS_OB_BUTTON_BLUR", _blur_clicked_cb);
  editor->remove = _tool_add(editor, row, "trash", "IDS_OB_BUTTON_DELETE", _remove_clicked_cb);
  editor->undo = _tool_add(editor, row, "undo", "IDS_OB_BUTTON_UNDO", _undo_clicked_cb);
  editor->redo = _tool_add(editor, row, "redo", "IDS_OB_BUTTON_REDO", _redo_clicked_cb);
  evas_object_show(row);
  elm_object_part_content_set(editor->ad->crop_layout, "tavro.swallow.tools", row);
}

void editor_tools_show(image_editor *editor) {
  const bool is_ready = editor->picture && !editor_is_busy(editor);
  elm_object_disabled_set(editor->done, !is_ready);
  elm_object_disabled_set(editor->stage, !is_ready);
  elm_object_disabled_set(editor->undo, !is_ready || !editor->steps.can_undo());
  elm_object_disabled_set(editor->redo, !is_ready || !editor->steps.can_redo());
  elm_object_disabled_set(editor->remove, !is_ready || editor->tool == EDITOR_BOX || !_has_chosen(editor));
  for (int tool = 0; tool < EDITOR_TOOLS; ++tool) {
    const bool is_used = editor->tool == tool;
    elm_object_disabled_set(editor->tools[tool], !is_ready);
    if (is_ready)
      elm_object_signal_emit(editor->tools[tool], is_used ? "tavro,used" : "tavro,unused", "tavro");
    elm_atspi_accessible_description_set(editor->tools[tool],
                                         is_used ? tavro_text("IDS_OB_BODY_TOOL_IN_USE") : "");
  }
  if (is_ready) _describe_stage(editor);
}

void editor_use(image_editor *editor, editor_tool tool) {
  if (!editor->picture || editor_is_busy(editor)) return;
  editor->tool = tool;
  editor->chosen = -1;
  if (tool != EDITOR_BOX && editor->edit.areas.empty())
    editor_hint(editor, "IDS_OB_TPOP_DRAW_OVER_WHAT_TO_HIDE");
  editor_show(editor);
}

void editor_hint(image_editor *editor, const char *text) {
  tavro_layout_text_set(editor->ad->crop_layout, "tavro.text.hint", tavro_text(text));
  elm_object_signal_emit(editor->ad->crop_layout, "tavro,hint", "tavro");
}

void editor_undo(image_editor *editor) {
  editor->steps.undo();
  _step_shown(editor);
}

void editor_redo(image_editor *editor) {
  editor->steps.redo();
  _step_shown(editor);
}

void editor_remove_area(image_editor *editor) {
  if (!_has_chosen(editor) || editor->tool == EDITOR_BOX) return;
  editor->edit.areas.erase(editor->edit.areas.begin() + editor->chosen);
  editor->chosen = -1;
  editor_commit(editor);
}
