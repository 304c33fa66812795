// What sending and the server's answers make of a stored report.
#include "store_world.h"

namespace {

using ::testing::MatchesRegex;

class StoreServerState : public StoreWorld {
 protected:
  static std::string column(const char *name, int id) {
    return value(std::string("SELECT ") + name + " FROM TABLE_VOC WHERE VOC_ID = " + std::to_string(id));
  }
};

TEST_F(StoreServerState, AnswersAccumulateAndMarkTheReportUnread) {
  struct answer {
    const char *status, *reply, *states, *replies;
  };
  const answer answers[] = {
      {"2", "We look at it", "12#2", "none#We look at it"},
      {"3", nullptr, "12#2#3", "none#We look at it#none"},
      {"4", "ticket #5 it's <b> & done", "12#2#3#4",
       "none#We look at it#none#ticket  5 it&apos;s &lt;b&gt; &amp; done"},
      {nullptr, "x", "12#2#3#4#", "none#We look at it#none#ticket  5 it&apos;s &lt;b&gt; &amp; done#x"},
      {"4",
       "a\xef\xbf\xbc"
       "b",
       "12#2#3#4##4", "none#We look at it#none#ticket  5 it&apos;s &lt;b&gt; &amp; done#x#a b"},
  };
  const int id = save_problem("user", "text");
  EXPECT_EQ(tavro_dbmgr_get_unread_push_notification_count("user"), 0);
  tavro_dbmgr_set_voc_data_submitted_to_server(id, 77, 12);
  const std::string sent = column("VOC_DATE_OF_UPDATION", id);
  for (const answer &each : answers) {
    EXPECT_EQ(_tavro_dbmgr_update_push_status_comments("77", each.status, each.reply), 0);
    EXPECT_EQ(column("VOC_STATE", id), each.states);
    EXPECT_EQ(taken(tavro_dbmgr_get_voc_comments_by_id(id)), each.replies);
    EXPECT_EQ(tavro_dbmgr_get_unread_push_notification_count(nullptr), 1);
    tavro_dbmgr_update_read_push_notifications(id, 1);
    EXPECT_EQ(tavro_dbmgr_get_unread_push_notification_count(nullptr), 0);
  }
  EXPECT_THAT(column("VOC_DATE_OF_UPDATION", id), MatchesRegex("([0-9]+000#){5}" + sent));
}

TEST_F(StoreServerState, LostNetworkTouchesOnlyTheUsersReportsThatAreBeingSent) {
  for (int i = 0; i < 3; i++) save_problem("o'user", "text");
  save_problem("other", "text");
  tavro_dbmgr_set_voc_submitted_to_server(2, 12);
  EXPECT_EQ(tavro_dbmgr_set_voc_network_status("o'user"), 0);
  EXPECT_EQ(value("SELECT group_concat(VOC_STATE) FROM TABLE_VOC"), "11,12,11,10");
  tavro_dbmgr_update_sending_state(3, 10);
  EXPECT_EQ(column("VOC_STATE", 3), "10");
}

TEST_F(StoreServerState, SingleColumnsAreWrittenForOneReport) {
  const int id = save_problem("user", "text");
  const int other = save_problem("user", "text");
  run("UPDATE TABLE_VOC SET VOC_DATE_OF_UPDATION = '5'");
  EXPECT_EQ(tavro_dbmgr_get_voc_retry_count(id), 0);
  tavro_dbmgr_update_voc_retry_count(id, 3);
  tavro_dbmgr_set_voc_updated_time(id);
  tavro_dbmgr_update_server_voc_id(id, 9);
  EXPECT_EQ(tavro_dbmgr_get_voc_retry_count(id), 3);
  EXPECT_THAT(column("VOC_DATE_OF_UPDATION", id), MatchesRegex("[0-9]{10}000"));
  EXPECT_EQ(column("VOC_DATE_OF_UPDATION", other), "5");
  EXPECT_EQ(tavro_dbmgr_get_voc_retry_count(other), 0);
  EXPECT_EQ(tavro_dbmgr_get_voc_retry_count(99), -1);
  EXPECT_EQ(tavro_dbmgr_is_voc_present(9), 1);
  EXPECT_EQ(tavro_dbmgr_is_voc_present(8), 0);
  EXPECT_EQ(tavro_dbmgr_get_server_voc_count(9), 1);
  EXPECT_EQ(tavro_dbmgr_get_server_voc_count(8), 0);
  tavro_dbmgr_update_server_voc_id(other, 9);  // refused: another report has it
  EXPECT_EQ(column("VOC_ID_SERVER", other), "NULL");
}

TEST_F(StoreServerState, ReportKnownToTheServerKeepsItsOwnDatesAndIsRead) {
  const Problem report = problem_report("user", "it's known", {"/a"});
  report->date_of_creation = TAVRO_STRDUP("1500000000000");
  report->push_comments = TAVRO_STRDUP("none#it's done");
  report->server_voc_id = 42;
  report->submitted = TAVRO_STATUS_SOLVED;
  ASSERT_EQ(tavro_dbmgr_update_bug_report_with_server_voc_id(report.get()), 1);
  Idea idea(TAVRO_ZALLOC(tavro_dbmgr_suggestion_info));
  idea->date_of_creation = TAVRO_STRDUP("1");
  idea->date_of_updation = TAVRO_STRDUP("2");
  idea->server_voc_id = 43;
  ASSERT_EQ(tavro_dbmgr_update_suggestion_with_server_voc_id(idea.get()), 2);

  const Voc problem(tavro_dbmgr_get_voc_by_server_id(42));
  EXPECT_STREQ(problem->description, "it's known");
  EXPECT_STREQ(problem->title_description, "it's known");
  EXPECT_STREQ(problem->date_of_creation, "1500000000000");
  EXPECT_STREQ(problem->date_of_updation, "1500000000000");
  EXPECT_STREQ(problem->push_comments, "none#it's done");
  EXPECT_STREQ(problem->submitted, "3");
  EXPECT_EQ(problem->push_read, 1);
  EXPECT_NE(problem->attachments, nullptr);
  const Voc known_idea(tavro_dbmgr_get_voc_by_server_id(43));
  EXPECT_STREQ(known_idea->date_of_updation, "2");
  EXPECT_STREQ(known_idea->type, "TAVRO_DBMGR_SUGGESTION");
}

}  // namespace
