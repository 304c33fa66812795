// How a crop box answers to a touch: which part of it the touch holds, and where its sides go. Plain values,
// in pixels of the canvas; any thread.
#pragma once

#include "ie_geometry.h"

enum ie_grasp {
  IE_GRASP_NONE = 0,
  IE_GRASP_CENTER = 1,
  IE_GRASP_TOP = 2,
  IE_GRASP_LEFT = 3,
  IE_GRASP_RIGHT = 4,
  IE_GRASP_BOTTOM = 5,
  IE_GRASP_TOP_LEFT = 6,
  IE_GRASP_TOP_RIGHT = 7,
  IE_GRASP_BOTTOM_LEFT = 8,
  IE_GRASP_BOTTOM_RIGHT = 9,
};

// A handle is a square of twice `half` around its point of the outline. Where squares overlap, the corner
// counts that comes first on the way round from the top left one.
ie_grasp ie_grasp_at(const ie::CRect &box, int half, int x, int y);

// Where a box over this picture may be: what can be seen of it. Coordinates below 1 count as 0.
ie::CRect ie_allowed_area(const ie::CRect &image, const ie::CRect &view);

struct ie_box_rules {
  ie::CRect area;
  int minimum;        // of width and height; gives way to the area
  int numerator = 0;  // of the fixed ratio of width to height; 0: none
  int denominator = 0;
};

// The box after the touch that holds it has moved. With a fixed ratio the middle of an edge moves the whole
// box.
ie::CRect ie_box_dragged(const ie::CRect &box, ie_grasp grasp, int dx, int dy, const ie_box_rules &rules);

// The box brought under the rules: of the ratio and within the area, around the same middle as far as it can.
ie::CRect ie_box_fitted(const ie::CRect &box, const ie_box_rules &rules);
