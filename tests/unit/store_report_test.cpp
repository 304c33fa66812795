// Reports, their attachments, and the application lists: what goes in comes out.
#include "store_world.h"

namespace {

using ::testing::ElementsAre;

class StoreReports : public StoreWorld {
 protected:
  static std::vector<Voc> history(const char *user) {
    std::vector<Voc> reports;
    GSList *list = tavro_dbmgr_get_vocs_for_history(user);
    for (GSList *item = list; item; item = item->next)
      reports.emplace_back(static_cast<svc_voc_data *>(item->data));
    g_slist_free(list);
    return reports;
  }

  static std::string paths(const GSList *attachments) {
    std::string joined;
    for (; attachments; attachments = attachments->next)
      joined += static_cast<const tavro_dbmgr_attachment_info *>(attachments->data)->file_path;
    return joined;
  }

  static std::vector<std::string> names(GSList *apps) {
    std::vector<std::string> found;
    for (GSList *item = apps; item; item = item->next)
      found.push_back(static_cast<tavro_pkg_info *>(item->data)->pkg_name);
    g_slist_free_full(apps, [](gpointer app) { tavro_db_free_app_info(static_cast<tavro_pkg_info *>(app)); });
    return found;
  }
};

TEST_F(StoreReports, NewReportHasItsKindStateTimesAndAttachmentsInOrder) {
  save_problem("other", "without attachments");
  const int id = save_problem("user", "", {"/b", "/a", "/c"});
  const Voc voc(tavro_dbmgr_get_voc_by_id(id));
  EXPECT_STREQ(voc->type, "TAVRO_DBMGR_BUG_REPORT");
  EXPECT_STREQ(voc->submitted, "10");
  EXPECT_EQ(voc->dump_file, nullptr);
  EXPECT_EQ(voc->push_comments, nullptr);
  EXPECT_STREQ(voc->date_of_creation, voc->date_of_updation);
  EXPECT_NEAR(std::stod(voc->date_of_creation), 1000.0 * static_cast<double>(time(nullptr)), 5000);
  for (GSList *item = voc->attachments; item; item = item->next) {
    const auto *attachment = static_cast<tavro_dbmgr_attachment_info *>(item->data);
    EXPECT_EQ(attachment->file_size, 1234);
    EXPECT_EQ(attachment->suggestion_id, id);
  }
  EXPECT_EQ(paths(voc->attachments), "/b/a/c");
  EXPECT_EQ(tavro_dbmgr_get_voc_by_id(id + 1), nullptr);
}

TEST_F(StoreReports, HistoryHoldsTheHundredChangedLastNewestFirst) {
  run("WITH RECURSIVE n(i) AS (SELECT 1 UNION ALL SELECT i + 1 FROM n WHERE i < 150) "
      "INSERT INTO TABLE_VOC(VOC_TYPE, VOC_APP_NAME, VOC_USER_NAME, VOC_DATE_OF_UPDATION) "
      "SELECT 't', 'a', 'user', (1600000000000 + i * 37 % 150 * 1000) || '#1500000000000' FROM n");
  save_problem("somebody else", "text");
  const auto reports = history("user");
  ASSERT_EQ(reports.size(), 100u);
  EXPECT_STREQ(reports.front()->date_of_updation, "1600000149000#1500000000000");
  EXPECT_STREQ(reports.back()->date_of_updation, "1600000050000#1500000000000");
}

TEST_F(StoreReports, EveryReportOfTheHistoryHasItsOwnTitleAndAttachments) {
  run("WITH RECURSIVE n(i) AS (SELECT 1 UNION ALL SELECT i + 1 FROM n WHERE i < 150) "
      "INSERT INTO TABLE_VOC(VOC_TYPE, VOC_APP_NAME, VOC_USER_NAME, VOC_DATE_OF_UPDATION) "
      "SELECT 't', 'a', 'user', '1600000000000' FROM n");  // changed at the same moment
  run("INSERT INTO TABLE_VOC_EXTENDED(VOC_ID, VOC_TITLE_TEXT) SELECT VOC_ID, 'title ' || VOC_ID FROM "
      "TABLE_VOC "
      "WHERE VOC_ID % 3 <> 0 ORDER BY VOC_ID * 37 % 150");
  run("INSERT INTO ATTACHMENT(ATTACHMENT_FILE_PATH, ATTACHMENT_FILE_TYPE, ATTACHMENT_SUGGESTION_ID) "
      "SELECT '/' || kind || VOC_ID, 'jpg', VOC_ID FROM TABLE_VOC, (SELECT 'b' AS kind UNION ALL SELECT 'a') "
      "WHERE VOC_ID % 2 = 0 ORDER BY VOC_ID * 37 % 150, kind DESC");
  for (const char *index : {"", "DROP INDEX VOC_BY_USER_AND_CHANGE", "DROP INDEX VOC_EXTENDED_BY_VOC",
                            "DROP INDEX ATTACHMENT_BY_VOC"}) {
    SCOPED_TRACE(index);
    run(index);
    const auto reports = history("user");
    ASSERT_EQ(reports.size(), 100u);
    for (const Voc &voc : reports) {
      const std::string id = std::to_string(voc->id);
      EXPECT_EQ(voc->title_description ? voc->title_description : "", voc->id % 3 ? "title " + id : "");
      EXPECT_EQ(paths(voc->attachments), voc->id % 2 ? "" : "/b" + id + "/a" + id);
    }
  }
}

TEST_F(StoreReports, DeletingTakesWhatItSays) {
  struct deletion {
    const char *name;
    void (*remove)();
    const char *left;  // rows of TABLE_VOC, ATTACHMENT, TABLE_VOC_EXTENDED
  };
  const deletion deletions[] = {
      {"one report", [] { tavro_dbmgr_destroy_vocs_by_id(1); }, "2/1/2"},
      {"all reports", tavro_dbmgr_destroy_vocs, "0/0/3"},
      {"problems", tavro_dbmgr_destroy_bug_reports, "1/3/3"},
      {"ideas", tavro_dbmgr_destroy_suggestions, "2/3/3"},
  };
  for (const deletion &each : deletions) {
    SCOPED_TRACE(each.name);
    run("DELETE FROM TABLE_VOC; DELETE FROM ATTACHMENT; DELETE FROM TABLE_VOC_EXTENDED; DELETE FROM "
        "sqlite_sequence");
    save_problem("user", "first", {"/a", "/b"});
    save_problem("user", "second", {"/a"});
    tavro_dbmgr_suggestion_info idea = {};
    tavro_dbmgr_update_suggestion(&idea);
    TAVRO_FREE(idea.type);
    each.remove();
    EXPECT_EQ(rows(), each.left);
  }
}

TEST_F(StoreReports, OnlyCompleteReportsThatAreBeingSentAreToBeSent) {
  const char *states[] = {"10", "11", "12#10", "1#11", "0", "6", "10#0", "110", "12#1"};
  for (const char *state : states) {
    const int id = save_problem("user", "text");
    run("UPDATE TABLE_VOC SET VOC_STATE = '" + std::string(state) + "' WHERE VOC_ID = " + std::to_string(id));
  }
  run("DELETE FROM TABLE_VOC_EXTENDED WHERE VOC_ID = " + std::to_string(save_problem("user", "half saved")));
  std::vector<int> ids;
  GSList *list = tavro_dbmgr_get_vocs_to_send();
  for (GSList *item = list; item; item = item->next) ids.push_back(GPOINTER_TO_INT(item->data));
  g_slist_free(list);
  EXPECT_THAT(ids, ElementsAre(1, 2, 3, 4));
}

TEST_F(StoreReports, DumpsAreLookedUpAndRenamedByName) {
  const int id = save_problem("user", "it's.zip");
  tavro_dbmgr_update_dump_file_bug_report("it's.zip", "new'name.zip");
  tavro_dbmgr_update_dump_file_bug_report("new'name.zip", nullptr);
  EXPECT_EQ(value("SELECT VOC_FILE_NAME FROM TABLE_VOC WHERE VOC_ID = " + std::to_string(id)),
            "new'name.zip");
  EXPECT_EQ(tavro_dbmgr_check_if_dump_file_is_uploaded("new'name.zip"), 1);
  EXPECT_EQ(tavro_dbmgr_check_if_dump_file_is_uploaded("nowhere"), 1);
  EXPECT_EQ(tavro_dbmgr_check_if_dump_file_is_uploaded(nullptr), -1);
}

TEST_F(StoreReports, ApplicationIsListedOnceAndRemovedWithItsPackage) {
  char pkg[] = "o'pkg", app[] = "o'app", name[] = "O'Neil's App", other[] = "Second name", icon[] = "/i'con";
  const tavro_pkg_info infos[] = {
      {1, pkg, app, name, icon}, {0, pkg, app, other, icon}, {0, pkg, other, other, icon}};
  for (const tavro_pkg_info &info : infos) tavro_dbmgr_update_app_list(&info);
  EXPECT_THAT(names(tavro_dbmgr_get_downloaded_app_list()), ElementsAre("O'Neil's App"));
  EXPECT_THAT(names(tavro_dbmgr_get_native_app_list()), ElementsAre("Second name"));
  EXPECT_EQ(taken(tavro_dbmgr_get_app_id_by_name("O'Neil's App")), "o'app");
  tavro_dbmgr_delete_uninstalled_app("o'pkg");
  EXPECT_TRUE(names(tavro_dbmgr_get_native_app_list()).empty());
}

TEST_F(StoreReports, CrashTimeOfAnApplicationIsNowAfterEachReport) {
  tavro_dbmgr_update_app_crash("o'app");
  run("UPDATE APP_CRASH SET APP_CRASH_REPORTED_TIME = '5'");
  tavro_dbmgr_set_app_crash_time("other");
  EXPECT_EQ(taken(tavro_dbmgr_get_app_crash_time_by_id("o'app")), "5");
  tavro_dbmgr_set_app_crash_time("o'app");
  EXPECT_GT(taken(tavro_dbmgr_get_app_crash_time_by_id("o'app")), "1600000000000");
  EXPECT_EQ(tavro_dbmgr_get_app_crash_time_by_id(nullptr), nullptr);
}

}  // namespace
