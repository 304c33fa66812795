// Stores with a given number of reports by one user, each with its extension row and three attachments. A
// store is made once and kept beside the phone's own, whose place it takes when it is asked for. Runs in a
// phone of its own only: the phone's store is removed. What cannot be made ends the program.
#pragma once

#include <cstdlib>
#include <filesystem>
#include <map>
#include <string>

#include "tavro_dbmgr.h"
#include "tavro_handles.h"

constexpr char kBenchUser[] = "bench@example.org";

inline std::string bench_description() {
  std::string text = "It's slow. ";
  while (text.size() < 600) text += "The list takes long to open after an update; ";
  return text;
}

inline std::string _count_to(int count) {
  return "WITH RECURSIVE n(i) AS (SELECT 1 UNION ALL SELECT i + 1 FROM n WHERE i < " + std::to_string(count) +
         ") ";
}

inline void _make_store(const std::string &path, int count) {
  std::filesystem::remove_all(TAVRO_DBMGR_FOLDER);
  if (tavro_dbmgr_ensure_schema() != TAVRO_STORE_READY) std::abort();
  TavroDb db;
  sqlite3_open(TAVRO_DBMGR_FILE, tavro_out(db));
  const std::string sql =
      "BEGIN;" + _count_to(count) +
      "INSERT INTO TABLE_VOC(VOC_TYPE, VOC_TEXT, VOC_APP_NAME, VOC_APP_ICON, VOC_SEVERITY, VOC_DUMP_PATH, "
      "VOC_STATE, VOC_PUSH_COMMENTS, VOC_PUSH_READ, VOC_FILE_NAME, VOC_USER_NAME, VOC_DATE_OF_CREATION, "
      "VOC_DATE_OF_UPDATION, VOC_RETRY_COUNT, VOC_ID_SERVER) SELECT 'TAVRO_DBMGR_BUG_REPORT', '" +
      bench_description().substr(10) +
      "', 'Gallery', '/opt/icon.png', 'High', '', '12#1#2', 'none#We look at it', 1, '', '" + kBenchUser +
      "', 1600000000000 + i, 1600000000000 + i, 0, i FROM n;" + _count_to(count) +
      "INSERT INTO TABLE_VOC_EXTENDED(VOC_ID, VOC_TITLE_TEXT, REF_2, REF_3) SELECT i, 'Gallery is slow', '', "
      "'/opt/usr/media/VantorCommunity/VantorCommunity_20260101000000.txt' FROM n;" +
      _count_to(count * 3) +
      "INSERT INTO ATTACHMENT(ATTACHMENT_FILE_PATH, ATTACHMENT_FILE_SIZE, ATTACHMENT_FILE_TYPE, "
      "ATTACHMENT_SUGGESTION_ID) SELECT '/opt/usr/media/DCIM/picture_' || i || '.jpg', 123456, 'jpg', "
      "(i - 1) / 3 + 1 FROM n; COMMIT;";
  if (sqlite3_exec(db.get(), sql.c_str(), nullptr, nullptr, nullptr) != SQLITE_OK) std::abort();
  db.reset();
  std::filesystem::rename(TAVRO_DBMGR_FILE, path);
}

// The file of the store with this many reports.
inline const std::string &bench_store(int count) {
  static std::map<int, std::string> stores;
  std::string &path = stores[count];
  if (path.empty()) {
    path = "/opt/usr/bench_store_" + std::to_string(count) + ".db";
    _make_store(path, count);
  }
  return path;
}
