// The local store beside plain SQLite doing the same work: saving a report with three attachments, and
// loading the history from a store with 100, 10,000 and 100,000 reports, and searching in it. Runs in a phone
// of its own.
#include <benchmark/benchmark.h>

#include <cstring>
#include <string>
#include <vector>

#include "store_sizes.h"
#include "tavro_memory.h"

namespace {

namespace fs = std::filesystem;

// The store's file becomes a link to the store with this many reports.
void _use_store(int count) {
  const std::string &store = bench_store(count);
  fs::remove(TAVRO_DBMGR_FILE);
  fs::create_symlink(store, TAVRO_DBMGR_FILE);
}

// ---- Plain SQLite ----

// A statement prepared once and run with texts in its place-holders.
class PlainStatement {
 public:
  PlainStatement(sqlite3 *db, const char *sql) {
    if (sqlite3_prepare_v2(db, sql, -1, tavro_out(statement_), nullptr) != SQLITE_OK) std::abort();
  }
  sqlite3_stmt *get() const { return statement_.get(); }
  void start(std::initializer_list<const char *> values) {
    sqlite3_reset(statement_.get());
    int index = 1;
    for (const char *value : values) sqlite3_bind_text(statement_.get(), index++, value, -1, SQLITE_STATIC);
  }
  void run(std::initializer_list<const char *> values) {
    start(values);
    if (sqlite3_step(statement_.get()) != SQLITE_DONE) std::abort();
    sqlite3_reset(statement_.get());
  }

 private:
  TavroStmt statement_;
};

char *_plain_text(sqlite3_stmt *statement, int column) {
  const auto *text = reinterpret_cast<const char *>(sqlite3_column_text(statement, column));
  return text ? strdup(text) : nullptr;
}

void _free_plain(svc_voc_data &voc) {
  for (char *text : {voc.description, voc.title_description, voc.app_name, voc.severity, voc.dump_file,
                     voc.date_of_creation, voc.date_of_updation, voc.dump_name, voc.syslog_file,
                     voc.submitted, voc.app_icon, voc.user_name, voc.type, voc.push_comments})
    std::free(text);
  for (GSList *item = voc.attachments; item; item = item->next) {
    auto *attachment = static_cast<tavro_dbmgr_attachment_info *>(item->data);
    std::free(attachment->file_path);
    std::free(attachment->file_type);
    std::free(attachment);
  }
  g_slist_free(voc.attachments);
}

void _read_plain_row(sqlite3_stmt *row, svc_voc_data &voc) {
  voc.id = sqlite3_column_int(row, 0);
  voc.type = _plain_text(row, 1);
  voc.description = _plain_text(row, 2);
  voc.app_name = _plain_text(row, 3);
  voc.app_icon = _plain_text(row, 4);
  voc.severity = _plain_text(row, 5);
  voc.dump_file = _plain_text(row, 6);
  voc.submitted = _plain_text(row, 7);
  voc.push_comments = _plain_text(row, 8);
  voc.push_read = sqlite3_column_int(row, 9);
  voc.dump_name = _plain_text(row, 10);
  voc.user_name = _plain_text(row, 11);
  voc.date_of_creation = _plain_text(row, 12);
  voc.date_of_updation = _plain_text(row, 13);
  voc.retry_count = sqlite3_column_int(row, 14);
  voc.server_voc_id = sqlite3_column_int(row, 15);
}

void _read_plain_attachments(PlainStatement &statement, svc_voc_data &voc) {
  sqlite3_reset(statement.get());
  sqlite3_bind_int(statement.get(), 1, voc.id);
  while (sqlite3_step(statement.get()) == SQLITE_ROW) {
    auto *attachment =
        static_cast<tavro_dbmgr_attachment_info *>(std::calloc(1, sizeof(tavro_dbmgr_attachment_info)));
    attachment->id = sqlite3_column_int(statement.get(), 0);
    attachment->file_path = _plain_text(statement.get(), 1);
    attachment->file_size = sqlite3_column_double(statement.get(), 2);
    attachment->file_type = _plain_text(statement.get(), 3);
    attachment->suggestion_id = sqlite3_column_int(statement.get(), 4);
    voc.attachments = g_slist_prepend(voc.attachments, attachment);
  }
  voc.attachments = g_slist_reverse(voc.attachments);
}

// The history by hand: connection and statements stay open from one load to the next.
class PlainHistory {
 public:
  PlainHistory()
      : db_(_open()),
        reports_(
            db_.get(),
            "SELECT * FROM TABLE_VOC WHERE VOC_USER_NAME = ? ORDER BY VOC_DATE_OF_UPDATION DESC LIMIT 100"),
        extension_(db_.get(), "SELECT VOC_TITLE_TEXT, REF_2 FROM TABLE_VOC_EXTENDED WHERE VOC_ID = ?"),
        attachments_(db_.get(), "SELECT * FROM ATTACHMENT WHERE ATTACHMENT_SUGGESTION_ID = ?") {}

  int load() {
    std::vector<svc_voc_data> history;
    reports_.start({kBenchUser});
    while (sqlite3_step(reports_.get()) == SQLITE_ROW) {
      svc_voc_data &voc = history.emplace_back();
      _read_plain_row(reports_.get(), voc);
      _read_extension(voc);
      _read_plain_attachments(attachments_, voc);
    }
    for (PlainStatement *statement : {&reports_, &extension_, &attachments_}) sqlite3_reset(statement->get());
    for (svc_voc_data &voc : history) _free_plain(voc);
    return static_cast<int>(history.size());
  }

 private:
  static TavroDb _open() {
    TavroDb db;
    if (sqlite3_open(TAVRO_DBMGR_FILE, tavro_out(db)) != SQLITE_OK) std::abort();
    return db;
  }

  void _read_extension(svc_voc_data &voc) {
    sqlite3_reset(extension_.get());
    sqlite3_bind_int(extension_.get(), 1, voc.id);
    if (sqlite3_step(extension_.get()) != SQLITE_ROW) return;
    voc.title_description = _plain_text(extension_.get(), 0);
    voc.syslog_file = _plain_text(extension_.get(), 1);
  }

  TavroDb db_;
  PlainStatement reports_;
  PlainStatement extension_;
  PlainStatement attachments_;
};

// ---- Saving ----

void SaveReport_Store(benchmark::State &state) {
  _use_store(100);
  tavro_dbmgr_bug_report_info report = {};
  const TavroText description(TAVRO_STRDUP(bench_description().c_str()));
  const TavroText user(TAVRO_STRDUP(kBenchUser));
  char title[] = "Gallery is slow", app[] = "Gallery", path[] = "/opt/usr/media/DCIM/picture.jpg",
       type[] = "jpg";
  tavro_dbmgr_attachment_info attachment = {0, path, 123456, type, 0};
  report.description = description.get();
  report.user_name = user.get();
  report.title_description = title;
  report.app_name = app;
  report.submitted = 10;
  for (int i = 0; i < 3; i++) report.attachments = g_slist_prepend(report.attachments, &attachment);
  for (auto _ : state)
    if (tavro_dbmgr_update_bug_report(&report) < 1) state.SkipWithError("not saved");
  g_slist_free(report.attachments);
  TAVRO_FREE(report.type);
}

// The same five rows, each committed by itself, on one connection that stays open.
void SaveReport_PlainSqlite(benchmark::State &state) {
  _use_store(100);
  TavroDb db;
  sqlite3_open(TAVRO_DBMGR_FILE, tavro_out(db));
  PlainStatement report(db.get(),
                        "INSERT INTO TABLE_VOC(VOC_TYPE, VOC_TEXT, VOC_APP_NAME, VOC_APP_ICON, VOC_SEVERITY, "
                        "VOC_DUMP_PATH, VOC_STATE, VOC_FILE_NAME, VOC_USER_NAME, VOC_DATE_OF_CREATION, "
                        "VOC_DATE_OF_UPDATION, VOC_RETRY_COUNT) VALUES(?, ?, ?, ?, ?, ?, ?, ?, ?, ?, ?, ?)");
  PlainStatement extension(
      db.get(), "INSERT INTO TABLE_VOC_EXTENDED(VOC_ID, VOC_TITLE_TEXT, REF_2, REF_3) VALUES(?, ?, ?, ?)");
  PlainStatement attachment(db.get(),
                            "INSERT INTO ATTACHMENT(ATTACHMENT_FILE_PATH, ATTACHMENT_FILE_SIZE, "
                            "ATTACHMENT_FILE_TYPE, ATTACHMENT_SUGGESTION_ID) VALUES(?, ?, ?, ?)");
  const std::string description = bench_description();
  const std::string now = std::to_string(time(nullptr)) + "000";
  for (auto _ : state) {
    report.run({"TAVRO_DBMGR_BUG_REPORT", description.c_str(), "Gallery", "", "", "", "10", "", kBenchUser,
                now.c_str(), now.c_str(), "0"});
    const std::string id = std::to_string(sqlite3_last_insert_rowid(db.get()));
    for (int i = 0; i < 3; i++)
      attachment.run({"/opt/usr/media/DCIM/picture.jpg", "123456", "jpg", id.c_str()});
    extension.run({id.c_str(), "Gallery is slow", "", ""});
  }
}

// ---- Loading ----

void LoadHistory_Store(benchmark::State &state) {
  _use_store(static_cast<int>(state.range(0)));
  for (auto _ : state) {
    GSList *history = tavro_dbmgr_get_vocs_for_history(kBenchUser);
    if (g_slist_length(history) != 100) state.SkipWithError("not all loaded");
    g_slist_free_full(history,
                      [](gpointer voc) { tavro_dbmgr_free_voc_data(static_cast<svc_voc_data *>(voc)); });
  }
}

void LoadHistory_PlainSqlite(benchmark::State &state) {
  _use_store(static_cast<int>(state.range(0)));
  PlainHistory history;
  for (auto _ : state)
    if (history.load() != 100) state.SkipWithError("not all loaded");
}

// ---- Searching ----

// What no report holds, so that all of them are read to their end.
constexpr char kNotThere[] = "gallery is FAST";

void SearchReports_Store(benchmark::State &state) {
  _use_store(static_cast<int>(state.range(0)));
  for (auto _ : state)
    if (tavro_dbmgr_search_vocs(kBenchUser, {kNotThere, TAVRO_VOC_STAGE_ANY, TAVRO_VOC_KIND_ANY, false}))
      state.SkipWithError("found");
}

// SQLite's own search, which knows the case of ASCII alone, on a connection that stays open.
void SearchReports_PlainLike(benchmark::State &state) {
  _use_store(static_cast<int>(state.range(0)));
  TavroDb db;
  sqlite3_open(TAVRO_DBMGR_FILE, tavro_out(db));
  PlainStatement search(db.get(),
                        "SELECT VOC_ID FROM TABLE_VOC WHERE VOC_USER_NAME = ?1 AND (VOC_TEXT LIKE ?2 OR "
                        "VOC_PUSH_COMMENTS LIKE ?2 OR EXISTS (SELECT 1 FROM TABLE_VOC_EXTENDED WHERE "
                        "TABLE_VOC_EXTENDED.VOC_ID = TABLE_VOC.VOC_ID AND VOC_TITLE_TEXT LIKE ?2)) "
                        "ORDER BY VOC_DATE_OF_UPDATION DESC LIMIT 100");
  const std::string pattern = std::string("%") + kNotThere + "%";
  for (auto _ : state) search.run({kBenchUser, pattern.c_str()});
}

BENCHMARK(SaveReport_Store)->Unit(benchmark::kMillisecond)->UseRealTime();
BENCHMARK(SaveReport_PlainSqlite)->Unit(benchmark::kMillisecond)->UseRealTime();
BENCHMARK(LoadHistory_Store)->Arg(100)->Arg(10000)->Arg(100000)->Unit(benchmark::kMillisecond)->UseRealTime();
BENCHMARK(LoadHistory_PlainSqlite)
    ->Arg(100)
    ->Arg(10000)
    ->Arg(100000)
    ->Unit(benchmark::kMillisecond)
    ->UseRealTime();
BENCHMARK(SearchReports_Store)->Arg(10000)->Unit(benchmark::kMillisecond)->UseRealTime();
BENCHMARK(SearchReports_PlainLike)->Arg(10000)->Unit(benchmark::kMillisecond)->UseRealTime();

}  // namespace

int main(int argc, char **argv) {
  tavro_mem_check_init();
  if (tavro_dbmgr_init_semaphore() != 0) return 1;
  benchmark::Initialize(&argc, argv);
  if (benchmark::ReportUnrecognizedArguments(argc, argv)) return 2;
  benchmark::RunSpecifiedBenchmarks();
  return 0;
}
