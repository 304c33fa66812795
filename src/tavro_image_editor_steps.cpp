#include "tavro_image_editor_steps.h"

#include <algorithm>
#include <cmath>
#include <cstdint>

namespace {

bool _is_same(const ie::CRect &left, const ie::CRect &right) {
  return left.Left() == right.Left() && left.Top() == right.Top() && left.Right() == right.Right() &&
         left.Bottom() == right.Bottom();
}

bool _is_same(const tavro_hidden_area &left, const tavro_hidden_area &right) {
  return left.x == right.x && left.y == right.y && left.width == right.width && left.height == right.height &&
         left.way == right.way;
}

int _scaled(int length, int to, int from) {
  return from > 0 ? static_cast<int>(std::lround(static_cast<double>(length) * to / from)) : 0;
}

int _scaled_down(int length, int to, int from) {
  return from > 0 ? static_cast<int>(static_cast<int64_t>(length) * to / from) : 0;
}

int _scaled_up(int length, int to, int from) {
  return from > 0 ? static_cast<int>((static_cast<int64_t>(length) * to + from - 1) / from) : 0;
}

}  // namespace

bool operator==(const tavro_edit &left, const tavro_edit &right) {
  return _is_same(left.box, right.box) &&
         std::equal(left.areas.begin(), left.areas.end(), right.areas.begin(), right.areas.end(),
                    [](const auto &one, const auto &other) { return _is_same(one, other); });
}

void tavro_edit_steps::add(const tavro_edit &edit, bool goes_on) {
  if (edit == now()) return;
  edits_.resize(place_ + 1);
  if (goes_on && is_open_) {
    edits_.back() = edit;
    return;
  }
  is_open_ = goes_on;
  edits_.push_back(edit);
  if (edits_.size() > kMostSteps + 1) {
    edits_.erase(edits_.begin());
    is_start_gone_ = true;
  }
  place_ = edits_.size() - 1;
}

void tavro_edit_steps::undo() {
  is_open_ = false;
  if (can_undo()) --place_;
}

void tavro_edit_steps::redo() {
  is_open_ = false;
  if (can_redo()) ++place_;
}

bool tavro_edit_steps::is_changed() const {
  return is_start_gone_ || !(now() == edits_.front());
}

int tavro_edit_area_at(const tavro_edit &edit, int x, int y) {
  for (size_t i = edit.areas.size(); i-- > 0;) {
    const tavro_hidden_area &area = edit.areas[i];
    if (x >= area.x && x < area.x + area.width && y >= area.y && y < area.y + area.height)
      return static_cast<int>(i);
  }
  return -1;
}

ie::CRect tavro_edit_to_screen(const ie::CRect &rect, const ie::CPoint &size, const ie::CRect &shown) {
  return {shown.Left() + _scaled(rect.Left(), shown.Width(), size.X()),
          shown.Top() + _scaled(rect.Top(), shown.Height(), size.Y()),
          shown.Left() + _scaled(rect.Right(), shown.Width(), size.X()),
          shown.Top() + _scaled(rect.Bottom(), shown.Height(), size.Y())};
}

ie::CRect tavro_edit_to_picture(const ie::CRect &rect, const ie::CPoint &size, const ie::CRect &shown) {
  const auto clamp = [](int value, int most) { return std::clamp(value, 0, most); };
  return {clamp(_scaled_down(rect.Left() - shown.Left(), size.X(), shown.Width()), size.X()),
          clamp(_scaled_down(rect.Top() - shown.Top(), size.Y(), shown.Height()), size.Y()),
          clamp(_scaled_up(rect.Right() - shown.Left(), size.X(), shown.Width()), size.X()),
          clamp(_scaled_up(rect.Bottom() - shown.Top(), size.Y(), shown.Height()), size.Y())};
}

ie::CRect tavro_edit_redrawn(const ie::CRect &rect, const ie::CRect &drawn, const ie::CPoint &size,
                             const ie::CRect &shown) {
  const ie::CRect before = tavro_edit_to_screen(rect, size, shown);
  ie::CRect now = tavro_edit_to_picture(drawn, size, shown);
  if (drawn.Left() == before.Left()) now.Left(rect.Left());
  if (drawn.Top() == before.Top()) now.Top(rect.Top());
  if (drawn.Width() == before.Width() && drawn.Height() == before.Height()) {
    const int left = std::min(now.Left(), size.X() - rect.Width());
    const int top = std::min(now.Top(), size.Y() - rect.Height());
    return {left, top, left + rect.Width(), top + rect.Height()};
  }
  if (drawn.Right() == before.Right()) now.Right(rect.Right());
  if (drawn.Bottom() == before.Bottom()) now.Bottom(rect.Bottom());
  return now;
}
