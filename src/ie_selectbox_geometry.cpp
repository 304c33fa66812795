#include "ie_selectbox_geometry.h"

#include <algorithm>
#include <cstdint>

namespace {

using ie::CRect;

bool _holds_left(ie_grasp grasp) {
  return grasp == IE_GRASP_LEFT || grasp == IE_GRASP_TOP_LEFT || grasp == IE_GRASP_BOTTOM_LEFT;
}

bool _holds_right(ie_grasp grasp) {
  return grasp == IE_GRASP_RIGHT || grasp == IE_GRASP_TOP_RIGHT || grasp == IE_GRASP_BOTTOM_RIGHT;
}

bool _holds_top(ie_grasp grasp) {
  return grasp == IE_GRASP_TOP || grasp == IE_GRASP_TOP_LEFT || grasp == IE_GRASP_TOP_RIGHT;
}

bool _holds_bottom(ie_grasp grasp) {
  return grasp == IE_GRASP_BOTTOM || grasp == IE_GRASP_BOTTOM_LEFT || grasp == IE_GRASP_BOTTOM_RIGHT;
}

bool _is_corner(ie_grasp grasp) {
  return grasp >= IE_GRASP_TOP_LEFT;
}

bool _has_ratio(const ie_box_rules &rules) {
  return rules.numerator > 0 && rules.denominator > 0;
}

int _scaled(int length, int by, int per) {
  return static_cast<int>((static_cast<int64_t>(length) * by + per / 2) / per);
}

// The start of a box of this length within the area; at its start when it does not fit.
int _within(int start, int length, int low, int high) {
  return std::max(low, std::min(start, high - length));
}

CRect _moved(const CRect &box, int dx, int dy, const CRect &area) {
  CRect moved = box;
  moved.MoveTo(_within(box.Left() + dx, box.Width(), area.Left(), area.Right()),
               _within(box.Top() + dy, box.Height(), area.Top(), area.Bottom()));
  return moved;
}

CRect _resized(const CRect &box, ie_grasp grasp, int dx, int dy, const ie_box_rules &rules) {
  CRect resized = box;
  const CRect &area = rules.area;
  const int least = rules.minimum;
  if (_holds_left(grasp)) resized.Left(std::max(std::min(box.Left() + dx, box.Right() - least), area.Left()));
  if (_holds_right(grasp))
    resized.Right(std::min(std::max(box.Right() + dx, box.Left() + least), area.Right()));
  if (_holds_top(grasp)) resized.Top(std::max(std::min(box.Top() + dy, box.Bottom() - least), area.Top()));
  if (_holds_bottom(grasp))
    resized.Bottom(std::min(std::max(box.Bottom() + dy, box.Top() + least), area.Bottom()));
  return resized;
}

// The largest width whose height, rounded, is not above this one.
int _width_for(int height, const ie_box_rules &rules) {
  return static_cast<int>(((2 * static_cast<int64_t>(height) + 1) * rules.numerator - 1) /
                          (2 * static_cast<int64_t>(rules.denominator)));
}

// A width that has room, with the height that the ratio gives it.
int _width_of_ratio(int width, int room_x, int room_y, const ie_box_rules &rules) {
  const int least = std::max(rules.minimum, _width_for(rules.minimum - 1, rules) + 1);
  return std::max(1, std::min({std::max(width, least), room_x, _width_for(room_y, rules)}));
}

// The opposite corner stays; the way of the finger that changes the box more decides its size.
CRect _resized_in_ratio(const CRect &box, ie_grasp grasp, int dx, int dy, const ie_box_rules &rules) {
  const CRect &area = rules.area;
  const bool is_left = _holds_left(grasp), is_top = _holds_top(grasp);
  const int by_x = is_left ? -dx : dx;
  const int by_y = _scaled(is_top ? -dy : dy, rules.numerator, rules.denominator);
  const int wanted = box.Width() + (std::abs(by_x) >= std::abs(by_y) ? by_x : by_y);
  const int width = _width_of_ratio(wanted, is_left ? box.Right() - area.Left() : area.Right() - box.Left(),
                                    is_top ? box.Bottom() - area.Top() : area.Bottom() - box.Top(), rules);
  const int height = _scaled(width, rules.denominator, rules.numerator);
  CRect resized(0, 0, width, height);
  resized.MoveTo(is_left ? box.Right() - width : box.Left(), is_top ? box.Bottom() - height : box.Top());
  return resized;
}

}  // namespace

ie_grasp ie_grasp_at(const ie::CRect &box, int half, int x, int y) {
  const int right = box.Width() / 2, down = box.Height() / 2;
  const struct {
    ie_grasp grasp;
    int dx, dy;  // from the handle before
  } way[] = {{IE_GRASP_TOP_LEFT, 0, 0},         {IE_GRASP_TOP, right, 0},
             {IE_GRASP_TOP_RIGHT, right, 0},    {IE_GRASP_RIGHT, 0, down},
             {IE_GRASP_BOTTOM_RIGHT, 0, down},  {IE_GRASP_BOTTOM, -right, 0},
             {IE_GRASP_BOTTOM_LEFT, -right, 0}, {IE_GRASP_LEFT, 0, -down}};
  CRect handle(box.Left() - half, box.Top() - half, box.Left() + half, box.Top() + half);
  for (const auto &step : way) {
    handle.MoveBy(step.dx, step.dy);
    if (handle.PtInRect(x, y)) return step.grasp;
  }
  return box.PtInRect(x, y) ? IE_GRASP_CENTER : IE_GRASP_NONE;
}

ie::CRect ie_allowed_area(const ie::CRect &image, const ie::CRect &view) {
  const auto at_least_0 = [](int edge) { return edge < 1 ? 0 : edge; };
  return {at_least_0(std::max(image.Left(), view.Left())), at_least_0(std::max(image.Top(), view.Top())),
          at_least_0(std::min(image.Right(), view.Right())),
          at_least_0(std::min(image.Bottom(), view.Bottom()))};
}

ie::CRect ie_box_dragged(const ie::CRect &box, ie_grasp grasp, int dx, int dy, const ie_box_rules &rules) {
  if (grasp == IE_GRASP_NONE) return box;
  const bool is_move = grasp == IE_GRASP_CENTER || (_has_ratio(rules) && !_is_corner(grasp));
  if (is_move) return _moved(box, dx, dy, rules.area);
  return _has_ratio(rules) ? _resized_in_ratio(box, grasp, dx, dy, rules)
                           : _resized(box, grasp, dx, dy, rules);
}

ie::CRect ie_box_fitted(const ie::CRect &box, const ie_box_rules &rules) {
  const CRect &area = rules.area;
  int width = std::min(std::max(box.Width(), rules.minimum), area.Width());
  int height = std::min(std::max(box.Height(), rules.minimum), area.Height());
  if (_has_ratio(rules)) {
    width = _width_of_ratio(width, area.Width(), std::min(height, area.Height()), rules);
    height = _scaled(width, rules.denominator, rules.numerator);
  }
  const int middle_x = box.Left() + box.Width() / 2, middle_y = box.Top() + box.Height() / 2;
  CRect fitted(0, 0, width, height);
  fitted.MoveTo(_within(middle_x - width / 2, width, area.Left(), area.Right()),
                _within(middle_y - height / 2, height, area.Top(), area.Bottom()));
  return fitted;
}
