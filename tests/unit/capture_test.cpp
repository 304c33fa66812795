// A capture from the first message to the last reply.
#include <gmock/gmock.h>

#include "capture_world.h"
#include "tavro-common.h"
#include "tavro_video_info.h"

// In the place of the platform's.
extern "C" int __wrap_notification_status_message_post(const char *message);
int __wrap_notification_status_message_post(const char *message) {
  toasts.push_back(message);
  return 0;
}

namespace {

using testing::ElementsAre;
using CaptureTest = CaptureWorld;

constexpr char kVideoValues[] =
    "outfilename=FILE.mp4 video_quality=HIGH video_fps=2 video_width=480 video_height=640 ";

TEST_F(CaptureTest, OnlyTheThirdNumberOfTheVersionDecidesWhetherASessionIsOpened) {
  for (const char *version : {"1.0.14", "1.0.14.2", "0.0.99"}) {
    install(version);
    ad.cpmgr_handle = 0;
    answer({{0, "17"}, {0, "17"}});
    send_cpmgr_init(&ad);
    EXPECT_THAT(messages(1),
                ElementsAre(std::string("action_type=Video_Init impl_method=xserver ") + kVideoValues))
        << version;
    EXPECT_TRUE(send_cpmgr_start(&ad));
    EXPECT_THAT(messages(1), ElementsAre("action_type=Video_Start impl_method=xserver handle=17 "))
        << version;
  }
  for (const char *version : {"3.2.13", "1", "1.0.x", "99", "a.b.c", "1.0.-20"}) {
    install(version);
    ad.cpmgr_handle = 0;
    send_cpmgr_init(&ad);
    EXPECT_EQ(ad.screen_recorder_is_latest, 0) << version;
    EXPECT_TRUE(send_cpmgr_start(&ad));
    EXPECT_THAT(
        messages(1),
        ElementsAre(std::string("action_type=Video_Start impl_method=xserver handle=0 ") + kVideoValues))
        << version;
  }
}

TEST_F(CaptureTest, QualityFollowsThePreference) {
  for (const auto &[stored, sent] : {std::pair(0, "HIGH"), {1, "MID"}, {5, "LOW"}, {-1, "LOW"}}) {
    preference_set_int(TAVRO_PREF_QUALITY, stored);
    send_cpmgr_init(&ad);
    EXPECT_THAT(messages(1), ElementsAre(testing::HasSubstr(std::string("video_quality=") + sent + " ")));
  }
}

TEST_F(CaptureTest, ALeftoverSessionIsStoppedBeforeTheNextIsOpened) {
  ad.cpmgr_handle = 9;
  answer({{0, "10"}});
  send_cpmgr_init(&ad);
  EXPECT_THAT(messages(2), ElementsAre("action_type=Video_Stop handle=9 no reply",
                                       testing::StartsWith("action_type=Video_Init")));
  EXPECT_EQ(ad.cpmgr_handle, 10);
}

TEST_F(CaptureTest, AReplyWithAHandleChangesNothingElse) {
  answer({{0, "17"}});
  ad.cpmgr_handle = 3;
  ad.recording_status = 1;
  send_cpmgr_action(&ad, "Video_Pause");
  messages(1);
  EXPECT_EQ(ad.cpmgr_handle, 17);
  EXPECT_EQ(ad.recording_status, 1);
  EXPECT_TRUE(window_calls.empty());
}

TEST_F(CaptureTest, AHandleThatIsNoneEndsTheRecordingHereAndThere) {
  for (const char *text : {"abc", "17x", "", "99999999999999", "0", "-4"}) {
    start();
    answer({{0, text}});
    pause_btn_clicked_cb(&ad, nullptr, nullptr);
    EXPECT_THAT(messages(2), ElementsAre("action_type=Video_Pause handle=17 ",
                                         "action_type=Video_Stop handle=17 no reply"))
        << text;
    EXPECT_EQ(ad.cpmgr_handle + ad.recording_status, 0) << text;
    EXPECT_EQ(window_calls.back(), "failure") << text;
  }
}

TEST_F(CaptureTest, AnOldManagerThatNeverAnswersIsGivenUpWhenTheTimeIsOver) {
  install("1.0.13");
  send_cpmgr_init(&ad);
  record();
  EXPECT_EQ(messages(1).size(), 1u);
  tick(6 + 121);
  EXPECT_EQ(shown_time, "00:00");
  EXPECT_EQ(window_calls.back(), "failure");
  EXPECT_EQ(ad.recording_status, 0);
}

TEST_F(CaptureTest, AVideoIsPausedResumedStoppedAndAdded) {
  start();
  answer({{0, "17"}, {0, "17"}, {0, nullptr}});
  tick(4);
  EXPECT_EQ(shown_time, "00:58");
  pause_btn_clicked_cb(&ad, nullptr, nullptr);
  EXPECT_TRUE(ad.video_paused);
  video_btn_clicked_cb(&ad, nullptr, nullptr);
  const std::string file = make_file();
  record_btn_clicked_cb(&ad, nullptr, nullptr);
  EXPECT_THAT(messages(3),
              ElementsAre("action_type=Video_Pause handle=17 ", "action_type=Video_Resume handle=17 ",
                          "action_type=Video_Stop handle=17 "));
  EXPECT_THAT(window_calls, ElementsAre("may stop", "paused", "resumed", "no time", "no control",
                                        "no control", "no time", "back", "video"));
  ASSERT_TRUE(ad.image_list);
  EXPECT_EQ(file, static_cast<char *>(ad.image_list->data));
  EXPECT_EQ(ad.recording_status + ad.cpmgr_handle, 0);
  EXPECT_FALSE(stays(file));  // as nothing here names it
  EXPECT_THAT(toasts, ElementsAre(tavro_text("IDS_OB_TPOP_VIDEO_SAVED_IN_ORBEL")));
}

TEST_F(CaptureTest, APanelThatDoesNotTellIsTakenToBeOffUnlessTheControlHasGone) {
  for (const bool has_gone : {false, true}) {
    ad.cType = IMAGE;
    camera_btn_clicked_cb(&ad, nullptr, nullptr);
    if (has_gone) back_btn_clicked_cb(&ad, nullptr, nullptr);
    tavro_capture_waited_cb(&ad);
    EXPECT_EQ(messages(has_gone ? 0 : 1).size(), has_gone ? 0u : 1u);
    tavro_capture_forget_file(&ad);
  }
}

TEST_F(CaptureTest, BackEndsTheRecordingWithAllThatIsShownOfItAndKeepsIt) {
  start();
  answer({{0, nullptr}});
  back_btn_clicked_cb(&ad, nullptr, nullptr);
  EXPECT_THAT(window_calls, ElementsAre("no time", "no control"));
  EXPECT_THAT(messages(1), ElementsAre("action_type=Video_Shutdown handle=17 "));
  EXPECT_EQ(window_calls.back(), "video");
}

TEST_F(CaptureTest, AVideoThatTheReportRefusesIsNotListedAndStays) {
  is_video_refused = true;
  start();
  const std::string file = make_file();
  stop();
  is_video_refused = false;
  EXPECT_FALSE(ad.image_list);
  EXPECT_THAT(toasts, testing::IsEmpty());
  tavro_deleted_files_note_copies({}, {file});  // attached from the gallery, and taken off again
  EXPECT_TRUE(stays(file));
}

TEST_F(CaptureTest, AVideoThatNobodyWaitsForGoesOnceItIsMade) {
  start();
  const std::string file = make_file();
  EXPECT_TRUE(stays(file));  // as long as it is being recorded
  open_another_report();
  stop();
  EXPECT_FALSE(ad.image_list);
  EXPECT_FALSE(std::filesystem::exists(file));
}

TEST_F(CaptureTest, AManagerThatHangsAtTheEndIsGivenUpAndItsLateReplyChangesNothing) {
  for (const bool is_playable : {false, true}) {
    start();
    const std::string file = make_file(is_playable);
    record_btn_clicked_cb(&ad, nullptr, nullptr);  // not answered
    messages(1);
    EXPECT_EQ(tavro_capture_waited_cb(&ad), ECORE_CALLBACK_CANCEL);
    EXPECT_EQ(window_calls.back(), "failure");
    EXPECT_EQ(stays(file), is_playable);  // among the pictures
    window_calls.clear();
    reply_late("handle", "17");
    EXPECT_THAT(window_calls, testing::IsEmpty());
    EXPECT_FALSE(ad.image_list);
  }
}

TEST_F(CaptureTest, AManagerThatIsKilledIsNoticedWithoutAButton) {
  for (const bool is_recording : {false, true}) {
    answer({{0, "17"}, {0, "17"}});
    send_cpmgr_init(&ad);
    messages(1);
    if (is_recording) record();
    messages(is_recording ? 1 : 0);
    EXPECT_EQ(tavro_capture_watch_cb(&ad), ECORE_CALLBACK_RENEW);
    run_manager(false);
    EXPECT_EQ(tavro_capture_watch_cb(&ad), ECORE_CALLBACK_CANCEL);
    run_manager(true);
    EXPECT_EQ(window_calls.back(), "failure");
    EXPECT_EQ(ad.cpmgr_handle + ad.recording_status, 0);
    EXPECT_TRUE(messages(0).empty());
  }
}

TEST_F(CaptureTest, AnOldManagerIsLeftAloneForSevenTicks) {
  install("1.0.13");
  answer({{0, "17"}});
  send_cpmgr_init(&ad);
  record();
  messages(1);
  tick(6);
  pause_btn_clicked_cb(&ad, nullptr, nullptr);
  record_btn_clicked_cb(&ad, nullptr, nullptr);
  back_btn_clicked_cb(&ad, nullptr, nullptr);
  EXPECT_TRUE(messages(0).empty());
  EXPECT_EQ(shown_time, "01:00");
  tick(1);
  EXPECT_THAT(window_calls, ElementsAre("recording", "may stop"));
  record_btn_clicked_cb(&ad, nullptr, nullptr);
  EXPECT_THAT(messages(1), ElementsAre("action_type=Video_Stop handle=17 "));
}

TEST_F(CaptureTest, ARecordingEndsAfterSixtySeconds) {
  start();
  tick(119);
  EXPECT_EQ(shown_time, "00:01");
  EXPECT_TRUE(messages(0).empty());
  shown_time.clear();  // a text that cannot be read does not end it
  tick(2);
  EXPECT_TRUE(messages(0).empty());
  shown_time = "00:01";
  tick(1);
  EXPECT_EQ(shown_time, "00:00");
  EXPECT_THAT(messages(1), ElementsAre("action_type=Video_Stop handle=17 "));
}

TEST_F(CaptureTest, ACancelledRecordingIsDroppedAndTheNextIsAdded) {
  start();
  const std::string file = make_file(), picture = tavro_video_picture_path(file);
  std::ofstream(picture) << "its picture";
  answer({{0, nullptr}});
  cancel_btn_clicked_cb(&ad, nullptr, nullptr);
  tick(1);
  messages(1);
  EXPECT_FALSE(ad.image_list);
  EXPECT_FALSE(std::filesystem::exists(file) || std::filesystem::exists(picture));
  EXPECT_THAT(window_calls, testing::Not(testing::Contains("video")));
  start();
  stop();
  EXPECT_TRUE(ad.image_list);
}

TEST_F(CaptureTest, ASessionWithoutARecordingLeavesNoFile) {
  answer({{0, "17"}, {0, nullptr}});
  send_cpmgr_init(&ad);
  messages(1);
  const std::string file = make_file();
  back_btn_clicked_cb(&ad, nullptr, nullptr);
  EXPECT_THAT(messages(1), ElementsAre("action_type=Video_Shutdown handle=17 "));
  EXPECT_FALSE(std::filesystem::exists(file));
  EXPECT_FALSE(ad.image_list);
  EXPECT_THAT(window_calls, ElementsAre("no control", "no control", "no time", "back"));
}

TEST_F(CaptureTest, AScreenshotOpensTheEditorAndALateReplyChangesNothing) {
  ad.cType = IMAGE;
  ad.device_orientation = 90;
  answer({{0, nullptr}});
  take_snapshot(&ad);
  const std::string file = ad.problem_view->filename;
  EXPECT_THAT(messages(1),
              ElementsAre("impl_method=xserver action_type=Screenshot orientation=90 outfilename=FILE.jpg "));
  EXPECT_THAT(window_calls, ElementsAre("no control", "no control", "no time", "back", "picture"));
  EXPECT_EQ(file, static_cast<char *>(ad.image_list->data));

  window_calls.clear();
  answer({});
  send_cpmgr_init(&ad);  // not answered yet
  back_btn_clicked_cb(&ad, nullptr, nullptr);
  reply_late("outfilename", file.c_str());
  EXPECT_THAT(window_calls, ElementsAre("no control", "back"));
  EXPECT_FALSE(ad.image_list->next);
}

TEST_F(CaptureTest, APictureForAReportThatWasClosedBringsTheClientBackAllTheSame) {
  ad.cType = IMAGE;
  answer({{0, nullptr}});
  take_snapshot(&ad);
  const std::string file = make_file();
  open_another_report();
  messages(1);
  EXPECT_EQ(window_calls.back(), "back");
  EXPECT_FALSE(ad.image_list || std::filesystem::exists(file));
  window_calls.clear();
  EXPECT_EQ(tavro_capture_waited_cb(&ad), ECORE_CALLBACK_CANCEL);
  EXPECT_THAT(window_calls, testing::IsEmpty()) << "nothing is waited for any more";
}

TEST_F(CaptureTest, ThePauseOfTheDisplayEndsWithItAndThatOfThePersonDoesNot) {
  start();
  display(DISPLAY_STATE_SCREEN_OFF);
  display(DISPLAY_STATE_SCREEN_OFF);
  EXPECT_TRUE(ad.video_paused);
  display(DISPLAY_STATE_NORMAL);
  EXPECT_FALSE(ad.video_paused);
  pause_btn_clicked_cb(&ad, nullptr, nullptr);
  display(DISPLAY_STATE_SCREEN_OFF);
  EXPECT_FALSE(ad.pause_on_lock);
  display(DISPLAY_STATE_NORMAL);
  EXPECT_TRUE(ad.video_paused);
  EXPECT_THAT(window_calls, ElementsAre("paused", "resumed", "paused"));
}

TEST_F(CaptureTest, AManagerThatFailsOrDiesAtAnyStepLeadsBackWithAMessage) {
  const std::pair<const char *, void (*)(appdata *)> kSteps[] = {
      {"pause", [](appdata *data) { pause_btn_clicked_cb(data, nullptr, nullptr); }},
      {"stop", [](appdata *data) { record_btn_clicked_cb(data, nullptr, nullptr); }},
      {"display", [](appdata *data) {
         on_device_changed_cb(DEVICE_CALLBACK_DISPLAY_STATE,
                              reinterpret_cast<void *>(intptr_t{DISPLAY_STATE_SCREEN_OFF}), data);
       }}};
  for (const auto &[name, step] : kSteps) {
    for (const bool is_dead : {false, true}) {
      start();
      answer({{-1, nullptr}});
      run_manager(!is_dead);
      step(&ad);
      const Lines sent = messages(is_dead ? 0 : 1);
      run_manager(true);
      EXPECT_EQ(testing::Value(sent, testing::Contains(testing::HasSubstr("Video_Stop"))), !is_dead) << name;
      EXPECT_THAT(window_calls, testing::IsSupersetOf({"no control", "no time", "back", "failure"}))
          << name << is_dead;
      EXPECT_EQ(ad.recording_status + ad.cpmgr_handle + ad.video_paused + ad.pause_on_lock, 0)
          << name << is_dead;
      EXPECT_FALSE(ad.problem_view->filename || ad.image_list) << name << is_dead;
    }
  }
  answer({{-1, nullptr}});
  send_cpmgr_init(&ad);
  messages(1);
  EXPECT_EQ(window_calls.back(), "failure");
}

TEST_F(CaptureTest, AManagerThatOpensNoSessionIsGivenUpAndItsLateSessionIsEnded) {
  send_cpmgr_init(&ad);  // not answered yet
  messages(1);
  ad.minicontrol_win = reinterpret_cast<Evas_Object *>(this);
  const std::string file = ad.problem_view->filename;
  video_btn_clicked_cb(&ad, nullptr, nullptr);
  int ticks = 1;
  while (tavro_capture_waited_cb(&ad) == ECORE_CALLBACK_RENEW) ++ticks;
  ad.minicontrol_win = nullptr;
  EXPECT_EQ(ticks, 200);
  EXPECT_THAT(window_calls, ElementsAre("no control", "no time", "back", "failure"));
  TavroAppControl late;
  app_control_create(tavro_out(late));
  app_control_add_extra_data(late.get(), "handle", "17");
  reply_late("outfilename", file.c_str(), late.get());
  EXPECT_EQ(ad.cpmgr_handle, 0);
  EXPECT_THAT(messages(1), ElementsAre("action_type=Video_Stop handle=17 no reply"));
}

TEST(VideoInfo, ADamagedFileHasNoLengthAndAWholeOneHas) {
  const std::string head("\0\0\0\10ftyp", 8);
  const std::string movie("\0\0\0\x74moov\0\0\0\x6cmvhd\0\0\0\0\0\0\0\0\0\0\0\0\0\0\x03\xe8\0\0\x1d\x4c", 36);
  const std::string whole = head + movie + std::string(80, '\0');
  const std::string path = std::string(getenv("TMPDIR")) + "/video.mp4";
  for (size_t size = 0; size <= whole.size(); ++size) {
    std::ofstream(path, std::ios::binary) << whole.substr(0, size);
    EXPECT_EQ(tavro_video_seconds(path.c_str()), size == whole.size() ? 7.5 : 0) << size;
  }
  EXPECT_EQ(tavro_video_length_text(7.4) + " " + tavro_video_length_text(3725), "0:07 1:02:05");
}

}  // namespace
