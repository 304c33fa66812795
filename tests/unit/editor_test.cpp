// The image editor's page with touches, and what it leaves on disk and on the compose screen.
#include <Evas.h>
#include <unistd.h>

#include <cstring>
#include <filesystem>

#include "ie_selectbox.h"
#include "screens_world.h"
#include "tavro_autosave.h"
#include "tavro_compose.h"
#include "tavro_compose_parts.h"
#include "tavro_compose_strip.h"
#include "tavro_deleted_files.h"
#include "tavro_drafts.h"
#include "tavro_image.h"
#include "tavro_image_editor.h"
#include "tavro_image_editor_work.h"
#include "tavro_memory.h"

namespace {

namespace fs = std::filesystem;

constexpr char kFolder[] = "/opt/usr/media/VantorCommunity";
constexpr char kPicture[] = "/opt/usr/media/picture.jpg";

tavro_pixels white(int width, int height) {
  tavro_pixels pixels;
  pixels.width = width;
  pixels.height = height;
  pixels.bytes.reset(static_cast<unsigned char *>(std::malloc(pixels.size())));
  std::memset(pixels.bytes.get(), 255, pixels.size());
  return pixels;
}

void write_picture(const char *path, int width, int height) {
  unlink(path);
  ASSERT_TRUE(tavro_image_save_jpeg(white(width, height), 90, path));
}

class Editor : public Screens {
 protected:
  void SetUp() override {
    fs::remove_all(kFolder);
    fs::create_directories(kFolder);
    start();
    evas_object_resize(ad_.win, 720, 1280);
    tavro_create_problem_page(&ad_, nullptr);
    ad_.type = PROBLEM;
    settle();
  }
  void TearDown() override { end(); }

  void open(const char *path, bool is_screenshot) {
    is_screenshot ? tavro_launch_image_editor(path, &ad_) : tavro_edit_attachment(path, &ad_);
    ASSERT_TRUE(wait_for([this] { return ad_.select_box != nullptr; }));
    settle();
  }
  // The report gets a picture, which is opened.
  void open_attached(int width = 600, int height = 800) {
    write_picture(kPicture, width, height);
    ASSERT_TRUE(tavro_compose_attach(ad_.problem_view, kPicture));
    open(kPicture, false);
  }
  bool is_left() {
    return wait_for([this] { return !ad_.crop_layout; });
  }
  void wait_for_work() {
    EXPECT_TRUE(
        wait_for([] { return ecore_thread_active_get() == 0 && ecore_thread_pending_total_get() == 0; }));
    settle();
  }
  void use(const char *tool) { tap(find_button(ad_.crop_layout, tavro_text(tool))); }
  void done() {
    use("IDS_OB_ACBUTTON_DONE_ABB3");
    ASSERT_TRUE(is_left());
    settle();
  }
  std::string open_screenshot(const char *name = "shot.jpg") {
    const std::string shot = std::string(kFolder) + "/" + name;
    write_picture(shot.c_str(), 720, 1280);
    open(shot.c_str(), true);
    return shot;
  }
  // Listed as captured.
  std::string take_screenshot(const char *name = "shot.jpg") {
    ad_.image_list = g_slist_append(nullptr, TAVRO_STRDUP((std::string(kFolder) + "/" + name).c_str()));
    return open_screenshot(name);
  }
  void stroke(int from_x, int from_y, int to_x, int to_y) {
    Evas *canvas = evas_object_evas_get(ad_.win);
    static unsigned time = 1;
    evas_event_feed_mouse_move(canvas, from_x, from_y, ++time, nullptr);
    evas_event_feed_mouse_down(canvas, 1, EVAS_BUTTON_NONE, ++time, nullptr);
    for (int i = 1; i <= 5; ++i)
      evas_event_feed_mouse_move(canvas, from_x + (to_x - from_x) * i / 5, from_y + (to_y - from_y) * i / 5,
                                 ++time, nullptr);
    evas_event_feed_mouse_up(canvas, 1, EVAS_BUTTON_NONE, ++time, nullptr);
  }
  // In pixels of the shown picture.
  void drag(int from_x, int from_y, int to_x, int to_y) {
    int x = 0, y = 0;
    evas_object_geometry_get(ad_.main_image, &x, &y, nullptr, nullptr);
    stroke(x + from_x, y + from_y, x + to_x, y + to_y);
    settle();
  }
  int shown_width() const {
    int width = 0;
    evas_object_geometry_get(ad_.main_image, nullptr, nullptr, &width, nullptr);
    return width;
  }
  std::string attachment() const {
    const GSList *files = ad_.problem_view->attachments;
    return files ? static_cast<const char *>(files->data) : "";
  }
  static size_t files() {
    return static_cast<size_t>(std::distance(fs::directory_iterator(kFolder), fs::directory_iterator()));
  }
  static unsigned char brightness(const tavro_pixels &pixels, int x, int y) {
    return pixels.bytes
        .get()[(static_cast<size_t>(y) * static_cast<size_t>(pixels.width) + static_cast<size_t>(x)) * 4];
  }
};

TEST_F(Editor, DrawnAreaIsBlackInTheFileThatReplacesThePicture) {
  open_attached();
  const int shown = shown_width();
  const auto screen = [shown](int pixels) { return pixels * shown / 600; };
  use("IDS_OB_BUTTON_HIDE");
  drag(screen(100), screen(200), screen(300), screen(400));
  drag(screen(200), screen(300), screen(250), screen(300));  // by its middle
  use("IDS_OB_BUTTON_CROP");
  drag(shown, screen(400), screen(500), screen(400));  // the right side's handle
  done();
  ASSERT_NE(attachment(), kPicture);
  EXPECT_EQ(g_slist_length(ad_.problem_view->attachments), 1u);
  tavro_pixels saved;
  ASSERT_TRUE(decode_image(attachment().c_str(), &saved));
  EXPECT_NEAR(saved.width, 500, 3);
  EXPECT_EQ(saved.height, 800);
  for (int x : {156, 344}) EXPECT_LT(brightness(saved, x, 300), 20) << x;
  for (int x : {140, 360}) EXPECT_GT(brightness(saved, x, 300), 235) << x;
  EXPECT_TRUE(fs::exists(kPicture));
}

TEST_F(Editor, ScreenshotIsCutItsBoxRecordedAndTheOriginalGone) {
  const std::string shot = take_screenshot();
  done();
  tavro_pixels saved;
  ASSERT_TRUE(decode_image(attachment().c_str(), &saved));
  EXPECT_EQ(saved.width, 720);
  EXPECT_EQ(saved.height, 1200);
  EXPECT_FALSE(fs::exists(shot));
  EXPECT_EQ(attachment(), static_cast<const char *>(ad_.image_list->data));
  ASSERT_EQ(g_slist_length(ad_.ie_select_box_list), 1u);
  const int *box = static_cast<const int *>(ad_.ie_select_box_list->data);
  EXPECT_NEAR(box[0], 144, 1);
  EXPECT_NEAR(box[1], 240, 1);
  EXPECT_NEAR(box[2], 432, 1);
  EXPECT_NEAR(box[3], 720, 2);
  for (int x = 140; x < 580; ++x) EXPECT_GT(brightness(saved, x, 600), 250) << "a box nobody moved";
}

TEST_F(Editor, MovedBoxOfAScreenshotIsSeenInItsFileWhereItLay) {
  tavro_edit_picture picture;
  picture.is_screenshot = true;
  picture.pixels = white(1080, 1946);
  const struct {
    ie::CRect box;
    int left, top, right, bottom;  // in the file
  } moves[] = {{{270, 596, 810, 1496}, 180, 300, 540, 900}, {{0, 0, 1080, 1046}, 0, 0, 720, 600}};
  for (const auto &move : moves) {
    const std::string path = tavro_edit_save(picture, {move.box, {}});
    tavro_pixels saved;
    ASSERT_TRUE(decode_image(path.c_str(), &saved));
    const int middle_x = (move.left + move.right) / 2, middle_y = (move.top + move.bottom) / 2;
    for (const auto &[x, y] : {std::pair(move.left + 1, middle_y),
                               {move.right - 2, middle_y},
                               {middle_x, move.top + 1},
                               {middle_x, move.bottom - 2}})
      EXPECT_LT(brightness(saved, x, y), 80) << x << "," << y;
    EXPECT_GT(brightness(saved, middle_x, move.bottom + 4), 235);
    EXPECT_GT(brightness(saved, middle_x, middle_y), 235);
  }
}

TEST_F(Editor, PictureOfAnyShapeLeavesAllButtonsInTheWindow) {
  for (const auto &[width, height] : {std::pair(4000, 3000), {2000, 100}, {20, 5000}}) {
    open_attached(width, height);
    int page_width = 0, page_height = 0;
    evas_object_geometry_get(ad_.crop_layout, nullptr, nullptr, &page_width, &page_height);
    EXPECT_EQ(std::pair(page_width, page_height), std::pair(720, 1280));
    for (const char *button : {"IDS_OB_ACBUTTON_DONE_ABB3", "IDS_OB_BUTTON_HIDE", "IDS_OB_BUTTON_REDO"}) {
      int x = 0, y = 0, w = 0, h = 0;
      evas_object_geometry_get(find_button(ad_.crop_layout, tavro_text(button)), &x, &y, &w, &h);
      EXPECT_TRUE(x >= 0 && y >= 0 && x + w <= 720 && y + h <= 1280) << width << " " << button;
    }
    EXPECT_LE(shown_width(), 720);
    use("IDS_OB_ACBUTTON_CANCEL3");
    ASSERT_TRUE(is_left());
    settle();
  }
}

TEST_F(Editor, SecondTapOfADoubleOneOnDoneDoesNotSend) {
  int taps = 0;
  Evas_Object *send = elm_object_part_content_get(ad_.problem_view->bottom, "tavro.swallow.button");
  evas_object_smart_callback_add(
      send, "clicked", [](void *data, Evas_Object *, void *) { ++*static_cast<int *>(data); }, &taps);
  const auto touch_send = [this, send] {
    int x = 0, y = 0, width = 0, height = 0;
    evas_object_geometry_get(send, &x, &y, &width, &height);
    stroke(x + width / 2, y + height / 2, x + width / 2, y + height / 2);
    wait_for([] { return false; }, 0.1);
  };
  open_attached();
  use("IDS_OB_ACBUTTON_DONE_ABB3");
  ASSERT_TRUE(wait_for([this] { return elm_naviframe_top_item_get(ad_.nf) == ad_.problem_view->nf_it; }));
  touch_send();
  EXPECT_EQ(taps, 0);
  settle();
  touch_send();
  EXPECT_EQ(taps, 1);
}

TEST_F(Editor, FreshScreenshotIsNotLostWhateverElseWantsTheScreen) {
  const std::string shot = take_screenshot("kept.jpg");  // a draft goes on naming it
  evas_object_smart_callback_call(ad_.win, "delete,request", nullptr);
  ASSERT_TRUE(answer(ad_.cancel_popup, "IDS_OB_BUTTON_STAY"));
  tavro_create_history_page(&ad_);
  settle();
  tavro_create_idea_page(&ad_, nullptr);
  ASSERT_TRUE(answer(ad_.cancel_popup, "IDS_OB_BUTTON_STAY"));
  tavro_pop_naviframe_middle_items(&ad_);
  settle();
  EXPECT_FALSE(ad_.idea_view);
  ASSERT_TRUE(ad_.crop_layout);
  EXPECT_EQ(elm_object_item_content_get(elm_naviframe_top_item_get(ad_.nf)), ad_.crop_layout);
  use("IDS_OB_BUTTON_HIDE");
  drag(20, 300, 200, 400);
  tavro_compose_save_draft(&ad_);
  ASSERT_TRUE(is_left());
  settle();
  EXPECT_EQ(elm_naviframe_top_item_get(ad_.nf), ad_.landing_nf_it);
  EXPECT_TRUE(fs::exists(shot)) << "in the draft";
}

TEST_F(Editor, EndsWithItsReportAndIsNoneOfTheNext) {
  open_attached();
  tavro_compose_remember_opened(&ad_);
  use("IDS_OB_ACBUTTON_DONE_ABB3");
  tavro_create_idea_page(&ad_, nullptr);
  ASSERT_TRUE(ad_.idea_view);
  EXPECT_FALSE(ad_.crop_layout);
  wait_for_work();
  EXPECT_EQ(elm_naviframe_top_item_get(ad_.nf), ad_.idea_view->nf_it);
  EXPECT_FALSE(ad_.idea_view->attachments);
}

TEST_F(Editor, WhatTheReportRefusesStaysInTheEditor) {
  for (unsigned i = 0; i < kMostAttachments; ++i) {
    const std::string path = "/opt/usr/media/" + std::to_string(i) + ".jpg";
    write_picture(path.c_str(), 8, 8);
    ASSERT_TRUE(tavro_compose_attach(ad_.problem_view, path.c_str()));
  }
  const std::string shot = take_screenshot();
  use("IDS_OB_ACBUTTON_DONE_ABB3");
  ASSERT_TRUE(wait_for([this] { return ad_.cancel_popup != nullptr; }));
  ASSERT_TRUE(answer(ad_.cancel_popup, "IDS_OB_BUTTON_OK"));
  settle();
  EXPECT_TRUE(ad_.crop_layout && fs::exists(shot));
  tavro_compose_save_draft(&ad_);
  ASSERT_TRUE(answer(ad_.cancel_popup, "IDS_OB_BUTTON_OK"));
  EXPECT_TRUE(ad_.crop_layout && tavro_compose_view(&ad_));
  EXPECT_EQ(files(), 1u);
}

TEST_F(Editor, LeavingWithChangesAsksAndKeepsNothing) {
  take_screenshot();
  use("IDS_OB_BUTTON_HIDE");
  drag(20, 300, 200, 400);
  use("IDS_OB_ACBUTTON_CANCEL3");
  ASSERT_TRUE(answer(ad_.imgedit_popup, "IDS_OB_BUTTON_KEEP_EDITING"));
  use("IDS_OB_BUTTON_UNDO");
  use("IDS_OB_BUTTON_REDO");
  use("IDS_OB_ACBUTTON_CANCEL3");
  ASSERT_TRUE(answer(ad_.imgedit_popup, "IDS_OB_BUTTON_DISCARD"));
  ASSERT_TRUE(is_left());
  EXPECT_EQ(attachment(), "");
  EXPECT_EQ(files(), 0u);
  EXPECT_FALSE(ad_.image_list);
}

TEST_F(Editor, CancelWhileSavingLeavesNoFile) {
  open_attached(4000, 3000);
  use("IDS_OB_ACBUTTON_DONE_ABB3");
  use("IDS_OB_ACBUTTON_CANCEL3");
  EXPECT_TRUE(is_left());
  wait_for_work();
  EXPECT_EQ(files(), 0u);
  EXPECT_EQ(attachment(), kPicture);
}

TEST_F(Editor, CopyStaysAsLongAsADraftNamesIt) {
  open_attached();
  done();
  const std::string first = attachment();
  open(first.c_str(), false);
  done();
  const std::string second = attachment();
  EXPECT_FALSE(fs::exists(first));
  const int id = tavro_save_compose_draft(&ad_);
  ASSERT_GE(id, 1);
  settle();
  const TavroHandle<svc_voc_data, tavro_dbmgr_free_voc_data> draft(tavro_dbmgr_get_voc_by_id(id));
  tavro_create_problem_page(&ad_, draft.get());
  settle();
  tavro_compose_strip_remove(&ad_, second.c_str());
  settle();
  EXPECT_TRUE(fs::exists(second));
  ASSERT_GE(tavro_save_compose_draft(&ad_), 1);
  EXPECT_EQ(files(), 0u);
  EXPECT_TRUE(fs::exists(kPicture));
}

TEST_F(Editor, CopyGoesWithADiscardedReport) {
  open_attached();
  done();
  EXPECT_EQ(files(), 1u);
  tavro_compose_discard(&ad_);
  ASSERT_TRUE(answer(ad_.cancel_popup, "IDS_OB_BUTTON_DISCARD"));
  EXPECT_EQ(files(), 0u);
}

TEST_F(Editor, ScreenshotOfAKilledClientGoesAtTheNextStart) {
  const std::string shot = open_screenshot();
  tavro_deleted_files_remove();
  EXPECT_TRUE(fs::exists(shot));
  tavro_free_compose_view(&ad_);
  tavro_deleted_files_remove();  // as a start does
  EXPECT_FALSE(fs::exists(shot));
}

TEST_F(Editor, ScreenshotThatIsBeingEditedIsInTheDraftsThatAreStoredByThemselves) {
  const std::string shot = open_screenshot();
  const auto is_in_newest = [&shot](int id) {
    const TavroHandle<svc_voc_data, tavro_dbmgr_free_voc_data> draft(tavro_dbmgr_get_voc_by_id(id));
    return fs::exists(shot) && draft && draft->attachments &&
           shot == static_cast<const tavro_dbmgr_attachment_info *>(draft->attachments->data)->file_path;
  };
  for (const intptr_t capacity : {15, 5, 4}) {
    __tavro_app_battery_capacity_changed_cb(DEVICE_CALLBACK_BATTERY_CAPACITY,
                                            reinterpret_cast<void *>(capacity), &ad_);
    EXPECT_TRUE(is_in_newest(ad_.auto_saved_id)) << capacity;
    EXPECT_EQ(attachment(), "");
  }
  const int automatic = ad_.auto_saved_id;
  EXPECT_TRUE(tavro_autosave_at_end(&ad_));
  settle();
  EXPECT_FALSE(ad_.crop_layout);
  EXPECT_TRUE(is_in_newest(automatic + 1));
}

TEST_F(Editor, WhatCannotBeEditedIsSaid) {
  const std::string low = std::string(kFolder) + "/low.jpg";
  write_picture(low.c_str(), 300, 146);
  const struct {
    const char *path;
    std::string text;
  } faults[] = {{"/opt/usr/media/none.jpg", "Media file not available"},
                {low.c_str(), tavro_text(tavro_image_fault_text(TAVRO_IMAGE_OTHER_KIND))}};
  for (const auto &fault : faults) {
    tavro_launch_image_editor(fault.path, &ad_);
    ASSERT_TRUE(wait_for([this] { return ad_.imgedit_popup != nullptr; })) << fault.path;
    EXPECT_EQ(body(ad_.imgedit_popup), fault.text);
    EXPECT_TRUE(answer(ad_.imgedit_popup, "IDS_OB_BUTTON_OK"));
    EXPECT_TRUE(is_left());
  }
}

}  // namespace
