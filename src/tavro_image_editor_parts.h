// The parts of the image editor's page among themselves. Main loop only. There is one editor at most; it
// lives as long as its page.
#pragma once

#include <Elementary.h>

#include <memory>
#include <string>

#include "ie_selectbox.h"
#include "tavro_image_editor_steps.h"
#include "tavro_image_editor_work.h"

struct appdata;
struct editor_job;

enum editor_tool {
  EDITOR_BOX,  // the crop box is moved and resized
  EDITOR_HIDE,
  EDITOR_BLUR,  // areas are drawn, chosen, moved and resized
  EDITOR_TOOLS,
};

// Fields of the page that appdata names are there: crop_layout, main_image, select_box.
struct image_editor {
  image_editor(appdata *of, const char *edited, bool is_of_screen)
      : ad(of), is_screenshot(is_of_screen), path(edited) {}

  appdata *ad;
  bool is_screenshot;
  std::string path;
  Evas_Object *report = nullptr;  // the compose screen's page that it was opened for; null once that is gone
  Elm_Object_Item *item = nullptr;
  Evas_Object *done = nullptr, *stage = nullptr;
  Evas_Object *area_box = nullptr;  // around the chosen area; null until the picture is there
  Evas_Object *tools[EDITOR_TOOLS] = {};
  Evas_Object *undo = nullptr, *redo = nullptr, *remove = nullptr;

  std::shared_ptr<const tavro_edit_picture> picture;  // null until it is there; a worker may read it too
  tavro_edit_steps steps;
  tavro_edit edit;  // the last step, or what a touch is making of it
  editor_tool tool = EDITOR_BOX;
  int chosen = -1;  // of edit.areas

  bool is_touched = false, is_drawing = false;  // a finger is on the picture, and draws an area
  int touched_x = 0, touched_y = 0;
  Ecore_Job *repaint = nullptr, *leave = nullptr;
  editor_job *job = nullptr;  // of a worker; nothing can be changed meanwhile
  bool may_leave = false;     // whatever was changed
  bool is_leaving = false;    // the page is on its way out: nothing can be done to it any more
};

// ---- The page (tavro_image_editor.cpp) ----

// Leave without asking; what was changed is lost.
void editor_leave(image_editor *editor);
// A popup with an OK button: `title` is a string id, `body` a text.
void editor_say(appdata *ad, const char *title, const char *body);

// ---- Work on a thread (tavro_image_editor_job.cpp) ----

void editor_load(image_editor *editor);
void editor_done(image_editor *editor);
bool editor_is_busy(const image_editor *editor);
// Nothing can be changed while a text (by string id) is shown; null: it is over.
void editor_show_busy(image_editor *editor, const char *text);
// The page is going: work that still goes on ends by itself and changes nothing.
void editor_work_forget(image_editor *editor);

// ---- The attachment (tavro_image_editor_attach.cpp) ----

// The file that was saved of the picture goes to the attachments of the open compose screen; whether it is
// there. When it is refused, the person has been told why, and the file is removed.
bool editor_attach_saved(appdata *ad, const tavro_edit_picture &picture, const tavro_edit &edit,
                         const std::string &path);

// The file of a screenshot goes, unless it is needed elsewhere, and is none that was captured any more.
void editor_drop_screenshot(appdata *ad, const std::string &path);

// ---- Picture, box and areas (tavro_image_editor_canvas.cpp) ----

// The picture is there.
void editor_canvas_build(image_editor *editor);
void editor_canvas_end(image_editor *editor);
// Show `edit` and what is chosen as they are now.
void editor_show(image_editor *editor);
// What a touch or a key has made of `edit` is a step. `goes_on`: keys that repeat make one step.
void editor_commit(image_editor *editor, bool goes_on = false);
// Move or resize what is chosen by this many pixels of the screen.
void editor_drag(image_editor *editor, ie_grasp grasp, int dx, int dy);
void editor_add_area(image_editor *editor);  // in the middle of the picture
void editor_choose(image_editor *editor, int area);

// ---- Tools (tavro_image_editor_tools.cpp) ----

void editor_tools_build(image_editor *editor);
// Show which can be used, and tell a screen reader what is chosen.
void editor_tools_show(image_editor *editor);
void editor_use(image_editor *editor, editor_tool tool);
// Say for a moment what can be done, by string id: in the page, where no button is covered.
void editor_hint(image_editor *editor, const char *text);
void editor_undo(image_editor *editor);
void editor_redo(image_editor *editor);
void editor_remove_area(image_editor *editor);

// ---- Keys (tavro_image_editor_keys.cpp) ----

void editor_keys_listen(image_editor *editor);
