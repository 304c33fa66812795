// The catalogue: what the server pushes is kept, what it pushes again costs no write.
#include <sys/sem.h>

#include "statement_watch.h"
#include "store_world.h"
#include "tavro_dbmgr_catalogue.h"

namespace {

using ::testing::ElementsAre;

// The store only reads the records that it is given.
char *text(const char *value) {
  return const_cast<char *>(value);
}

// Neither survives an int or a double.
constexpr unsigned long long kFarTime = 9007199254740993999ULL;
constexpr unsigned long long kLastTime = 9223372036854775807ULL;  // that can be stored
constexpr long kFarId = 9007199254740993L;

tavro_dbmgr_beta_info programme(long id, const char *name, int status = 1) {
  return {id, text("app"), text(name), text("1.0"), kFarTime, text("http://d"), text("user"), status};
}

tavro_dbmgr_banner_info banner(long id, int place, const char *url) {
  return {id, text("BETA"), text("open"), text("data"), text(url), place, 0, text("/image")};
}

tavro_dbmgr_notification_details notification(long id, unsigned long long sent, const char *any = "t") {
  char *all = text(any);
  return {id, 1, kFarId, 3, all, all, all, all, sent, sent + 1, 0};
}

class StoreCatalogue : public StoreWorld {
 protected:
  template <typename Record>
  static int receive(int (*update)(const GSList *), const std::vector<Record> &records) {
    GSList *list = nullptr;
    for (auto each = records.rbegin(); each != records.rend(); ++each)
      list = g_slist_prepend(list, const_cast<Record *>(&*each));
    const int ret = update(list);
    g_slist_free(list);
    return ret;
  }

  static int receive(const tavro_dbmgr_beta_info &info) {
    return receive<tavro_dbmgr_beta_info>(tavro_dbmgr_update_beta_list, {info});
  }

  // One operation on a connection of its own.
  static void with_store(const std::function<void(sqlite3 *)> &work) {
    sqlite3 *db = nullptr;
    ASSERT_EQ(tavro_dbmgr_db_open(&db, TAVRO_DBMGR_FILE), 0);
    work(db);
    tavro_dbmgr_db_close(db);
  }

  static GSList *programmes(tavro_dbmgr_beta_list_type type) {
    GSList *list = nullptr;
    with_store([&](sqlite3 *db) { EXPECT_EQ(tavro_dbmgr_get_beta_list(db, type, &list), 0); });
    return list;
  }

  static std::vector<long> ids(tavro_dbmgr_beta_list_type type) {
    std::vector<long> found;
    GSList *list = programmes(type);
    for (GSList *item = list; item; item = item->next)
      found.push_back(static_cast<tavro_dbmgr_beta_info *>(item->data)->betaId);
    tavro_dbmgr_free_beta_list(list);
    return found;
  }

  static std::string rows(const char *table) { return value(std::string("SELECT count(*) FROM ") + table); }
};

// Those of programmes and notifications are the fuzz target's.
TEST_F(StoreCatalogue, AnyTextOfABannerIsReadBackAsReceived) {
  int place = 0;
  for (const std::string &each : {std::string("it's"), std::string("');DELETE FROM TABLE_BANNER;--"),
                                  std::string("%s%n \xf0\x9f\x98\x80"), std::string(9000, '\'')}) {
    SCOPED_TRACE(each.substr(0, 30));
    char *any = text(each.c_str());
    const tavro_dbmgr_banner_info shown = {kFarId + ++place, any, any, any, any, place, 0, nullptr};
    for (int turn = 0; turn < 2; turn++)  // inserted, then compared
      receive<tavro_dbmgr_banner_info>(tavro_dbmgr_update_banner_list, {shown});
    GSList *banners = nullptr;
    tavro_dbmgr_get_banner_list(&banners);
    const auto *last = static_cast<tavro_dbmgr_banner_info *>(g_slist_last(banners)->data);
    for (const char *read : {last->bannerType, last->bannerAction, last->bannerActionData, last->bannerUrl})
      EXPECT_EQ(read, each);
    EXPECT_EQ(last->bannerId, shown.bannerId);
    tavro_dbmgr_free_banner_list(banners);
  }
  EXPECT_EQ(rows("TABLE_BANNER"), "5");
}

TEST_F(StoreCatalogue, ListReceivedAgainIssuesNoUpdateAndAChangedFieldOne) {
  std::vector<tavro_dbmgr_beta_info> list;
  for (long id = 1; id <= 60; id++) list.push_back(programme(id, "it's one", static_cast<int>(id % 9)));
  StatementWatch watch;
  receive(tavro_dbmgr_update_beta_list, list);
  EXPECT_EQ(watch.take("INSERT"), 60);
  receive(tavro_dbmgr_update_beta_list, list);
  EXPECT_EQ(watch.take("UPDATE"), 0);
  tavro_dbmgr_beta_info &info = list[30];
  for (auto member : {&tavro_dbmgr_beta_info::betaType, &tavro_dbmgr_beta_info::betaName,
                      &tavro_dbmgr_beta_info::betaVersion, &tavro_dbmgr_beta_info::user_name,
                      &tavro_dbmgr_beta_info::discussionUrl}) {
    info.*member = text("it's two");
    receive(tavro_dbmgr_update_beta_list, list);
    EXPECT_EQ(watch.take("UPDATE"), 1);
  }
  info.betaDate--;
  info.userStatus = 2;
  receive(tavro_dbmgr_update_beta_list, list);
  EXPECT_EQ(watch.take("UPDATE"), 2);
  EXPECT_EQ(value("SELECT BETA_TYPE || BETA_NAME || BETA_VERSION || BETA_USER_NAME || BETA_DATE || "
                  "BETA_DISCUSSION_URL || BETA_USER_STATUS FROM TABLE_BETA_PROGRAM WHERE BETA_ID = 31"),
            "it's twoit's twoit's twoit's two9007199254740993998it's twoOPT In Requested");
  EXPECT_EQ(rows("TABLE_BETA_PROGRAM"), "60");
}

TEST_F(StoreCatalogue, StatusIsStoredAsItsTextAndChoosesTheList) {
  struct expectation {
    int written;
    const char *stored;
    int read;
  };
  const expectation table[] = {{1, "Available", 1},
                               {2, "OPT In Requested", 2},
                               {3, "OPT In Approved", 3},
                               {4, "OPTED In Available", 4},
                               {5, "OPT Out Approved", 5},
                               {6, "NA", 5},
                               {7, "OPT Out Requested", 5},
                               {0, "NA", 5},
                               {-1, "NA", 5}};
  for (const expectation &each : table) {
    SCOPED_TRACE(each.written);
    run("DELETE FROM TABLE_BETA_PROGRAM");
    receive(programme(1, "new in a list", each.written));
    receive(programme(2, "told later", each.written == 1 ? 2 : 1));
    EXPECT_EQ(tavro_dbmgr_update_beta_user_status(2, each.written), 0);
    EXPECT_EQ(value("SELECT group_concat(BETA_USER_STATUS) FROM TABLE_BETA_PROGRAM"),
              std::string(each.stored) + "," + each.stored);
    EXPECT_EQ(tavro_dbmgr_get_beta_user_status(2), each.read);
    const bool is_available = each.written == 1;
    EXPECT_EQ(ids(TAVRO_BETA_LIST_TYPE_AVAILABLE).size(), is_available ? 2u : 0u);
    EXPECT_EQ(ids(TAVRO_BETA_LIST_TYPE_OPTED).size(), is_available ? 0u : 2u);
  }
  EXPECT_EQ(tavro_dbmgr_update_beta_user_status(99, 1), 0);
  EXPECT_EQ(tavro_dbmgr_get_beta_user_status(99), 5);
  EXPECT_EQ(rows("TABLE_BETA_PROGRAM"), "2");
}

TEST_F(StoreCatalogue, FirstOfTwoElementsWithOneKeyStaysAndNullOnesAreSkipped) {
  auto first = programme(1, "first"), second = programme(1, "second"), other = programme(2, "other");
  GSList *list = nullptr;
  for (tavro_dbmgr_beta_info *each : {&other, &second, static_cast<tavro_dbmgr_beta_info *>(nullptr), &first})
    list = g_slist_prepend(list, each);
  EXPECT_EQ(tavro_dbmgr_update_beta_list(list), 0);
  g_slist_free(list);
  EXPECT_EQ(taken(tavro_dbmgr_get_beta_name(1)), "first");
  EXPECT_THAT(ids(TAVRO_BETA_LIST_TYPE_AVAILABLE), ElementsAre(1, 2));
  receive<tavro_dbmgr_banner_info>(tavro_dbmgr_update_banner_list,
                                   {banner(5, 3, "http://first"), banner(6, 3, "http://second")});
  EXPECT_EQ(value("SELECT BANNER_ID || BANNER_IMAGE_URL FROM TABLE_BANNER WHERE BANNER_SEQ_NO = 3"),
            "5http://first");
}

TEST_F(StoreCatalogue, BannerAsksForItsImageWhenItOrItsAddressIsAnother) {
  struct expectation {
    const char *name;
    tavro_dbmgr_banner_info received;
    const char *flag;
    int updates;
  };
  auto other_words = banner(1, 4, "http://a"), without_url = other_words;
  other_words.bannerType = other_words.bannerAction = other_words.bannerActionData = text("other");
  without_url.bannerUrl = nullptr;
  const expectation table[] = {
      {"the same", banner(1, 4, "http://a"), "0", 0},
      {"another type and action", other_words, "0", 3},
      {"no word of the address", without_url, "0", 0},
      {"another address", banner(1, 4, "http://it's"), "1", 2},
      {"another banner", banner(2, 4, "http://a"), "1", 2},
      {"another banner and address", banner(2, 4, "http://b"), "1", 4},
  };
  for (const expectation &each : table) {
    SCOPED_TRACE(each.name);
    run("DELETE FROM TABLE_BANNER WHERE BANNER_SEQ_NO = 4");
    receive<tavro_dbmgr_banner_info>(tavro_dbmgr_update_banner_list, {banner(1, 4, "http://a")});
    StatementWatch watch;
    receive<tavro_dbmgr_banner_info>(tavro_dbmgr_update_banner_list, {each.received});
    EXPECT_EQ(watch.take("UPDATE"), each.updates);
    EXPECT_EQ(value("SELECT BANNER_UPDATE_FLAG FROM TABLE_BANNER WHERE BANNER_SEQ_NO = 4"), each.flag);
  }
}

TEST_F(StoreCatalogue, OnlyANewBannerAtTheFirstPlaceBringsItsImage) {
  const char image[] = "SELECT BANNER_ID || BANNER_IMAGE_PATH FROM TABLE_BANNER WHERE BANNER_SEQ_NO = 0";
  const std::string built_in = value("SELECT BANNER_IMAGE_PATH FROM TABLE_BANNER");
  const std::vector<tavro_dbmgr_banner_info> list = {banner(8, 1, "http://a"), banner(9, 0, "http://b")};
  receive(tavro_dbmgr_update_banner_list, list);
  EXPECT_EQ(value(image), "9" + built_in);
  run("DELETE FROM TABLE_BANNER");
  receive(tavro_dbmgr_update_banner_list, list);
  EXPECT_EQ(value(image), "9/image");
  EXPECT_EQ(value("SELECT BANNER_IMAGE_PATH FROM TABLE_BANNER WHERE BANNER_SEQ_NO = 1"), "NULL");
}

TEST_F(StoreCatalogue, DetailsCompleteAProgrammeThatAListBrought) {
  receive(programme(1, "it's"));
  EXPECT_EQ(taken(tavro_dbmgr_get_beta_url(1)), "");
  EXPECT_EQ(tavro_dbmgr_get_beta_date(1, TAVRO_BETA_DATE_END), 0u);
  auto *details = tavro_dbmgr_init_beta_details();
  details->betaId = 1;
  details->betaDate = kFarTime;
  details->betaStartDate = kFarTime - 1;
  details->betaEndDate = ~0ULL;
  details->betaUrl = TAVRO_STRDUP("http://u'rl");
  details->userStatus = 4;
  StatementWatch watch;
  EXPECT_EQ(tavro_dbmgr_update_beta_details(details), 0);
  EXPECT_EQ(watch.take("UPDATE"), 4);
  EXPECT_EQ(tavro_dbmgr_update_beta_details(details), 0);
  EXPECT_EQ(watch.take("UPDATE"), 0);
  tavro_dbmgr_free_beta_details(details);
  EXPECT_EQ(taken(tavro_dbmgr_get_beta_url(1)), "http://u'rl");
  EXPECT_EQ(taken(tavro_dbmgr_get_beta_name(1)), "it's");  // the details said nothing about it
  EXPECT_EQ(tavro_dbmgr_get_beta_date(1, TAVRO_BETA_DATE_DATE), kFarTime);
  EXPECT_EQ(tavro_dbmgr_get_beta_date(1, TAVRO_BETA_DATE_START), kFarTime - 1);
  EXPECT_EQ(tavro_dbmgr_get_beta_date(1, TAVRO_BETA_DATE_END), kLastTime);
  EXPECT_EQ(tavro_dbmgr_get_beta_user_status(1), 4);
  EXPECT_EQ(tavro_dbmgr_get_beta_name(2), nullptr);
}

TEST_F(StoreCatalogue, NotificationKeepsItsTextsAndIsMarkedByEitherKey) {
  for (long id : {1L, 2L, 3L}) {
    const auto told = notification(id, kFarTime + static_cast<unsigned long long>(id % 3));
    tavro_dbmgr_update_non_voc_ntfctn_deatils(&told);
  }
  run("UPDATE TABLE_NOTIFICATIONS SET NTFCTN_TYPE_ID = 7 WHERE NTFCTN_ID = 3");
  auto again = notification(1, 4, "other");
  again.ntfctn_type = 9;
  StatementWatch watch;
  tavro_dbmgr_update_non_voc_ntfctn_deatils(&again);
  EXPECT_EQ(watch.take("UPDATE"), 3);
  EXPECT_EQ(value("SELECT NTFCTN_TITLE FROM TABLE_NOTIFICATIONS WHERE NTFCTN_ID = 1"), "t");
  EXPECT_EQ(tavro_dbmgr_get_ntfctn_type(1), 9);
  EXPECT_EQ(tavro_dbmgr_get_non_voc_ntfctn_sent_time(1), 4u);
  EXPECT_EQ(tavro_dbmgr_get_non_voc_ntfctn_expiry_time(2), kFarTime + 3);
  EXPECT_EQ(tavro_dbmgr_get_ntfctn_type(99), -1);
  EXPECT_EQ(tavro_dbmgr_get_non_voc_ntfctn_details(99), nullptr);

  const std::string read = "SELECT group_concat(NTFCTN_READ_STATUS) FROM TABLE_NOTIFICATIONS";
  EXPECT_EQ(tavro_dbmgr_mark_nonvoc_notification_as_read(3, TAVRO_NTFCTN_KEY_ID), 0);
  EXPECT_EQ(value(read), "0,0,1");
  EXPECT_EQ(tavro_dbmgr_mark_nonvoc_notification_as_read(kFarId, TAVRO_NTFCTN_KEY_TYPE_ID), 0);
  EXPECT_EQ(value(read), "1,1,1");
  GSList *list = nullptr;
  EXPECT_EQ(tavro_dbmgr_get_banner_info(&list), 0);
  std::string order;
  for (GSList *item = list; item; item = item->next)
    order += std::to_string(static_cast<tavro_dbmgr_notification_details *>(item->data)->ntfctn_id);
  EXPECT_EQ(order, "231");
  tavro_dbmgr_free_ntfctn_list(list);
}

TEST_F(StoreCatalogue, TesterStatusIsKeptForEachUser) {
  StatementWatch watch;
  with_store([](sqlite3 *db) {
    for (const char *user : {"o'user", "' OR '1'='1"})
      for (int status : {0, 1, 1}) EXPECT_EQ(tavro_dbmgr_update_user_beta_tester_status(db, user, status), 0);
    EXPECT_EQ(tavro_dbmgr_update_user_beta_tester_status(db, "o'user", 2), 0);
    EXPECT_EQ(tavro_dbmgr_update_user_beta_tester_status(db, nullptr, 1), -1);
  });
  EXPECT_EQ(watch.take("UPDATE"), 3);
  EXPECT_EQ(tavro_dbmgr_get_user_beta_tester_status("o'user"), 2);
  EXPECT_EQ(tavro_dbmgr_get_user_beta_tester_status("' OR '1'='1"), 1);
  EXPECT_EQ(tavro_dbmgr_get_user_beta_tester_status("nobody"), -1);
  EXPECT_EQ(value("SELECT group_concat(USER_NAME) FROM TABLE_USER_PROFILE"), "o'user,' OR '1'='1");
}

TEST_F(StoreCatalogue, MachineryTakesOptionalClausesAndRefusesNull) {
  const tavro_dbmgr_beta_info any = programme(1, "it's");
  receive<tavro_dbmgr_beta_info>(tavro_dbmgr_update_beta_list, {any, programme(2, "b"), programme(3, "c")});
  with_store([&](sqlite3 *db) {
    const char *table = TAVRO_DBMGR_TABLE_BETA, *where = "BETA_ID = 1";
    const auto type = TAVRO_RECORD_LIST_TYPE_BETA_OPTED;
    GSList *list = nullptr;
    EXPECT_EQ(_tavro_dbmgr_get_matching_record_count(db, table, nullptr), 3);
    EXPECT_EQ(_tavro_dbmgr_get_matching_record_count(db, table, "BETA_ID > 1"), 2);
    EXPECT_EQ(_tavro_dbmgr_get_matching_record_count(db, "NO_TABLE", nullptr), -1);
    _tavro_dbmgr_get_matching_record_list(db, table, "BETA_ID > 1", "ORDER BY BETA_ID DESC", type, &list);
    EXPECT_EQ(g_slist_length(list), 2u);
    EXPECT_EQ(static_cast<tavro_dbmgr_beta_info *>(list->data)->betaId, 3);
    EXPECT_EQ(static_cast<tavro_dbmgr_beta_info *>(list->data)->betaDate, kFarTime);
    tavro_dbmgr_free_beta_list(list);
    EXPECT_EQ(
        _tavro_dbmgr_get_matching_record_list(db, table, nullptr, nullptr, TAVRO_RECORD_LIST_TYPE_NA, &list),
        -1);
    EXPECT_EQ(_tavro_dbmgr_insert_new_record(db, "TABLE_VOC", &any), -1);
    EXPECT_EQ(_tavro_dbmgr_insert_new_record(db, table, nullptr), -1);
    EXPECT_EQ(_tavro_dbmgr_is_data_changed(db, table, "BETA_REF_1", "", where), 1);
    EXPECT_EQ(_tavro_dbmgr_is_data_changed(db, table, "BETA_NAME", nullptr, where), 0);
    EXPECT_EQ(_tavro_dbmgr_is_data_changed(nullptr, table, "BETA_NAME", "its", where), 0);
    for (const char *clause : {where, static_cast<const char *>(nullptr)}) {
      _tavro_dbmgr_delete_record(db, table, clause);
      EXPECT_EQ(_tavro_dbmgr_get_matching_record_count(db, table, nullptr), clause ? 2 : 0);
    }
  });
}

TEST_F(StoreCatalogue, StoreThatCannotBeOpenedFailsEachOperationAndLeavesTheLockFree) {
  std::filesystem::remove(TAVRO_DBMGR_FILE);
  std::filesystem::create_directory(TAVRO_DBMGR_FILE);
  const auto details = notification(1, 1);
  GSList *list = nullptr;
  EXPECT_EQ(receive(programme(1, "a")), -1);
  EXPECT_EQ(tavro_dbmgr_update_beta_user_status(1, 1), -1);
  EXPECT_EQ(tavro_dbmgr_update_non_voc_ntfctn_deatils(&details), -1);
  EXPECT_EQ(tavro_dbmgr_get_banner_list(&list), -1);
  EXPECT_EQ(tavro_dbmgr_get_beta_user_status(1), -1);
  EXPECT_EQ(tavro_dbmgr_get_beta_name(1), nullptr);
  EXPECT_EQ(tavro_dbmgr_update_beta_list(nullptr), -1);
  EXPECT_EQ(tavro_dbmgr_update_banner_list(nullptr), -1);
  EXPECT_EQ(tavro_dbmgr_update_beta_details(nullptr), -1);
  EXPECT_EQ(semctl(dbmgr_semid, 0, GETVAL), 1);
}

}  // namespace
