// The crop box's geometry, and what an edit of a picture remembers.
#include <gtest/gtest.h>

#include <ostream>

#include "ie_selectbox_geometry.h"
#include "tavro_image_editor_steps.h"

using ie::CRect;

namespace ie {
bool operator==(const CRect &left, const CRect &right) {
  return left.Left() == right.Left() && left.Top() == right.Top() && left.Right() == right.Right() &&
         left.Bottom() == right.Bottom();
}
std::ostream &operator<<(std::ostream &out, const CRect &rect) {
  return out << rect.Left() << "," << rect.Top() << " " << rect.Right() << "," << rect.Bottom();
}
}  // namespace ie

namespace {

const CRect kArea(0, 100, 700, 1100);
const ie_box_rules kFree{kArea, 50};
const ie_box_rules kTwoToOne{kArea, 50, 2, 1};

}  // namespace

TEST(SelectBox, TouchHoldsTheFirstHandleOnTheWayRoundThatContainsIt) {
  const CRect usual(100, 200, 301, 401);   // odd: its far handles lie one pixel inside
  const CRect narrow(100, 200, 112, 600);  // corner and middle squares overlap
  const struct {
    CRect box;
    int x, y;
    ie_grasp grasp;
  } touches[] = {{usual, 100, 200, IE_GRASP_TOP_LEFT},   {usual, 200, 209, IE_GRASP_TOP},
                 {usual, 309, 191, IE_GRASP_TOP_RIGHT},  {usual, 310, 200, IE_GRASP_NONE},
                 {usual, 300, 300, IE_GRASP_RIGHT},      {usual, 300, 400, IE_GRASP_BOTTOM_RIGHT},
                 {usual, 200, 400, IE_GRASP_BOTTOM},     {usual, 91, 409, IE_GRASP_BOTTOM_LEFT},
                 {usual, 90, 400, IE_GRASP_NONE},        {usual, 100, 300, IE_GRASP_LEFT},
                 {usual, 150, 250, IE_GRASP_CENTER},     {usual, 150, 200, IE_GRASP_NONE},
                 {usual, 150, 201, IE_GRASP_CENTER},     {usual, 20, 20, IE_GRASP_NONE},
                 {narrow, 106, 200, IE_GRASP_TOP_LEFT},  {narrow, 111, 200, IE_GRASP_TOP},
                 {narrow, 116, 200, IE_GRASP_TOP_RIGHT}, {narrow, 106, 600, IE_GRASP_BOTTOM_RIGHT},
                 {narrow, 106, 300, IE_GRASP_CENTER}};
  for (const auto &touch : touches)
    EXPECT_EQ(ie_grasp_at(touch.box, 10, touch.x, touch.y), touch.grasp) << touch.x << "," << touch.y;
}

TEST(SelectBox, DragMovesWhatIsHeldWithinAreaAndMinimum) {
  const CRect box(100, 200, 300, 400);
  const struct {
    ie_grasp grasp;
    int dx, dy;
    ie_box_rules rules;
    CRect after;
  } drags[] = {
      {IE_GRASP_NONE, 9, 9, kFree, box},
      {IE_GRASP_CENTER, 10, -20, kFree, {110, 180, 310, 380}},
      {IE_GRASP_CENTER, -500, -500, kFree, {0, 100, 200, 300}},
      {IE_GRASP_CENTER, 5000, 5000, kFree, {500, 900, 700, 1100}},
      {IE_GRASP_TOP, 70, 30, kFree, {100, 230, 300, 400}},
      {IE_GRASP_TOP, 0, 500, kFree, {100, 350, 300, 400}},
      {IE_GRASP_LEFT, -500, 70, kFree, {0, 200, 300, 400}},
      {IE_GRASP_RIGHT, -500, 0, kFree, {100, 200, 150, 400}},
      {IE_GRASP_BOTTOM, 0, 5000, kFree, {100, 200, 300, 1100}},
      {IE_GRASP_BOTTOM_LEFT, 500, -500, kFree, {250, 200, 300, 250}},
      {IE_GRASP_TOP_RIGHT, 5000, -5000, kFree, {100, 100, 700, 400}},
      {IE_GRASP_TOP, 10, 30, kTwoToOne, {110, 230, 310, 430}},  // the whole box
      {IE_GRASP_BOTTOM_RIGHT, 40, 3, kTwoToOne, {100, 200, 340, 320}},
      {IE_GRASP_BOTTOM_RIGHT, 3, 40, kTwoToOne, {100, 200, 380, 340}},
      {IE_GRASP_TOP_LEFT, -5000, -5000, kTwoToOne, {0, 250, 300, 400}},
      {IE_GRASP_TOP_LEFT, 5000, 5000, kTwoToOne, {201, 350, 300, 400}},
  };
  for (const auto &drag : drags)
    EXPECT_EQ(ie_box_dragged(box, drag.grasp, drag.dx, drag.dy, drag.rules), drag.after)
        << drag.grasp << " by " << drag.dx << "," << drag.dy;
}

TEST(SelectBox, NoWayOfDraggingLeavesAreaMinimumOrRatio) {
  unsigned random = 1;
  const auto next = [&random](int most) {
    random = random * 1664525u + 1013904223u;
    return static_cast<int>((random >> 8) % static_cast<unsigned>(2 * most + 1)) - most;
  };
  for (const ie_box_rules &rules : {kFree, kTwoToOne, ie_box_rules{kArea, 37, 3, 7}}) {
    CRect box = ie_box_fitted({10, 20, 400, 300}, rules);
    for (int i = 0; i < 3000; ++i) {
      box = ie_box_dragged(box, static_cast<ie_grasp>(1 + (next(4) + 4)), next(300), next(300), rules);
      ASSERT_TRUE(box.Left() >= 0 && box.Top() >= 100 && box.Right() <= 700 && box.Bottom() <= 1100) << box;
      ASSERT_TRUE(box.Width() >= rules.minimum && box.Height() >= rules.minimum) << box;
      if (rules.numerator) {
        ASSERT_NEAR(box.Height() * rules.numerator, box.Width() * rules.denominator, rules.numerator) << box;
      }
    }
  }
}

TEST(SelectBox, AllowedAreaIsWhatCanBeSeenOfThePicture) {
  EXPECT_EQ(ie_allowed_area({-1, -40, 800, 900}, {0, 0, 720, 1280}), CRect(0, 0, 720, 900));
  EXPECT_EQ(ie_allowed_area({40, 56, 680, 1300}, {0, 0, 1280, 720}), CRect(40, 56, 680, 720));
}

TEST(EditSteps, UndoAndRedoWalkTheStepsAndANewOneCutsTheRest) {
  tavro_edit_steps steps({{0, 0, 9, 9}, {}});
  const auto add = [&steps](int x, bool goes_on = false) {
    tavro_edit edit = steps.now();
    edit.areas = {{x, 0, 5, 5, TAVRO_HIDE_FILL}};
    steps.add(edit, goes_on);
  };
  const auto x = [&steps] { return steps.now().areas.empty() ? -1 : steps.now().areas[0].x; };
  add(1);
  add(1);  // no change: no step
  for (int key = 2; key < 6; ++key) add(key, true);
  add(6);
  steps.undo();
  EXPECT_EQ(x(), 5);
  steps.undo();
  EXPECT_EQ(x(), 1) << "keys that repeat are one step";
  steps.redo();
  EXPECT_EQ(x(), 5);
  add(7, true);  // after a redo it is a step of its own
  EXPECT_FALSE(steps.can_redo());
  for (int i = 0; i < 3; ++i) steps.undo();
  EXPECT_EQ(x(), -1);
  EXPECT_FALSE(steps.can_undo() || steps.is_changed());
  for (int i = 0; i < 250; ++i) add(i);
  size_t undone = 0;
  for (; steps.can_undo(); ++undone) steps.undo();
  EXPECT_EQ(undone, kMostSteps);
  EXPECT_TRUE(steps.is_changed()) << "the start is out of reach";
}

TEST(EditSteps, AreaDrawnOnTheScreenCoversEveryPixelUnderIt) {
  const ie::CPoint size(1000, 3000);
  const CRect shown(20, 72, 353, 1071), drawn(37, 90, 61, 131);
  const CRect picture = tavro_edit_to_picture(drawn, size, shown);
  EXPECT_EQ(picture, CRect(51, 54, 124, 178));
  EXPECT_EQ(tavro_edit_to_picture({0, 0, 900, 1900}, size, shown), CRect(0, 0, 1000, 3000));
  EXPECT_EQ(tavro_edit_to_screen(picture, size, shown), CRect(37, 90, 61, 131));
}

TEST(EditSteps, AreaThatIsMovedToAndFroKeepsItsSizeAndItsPlace) {
  for (const ie::CPoint size : {ie::CPoint(800, 800), ie::CPoint(300, 300), ie::CPoint(4000, 3000)}) {
    const CRect shown(20, 72, 720, 772), start(101, 53, 201, 117);
    CRect rect = start;
    for (int i = 0; i < 50; ++i) {
      CRect drawn = tavro_edit_to_screen(rect, size, shown);
      drawn.MoveBy(i % 2 ? -7 : 7, 0);
      rect = tavro_edit_redrawn(rect, drawn, size, shown);
      ASSERT_TRUE(rect.Width() == 100 && rect.Height() == 64 && rect.Top() == 53) << rect;
    }
    CRect drawn = tavro_edit_to_screen(rect, size, shown);
    drawn.Right(drawn.Right() + 50);
    const CRect resized = tavro_edit_redrawn(rect, drawn, size, shown);
    EXPECT_EQ(CRect(resized.Left(), resized.Top(), 0, resized.Bottom()), CRect(rect.Left(), 53, 0, 117));
    EXPECT_GT(resized.Width(), 100);
  }
}
