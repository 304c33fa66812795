// The upload service with the real desk: what arrives there, what comes back, and what a kill does to either.
#include "service_world.h"

namespace {

// The service's own: changed, it is as a kill at a certain moment would have left it.
constexpr char kMemory[] = "/opt/usr/apps/corvane.tavro-svc/data/service.db";
constexpr char kLog[] = "/opt/usr/share/log/platform.log";

class Service : public ServiceWorld {
 protected:
  void SetUp() override {
    ServiceWorld::SetUp();
    start_desk();
  }
  // Comes with the service.
  int send_report(const std::vector<std::string> &paths = {}) {
    const int id = store_report(paths);
    start_service();
    EXPECT_TRUE(wait_for_state(id, "1"));
    return id;
  }
};

TEST_F(Service, BringsAReportWithAllItsFilesToTheDesk) {
  const std::string picture(3000000, 'p');  // more than one piece
  const int id =
      store_report({make_file("ü & b?.png", picture), make_file("empty.png", "")}, "It's <b>grey</b> #1");
  start_service();
  launch("TAVRO_OPERATION_TYPE_UI", id);
  ASSERT_TRUE(wait_for_message("SUCCESS " + std::to_string(id)));
  EXPECT_EQ(column("VOC_STATE", id), "1");
  EXPECT_EQ(column("VOC_RETRY_COUNT", id), "1");
  EXPECT_EQ(std::filesystem::status(kMemory).permissions(), std::filesystem::perms(0600));
  const auto report = desk_report(id);
  EXPECT_EQ(report["text"], "It's <b>grey</b> #1");
  EXPECT_EQ(report["kind"], "problem");
  EXPECT_EQ(report["user"], "jana");
  ASSERT_EQ(report["attachments"].size(), 3u) << report;
  EXPECT_EQ(report["attachments"][0]["kind"], "device_status");
  EXPECT_EQ(report["attachments"][1]["name"], "ü & b?.png");
  EXPECT_EQ(report["missing"], nlohmann::json::array());
  EXPECT_EQ(file_contents(desk_folder_ + "/reports/" + column("VOC_ID_SERVER", id) + "/2"), picture);
}

TEST_F(Service, SendsAReportWithoutTheFilesThatCannotBeSentAndNamesThem) {
  std::filesystem::create_directories("/opt/usr/media/folder.png");
  const std::string huge = make_file("huge.mp4", "");
  std::filesystem::resize_file(huge, 65ll * 1024 * 1024);
  const int id = send_report(
      {"/opt/usr/media/gone.png", "/opt/usr/media/folder.png", huge, make_file("good.png", "good")});
  const auto report = desk_report(id);
  EXPECT_EQ(report["missing"], nlohmann::json({"gone.png", "folder.png", "huge.mp4"}));
  EXPECT_EQ(report["attachments"].size(), 2u);
}

TEST_F(Service, SendsPicturesWithoutTheirMetadataAndNoneThatItCannotTakeItFrom) {
  using namespace std::string_literals;
  const std::string rest = "\xFF\xDA\0\x02pixels\xFF\xD9"s;
  const std::string picture = "\xFF\xD8\xFF\xE1\0\x0E"s + "Exif\0\0where?"s + rest;
  const std::string path = make_file("holiday.jpg", picture);
  const int id = send_report({path, make_file("broken.jpg", "\xFF\xD8\xFF\xE1\xFF\xFF where?")});
  EXPECT_EQ(file_contents(desk_folder_ + "/reports/" + column("VOC_ID_SERVER", id) + "/2"),
            "\xFF\xD8" + rest);
  EXPECT_EQ(desk_report(id)["missing"], nlohmann::json({"broken.jpg"}));
  EXPECT_EQ(file_contents(path), picture);
}

TEST_F(Service, LeavesTheLastAttachmentsBehindWhenThereAreMoreFilesThanTheDeskTakes) {
  std::vector<std::string> paths;
  for (int i = 1; i <= 33; ++i) paths.push_back(make_file(std::to_string(i) + ".png", "p"));
  const int id = send_report(paths);
  const auto report = desk_report(id);
  EXPECT_EQ(report["missing"], nlohmann::json({"32.png", "33.png"}));
  EXPECT_EQ(report["attachments"][0]["kind"], "device_status");
}

TEST_F(Service, FollowUpToAReportThatTheDeskDoesNotKnowIsRefusedAndHoldsNothingUp) {
  const auto store_follow_up = [](int first) {
    Problem report = problem_report("jana", "Still grey");
    for (char **path : {&report->dump_file, &report->syslog_file, &report->device_data_filepath})
      TAVRO_FREE(*path);
    report->follow_up_of = first;
    report->follow_up_verdict = TAVRO_STRDUP(TAVRO_DBMGR_STILL_HAPPENS);
    return tavro_dbmgr_update_bug_report(report.get());
  };
  const int first = store_report(), to_nobody = store_follow_up(7);
  start_service();
  ASSERT_TRUE(wait_for_message("FAIL " + std::to_string(to_nobody)));
  EXPECT_EQ(column("VOC_STATE", to_nobody), "0");
  ASSERT_TRUE(wait_for_state(first, "1"));
  const int server_id = std::stoi(column("VOC_ID_SERVER", first));
  const int follow_up = store_follow_up(server_id);
  launch("TAVRO_OPERATION_TYPE_UI", follow_up);
  ASSERT_TRUE(wait_for_state(follow_up, "1"));
  EXPECT_EQ(desk_report(follow_up)["follow_up_of"], server_id);
}

TEST_F(Service, SendsARequestedReportOnlyOnceItIsWrittenWhole) {
  const int half = store_report(), whole = store_report();
  const std::string row = " FROM TABLE_VOC_EXTENDED WHERE VOC_ID = " + std::to_string(half);
  run("CREATE TABLE kept AS SELECT *" + row);
  run("DELETE" + row);
  start_service();
  launch("TAVRO_OPERATION_TYPE_UI", half);
  launch("TAVRO_OPERATION_TYPE_UI", whole);
  ASSERT_TRUE(wait_for_message("SUCCESS " + std::to_string(whole)));
  run_loop_for(200);
  EXPECT_EQ(column("VOC_STATE", half), "10");
  run("INSERT INTO TABLE_VOC_EXTENDED SELECT * FROM kept");
  launch("TAVRO_OPERATION_TYPE_UI", half);
  EXPECT_TRUE(wait_for_state(half, "1"));
}

TEST_F(Service, KeepsAMessageUntilAClientThatIsAwayIsBack) {
  set_client_present(false);
  const int id = send_report();
  run_loop_for(1000);  // more than five tries
  set_client_present(true);
  EXPECT_TRUE(wait_for_message("SUCCESS " + std::to_string(id)));
  EXPECT_EQ(messages_.size(), 1u);
}

TEST_F(Service, KeepsAReportWhileTheDeskIsDownAndSendsItUnaskedOnceTheDeskIsBack) {
  start_service();
  desk_.kill();
  const int first = store_report(), second = store_report();
  launch("TAVRO_OPERATION_TYPE_UI", first);
  ASSERT_TRUE(wait_for_state(first, "11"));
  ASSERT_TRUE(wait_for_state(second, "11"));
  // A launch request that comes after the service found the report on its own makes the failure no news.
  launch("TAVRO_OPERATION_TYPE_UI", second);
  run_loop_for(600);  // several tries
  for (int id : {first, second}) EXPECT_EQ(count_messages("FAIL " + std::to_string(id)), 1);
  EXPECT_GT(std::stoi(column("VOC_RETRY_COUNT", first)), 1);
  start_desk();
  ASSERT_TRUE(wait_for_state(first, "1"));
  ASSERT_TRUE(wait_for_state(second, "1"));
  ASSERT_TRUE(wait_for_message("SUCCESS " + std::to_string(second)));
}

TEST_F(Service, KeepsADraftADraftUntilItHasArrivedAlsoWhenItIsKilledMeanwhile) {
  const int id = store_report();
  tavro_dbmgr_update_sending_state(id, TAVRO_STATUS_DRAFT_SAVED);
  start_service();
  run_loop_for(300);
  EXPECT_EQ(column("VOC_STATE", id), "6");  // nobody asked
  service_.kill();
  FakeDesk silent;
  silent.on_report = [](SoupServerMessage *message) { soup_server_message_pause(message); };
  run("DELETE FROM value WHERE name = 'token'", kMemory);
  start_service(silent.url);
  launch("TAVRO_SEND_FAILED_VOC", id);
  ASSERT_TRUE(wait_until([&] { return silent.reports > 0; }));
  EXPECT_EQ(column("VOC_STATE", id), "6");
  service_.kill();
  run("DELETE FROM value WHERE name = 'token'", kMemory);
  start_service();
  EXPECT_TRUE(wait_for_state(id, "1"));
}

TEST_F(Service, BringsAnAnswerToAnIdeaIntoTheStoreAndToTheClient) {
  const Idea idea(TAVRO_ZALLOC(tavro_dbmgr_suggestion_info));
  idea->suggestion = TAVRO_STRDUP("A dark keyboard");
  idea->app_name = TAVRO_STRDUP("IDS_OB_BODY_SOMETHING_ELSE");
  idea->user_name = TAVRO_STRDUP("jana");
  idea->submitted = TAVRO_STATUS_SENDING;
  const int id = tavro_dbmgr_update_suggestion(idea.get());
  start_service();
  ASSERT_TRUE(wait_for_state(id, "1"));
  EXPECT_EQ(desk_report(id)["kind"], "idea");
  EXPECT_EQ(desk_report(id)["app"], "Something else");
  answer(id, 2, "We look # at <it>");
  ASSERT_TRUE(wait_for_message("UPDATED " + std::to_string(id) + " We look # at <it>"));
  answer(id, 3, "");
  ASSERT_TRUE(wait_for_message("UPDATED " + std::to_string(id)));
  EXPECT_EQ(column("VOC_STATE", id), "1#2#3");
  EXPECT_EQ(column("VOC_PUSH_COMMENTS", id), "none#We look   at &lt;it&gt;#none");
  EXPECT_EQ(column("VOC_PUSH_READ", id), "0");
}

TEST_F(Service, WritesAnAnswerOnceWhenItDiesBetweenWritingItAndNotingSo) {
  const int id = send_report();
  answer(id, 2, "Once");
  ASSERT_TRUE(wait_for_message("UPDATED " + std::to_string(id) + " Once"));
  service_.kill();
  run("UPDATE value SET value = '0' WHERE name = 'cursor'; INSERT INTO intent VALUES(1, 1, 1)", kMemory);
  start_service();
  ASSERT_TRUE(wait_for_message("UPDATED " + std::to_string(id) + " Once", 2));
  EXPECT_EQ(column("VOC_STATE", id), "1#2");
}

TEST_F(Service, FindsTheReportOfAnAnswerThatOvertookTheEndOfItsUpload) {
  const int id = send_report();
  service_.kill();
  answer(id, 4, "Done");
  run("UPDATE TABLE_VOC SET VOC_STATE = '10', VOC_ID_SERVER = NULL");
  start_service();
  EXPECT_TRUE(wait_for_state(id, "1#4"));
  run_loop_for(300);
  EXPECT_EQ(column("VOC_STATE", id), "1#4");
}

TEST_F(Service, LosesAndDoublesNothingWhenEverythingIsKilledAtAnyMoment) {
  std::vector<int> ids;
  for (int i = 0; i < 6; ++i)
    ids.push_back(store_report({make_file(std::to_string(i) + ".mp4", std::string(3000000, 'v'))}));
  for (unsigned round = 0; round < 40; ++round) {
    start_service();
    run_loop_for(5 + round * 13 % 97);
    if (round % 4 == 3) {
      desk_.kill();
      start_desk();
    }
    if (round % 3 == 2 && column("VOC_STATE", ids[0]) == "1") answer(ids[0], 2, "Seen");
    service_.kill();
  }
  start_service();
  for (int id : ids)
    ASSERT_TRUE(wait_until([&] {
      return column("VOC_STATE", id)[0] == '1' && column("VOC_STATE", id) != "10" &&
             column("VOC_STATE", id) != "11";
    }));
  answer(ids[0], 5, "Last");
  ASSERT_TRUE(wait_for_message("UPDATED " + std::to_string(ids[0]) + " Last"));
  EXPECT_EQ(staff("/reports")["reports"].size(), ids.size());
  std::string expected = "1";
  const auto first = desk_report(ids[0]);
  for (const auto &given : first["answers"]) expected += "#" + given["status"].dump();
  EXPECT_EQ(column("VOC_STATE", ids[0]), expected);
  for (int id : ids) {
    const auto files = desk_report(id)["attachments"];
    EXPECT_EQ(files.size(), 2u);
    for (const auto &file : files) EXPECT_TRUE(file["complete"]);
    EXPECT_GE(count_messages("SUCCESS " + std::to_string(id)), 1);
  }
}

TEST_F(Service, LeavesEverythingAsItIsAfterABadRequest) {
  const int id = store_report();
  tavro_dbmgr_update_sending_state(id, TAVRO_STATUS_DRAFT_SAVED);
  const std::string long_text(1024 * 1024, '7'), own = std::to_string(id);
  start_service();
  const auto log_size = file_contents(kLog).size();
  using Pairs = std::vector<std::pair<std::string, std::string>>;
  for (const Pairs &bad :
       std::vector<Pairs>{{},
                          {{"TAVRO_VOC_ID", own}},
                          {{"TAVRO_OPERATION_TYPE", "TAVRO_NO_SUCH"}, {"TAVRO_VOC_ID", own}},
                          {{"TAVRO_OPERATION_TYPE", long_text}},
                          {{"TAVRO_OPERATION_TYPE", "TAVRO_OPERATION_TYPE_UI"}},
                          {{"TAVRO_OPERATION_TYPE", "TAVRO_OPERATION_TYPE_GET_BANNERS"}}})
    launch(bad);
  for (const std::string &bad_id :
       {std::string("0"), own + " ", "-" + own, own + "x", std::string("99999999999"), std::string("4711"),
        long_text, std::string("1; DROP TABLE TABLE_VOC")})
    launch({{"TAVRO_OPERATION_TYPE", "TAVRO_OPERATION_TYPE_UI"}, {"TAVRO_VOC_ID", bad_id}});
  const int good = store_report();
  launch("TAVRO_OPERATION_TYPE_UI", good);
  ASSERT_TRUE(wait_for_message("SUCCESS " + std::to_string(good)));
  EXPECT_EQ(column("VOC_STATE", id), "6");
  EXPECT_TRUE(service_.is_running());
  EXPECT_EQ(messages_.size(), 1u);
  const auto log = file_contents(kLog);
  EXPECT_LT(log.size() - log_size, 20000u);  // a long text is not repeated at length
  EXPECT_NE(log.find("unknown operation \"TAVRO_NO_SUCH\""), std::string::npos);
}

}  // namespace
