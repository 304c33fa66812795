// The editor's work on pixels that goes on while its page is there: loading the picture, saving what was made
// of it.
#include "tavro-common.h"
#include "tavro-main.h"
#include "tavro_compose.h"
#include "tavro_compose_strip.h"
#include "tavro_image_editor_parts.h"
#include "tavro_widgets.h"

// Work on a thread; `editor` is the main loop's, null once the page is gone.
struct editor_job {
  image_editor *editor;
  Ecore_Thread *thread;
  std::shared_ptr<tavro_edit_picture> loaded;        // by loading
  std::shared_ptr<const tavro_edit_picture> edited;  // to be saved
  tavro_edit edit;
  std::string path;  // to load; saved
  bool is_screenshot;
  int width, height;  // of the window
  tavro_image_fault fault;
};

namespace {

void _run(image_editor *editor, std::unique_ptr<editor_job> job, const char *text, Ecore_Thread_Cb work,
          Ecore_Thread_Cb ended) {
  job->editor = editor;
  editor->job = job.get();
  editor_show_busy(editor, text);
  editor_job *running = job.release();
  Ecore_Thread *thread = ecore_thread_run(work, ended, ended, running);
  if (thread) running->thread = thread;
}

void _load(void *data, Ecore_Thread *) {
  auto *job = static_cast<editor_job *>(data);
  job->fault = tavro_edit_load(job->path, job->is_screenshot, job->width, job->height, job->loaded.get());
}

void _loaded_cb(void *data, Ecore_Thread *) {
  const std::unique_ptr<editor_job> job(static_cast<editor_job *>(data));
  image_editor *editor = job->editor;
  if (!editor) return;
  editor->job = nullptr;
  if (editor->is_leaving) return;
  if (job->fault != TAVRO_IMAGE_GOOD) {
    appdata *ad = editor->ad;
    editor_leave(editor);
    return editor_say(ad, "IDS_OB_HEADER_CANNOT_BE_OPENED", tavro_text(tavro_image_fault_text(job->fault)));
  }
  editor->picture = job->loaded;
  editor->steps = tavro_edit_steps(tavro_edit_start(*editor->picture));
  editor->edit = editor->steps.now();
  editor_canvas_build(editor);
  editor_show_busy(editor, nullptr);
  elm_object_focus_set(editor->stage, EINA_TRUE);
}

void _save(void *data, Ecore_Thread *) {
  auto *job = static_cast<editor_job *>(data);
  job->path = tavro_edit_save(*job->edited, job->edit);
}

void _saved_cb(void *data, Ecore_Thread *) {
  const std::unique_ptr<editor_job> job(static_cast<editor_job *>(data));
  image_editor *editor = job->editor;
  if (editor) editor->job = nullptr;
  if (!editor || editor->is_leaving) {
    if (!job->path.empty()) tavro_edit_remove_file(job->path);
    return;
  }
  if (job->path.empty()) {
    editor_show_busy(editor, nullptr);
    return editor_say(editor->ad, "IDS_OB_HEADER_PICTURE_NOT_SAVED",
                      tavro_text("IDS_OB_BODY_PICTURE_NOT_SAVED"));
  }
  appdata *ad = editor->ad;
  const compose_view_win *report = tavro_compose_view(ad);
  if (!report || report->layout != editor->report) {
    // Another one may be open by now, which it was not made for.
    tavro_edit_remove_file(job->path);
    editor_leave(editor);
    return editor_say(ad, "IDS_OB_HEADER_PICTURE_NOT_SAVED", tavro_text("IDS_OB_BODY_PICTURE_OF_NO_REPORT"));
  }
  if (!editor_attach_saved(ad, *job->edited, job->edit, job->path)) return editor_show_busy(editor, nullptr);
  editor_leave(editor);
  tavro_compose_strip_focus(ad, job->path.c_str());
}

}  // namespace

void editor_show_busy(image_editor *editor, const char *text) {
  tavro_layout_text_set(editor->ad->crop_layout, "elm.text", text ? tavro_text(text) : "");
  elm_object_signal_emit(editor->ad->crop_layout, text ? "tavro,busy" : "tavro,ready", "tavro");
  editor_tools_show(editor);
}

bool editor_is_busy(const image_editor *editor) {
  return editor->job;
}

void editor_load(image_editor *editor) {
  auto job = std::make_unique<editor_job>();
  job->path = editor->path;
  job->is_screenshot = editor->is_screenshot;
  job->loaded = std::make_shared<tavro_edit_picture>();
  evas_object_geometry_get(editor->ad->win, nullptr, nullptr, &job->width, &job->height);
  _run(editor, std::move(job), "IDS_OB_BODY_OPENING_PICTURE", _load, _loaded_cb);
}

void editor_done(image_editor *editor) {
  if (!editor->picture || editor->job) return;
  auto job = std::make_unique<editor_job>();
  job->edited = editor->picture;
  job->edit = editor->edit;
  job->is_screenshot = editor->is_screenshot;
  _run(editor, std::move(job), "IDS_OB_BODY_SAVING_PICTURE", _save, _saved_cb);
}

void editor_work_forget(image_editor *editor) {
  if (!editor->job) return;
  editor->job->editor = nullptr;
  ecore_thread_cancel(editor->job->thread);  // may end it at once, and then frees the job
}
