// The editor's work on pixels, for a worker thread: what is shown on the screen, and the file that is made at
// the end. Plain values; blocks for as long as disk and codecs take.
#pragma once

#include <memory>
#include <string>

#include "tavro_image_editor_steps.h"

struct tavro_edit_picture {
  std::string path;
  bool is_screenshot;  // its part below the status bar is kept, at one size
  tavro_pixels pixels;
  tavro_pixels shown;  // a miniature to be looked at, without what was done to it
};

// Decode the picture; its miniature is about as large as it can be seen in a window of this size.
tavro_image_fault tavro_edit_load(const std::string &path, bool is_screenshot, int width, int height,
                                  tavro_edit_picture *picture);

// The box and areas that a picture begins with.
tavro_edit tavro_edit_start(const tavro_edit_picture &picture);

// Overwrite in a miniature what the edit hides.
void tavro_edit_hide_in(tavro_pixels &miniature, const tavro_edit_picture &picture, const tavro_edit &edit);

// Whether a box lies elsewhere than it began.
bool tavro_edit_is_box_moved(const tavro_edit_picture &picture, const tavro_edit &edit);

// Make the blurred areas of a miniature stand out: one of an even ground looks like nothing.
void tavro_edit_outline_in(tavro_pixels &miniature, const tavro_edit_picture &picture, const tavro_edit &edit,
                           int thickness);

// Write a new file in the folder of generated files with all that the edit hides burnt in: of a screenshot
// what is sent of it, with the outline of a box that was moved; otherwise the box. The picture stays as it
// is. Returns the path; empty, with a log line, when it cannot be written.
std::string tavro_edit_save(const tavro_edit_picture &picture, const tavro_edit &edit);

// The box of a screenshot in pixels of the file that was saved.
ie::CRect tavro_edit_saved_box(const tavro_edit_picture &picture, const tavro_edit &edit);

// Remove a file of the client's own, unless a stored report or an unfinished one names it, and tell the media
// database so. Main loop only.
void tavro_edit_remove_file(const std::string &path);
