// Whatever text comes in: it is read back as it was written, and no row but its own changes.
//
// An input is a digit, which chooses what is done with the texts, and then the texts, each ended by a zero
// byte; texts that are missing are null. Runs in a fresh phone (tests/support/in_phone): under libFuzzer in
// the preset "fuzz", over the seeds alone in every other build.
#include <sqlite3.h>

#include <algorithm>
#include <cstdint>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <string>
#include <vector>

#include "fuzz_input.h"
#include "tavro_dbmgr.h"
#include "tavro_dbmgr_catalogue.h"
#include "tavro_handles.h"
#include "tavro_memory.h"
#include "tavro_type.h"

namespace {

constexpr char kNeighbour[] = "it's the neighbour's 7f3a";
constexpr int kServerId = 5;
constexpr int kMostOfAKind = 4;  // attachments, answers: more are only slower
constexpr const char *kTables[] = {"TABLE_VOC",    "TABLE_VOC_EXTENDED",  "ATTACHMENT",
                                   "APP_DATA",     "APP_CRASH",           "TABLE_BETA_PROGRAM",
                                   "TABLE_BANNER", "TABLE_NOTIFICATIONS", "TABLE_USER_PROFILE"};

// A column is never NULL after a save: a missing text is stored as the empty one.
void expect_same(const char *what, const char *read, const char *written) {
  const std::string is = read ? read : "", should_be = written ? written : "";
  if (is != should_be) fail(std::string(what) + " is \"" + is + "\" and not \"" + should_be + "\"");
}

void expect_same_taken(const char *what, char *read, const char *written) {
  const TavroText owner(read);
  expect_same(what, owner.get(), written);
}

// ---- The store as another program sees it ----

sqlite3 *store() {
  static const TavroDb db = [] {
    TavroDb opened;
    expect(sqlite3_open(TAVRO_DBMGR_FILE, tavro_out(opened)) == SQLITE_OK, "the store cannot be opened");
    return opened;
  }();
  return db.get();
}

// Every value of every row of the statement; a text may be given for "?".
std::string rows(const std::string &sql, const char *text = nullptr) {
  TavroStmt statement;
  expect(sqlite3_prepare_v2(store(), sql.c_str(), -1, tavro_out(statement), nullptr) == SQLITE_OK,
         sql.c_str());
  if (text) sqlite3_bind_text(statement.get(), 1, text, -1, SQLITE_TRANSIENT);
  std::string values;
  while (sqlite3_step(statement.get()) == SQLITE_ROW) {
    for (int i = 0; i < sqlite3_column_count(statement.get()); i++) {
      const auto *value = reinterpret_cast<const char *>(sqlite3_column_text(statement.get(), i));
      values += (i ? "|" : "") + std::string(value ? value : "NULL");
    }
    values += "\n";
  }
  return values;
}

int count(const std::string &table) {
  return std::stoi(rows("SELECT count(*) FROM " + table));
}

// The rows that were there before the input came.
std::string neighbours() {
  std::string all;
  for (const char *table : kTables) all += rows(std::string("SELECT * FROM ") + table + " WHERE rowid = 1");
  return all;
}

void remove_all_but_neighbours() {
  for (const char *table : kTables) {
    const std::string sql = std::string("DELETE FROM ") + table + " WHERE rowid > 1";
    expect(sqlite3_exec(store(), sql.c_str(), nullptr, nullptr, nullptr) == SQLITE_OK, "rows not removed");
  }
}

// ---- Saving ----

GSList *next_attachments(texts &input) {
  GSList *attachments = nullptr;
  for (int i = 0; i < kMostOfAKind && !input.is_at_end(); i++) {
    auto *attachment = TAVRO_ZALLOC(tavro_dbmgr_attachment_info);
    attachment->file_path = input.next_copy();
    attachment->file_type = input.next_copy();
    attachment->file_size = 1;
    attachments = g_slist_append(attachments, attachment);
  }
  return attachments;
}

void expect_attachments(const GSList *read, const GSList *written) {
  expect(g_slist_length(const_cast<GSList *>(read)) == g_slist_length(const_cast<GSList *>(written)),
         "number of attachments");
  for (; read; read = read->next, written = written->next) {
    const auto *is = static_cast<const tavro_dbmgr_attachment_info *>(read->data);
    const auto *should_be = static_cast<const tavro_dbmgr_attachment_info *>(written->data);
    expect_same("attachment path", is->file_path, should_be->file_path);
    expect_same("attachment type", is->file_type, should_be->file_type);
  }
}

// The common part of both kinds.
template <typename Report>
void expect_report(int id, const Report &written) {
  expect(id > 1 && count("TABLE_VOC") == 2 && count("TABLE_VOC_EXTENDED") == 2, "a save adds one row");
  const voc_owner read(tavro_dbmgr_get_voc_by_id(id));
  expect(read != nullptr, "a saved report is there");
  expect_same("title", read->title_description, written.title_description);
  expect_same("application", read->app_name, written.app_name);
  expect_same("icon", read->app_icon, written.app_icon);
  expect_same("severity", read->severity, written.severity);
  expect_same("system log", read->syslog_file, written.syslog_file);
  expect_same("user", read->user_name, written.user_name);
  expect_attachments(read->attachments, written.attachments);
  if (!written.user_name) return;
  const std::string number =
      rows("SELECT count(*) FROM TABLE_VOC WHERE VOC_USER_NAME = ?", written.user_name);
  expect(tavro_dbmgr_get_voc_count(written.user_name) == std::stoi(number), "number of the user's reports");
  GSList *history = tavro_dbmgr_get_vocs_for_history(written.user_name);
  expect(g_slist_length(history) == static_cast<guint>(std::stoi(number)), "the user's history");
  g_slist_free_full(history,
                    [](gpointer voc) { tavro_dbmgr_free_voc_data(static_cast<svc_voc_data *>(voc)); });
}

void save_problem(texts &input) {
  const TavroHandle<tavro_dbmgr_bug_report_info, tavro_dbmgr_free_bug_report_data> report(
      TAVRO_ZALLOC(tavro_dbmgr_bug_report_info));
  for (char **member : {&report->description, &report->title_description, &report->app_name,
                        &report->app_icon, &report->severity, &report->dump_file, &report->dump_name,
                        &report->syslog_file, &report->device_data_filepath, &report->user_name})
    *member = input.next_copy();
  report->attachments = next_attachments(input);
  const int id = tavro_dbmgr_update_bug_report(report.get());
  expect_report(id, *report);
  expect_same_taken("description", tavro_dbmgr_get_voc_description_by_id(id), report->description);
  expect_same_taken("dump", tavro_dbmgr_get_dump_file_by_id(id), report->dump_file);
  expect_same_taken("device data", tavro_dbmgr_get_device_data_file_by_id(id), report->device_data_filepath);
  if (!report->attachments) return;
  const char *path = static_cast<const tavro_dbmgr_attachment_info *>(report->attachments->data)->file_path;
  tavro_dbmgr_destroy_attachments_by_filename(path);
  expect(!path || rows("SELECT 1 FROM ATTACHMENT WHERE ATTACHMENT_FILE_PATH = ?", path).empty(),
         "a removed attachment is gone");
}

// An idea that the server knows: with dates and replies of its own.
void save_known_idea(texts &input) {
  const TavroHandle<tavro_dbmgr_suggestion_info, tavro_dbmgr_free_suggestion_data> idea(
      TAVRO_ZALLOC(tavro_dbmgr_suggestion_info));
  for (char **member : {&idea->suggestion, &idea->title_description, &idea->app_name, &idea->app_icon,
                        &idea->severity, &idea->syslog_file, &idea->user_name, &idea->push_comments,
                        &idea->date_of_creation, &idea->date_of_updation})
    *member = input.next_copy();
  idea->attachments = next_attachments(input);
  idea->server_voc_id = kServerId;
  const int id = tavro_dbmgr_update_suggestion_with_server_voc_id(idea.get());
  expect_report(id, *idea);
  const voc_owner read(tavro_dbmgr_get_voc_by_server_id(kServerId));
  expect(read && read->id == id, "a report is found by its server id");
  expect_same("description", read->description, idea->suggestion);
  expect_same("replies", read->push_comments, idea->push_comments);
  expect_same("creation", read->date_of_creation, idea->date_of_creation);
  expect_same("last change", read->date_of_updation, idea->date_of_updation);
}

// ---- Answers ----

void answer(const char *status, const char *reply) {
  const voc_owner before(tavro_dbmgr_get_voc_by_server_id(kServerId));
  _tavro_dbmgr_update_push_status_comments(std::to_string(kServerId).c_str(), status, reply);
  const voc_owner after(tavro_dbmgr_get_voc_by_server_id(kServerId));
  expect(after != nullptr, "an answered report is there");
  const std::string states = before->submitted;
  expect_same("states", after->submitted,
              ((states.empty() ? "" : states + "#") + (status ? status : "")).c_str());
  const std::string replies = before->push_comments ? before->push_comments : "none",
                    now = after->push_comments;
  expect(now.compare(0, replies.size() + 1, replies + "#") == 0, "earlier replies stay");
  expect(separators(now.c_str()) == separators(replies.c_str()) + 1, "an answer is one entry");
  expect(after->push_read == 0, "an answer is unread");
}

// The first text is a server id from outside, then come states and replies.
void answer_report(texts &input) {
  TavroHandle<tavro_dbmgr_suggestion_info, tavro_dbmgr_free_suggestion_data> idea(
      TAVRO_ZALLOC(tavro_dbmgr_suggestion_info));
  tavro_dbmgr_update_server_voc_id(tavro_dbmgr_update_suggestion(idea.get()), kServerId);
  const char *server_id = input.next();
  const std::string all = "SELECT * FROM TABLE_VOC";
  const std::string before = rows(all);
  if (!server_id || rows("SELECT 1 FROM TABLE_VOC WHERE VOC_ID_SERVER = ?", server_id).empty()) {
    _tavro_dbmgr_update_push_status_comments(server_id, "2", "for another");
    expect(rows(all) == before, "an unknown server id changes nothing");
  }
  for (int i = 0; i < kMostOfAKind && !input.is_at_end(); i++) {
    const char *status = input.next();
    answer(status, input.next());
  }
  expect(count("TABLE_VOC") == 2, "an answer adds no row");
}

// ---- Applications, and texts that select rows ----

void select_by_text(texts &input) {
  const char *members[4];
  for (const char *&member : members) member = input.next();
  tavro_pkg_info app = {};
  app.pkg_id = const_cast<char *>(members[0]);
  app.app_id = const_cast<char *>(members[1]);
  app.pkg_name = const_cast<char *>(members[2]);
  app.pkg_icon = const_cast<char *>(members[3]);
  tavro_dbmgr_update_app_list(&app);
  expect(count("APP_DATA") == 2, "an application adds one row");
  if (app.pkg_name)
    expect_same_taken("application id", tavro_dbmgr_get_app_id_by_name(app.pkg_name), app.app_id);
  tavro_dbmgr_update_app_crash(members[1]);
  tavro_dbmgr_set_app_crash_time(members[1]);
  tavro_dbmgr_destroy_attachments_by_filename(members[0]);
  tavro_dbmgr_update_dump_file_bug_report(members[0], members[1]);
  tavro_dbmgr_check_if_dump_file_is_uploaded(members[0]);
  tavro_dbmgr_set_voc_network_status(members[0]);
  const TavroText time(tavro_dbmgr_get_app_crash_time_by_id(members[1]));
  expect(!members[1] || time, "a crash has a time");
  tavro_dbmgr_delete_uninstalled_app(members[0]);
  expect(!members[0] || count("APP_DATA") == 1, "a removed application is gone");
}

// ---- Catalogue ----

void store_programme(texts &input) {
  const TavroHandle<tavro_dbmgr_beta_details, tavro_dbmgr_free_beta_details> details(
      tavro_dbmgr_init_beta_details());
  details->betaId = kServerId;
  for (char **member : {&details->betaType, &details->betaName, &details->betaVersion, &details->betaUrl,
                        &details->discussionUrl, &details->user_name, &details->language,
                        &details->description, &details->whatsNew})
    *member = input.next_copy();
  std::string stored;
  for (int i = 0; i < 2; i++) {
    tavro_dbmgr_update_beta_details(details.get());
    expect(count("TABLE_BETA_PROGRAM") == 2, "a programme is one row");
    const std::string now = rows("SELECT * FROM TABLE_BETA_PROGRAM");
    expect(i == 0 || now == stored, "the same programme again changes nothing");
    stored = now;
  }
  expect_same_taken("programme", tavro_dbmgr_get_beta_name(kServerId), details->betaName);
  expect_same_taken("kind", tavro_dbmgr_get_beta_type(kServerId), details->betaType);
  expect_same_taken("version", tavro_dbmgr_get_beta_version(kServerId), details->betaVersion);
  expect_same_taken("address", tavro_dbmgr_get_beta_url(kServerId), details->betaUrl);
  expect_same_taken("discussion", tavro_dbmgr_get_beta_discussion_url(kServerId), details->discussionUrl);
  std::string others;
  for (const char *text : {details->user_name, details->language, details->description, details->whatsNew})
    others += std::string(text ? text : "") + "|";
  const std::string columns =
      "ifnull(BETA_USER_NAME, ''), ifnull(BETA_LANGUAGE, ''), ifnull(BETA_DESCRIPTION, ''), "
      "ifnull(BETA_WHATS_NEW, ''), ''";
  expect_same("texts", rows("SELECT " + columns + " FROM TABLE_BETA_PROGRAM WHERE BETA_ID <> 1").c_str(),
              (others + "\n").c_str());
}

void store_notification_and_user(texts &input) {
  const TavroHandle<tavro_dbmgr_notification_details, tavro_dbmgr_free_non_voc_ntfctn_details> written(
      TAVRO_ZALLOC(tavro_dbmgr_notification_details));
  written->ntfctn_id = kServerId;
  for (char **member : {&written->ntfctn_title, &written->ntfctn_message, &written->ntfctn_action,
                        &written->ntfctn_action_data})
    *member = input.next_copy();
  tavro_dbmgr_update_non_voc_ntfctn_deatils(written.get());
  const TavroHandle<tavro_dbmgr_notification_details, tavro_dbmgr_free_non_voc_ntfctn_details> read(
      tavro_dbmgr_get_non_voc_ntfctn_details(kServerId));
  expect(read && count("TABLE_NOTIFICATIONS") == 2, "a notification is one row");
  expect_same("title", read->ntfctn_title, written->ntfctn_title);
  expect_same("message", read->ntfctn_message, written->ntfctn_message);
  expect_same("action", read->ntfctn_action, written->ntfctn_action);
  expect_same("action's data", read->ntfctn_action_data, written->ntfctn_action_data);
  const char *user = input.next();
  sqlite3 *db = nullptr;
  if (!user || tavro_dbmgr_db_open(&db, TAVRO_DBMGR_FILE) != 0) return;
  tavro_dbmgr_update_user_beta_tester_status(db, user, 3);
  tavro_dbmgr_db_close(db);
  expect(tavro_dbmgr_get_user_beta_tester_status(user) == 3, "a user's status is read back");
}

void store_catalogue(texts &input) {
  store_programme(input);
  store_notification_and_user(input);
}

// ---- The world ----

// One row of everything, which no input may touch.
std::string make_neighbours() {
  expect(tavro_dbmgr_init_semaphore() == 0 && tavro_dbmgr_ensure_schema() == TAVRO_STORE_READY, "no store");
  const char *statements[] = {
      "INSERT INTO TABLE_VOC(VOC_TYPE, VOC_TEXT, VOC_APP_NAME, VOC_USER_NAME, VOC_FILE_NAME, VOC_STATE, "
      "VOC_ID_SERVER) VALUES(%Q, %Q, %Q, %Q, %Q, '10', 900001)",
      "INSERT INTO TABLE_VOC_EXTENDED(VOC_ID, VOC_TITLE_TEXT) VALUES(1, %Q)",
      "INSERT INTO ATTACHMENT(ATTACHMENT_FILE_PATH, ATTACHMENT_FILE_TYPE, ATTACHMENT_SUGGESTION_ID) "
      "VALUES(%Q, %Q, 1)",
      "INSERT INTO APP_DATA(PKG_ID, APP_ID, APP_NAME) VALUES(%Q, %Q, %Q)",
      "INSERT INTO APP_CRASH(APP_ID, APP_CRASH_REPORTED_TIME) VALUES(%Q, '1')",
      "INSERT INTO TABLE_BETA_PROGRAM(BETA_ID, BETA_NAME) VALUES(1, %Q)",
      "INSERT INTO TABLE_NOTIFICATIONS(NTFCTN_ID, NTFCTN_TITLE) VALUES(1, %Q)",
      "INSERT INTO TABLE_USER_PROFILE(USER_ID, USER_NAME) VALUES(%Q, %Q)",
  };
  for (const char *statement : statements) {
    const TavroSqlText sql(
        sqlite3_mprintf(statement, kNeighbour, kNeighbour, kNeighbour, kNeighbour, kNeighbour));
    expect(sqlite3_exec(store(), sql.get(), nullptr, nullptr, nullptr) == SQLITE_OK, statement);
  }
  return neighbours();
}

constexpr void (*kActions[])(texts &) = {save_problem, save_known_idea, answer_report, select_by_text,
                                         store_catalogue};

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t *data, std::size_t size) {
  static const std::string untouched = make_neighbours();
  const std::string all(reinterpret_cast<const char *>(data), size);
  // Whoever knows the neighbour by name may change it.
  if (size == 0 || all.find("7f3a") != std::string::npos) return 0;
  texts input(data + 1, size - 1);
  kActions[(data[0] - '0' + 10 * 5) % 5](input);
  expect(neighbours() == untouched, "an input changed another row");
  remove_all_but_neighbours();
  expect_nothing_held();
  return 0;
}
