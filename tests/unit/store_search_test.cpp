// Finding reports by text, stage and kind.
#include "store_world.h"

namespace {

class StoreSearch : public StoreWorld {
 protected:
  // Adds a report; the last of them changed last.
  static void add(const char *title, const char *text, const char *replies = nullptr,
                  const char *states = "1", const char *type = TAVRO_DBMGR_BUG_REPORT, const char *dump = "",
                  const char *read = "NULL", const char *user = "anna") {
    static int change = 0;
    const TavroSqlText sql(sqlite3_mprintf(
        "INSERT INTO TABLE_VOC(VOC_TYPE, VOC_TEXT, VOC_APP_NAME, VOC_STATE, VOC_PUSH_COMMENTS, "
        "VOC_USER_NAME, "
        "VOC_DUMP_PATH, VOC_PUSH_READ, VOC_DATE_OF_UPDATION) VALUES(%Q, %Q, 'App', %Q, %Q, %Q, %Q, %s, '%d');"
        "INSERT INTO TABLE_VOC_EXTENDED(VOC_ID, VOC_TITLE_TEXT) VALUES(last_insert_rowid(), %Q)",
        type, text, states, replies, user, dump, read, 1000000 + ++change, title));
    run(sql.get());
  }

  // Titles of what is found, in order.
  static std::string titles(const tavro_voc_filter &filter, const char *user = "anna") {
    std::string all;
    GSList *found = tavro_dbmgr_search_vocs(user, filter);
    for (const GSList *link = found; link; link = link->next)
      all += std::string(static_cast<svc_voc_data *>(link->data)->title_description) + " ";
    g_slist_free_full(found,
                      [](gpointer voc) { tavro_dbmgr_free_voc_data(static_cast<svc_voc_data *>(voc)); });
    return all;
  }
};

TEST_F(StoreSearch, TextIsFoundInTitleDescriptionAndRepliesWhateverItsCase) {
  add("One", "Der Straßenname fehlt");
  add("ÉCRAN", "100 % of 5_6", "none#Which model &amp; version?<br/>It&apos;s odd#none");
  add("<b>", "o'clock; ΟΔΟΣ \xff\xfe end", "none#We look at it#none#Fixed <i>if</i> 1 < 2 & 3");
  const std::pair<const char *, const char *> cases[] = {
      {nullptr, "<b> ÉCRAN One "},
      {"", "<b> ÉCRAN One "},
      {"one", "One "},
      {"STRASSEN", "One "},
      {"écran", "ÉCRAN "},
      {"οδοσ", "<b> "},
      {"%", "ÉCRAN "},
      {"5_6", "ÉCRAN "},
      {"5x6", ""},
      {"O'CLOCK", "<b> "},
      {"' OR 1=1 --", ""},
      {"\xff\xfe END", "<b> "},
      {"model & VERSION?\nit's", "ÉCRAN "},
      {"amp;", ""},
      {"<br", ""},
      {"<B>", "<b> "},
      {"none", ""},
      {"#", ""},
      {"it#none", ""},
      {"fixed if 1 < 2 & 3", "<b> "},
  };
  for (const auto &[text, found] : cases)
    EXPECT_EQ(titles({text, TAVRO_VOC_STAGE_ANY, TAVRO_VOC_KIND_ANY, false}), found)
        << (text ? text : "null");
}

TEST_F(StoreSearch, StageKindAndUnreadNarrowTheSearch) {
  add("draft", "", nullptr, "6", TAVRO_DBMGR_SUGGESTION);
  add("sending", "", nullptr, "10");
  add("sent", "", nullptr, "12", TAVRO_DBMGR_BUG_REPORT, "/dump.zip");
  add("failed", "", nullptr, "6#10#11");
  add("open", "", "none#hi", "1#2", TAVRO_DBMGR_BUG_REPORT, "", "0");
  add("answered", "", "none#hi", "2#", TAVRO_DBMGR_SUGGESTION, "", "1");
  add("closed", "", "none#hi", "2#5", TAVRO_DBMGR_BUG_REPORT, "", "0");
  add("foreign", "", nullptr, "1", TAVRO_DBMGR_BUG_REPORT, "", "0", "bert");
  struct {
    tavro_voc_filter filter;
    const char *found;
  } const cases[] = {
      {{nullptr, TAVRO_VOC_STAGE_DRAFT, TAVRO_VOC_KIND_ANY, false}, "draft "},
      {{nullptr, TAVRO_VOC_STAGE_SENDING, TAVRO_VOC_KIND_ANY, false}, "sent sending "},
      {{nullptr, TAVRO_VOC_STAGE_FAILED, TAVRO_VOC_KIND_ANY, false}, "failed "},
      {{nullptr, TAVRO_VOC_STAGE_OPEN, TAVRO_VOC_KIND_ANY, false}, "answered open "},
      {{nullptr, TAVRO_VOC_STAGE_CLOSED, TAVRO_VOC_KIND_ANY, false}, "closed "},
      {{nullptr, TAVRO_VOC_STAGE_ANY, TAVRO_VOC_KIND_IDEA, false}, "answered draft "},
      {{nullptr, TAVRO_VOC_STAGE_ANY, TAVRO_VOC_KIND_CRASH, false}, "sent "},
      {{nullptr, TAVRO_VOC_STAGE_ANY, TAVRO_VOC_KIND_PROBLEM, false}, "closed open failed sending "},
      {{nullptr, TAVRO_VOC_STAGE_ANY, TAVRO_VOC_KIND_ANY, true}, "closed open "},
      {{"CLOSE", TAVRO_VOC_STAGE_CLOSED, TAVRO_VOC_KIND_PROBLEM, true}, "closed "},
      {{"OPEN", TAVRO_VOC_STAGE_CLOSED, TAVRO_VOC_KIND_ANY, false}, ""},
  };
  for (const auto &[filter, found] : cases) EXPECT_EQ(titles(filter), found);
}

TEST_F(StoreSearch, TheNewestHundredOfAllAreFoundAsTheHistoryShowsThem) {
  // Three reports of each time.
  run("WITH RECURSIVE n(i) AS (SELECT 1 UNION ALL SELECT i + 1 FROM n WHERE i < 120) INSERT INTO "
      "TABLE_VOC(VOC_TYPE, VOC_TEXT, VOC_APP_NAME, VOC_USER_NAME, VOC_DATE_OF_UPDATION) SELECT "
      "'TAVRO_DBMGR_BUG_REPORT', iif(i > 110, 'hay', 'needle'), 'App', 'anna', 5000 + i / 3 FROM n;"
      "INSERT INTO ATTACHMENT(ATTACHMENT_FILE_PATH, ATTACHMENT_FILE_TYPE, ATTACHMENT_SUGGESTION_ID) "
      "SELECT '/a', 'jpg', VOC_ID FROM TABLE_VOC UNION ALL SELECT '/b', 'jpg', VOC_ID FROM TABLE_VOC;");
  GSList *found = tavro_dbmgr_search_vocs("anna", {"NEEDLE", TAVRO_VOC_STAGE_ANY, TAVRO_VOC_KIND_ANY, false});
  GSList *all = tavro_dbmgr_get_vocs_for_history("anna");
  ASSERT_EQ(g_slist_length(found), 100u);
  const auto voc = [](GSList *list, guint at) {
    return static_cast<svc_voc_data *>(g_slist_nth_data(list, at));
  };
  for (guint i = 0; i < 90; i++) ASSERT_EQ(voc(found, i)->id, voc(all, i + 10)->id) << i;
  EXPECT_EQ(g_slist_length(voc(found, 99)->attachments), 2u);
  for (GSList *list : {found, all})
    g_slist_free_full(list,
                      [](gpointer one) { tavro_dbmgr_free_voc_data(static_cast<svc_voc_data *>(one)); });
}

}  // namespace
