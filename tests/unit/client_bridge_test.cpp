// Requests to other programs and the version check: what the receivers read on the bus.
#include <gmock/gmock.h>

#include <ctime>

#include "client_support.h"
#include "tavro_notifications.h"
#include "tavro_preferences.h"
#include "tavro_service_bridge.h"
#include "tavro_version_check.h"

using ::testing::ElementsAre;

namespace {

constexpr char kDefault[] = "/corvane/tavro_svc http://tizen.org/appcontrol/operation/default  ";

class Bridge : public ClientTest {};

TEST_F(Bridge, EveryOperationCarriesItsKeysInOrder) {
  const struct {
    const char *operation;
    int value;
    const char *extras;
  } cases[] = {
      {"TAVRO_SEND_FAILED_VOC", 7, " TAVRO_VOC_ID=7"},
      {"TAVRO_OPERATION_TYPE_UI", -1, " TAVRO_VOC_ID=-1"},
      {"TAVRO_OPERATION_TYPE_GET_BETA_LIST", 0,
       " TAVRO_BETA_LIST_TYPE=false TAVRO_BETA_PAGE_NO=1 TAVRO_BETA_PAGE_SIZE=10"},
      {"TAVRO_OPERATION_TYPE_GET_BETA_LIST", 5,
       " TAVRO_BETA_LIST_TYPE=true TAVRO_BETA_PAGE_NO=1 TAVRO_BETA_PAGE_SIZE=10"},
      {"TAVRO_OPERATION_TYPE_GET_BETA_DETAILS", 2147483647, " TAVRO_BETA_ID=2147483647"},
      {"TAVRO_OPERATION_TYPE_OPT_IN_BETA", 3, " TAVRO_BETA_ID=3 TAVRO_BETA_TYPE=app"},
      {"TAVRO_OPERATION_TYPE_OPT_OUT_BETA", 3, " TAVRO_BETA_ID=3 TAVRO_BETA_TYPE=app"},
      {"TAVRO_OPERATION_TYPE_REGISTER_USER_CLICK", 4, " TAVRO_CLICK_ITEM_ID=4 TAVRO_CLICK_ITEM_TYPE=banner"},
      {"TAVRO_OPERATION_TYPE_GET_BANNERS", 9, ""},
      {nullptr, 9, ""},
  };
  for (const auto &one : cases) {
    _tavro_launch_upload_mgr_svc(one.operation, one.value);
    const std::string type = std::string("TAVRO_OPERATION_TYPE=") + (one.operation ? one.operation : "");
    EXPECT_THAT(Listener::get().take(), ElementsAre(kDefault + type + one.extras));
  }
}

TEST_F(Bridge, AClickIsToldWithItsKindWhenThatIsKnown) {
  const std::string click =
      kDefault + std::string("TAVRO_OPERATION_TYPE=TAVRO_OPERATION_TYPE_REGISTER_USER_CLICK");
  const std::pair<const char *, std::string> kinds[] = {
      {"general", " TAVRO_CLICK_ITEM_ID=-9000000000 TAVRO_CLICK_ITEM_TYPE=general"},
      {"banner", " TAVRO_CLICK_ITEM_ID=-9000000000 TAVRO_CLICK_ITEM_TYPE=banner"},
      {"other", ""},
      {nullptr, ""}};
  for (const auto &[kind, extras] : kinds) {
    _tavro_send_beta_click_event_to_svc(kind, -9000000000);
    EXPECT_THAT(Listener::get().take(), ElementsAre(click + extras));
  }
}

TEST_F(Bridge, AnAddressIsOpenedByThePhonesApplicationOrTheMachinesForItsScheme) {
  EXPECT_TRUE(_tavro_launch_app_store("tizenstore://ProductDetail/x"));
  EXPECT_THAT(Listener::get().take(),
              ElementsAre("/org/tizen/tizenstore http://tizen.org/appcontrol/operation/view "
                          "tizenstore://ProductDetail/x"));
  EXPECT_FALSE(tavro_launch_browser("gopher://nobody"));
  EXPECT_FALSE(tavro_launch_browser(nullptr));
  const std::string visited = std::string(getenv("TMPDIR")) + "/data/visited";
  const std::string address = "https://forum.example/a?b=1&c='$(d)'";
  EXPECT_TRUE(tavro_launch_browser(address.c_str()));
  TavroGText contents;
  for (int i = 0; i < 3000 && !contents; i++) {
    char *read = nullptr;
    g_usleep(10000);
    if (g_file_get_contents(visited.c_str(), &read, nullptr, nullptr)) contents.reset(read);
  }
  ASSERT_NE(contents, nullptr);
  EXPECT_EQ(contents.get(), address);
}

TEST_F(Bridge, TheCrashServiceGetsOneWayCallsAndAWrongBodyIsRefused) {
  const char *const parameters[] = {"2", "none", "none"};
  const auto call = [&](const char *method, const char *signature) {
    return _tavro_dbus_method_sync("org.tizen.system.crash", "/Org/Tizen/System/Crash/Crash",
                                   "org.tizen.system.crash.Crash", method, signature, parameters);
  };
  EXPECT_EQ(call("dump_log", "(iss)"), 0);
  EXPECT_EQ(call("delete_dump", "(is)"), 0);
  EXPECT_EQ(call("delete_dump", "(iss)"), -1);
  EXPECT_EQ(call("no method name", "(is)"), -1);
  EXPECT_THAT(Listener::get().take(),
              ElementsAre("dump_log /Org/Tizen/System/Crash/Crash (2, 'none', 'none')",
                          "delete_dump /Org/Tizen/System/Crash/Crash (2, 'none')"));
}

TEST_F(Bridge, OnlyAnAnswerThatAsksForAnotherVersionOffersAnUpdate) {
  const std::string now = std::to_string(std::time(nullptr)) + "000";
  const std::string ahead = "99999999999999999";
  const struct {
    const char *code, *kind, *version, *offered_before;
    std::string update_time;
    int result;
    bool is_offered;
  } cases[] = {{nullptr, "major", "2.0.0", nullptr, "", -1, false},
               {"1", "major", "2.0.0", nullptr, "", 0, false},
               {"two", "major", "2.0.0", nullptr, "", 0, false},
               {"2", "major", "1.0.0", nullptr, "", 2, false},
               {"2", nullptr, "2.0.0", nullptr, "", 2, false},
               {"2", "major", "2.0.0", nullptr, "", 1, true},
               {"2", "minor", "2.0.0", nullptr, "", 2, true},
               {"2", "minor", "2.0.0", "updated", now, 2, false},
               {"2", "minor", "2.0.0", "updated", "1000", 2, true},
               {"2", "minor", "2.0.0", "updated", ahead, 2, false}};
  for (const auto &one : cases) {
    SetUp();
    const std::pair<const char *, const char *> values[] = {
        {TAVRO_PREF_APP_RESULT_CODE, one.code},
        {TAVRO_PREF_APP_VERSION_CHANGE, one.kind},
        {TAVRO_PREF_APP_VERSION, one.version},
        {TAVRO_PREF_UPDATE, one.offered_before},
        {TAVRO_PREF_APP_UPDATE_TIME, one.update_time.c_str()}};
    for (const auto &[key, value] : values) {
      if (value) preference_set_string(key, value);
    }
    EXPECT_EQ(check_version_update(&ad), one.result);
    EXPECT_EQ(tavro_version_popup_is_up(&ad), one.is_offered) << one.version << one.update_time;
    tavro_show_due_version_popup(&ad);
    EXPECT_EQ(ad.version_popup != nullptr, one.is_offered);
    ad.version_popup = nullptr;
  }
}

TEST_F(Bridge, APreferenceOfAnotherTypeReadsAsNoValue) {
  preference_set_int(TAVRO_PREF_USERNAME, 5);
  preference_set_string(TAVRO_PREF_MAX_SIZE_ATTACHMENT, "many");
  preference_set_string(TAVRO_PREF_NOTIFY, "yes");
  EXPECT_EQ(tavro_get_username_from_preference(), nullptr);
  EXPECT_EQ(tavro_preference_int(TAVRO_PREF_MAX_SIZE_ATTACHMENT, 3), 3);
  EXPECT_FALSE(tavro_preference_flag(TAVRO_PREF_NOTIFY, false));
}

TEST_F(Bridge, ReplyNotificationsAreShortAndLeftOutWhenSwitchedOff) {
  tavro_create_push_notification("thank <b>you", 3);
  tavro_create_push_notification((std::string(199, 'x') + "öö" + std::string(1 << 20, 'y')).c_str(), 3);
  preference_set_boolean(TAVRO_PREF_NOTIFY, false);
  tavro_create_push_notification("again", 3);
  const std::vector<std::string> posted = Listener::get().take();
  ASSERT_EQ(posted.size(), 2u);
  EXPECT_EQ(posted[1], "Notify IDS_OB_MBODY_NEW_REPLY|" + std::string(199, 'x') + "ö…");
  EXPECT_THAT(posted[0], ::testing::StartsWith("Notify IDS_OB_MBODY_NEW_REPLY|thank"));
}

}  // namespace
