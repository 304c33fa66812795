// Create, resume and terminate of the client.
#include <gmock/gmock.h>

#include <ctime>

#include "client_support.h"
#include "files.h"
#include "tavro_lifecycle.h"
#include "tavro_memory.h"
#include "tavro_preferences.h"

using ::testing::ElementsAre;
using ::testing::HasSubstr;
using ::testing::IsEmpty;

namespace {

class Lifecycle : public ClientTest {
 protected:
  static bool flag(const char *key) { return tavro_preference_flag(key, false); }
};

TEST_F(Lifecycle, TheFirstStartSeedsPreferencesAndLaterOnesKeepThem) {
  preference_set_string(TAVRO_PREF_FEEDBACK, "not a switch");
  ASSERT_TRUE(app_create(&ad));
  EXPECT_TRUE(flag(TAVRO_PREF_NOTIFY));
  bool value = true;
  EXPECT_EQ(preference_get_boolean(TAVRO_PREF_FEEDBACK, &value), PREFERENCE_ERROR_NONE);
  EXPECT_FALSE(value);
  EXPECT_EQ(tavro_preference_int(TAVRO_PREF_MAX_SIZE_ATTACHMENT, 0), 30720);
  EXPECT_EQ(tavro_preference_int(TAVRO_PREF_FLASH_WINDOWS, 7), 0);
  EXPECT_EQ(ad.win, nullptr);
  EXPECT_EQ(ad.add_video_to_tavro, 1);
  EXPECT_EQ(ad.comm_url_type, TAVRO_COMMUNITY_MAX);
  EXPECT_THAT(Listener::get().take(), IsEmpty());

  preference_set_boolean(TAVRO_PREF_NOTIFY, false);
  preference_set_int(TAVRO_PREF_MAX_SIZE_ATTACHMENT, 5);
  ASSERT_TRUE(app_create(&ad));
  EXPECT_FALSE(flag(TAVRO_PREF_NOTIFY));
  EXPECT_EQ(tavro_preference_int(TAVRO_PREF_MAX_SIZE_ATTACHMENT, 0), 30720);
}

TEST_F(Lifecycle, AMandatoryUpdateLeavesEverythingElseUndone) {
  sign_in();
  offer_version("major");
  EXPECT_TRUE(app_create(&ad));
  EXPECT_FALSE(flag(TAVRO_PREF_NOTIFY));
  EXPECT_EQ(tavro_preference_int(TAVRO_PREF_MAX_SIZE_ATTACHMENT, 0), 0);
  EXPECT_EQ(ad.win, nullptr);
  EXPECT_THAT(Listener::get().take(), IsEmpty());
  launch(nullptr);
  EXPECT_THAT(ui_calls, ElementsAre("window", "landing", "popup IDS_OB_HEADER_UPDATE_AVAILABLE"));
}

TEST_F(Lifecycle, TheForumIsAskedForOnlyWithAnAccountAndAnOldCookie) {
  const int now = static_cast<int>(std::time(nullptr));
  tavro_prepare_webview(&ad);
  sign_in();
  preference_set_int(TAVRO_PREF_COOKIE_EXPIRY_TIME, now + 1000);
  tavro_prepare_webview(&ad);
  EXPECT_THAT(Listener::get().take(), IsEmpty());
  preference_set_int(TAVRO_PREF_COOKIE_EXPIRY_TIME, now - 1000);
  ad.load_urls_to_webview = 1;
  tavro_prepare_webview(&ad);
  EXPECT_EQ(ad.load_urls_to_webview, 0);
  EXPECT_THAT(Listener::get().take(), ElementsAre(HasSubstr("TAVRO_OPERATION_TYPE_GET_BOARDS_URL")));
}

TEST_F(Lifecycle, EveryResumeAsksForBannersOnceAlsoWithoutAWindow) {
  app_resume(&ad);
  EXPECT_THAT(Listener::get().take(), ElementsAre(HasSubstr("=TAVRO_OPERATION_TYPE_GET_BANNERS")));
}

TEST_F(Lifecycle, TerminateDropsARunningRecordingAndReleasesTheRecord) {
  preference_set_boolean(TAVRO_PREF_SYSLOGS, true);
  launch(nullptr);
  ad.minicontrol_win = ad.win;
  ad.cType = VIDEO;
  ad.recording_status = 1;
  ad.add_video_to_tavro = 1;
  ad.crashed_appname = TAVRO_STRDUP("mail");
  ad.image_list = g_slist_append(nullptr, TAVRO_STRDUP("/x.png"));
  app_terminate(&ad);
  EXPECT_EQ(ad.add_video_to_tavro, 0);
  EXPECT_FALSE(tavro_preference_flag(TAVRO_PREF_SYSLOGS, true));
  EXPECT_EQ(ad.win, nullptr);
  const std::string text = file_contents("/opt/usr/share/log/platform.log");
  EXPECT_THAT(text.substr(text.rfind("app terminate")), HasSubstr("total leak = 0"));
}

}  // namespace
