// The compose screens: what is attached, stored, kept and asked.
#include <gmock/gmock.h>

#include <climits>

#include "compose_world.h"
#include "tavro_autosave.h"
#include "tavro_compose_parts.h"
#include "tavro_compose_strip.h"
#include "tavro_deleted_files.h"
#include "tavro_hoverui.h"

namespace {

using testing::ElementsAre;
using testing::HasSubstr;

TEST_F(Compose, AttachesAFileOnceAndAddsUpWhatIsThere) {
  tavro_create_problem_page(&ad_, nullptr);
  const std::string small = make_picture("small.jpg", 10240), large = make_picture("large.jpg", 1048576);
  for (const std::string &path : {small, small, large})
    EXPECT_TRUE(tavro_compose_attach(view(), path.c_str()));
  EXPECT_EQ(view()->buffer, 10240 + 1048576);
  view()->app_name = TAVRO_STRDUP("Hardware");
  EXPECT_EQ(tavro_compose_check(&ad_, view()->buffer), TAVRO_COMPOSE_COMPLETE);
  EXPECT_EQ(tavro_compose_check(&ad_, view()->buffer - 1), TAVRO_COMPOSE_TOO_LARGE);
  unlink(small.c_str());
  tavro_compose_detach(view(), large.c_str());
  EXPECT_EQ(view()->buffer, 0);
}

TEST_F(Compose, NamesEachFileThatItRefusesWithTheReason) {
  tavro_create_problem_page(&ad_, nullptr);
  std::string paths[] = {make_picture("good.jpg"),
                         make_file("empty.jpg", ""),
                         make_file("text.jpg", "no picture at all"),
                         make_file("boxed.mp4", std::string("\0\0\0\x18"
                                                            "ftypisom\0\0\0\0mp42avif",
                                                            24)),
                         make_picture("huge.jpg", off_t{4} << 30),
                         std::string(kComposeMedia) + "gone.jpg",
                         kComposeMedia};
  GSList *list = nullptr;
  for (std::string &path : paths) list = g_slist_append(list, path.data());
  tavro_compose_attach_files(&ad_, list);
  g_slist_free(list);
  EXPECT_THAT(attached(), ElementsAre("good.jpg"));
  const std::string told = body(ad_.cancel_popup);
  for (const char *part :
       {"empty.jpg: the file is empty", "text.jpg: not a picture", "boxed.mp4: not a picture",
        "huge.jpg: larger than the limit of 30.0 MB", "gone.jpg: cannot be read"})
    EXPECT_THAT(told, HasSubstr(part));
}

constexpr char kOwnFolder[] = "/opt/usr/media/VantorCommunity/";
const auto kIsCopy = testing::MatchesRegex("/opt/usr/media/VantorCommunity/VantorCommunity_.*jpg");

std::string make_webp() {
  return make_file(
      "modern.webp",
      std::string("RIFF\x1a\0\0\0WEBPVP8L\x0d\0\0\0\x2f\0\0\0\x10\x07\x10\x11\x11\x88\x88\xfe\x07\0", 34));
}

TEST_F(Compose, WebpPictureBecomesACopyThatSupportCanOpenUnlessTheScreenEndsMeanwhile) {
  std::string path = make_webp();
  const TavroHandle<GSList, g_slist_free> list(g_slist_append(nullptr, path.data()));
  tavro_create_problem_page(&ad_, nullptr);
  tavro_compose_attach(view(), make_picture("before.jpg").c_str());
  tavro_compose_attach_files(&ad_, list.get());
  tavro_compose_attach(view(), make_picture("after.jpg").c_str());
  EXPECT_THAT(attached(), ElementsAre("before.jpg", "modern.webp", "after.jpg"));
  ASSERT_TRUE(wait_for([this] { return attached()[1] != "modern.webp"; }));
  EXPECT_THAT(tavro_compose_attached(&ad_)[1], kIsCopy);
  tavro_compose_attach_files(&ad_, list.get());
  end();
  start();
  tavro_create_problem_page(&ad_, nullptr);
  settle();
  EXPECT_THAT(attached(), testing::IsEmpty());
  EXPECT_EQ(std::distance(std::filesystem::directory_iterator(kOwnFolder), {}), 1);
}

TEST_F(Compose, SendWaitsForAPictureThatIsBeingConvertedAndADraftHoldsThePictureItself) {
  std::string path = make_webp();
  const TavroHandle<GSList, g_slist_free> list(g_slist_append(nullptr, path.data()));
  write_problem();
  tavro_compose_attach_files(&ad_, list.get());
  const int id = tavro_save_compose_draft(&ad_);
  const std::string stored = "SELECT ATTACHMENT_FILE_PATH FROM ATTACHMENT ORDER BY rowid DESC LIMIT 1";
  EXPECT_EQ(value(stored), path);
  settle();
  const Voc draft(tavro_dbmgr_get_voc_by_id(id));
  tavro_create_problem_page(&ad_, draft.get());
  ASSERT_TRUE(wait_for([this] { return attached()[0] != "modern.webp"; }));
  settle();

  tavro_compose_attach_files(&ad_, list.get());
  tap_send();
  ASSERT_TRUE(answer(ad_.cancel_popup, "IDS_OB_BUTTON_STAY"));
  ASSERT_TRUE(wait_for([this] { return attached()[1] != "modern.webp"; }));
  tavro_compose_attach_files(&ad_, list.get());
  const int before = reports();
  tavro_compose_send_from_review(&ad_);
  EXPECT_TRUE(view());
  ASSERT_TRUE(wait_for([this] { return !view(); }));
  EXPECT_EQ(reports(), before) << "in the place of the draft";
  EXPECT_THAT(value(stored), kIsCopy);
}

TEST_F(Compose, VideoThatTheClientMadeGoesWhenItIsTakenOffAndOneOfTheGalleryStays) {
  tavro_create_problem_page(&ad_, nullptr);
  const std::string gallery = make_file("a.mp4", std::string("\0\0\0\x08"
                                                             "ftypmp42",
                                                             12));
  const std::string own = std::string(kOwnFolder) + "a.mp4", tile = std::string(kOwnFolder) + ".a.mp4.jpg";
  std::filesystem::create_directories(kOwnFolder);
  std::filesystem::copy_file(gallery, own);
  std::ofstream(tile) << "its picture";
  for (const char *unfinished : {own.c_str(), ""}) tavro_deleted_files_set_unfinished(unfinished);
  for (const std::string &path : {gallery, own}) {
    ASSERT_TRUE(tavro_compose_attach(view(), path.c_str()));
    tavro_compose_strip_remove(&ad_, path.c_str());
  }
  settle();
  EXPECT_TRUE(std::filesystem::exists(gallery));
  EXPECT_FALSE(std::filesystem::exists(own) || std::filesystem::exists(tile));
}

TEST_F(Compose, AttachmentsAreReorderedAndTheMenuOffersOnlyWhatIsPossible) {
  tavro_create_problem_page(&ad_, nullptr);
  const std::string a = make_picture("a.jpg"), b = make_picture("b.jpg"), c = make_picture("c.jpg");
  for (const std::string &path : {a, b, c}) tavro_compose_attach(view(), path.c_str());
  tavro_compose_show_attachment_menu(&ad_, a.c_str());
  EXPECT_FALSE(answer(view()->menu_popup, "IDS_OB_BUTTON_MOVE_LEFT"));
  EXPECT_TRUE(answer(view()->menu_popup, "IDS_OB_BUTTON_MOVE_RIGHT"));
  EXPECT_THAT(attached(), ElementsAre("b.jpg", "a.jpg", "c.jpg"));
  tavro_compose_move(view(), c.c_str(), -9);
  EXPECT_THAT(attached(), ElementsAre("c.jpg", "b.jpg", "a.jpg"));
  tavro_compose_show_attachment_menu(&ad_, a.c_str());
  EXPECT_FALSE(answer(view()->menu_popup, "IDS_OB_BUTTON_MOVE_RIGHT"));
  EXPECT_TRUE(answer(view()->menu_popup, "IDS_OB_BUTTON_REMOVE"));
  EXPECT_THAT(attached(), ElementsAre("c.jpg", "b.jpg"));
}

TEST_F(Compose, SizeIsShownAgainstASaneLimit) {
  tavro_create_problem_page(&ad_, nullptr);
  preference_set_int(TAVRO_PREF_MAX_SIZE_ATTACHMENT, INT_MAX);
  tavro_compose_size_refresh(&ad_);
  EXPECT_EQ(size_text(), "0.0 of 1024.0 MB");
}

TEST_F(Compose, FilesLostSinceTheyWereChosenAreNamedBeforeSending) {
  write_problem();
  const std::string kept = make_picture("kept.jpg"), gone = make_picture("gone.jpg"),
                    cut = make_picture("cut.jpg");
  for (const std::string &path : {kept, gone, cut}) tavro_compose_attach(view(), path.c_str());
  unlink(gone.c_str());
  make_file("cut.jpg", "");
  const int before = reports();
  tap_send();
  EXPECT_THAT(body(ad_.cancel_popup), testing::AllOf(HasSubstr("gone.jpg"), HasSubstr("cut.jpg")));
  EXPECT_THAT(body(ad_.cancel_popup), testing::Not(HasSubstr("kept.jpg")));
  ASSERT_TRUE(answer(ad_.cancel_popup, "IDS_OB_BUTTON_STAY"));
  EXPECT_THAT(attached(), testing::SizeIs(3));
  tap_send();
  ASSERT_TRUE(answer(ad_.cancel_popup, "IDS_OB_BUTTON_SEND_WITHOUT_FILES"));
  EXPECT_FALSE(ad_.problem_view);
  EXPECT_EQ(reports(), before + 1);
}

TEST_F(Compose, DeviceStatusGoesAlongUnlessThePersonTookItOff) {
  write_problem();
  tap_send();
  EXPECT_NE(newest("REF_3"), "");
  write_problem();
  ad_.problem_view->is_device_status_removed = true;
  tap_send();
  EXPECT_EQ(newest("REF_3"), "");
}

// Stored, it does not know whether the person had taken the device status off.
TEST_F(Compose, DraftOfAProblemIsShownOnceMoreBeforeItGoes) {
  write_problem();
  tavro_compose_save_draft(&ad_);
  const Voc draft(tavro_dbmgr_get_voc_by_id(std::stoi(newest("VOC_ID"))));
  tavro_create_problem_page(&ad_, draft.get());
  settle();
  tap_send();
  ASSERT_TRUE(view()) << newest("VOC_ID");
  EXPECT_FALSE(ad_.cancel_popup) << body(ad_.cancel_popup);
  EXPECT_NE(elm_naviframe_top_item_get(ad_.nf), view()->nf_it);
  tavro_compose_send_from_review(&ad_);
  EXPECT_FALSE(view());
}

TEST_F(Compose, DamagedDraftOpensWithWhatIsThere) {
  const std::string text = make_file("text.jpg", "no picture", 2097152);
  const Voc draft(store_draft());
  for (const char *path : {static_cast<const char *>(nullptr), text.c_str()}) {
    auto *file = TAVRO_ZALLOC(tavro_dbmgr_attachment_info);
    file->file_path = TAVRO_STRDUP(path);
    draft->attachments = g_slist_append(draft->attachments, file);
  }
  ad_.type = CRASH;
  tavro_create_problem_page(&ad_, draft.get());
  EXPECT_EQ(ad_.type, CRASH);
  EXPECT_THAT(attached(), ElementsAre("text.jpg"));
  EXPECT_EQ(size_text(), "2.0 of 30.0 MB");
  tavro_create_problem_page(&ad_, nullptr);
  EXPECT_EQ(ad_.type, PROBLEM) << "a new report is of no crash";
}

TEST_F(Compose, StoreThatRefusesTheReportLeavesTheScreenAsItIs) {
  write_problem();
  const std::string picture = make_picture("kept.jpg");
  tavro_compose_attach(view(), picture.c_str());
  run("CREATE TRIGGER full BEFORE INSERT ON TABLE_VOC BEGIN SELECT RAISE(FAIL, 'full'); END");
  tap_send();
  run("DROP TRIGGER full");
  ASSERT_TRUE(view());
  EXPECT_STREQ(elm_entry_entry_get(view()->title_entry), "It broke");
  EXPECT_THAT(attached(), ElementsAre("kept.jpg"));
  EXPECT_THAT(body(ad_.cancel_popup), HasSubstr("could not store"));
  tap_send();
  EXPECT_FALSE(view());
}

TEST_F(Compose, BlanksAreNothingToSendAndAReportTakesNoMoreFilesThanSupportDoes) {
  write_problem();
  elm_entry_entry_set(view()->title_entry, "  \xE2\x80\x8B<br/>");
  EXPECT_FALSE(tavro_compose_has_content(&ad_));
  for (unsigned i = 0; i < kMostAttachments; i++)
    EXPECT_TRUE(tavro_compose_attach(view(), make_picture(std::to_string(i) + ".jpg").c_str()));
  const std::string beyond = make_picture("beyond.jpg");
  EXPECT_EQ(tavro_attachment_check(view(), beyond.c_str()), TAVRO_ATTACHMENT_TOO_MANY);
  EXPECT_FALSE(tavro_compose_attach(view(), beyond.c_str()));
}

TEST_F(Compose, SecondScreenDoesNotThrowAwayWhatTheFirstHolds) {
  tavro_create_problem_page(&ad_, nullptr);
  elm_entry_entry_set(view()->entry, "hours of work");
  tavro_create_history_page(&ad_);
  settle();
  tavro_create_idea_page(&ad_, nullptr);
  settle();
  ASSERT_TRUE(ad_.problem_view);
  EXPECT_FALSE(ad_.idea_view);
  EXPECT_TRUE(ad_.cancel_popup);
  EXPECT_STREQ(elm_entry_entry_get(ad_.problem_view->entry), "hours of work");
  EXPECT_EQ(elm_naviframe_top_item_get(ad_.nf), ad_.problem_view->nf_it);
  tavro_pop_naviframe_middle_items(&ad_);
  EXPECT_TRUE(ad_.problem_view);
}

TEST_F(Compose, EmptyScreenMakesRoomForAnotherAndItsMenuGoesWithIt) {
  tavro_create_problem_page(&ad_, nullptr);
  tavro_compose_show_sources(&ad_);
  tavro_create_idea_page(&ad_, nullptr);
  EXPECT_FALSE(ad_.problem_view);
  EXPECT_TRUE(ad_.idea_view);
}

TEST_F(Compose, UnchangedDraftStaysAndItsAutomaticCopyGoesWhenThePageOrTheApplicationEnds) {
  for (const bool is_end_of_all : {false, true}) {
    const Voc copy(store_draft()), draft(store_draft());
    tavro_create_problem_page(&ad_, draft.get());
    ad_.auto_saved_id = copy->id;
    const int before = reports();
    settle();
    if (is_end_of_all)
      tavro_autosave_at_end(&ad_);
    else
      elm_naviframe_item_pop(ad_.nf);
    EXPECT_FALSE(ad_.problem_view);
    EXPECT_EQ(ad_.auto_saved_id, 0);
    EXPECT_EQ(reports(), before - 1);
    EXPECT_EQ(value("SELECT count(*) FROM TABLE_VOC WHERE VOC_ID=" + std::to_string(draft->id)), "1");
  }
}

TEST_F(Compose, DraftIsNotDiscardedWithoutAQuestionAndItsLogGoesWithIt) {
  const std::string log = make_file("draft.zip", "log");
  const Voc draft(store_draft(log.c_str()));
  tavro_create_problem_page(&ad_, draft.get());
  const int before = reports();
  tavro_compose_discard(&ad_);
  ASSERT_TRUE(view());
  EXPECT_EQ(reports(), before);
  ASSERT_TRUE(answer(ad_.cancel_popup, "IDS_OB_BUTTON_DISCARD"));
  EXPECT_FALSE(view());
  EXPECT_EQ(reports(), before - 1);
  EXPECT_FALSE(std::filesystem::exists(log));
}

TEST_F(Compose, DoubleTapDoesNotThrowARecordingAway) {
  ad_.minicontrol_layout = tavro_hoverui_layout_add(ad_.win, "minicontrol", "minicontrol_video");
  ASSERT_TRUE(ad_.minicontrol_layout);
  add_discard_button(&ad_);
  Evas_Object *discard = elm_object_part_content_get(ad_.minicontrol_layout, "cancel_btn_swallow");
  ad_.recording_status = 1;
  const double now = ecore_loop_time_get();
  for (const double seconds_ago : {1.0, 0.7, 0.0}) {
    ecore_loop_time_set(now - seconds_ago);
    evas_object_smart_callback_call(discard, "clicked", nullptr);
    EXPECT_EQ(ad_.cancel_video_recording == 1, seconds_ago == 0);
  }
  evas_object_del(ad_.minicontrol_layout);
  ad_.minicontrol_layout = nullptr;
  ad_.recording_status = ad_.cancel_video_recording = 0;
}

TEST_F(Compose, DraftThatIsStoredAnewKeepsItsLogAndLosesOneThatWasReplaced) {
  for (const bool is_replaced : {false, true}) {
    const std::string log = make_file("draft.zip", "log"), other = make_file("other.zip", "log");
    tavro_create_problem_page(&ad_, Voc(store_draft(log.c_str())).get());
    if (is_replaced) {
      TAVRO_FREE(ad_.problem_view->syslog_filepath);
      ad_.problem_view->syslog_filepath = TAVRO_STRDUP(other.c_str());
    }
    tavro_compose_save_draft(&ad_);
    EXPECT_EQ(std::filesystem::exists(log), !is_replaced);
    EXPECT_EQ(newest("REF_2"), is_replaced ? other : log);
  }
}

}  // namespace
