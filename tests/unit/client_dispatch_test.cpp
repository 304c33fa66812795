// Launch dispatch and the upload service's messages: what each request makes the client do.
#include <badge.h>
#include <gmock/gmock.h>

#include <ctime>
#include <filesystem>
#include <fstream>

#include "client_support.h"
#include "store_access.h"
#include "tavro_appcontrol_util.h"
#include "tavro_appdata.h"
#include "tavro_dbmgr.h"
#include "tavro_dbmgr_catalogue.h"
#include "tavro_lifecycle.h"
#include "tavro_notifications.h"
#include "tavro_preferences.h"
#include "tavro_service_events.h"

using ::testing::ElementsAre;
using ::testing::HasSubstr;
using ::testing::IsEmpty;

namespace {

class Dispatch : public ClientTest {
 protected:
  // A report of the person that the desk knows as 77 and has just answered.
  int answered_report() {
    sign_in();
    const int id = store_report("no sound", 12);
    tavro_dbmgr_update_server_voc_id(id, 77);
    _tavro_dbmgr_update_push_status_comments("77", "2", "we look at it");
    return id;
  }
  void update(Extras extras) { launch("TAVRO_UPDATE_HISTORY", extras); }
  void upload(const std::string &result, const std::string &id) {
    update({{TAVRO_SERVER_UPLOAD_STATUS, result}, {TAVRO_SERVER_PUSH_NOTI_VOC_ID, id}});
  }
  void reply(int id, const char *text) {
    update({{TAVRO_SERVER_PUSH_NOTI_STATUS, TAVRO_SERVER_PUSH_NOTI_UPDATED},
            {TAVRO_SERVER_PUSH_NOTI_VOC_ID, std::to_string(id)},
            {TAVRO_SERVER_PUSH_NOTI_VOC_COMMENTS, text}});
  }
  // Its start is no part of the test.
  void open_client() {
    launch(nullptr);
    Listener::get().take();
    ui_calls.clear();
  }
};

TEST_F(Dispatch, EveryRequestAsksTheServiceForNewsFirst) {
  const auto asked = [](const char *operation) {
    return HasSubstr(std::string("TAVRO_OPERATION_TYPE=") + operation);
  };
  app_control(make_request("NOBODY_KNOWS_THIS", {}).get(), nullptr);
  EXPECT_THAT(Listener::get().take(), ElementsAre(asked("TAVRO_OPERATION_TYPE_APP_UPDATE"),
                                                  asked("TAVRO_OPERATION_TYPE_GET_BETA_URLS"),
                                                  asked("TAVRO_OPERATION_TYPE_GET_MAX_LIMIT")));
  launch("NOBODY_KNOWS_THIS");
  EXPECT_THAT(Listener::get().take(), ElementsAre(asked("TAVRO_OPERATION_TYPE_APP_UPDATE"),
                                                  asked("TAVRO_OPERATION_TYPE_GET_BETA_URLS"),
                                                  asked("TAVRO_OPERATION_TYPE_GET_MAX_LIMIT"),
                                                  asked("TAVRO_OPERATION_TYPE_GET_USER_BETA_STATUS"),
                                                  asked("TAVRO_OPERATION_TYPE_GET_MODEL_ALIAS_STATUS")));
  EXPECT_THAT(ui_calls, ElementsAre("window", "account"));
}

TEST_F(Dispatch, EveryKnownOperationBuildsTheWindowOnceOrEndsAClientWithoutOne) {
  const char *const build[] = {"CPMGR_ERROR",
                               "TAVRO_GET_BETA_URLS",
                               "TAVRO_LICENSE_URL",
                               "TAVRO_BANNER_INFO",
                               "TAVRO_JOIN_BETA",
                               "TAVRO_GET_BETA_LIST",
                               "TAVRO_GET_BETA_DETAILS",
                               "TAVRO_QUIT_BETA",
                               "TAVRO_OPT_IN_BETA",
                               "TAVRO_OPT_OUT_BETA",
                               "TAVRO_GET_BETA_USER_STATUS",
                               "TAVRO_NON_VOC_PUSH_NTFCTN",
                               "TAVRO_BETA_PUSH_NTFCTN",
                               APP_CONTROL_OPERATION_SHARE,
                               "TAVRO_UPDATE_HISTORY",
                               nullptr};
  sign_in();
  for (const char *operation : build) {
    ui_calls.clear();
    launch(operation);
    launch(operation);
    EXPECT_THAT(ui_calls, ElementsAre("window", "landing")) << operation;
    EXPECT_FALSE(tavro_is_ending());
    evas_object_del(std::exchange(ad.win, nullptr));
  }
  for (const char *operation : {"TAVRO_BOARDS_URLS", "DUMP_LOG_PROCESS"}) {
    tavro_initialize_application_data(&ad);
    launch(operation);
    EXPECT_TRUE(tavro_is_ending()) << operation;
    EXPECT_EQ(ad.win, nullptr);
  }
}

TEST_F(Dispatch, ATouchedNotificationOpensTheReportThatItNames) {
  const int id = answered_report();
  const auto touch = [this](const char *type, const std::string &voc_id) {
    ui_calls.clear();
    launch(nullptr, {{TAVRO_NOTIFICATION_EVENT, TAVRO_NOTIFICATION_CLICKED},
                     {TAVRO_NOTIFICATION_TYPE, type},
                     {TAVRO_NOTIFICATION_VOC_ID, voc_id}});
    return ui_calls;
  };
  EXPECT_THAT(touch(TAVRO_NOTIFICATION_VOC, std::to_string(id)),
              ElementsAre("window", "landing", "history", "details " + std::to_string(id)));
  for (const char *bad_id : {"", "0", "-1", "12abc", "99999999999999999999", "424242"}) {
    EXPECT_THAT(touch(TAVRO_NOTIFICATION_VOC, bad_id), ElementsAre("history")) << bad_id;
  }
  EXPECT_THAT(touch(TAVRO_NOTIFICATION_NONVOC, std::to_string(id)), IsEmpty());
}

TEST_F(Dispatch, NewsOfTheCatalogueIsToldOnceUntilItIsReadOrExpired) {
  const auto store = [](long id, const char *title, unsigned long long expiry) {
    char *const text = const_cast<char *>(title);
    const tavro_dbmgr_notification_details news = {id, 1, 4, 0, text, text, nullptr, nullptr, 1, expiry, 0};
    ASSERT_EQ(tavro_dbmgr_update_non_voc_ntfctn_deatils(&news), 0);
  };
  char name[] = "Camera 2";
  const tavro_dbmgr_beta_info programme = {4, nullptr, name, nullptr, 1, nullptr, nullptr, 1};
  const GSList programmes = {const_cast<tavro_dbmgr_beta_info *>(&programme), nullptr};
  tavro_dbmgr_update_beta_list(&programmes);
  store(31, "fresh", 0);
  store(32, "late", 1);
  const auto told = [this](const char *operation, const char *noti_id, const char *beta_id) {
    launch(operation, {{TAVRO_NOTIFICATION_NOTI_ID, noti_id}, {TAVRO_NOTIFICATION_BETA_ID, beta_id}});
    return Listener::get().take_answers();
  };
  const char kNews[] = "TAVRO_NON_VOC_PUSH_NTFCTN", kBeta[] = "TAVRO_BETA_PUSH_NTFCTN";
  EXPECT_THAT(told(kNews, "31", "4"), ElementsAre("Notify fresh|fresh"));
  EXPECT_THAT(told(kBeta, "0", "4"), ElementsAre("Notify IDS_OB_MBODY_BETA_NEWS|Camera 2"));
  for (const char *unknown : {"32", "33", "", "3x", "99999999999999999999"})
    EXPECT_THAT(told(kNews, unknown, "5"), IsEmpty()) << unknown;
  EXPECT_THAT(told(kBeta, "33", "5"), IsEmpty());
  launch(nullptr, {{TAVRO_NOTIFICATION_EVENT, TAVRO_NOTIFICATION_CLICKED},
                   {TAVRO_NOTIFICATION_TYPE, TAVRO_NOTIFICATION_NONVOC},
                   {TAVRO_NOTIFICATION_NOTI_ID, "31"}});
  EXPECT_THAT(told(kBeta, "31", "4"), IsEmpty());
}

TEST_F(Dispatch, LogOutForgetsTheAccountAndShowsTheAccountPageAlone) {
  const char *const gone[] = {"tavro_username",        "tavro_password",   "tavro_account_domain",
                              "tavro_domain",          "tavro_cookie_val", "tavro_cookie_name",
                              "tavro_beta_testing_url"};
  for (const char *key : gone) preference_set_string(key, "x");
  preference_set_int("tavro_cookie_expiry_time", 5);
  preference_set_string("tavro_corvane_user_name", "anna");
  ad.push_noti_count = 3;
  tavro_create_noti_badge_on_appicon(3);
  launch(nullptr);
  ui_calls.clear();
  launch("TAVRO_USER_LOGOUT");
  EXPECT_THAT(ui_calls, ElementsAre("account", "account says IDS_OB_BODY_SIGNED_OUT"));
  EXPECT_EQ(elm_naviframe_top_item_get(ad.nf), elm_naviframe_bottom_item_get(ad.nf));
  bool exists = true;
  for (const char *key : gone) EXPECT_TRUE(preference_is_existing(key, &exists) == 0 && !exists) << key;
  EXPECT_TRUE(preference_is_existing("tavro_cookie_expiry_time", &exists) == 0 && !exists);
  EXPECT_TRUE(preference_is_existing("tavro_corvane_user_name", &exists) == 0 && exists);
  unsigned int count = 3;
  EXPECT_TRUE(badge_get_count(TAVRO_APP_ID, &count) != BADGE_ERROR_NONE || count == 0);
}

TEST_F(Dispatch, AnUploadedReportGivesUpItsLogAndIsAnnounced) {
  sign_in();
  const std::string log_path = std::string(getenv("TMPDIR")) + "/system.log";
  std::ofstream(log_path) << "log";
  const std::string id = std::to_string(store_report("no sound", 12, log_path.c_str()));
  open_client();
  upload(TAVRO_SERVER_UPLOAD_SUCCESS, id);
  EXPECT_FALSE(std::filesystem::exists(log_path));
  EXPECT_THAT(Listener::get().take_answers(), ElementsAre("Notify IDS_OB_MBODY_FEEDBACK_SENT|no sound"));
  EXPECT_THAT(ui_calls, ElementsAre("update history", "update details " + id));
  EXPECT_FALSE(tavro_is_ending());
}

TEST_F(Dispatch, AnUploadResultIsShownOnlyToItsOwnerWhoIsSignedIn) {
  const std::string id = std::to_string(store_report("no sound", 11));
  const auto fail = [&] {
    upload(TAVRO_SERVER_UPLOAD_FAIL, id);
    return Listener::get().take_answers();
  };
  EXPECT_THAT(fail(), IsEmpty());
  EXPECT_EQ(ad.connection_popup, nullptr);
  preference_set_string("tavro_username", "bert");
  EXPECT_THAT(fail(), IsEmpty()) << "it is anna's";
  sign_in();
  EXPECT_THAT(fail(), ElementsAre("Notify IDS_OB_TMBODY_SENDING_FAILED|no sound"));
  EXPECT_NE(ad.connection_popup, nullptr);
}

TEST_F(Dispatch, AReplyRaisesBadgeAndNotificationAndRefreshesWhatIsOpen) {
  const int id = answered_report();
  open_client();
  reply(id, "we look at it");
  unsigned int count = 0;
  EXPECT_EQ(badge_get_count(TAVRO_APP_ID, &count), BADGE_ERROR_NONE);
  EXPECT_EQ(count, 1u);
  EXPECT_THAT(ui_calls, ElementsAre("badge 1", "update history", "update details " + std::to_string(id)));
  EXPECT_THAT(Listener::get().take_answers(), ElementsAre("Notify IDS_OB_MBODY_NEW_REPLY|we look at it"));
  preference_set_string("tavro_username", "bert");
  reply(id, "we look at it");
  EXPECT_THAT(Listener::get().take_answers(), IsEmpty()) << "it is anna's";
}

TEST_F(Dispatch, TwoAnswersInTheSameMillisecondAreBothStoredAndTold) {
  const int id = answered_report();
  _tavro_dbmgr_update_push_status_comments("77", "3", "solved");
  _tavro_dbmgr_update_push_status_comments("424242", "3", "nobody's");
  launch(nullptr);
  for (const char *text : {"we look at it", "solved"}) reply(id, text);
  EXPECT_THAT(Listener::get().take_answers(),
              ::testing::IsSupersetOf(
                  {"Notify IDS_OB_MBODY_NEW_REPLY|we look at it", "Notify IDS_OB_MBODY_NEW_REPLY|solved"}));
  EXPECT_EQ(column(id, "VOC_STATE"), "12#2#3");
  EXPECT_THAT(column(id, "VOC_PUSH_COMMENTS"),
              ::testing::AllOf(HasSubstr("we look at it"), HasSubstr("solved")));
  EXPECT_EQ(ad.push_noti_count, 1) << "one report has news";
}

TEST_F(Dispatch, AReplyIsToldAndTheClientEndsAlsoWhenTheStoreCannotBeCounted) {
  sign_in();
  const TavroRequest reply = make_request(nullptr, {{TAVRO_SERVER_PUSH_NOTI_VOC_COMMENTS, "we look at it"}});
  run("ALTER TABLE TABLE_VOC RENAME TO AWAY");
  for (const auto &[known, shown] : {std::pair(3, 3u), std::pair(-1, 3u)}) {
    tavro_initialize_application_data(&ad);
    ad.push_noti_count = known;
    tavro_handle_badge_notifications(reply.get(), &ad);
    unsigned int count = 0;
    badge_get_count(TAVRO_APP_ID, &count);
    EXPECT_EQ(count, shown) << "only a count that is known is put on the icon";
    EXPECT_TRUE(tavro_is_ending());
    EXPECT_THAT(Listener::get().take_answers(), ElementsAre("Notify IDS_OB_MBODY_NEW_REPLY|we look at it"));
  }
  run("ALTER TABLE AWAY RENAME TO TABLE_VOC");
}

TEST_F(Dispatch, AClientStartedForAMessageEndsAndBuildsNoWindow) {
  const std::string id = std::to_string(answered_report());
  for (const auto &[key, value] :
       {std::pair(TAVRO_SERVER_UPLOAD_STATUS, TAVRO_SERVER_UPLOAD_SUCCESS),
        std::pair(TAVRO_SERVER_PUSH_NOTI_STATUS, TAVRO_SERVER_PUSH_NOTI_UPDATED)}) {
    tavro_initialize_application_data(&ad);
    update({{key, value}, {TAVRO_SERVER_PUSH_NOTI_VOC_ID, id}});
    EXPECT_TRUE(tavro_is_ending());
    EXPECT_EQ(ad.win, nullptr);
  }
}

TEST_F(Dispatch, AMandatoryUpdateStopsTheRestOfTheMessage) {
  const int id = answered_report();
  offer_version("major");
  update({{TAVRO_APP_UPDATE_STATUS, "any"},
          {TAVRO_SERVER_UPLOAD_STATUS, TAVRO_SERVER_UPLOAD_SUCCESS},
          {TAVRO_SERVER_PUSH_NOTI_STATUS, TAVRO_SERVER_PUSH_NOTI_UPDATED},
          {TAVRO_SERVER_PUSH_NOTI_VOC_ID, std::to_string(id)}});
  EXPECT_THAT(ui_calls, ElementsAre("window", "landing", "popup IDS_OB_HEADER_UPDATE_AVAILABLE"));
  EXPECT_THAT(Listener::get().take_answers(), IsEmpty());
  EXPECT_EQ(ad.push_noti_count, 0);
}

TEST_F(Dispatch, AnUpdateThatCouldNotBeOfferedYetIsOfferedOverAPageOrAtTheNextStart) {
  const std::string id = std::to_string(answered_report());
  offer_version("minor");
  preference_set_string(TAVRO_PREF_APP_UPDATE_TIME, (std::to_string(std::time(nullptr)) + "000").c_str());
  app_create(&ad);
  upload(TAVRO_SERVER_UPLOAD_SUCCESS, id);
  EXPECT_TRUE(tavro_is_ending());
  app_terminate(&ad);
  ui_calls.clear();
  app_create(&ad);
  launch("TAVRO_BOARDS_URLS");
  EXPECT_FALSE(tavro_is_ending());
  EXPECT_THAT(ui_calls, ElementsAre("window", "landing", "popup IDS_OB_HEADER_UPDATE_AVAILABLE"));
}

TEST_F(Dispatch, ValuesThatMakeNoSenseChangeNothingStored) {
  const int id = answered_report();
  const std::string before = column(id, "VOC_STATE || VOC_PUSH_COMMENTS || VOC_PUSH_READ");
  open_client();
  const std::string huge(1 << 20, 'x');
  for (const std::string &bad : {huge, std::string("12x"), std::string("-5"), std::string("424242")}) {
    upload(bad, bad);
    upload(TAVRO_SERVER_UPLOAD_FAIL, bad);
    EXPECT_THAT(Listener::get().take_answers(), ElementsAre("Notify IDS_OB_TMBODY_SENDING_FAILED|"));
  }
  update({{huge.c_str(), huge}});
  // A key that came twice is no text.
  const TavroRequest twice = make_request("TAVRO_UPDATE_HISTORY", {});
  const char *ids[] = {"1", "2"}, *statuses[] = {TAVRO_SERVER_UPLOAD_FAIL, TAVRO_SERVER_UPLOAD_FAIL};
  app_control_add_extra_data_array(twice.get(), TAVRO_SERVER_PUSH_NOTI_VOC_ID, ids, 2);
  app_control_add_extra_data_array(twice.get(), TAVRO_SERVER_UPLOAD_STATUS, statuses, 2);
  app_control(twice.get(), &ad);
  EXPECT_THAT(Listener::get().take_answers(), IsEmpty());
  EXPECT_EQ(column(id, "VOC_STATE || VOC_PUSH_COMMENTS || VOC_PUSH_READ"), before);
}

}  // namespace
