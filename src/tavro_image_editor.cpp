// The editor's page: opening and leaving.
#include "tavro_image_editor.h"

#include <elm_atspi.h>
#include <unistd.h>

#include "tavro-common.h"
#include "tavro-main.h"
#include "tavro_autosave.h"
#include "tavro_compose.h"
#include "tavro_deleted_files.h"
#include "tavro_image_editor_parts.h"
#include "tavro_log.h"
#include "tavro_memory.h"
#include "tavro_theme.h"
#include "tavro_widgets.h"

namespace {

image_editor *_open = nullptr;

std::string _layout_file() {
  const std::string theme = tavro_theme_file();
  return theme.substr(0, theme.rfind('/') + 1) + "tavro_image_editor.edj";
}

// ---- Leaving ----

// The report goes, and this page with it. Who takes several pages away may be about to take this one.
void _leave_cb(void *data) {
  auto *editor = static_cast<image_editor *>(data);
  editor->leave = nullptr;
  editor_leave(editor);
}

void _report_deleted_cb(void *data, Evas *, Evas_Object *, void *) {
  auto *editor = static_cast<image_editor *>(data);
  editor->report = nullptr;
  editor->may_leave = true;
  if (!editor->leave) editor->leave = ecore_job_add(_leave_cb, editor);
}

void _discard(appdata *) {
  if (_open) editor_leave(_open);
}

Eina_Bool _pop_cb(void *data, Elm_Object_Item *) {
  auto *editor = static_cast<image_editor *>(data);
  if (editor->may_leave || !editor->steps.is_changed()) {
    editor->is_leaving = true;
    return EINA_TRUE;
  }
  tavro_popup_show(
      editor->ad, &editor->ad->imgedit_popup, tavro_text("IDS_OB_HEADER_DISCARD_EDITS"),
      tavro_text("IDS_OB_BODY_DISCARD_EDITS"),
      {{tavro_text("IDS_OB_BUTTON_KEEP_EDITING"), nullptr}, {tavro_text("IDS_OB_BUTTON_DISCARD"), _discard}});
  return EINA_FALSE;
}

void _cancel_clicked_cb(void *data, Evas_Object *, void *) {
  elm_naviframe_item_pop(static_cast<image_editor *>(data)->ad->nf);
}

void _shown_cb(void *data, Evas_Object *nf, void *);

void _forget_page(appdata *ad) {
  ad->crop_layout = ad->main_image = ad->select_box = nullptr;
  TAVRO_FREE(ad->main_image_file);
}

void _page_deleted_cb(void *data, Evas *, Evas_Object *, void *) {
  const std::unique_ptr<image_editor> editor(static_cast<image_editor *>(data));
  _open = nullptr;
  tavro_autosave_set_screenshot("");
  if (editor->leave) ecore_job_del(editor->leave);
  if (editor->report)
    evas_object_event_callback_del_full(editor->report, EVAS_CALLBACK_DEL, _report_deleted_cb, editor.get());
  editor_canvas_end(editor.get());
  if (editor->ad->nf)
    evas_object_smart_callback_del_full(editor->ad->nf, "transition,finished", _shown_cb, editor.get());
  editor_work_forget(editor.get());
  if (editor->is_screenshot) editor_drop_screenshot(editor->ad, editor->path);
  _forget_page(editor->ad);
}

// ---- Building ----

void _done_clicked_cb(void *data, Evas_Object *, void *) {
  editor_done(static_cast<image_editor *>(data));
}

// Of keys and screen readers; touches are the picture's.
void _stage_clicked_cb(void *data, Evas_Object *, void *) {
  auto *editor = static_cast<image_editor *>(data);
  if (editor->picture && editor->tool != EDITOR_BOX && !editor_is_busy(editor)) editor_add_area(editor);
}

Evas_Object *_part_add(image_editor *editor, const char *part, const char *style, const char *text,
                       Evas_Smart_Cb clicked) {
  Evas_Object *page = editor->ad->crop_layout;
  Evas_Object *button = tavro_button_add(page, style, text, nullptr, nullptr, clicked, editor);
  elm_object_part_content_set(page, part, button);
  return button;
}

void _build(image_editor *editor, const char *title) {
  appdata *ad = editor->ad;
  ad->crop_layout = elm_layout_add(ad->nf);
  elm_layout_file_set(ad->crop_layout, _layout_file().c_str(), "iv-edit-crop");
  evas_object_size_hint_weight_set(ad->crop_layout, EVAS_HINT_EXPAND, EVAS_HINT_EXPAND);
  evas_object_show(ad->crop_layout);
  evas_object_event_callback_add(ad->crop_layout, EVAS_CALLBACK_DEL, _page_deleted_cb, editor);
  elm_object_part_text_set(ad->crop_layout, "elm.text.title", title);
  _part_add(editor, "tavro.swallow.start", "tavro_editor_text", tavro_text("IDS_OB_ACBUTTON_CANCEL3"),
            _cancel_clicked_cb);
  editor->done = _part_add(editor, "tavro.swallow.end", "tavro_editor_text",
                           tavro_text("IDS_OB_ACBUTTON_DONE_ABB3"), _done_clicked_cb);
  editor->stage = _part_add(editor, "tavro.swallow.stage", "tavro_editor_stage", nullptr, _stage_clicked_cb);
  elm_object_part_content_set(ad->crop_layout, "tavro.swallow.busy",
                              tavro_tile_add(ad->crop_layout, "spinner"));
  editor_tools_build(editor);
  editor_keys_listen(editor);
}

void _shown_cb(void *data, Evas_Object *nf, void *) {
  evas_object_smart_callback_del_full(nf, "transition,finished", _shown_cb, data);
  editor_load(static_cast<image_editor *>(data));
}

// A page that comes up cannot be left yet, which a picture that is no good asks for: it is opened after that.
void _start(image_editor *editor) {
  appdata *ad = editor->ad;
  const char *title = tavro_text("IDS_OB_HEADER_SELECT_AREA");
  _build(editor, title);
  editor_show_busy(editor, "IDS_OB_BODY_OPENING_PICTURE");
  evas_object_smart_callback_add(ad->nf, "transition,finished", _shown_cb, editor);
  editor->item = tavro_page_push(ad, ad->crop_layout, title);
  elm_naviframe_item_pop_cb_set(editor->item, _pop_cb, editor);
  editor_hint(editor, editor->is_screenshot
                          ? "IDS_OB_TPOP_MOVE_OR_RESIZE_THE_BOX_TO_HIGHLIGHT_THE_PROBLEM_AREA"
                          : "IDS_OB_TPOP_MOVE_OR_RESIZE_THE_BOX_TO_CROP");
}

void _launch(appdata *ad, const char *path, bool is_screenshot) {
  if (_open || !ad->nf || !tavro_compose_view(ad)) {
    TAVRO_LOGE("no editor for %s: there is no screen to attach it to, or another one is open", path);
    if (is_screenshot && !(_open && _open->path == path)) editor_drop_screenshot(ad, path);
    return;
  }
  if (access(path, R_OK) != 0)
    return editor_say(ad, "IDS_OB_HEADER_CANNOT_BE_OPENED", "Media file not available");
  // Nothing is hidden in it yet: should the client be killed, it goes at the next start.
  if (is_screenshot) tavro_deleted_files_note_copies({}, {path});
  if (is_screenshot) tavro_autosave_set_screenshot(path);
  _open = new image_editor(ad, path, is_screenshot);
  _open->report = tavro_compose_view(ad)->layout;
  evas_object_event_callback_add(_open->report, EVAS_CALLBACK_DEL, _report_deleted_cb, _open);
  ad->main_image_file = TAVRO_STRDUP(path);
  _start(_open);
}

}  // namespace

void editor_say(appdata *ad, const char *title, const char *body) {
  tavro_popup_show(ad, &ad->imgedit_popup, tavro_text(title), body,
                   {{tavro_text("IDS_OB_BUTTON_OK"), nullptr}});
}

void editor_leave(image_editor *editor) {
  if (editor->is_leaving) return;
  editor->may_leave = editor->is_leaving = true;
  tavro_autosave_set_screenshot("");
  if (editor->ad->imgedit_popup) evas_object_del(editor->ad->imgedit_popup);  // a question that is answered
  Evas_Object *nf = editor->ad->nf;
  tavro_compose_rest(editor->ad);  // "Done" lies over the report's "Send"
  if (elm_naviframe_top_item_get(nf) == editor->item)
    elm_naviframe_item_pop(nf);
  else
    elm_object_item_del(editor->item);
}

Elm_Object_Item *tavro_image_editor_kept_page() {
  const bool is_anything = _open && !_open->is_leaving && (_open->is_screenshot || _open->steps.is_changed());
  return is_anything ? _open->item : nullptr;
}

void tavro_image_editor_close() {
  if (!_open) return;
  _open->may_leave = _open->is_leaving = true;
  elm_object_item_del(_open->item);
}

void tavro_launch_image_editor(const char *path, appdata *ad) {
  _launch(ad, path, true);
}

void tavro_edit_attachment(const char *path, appdata *ad) {
  _launch(ad, path, false);
}
