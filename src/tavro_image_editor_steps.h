// What a person has done to a picture: the box and the hidden areas, in the picture's pixels, and the way
// back. Plain values; any thread.
#pragma once

#include <cstddef>
#include <vector>

#include "ie_geometry.h"
#include "tavro_image.h"

struct tavro_edit {
  ie::CRect box;
  std::vector<tavro_hidden_area> areas;
};
bool operator==(const tavro_edit &left, const tavro_edit &right);

constexpr size_t kMostSteps = 100;  // that can be undone; older ones stay done

class tavro_edit_steps {
 public:
  explicit tavro_edit_steps(const tavro_edit &start = {}) : edits_{start} {}

  const tavro_edit &now() const { return edits_[place_]; }
  // What was undone is forgotten. A step that changes nothing is none. `goes_on`: part of the step before, as
  // long as that was one too: keys that repeat.
  void add(const tavro_edit &edit, bool goes_on = false);
  bool can_undo() const { return place_ > 0; }
  bool can_redo() const { return place_ + 1 < edits_.size(); }
  void undo();
  void redo();
  // Whether anything differs from the start.
  bool is_changed() const;

 private:
  std::vector<tavro_edit> edits_;
  size_t place_ = 0;
  bool is_open_ = false;        // the step before may go on
  bool is_start_gone_ = false;  // pushed out by newer steps
};

// The last area drawn that holds the point; -1: none.
int tavro_edit_area_at(const tavro_edit &edit, int x, int y);

// The rectangle of a picture of `size` pixels as it lies in `shown`, and back; the way back covers every
// pixel that is touched.
ie::CRect tavro_edit_to_screen(const ie::CRect &rect, const ie::CPoint &size, const ie::CRect &shown);
ie::CRect tavro_edit_to_picture(const ie::CRect &rect, const ie::CPoint &size, const ie::CRect &shown);

// What a rectangle of the picture is after it was moved or resized on the screen to `drawn`. What is moved
// keeps its size and a side that stays on the screen stays: rounding would let it grow a little each time.
ie::CRect tavro_edit_redrawn(const ie::CRect &rect, const ie::CRect &drawn, const ie::CPoint &size,
                             const ie::CRect &shown);
