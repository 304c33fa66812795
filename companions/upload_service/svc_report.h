// A stored report in the form in which it goes to the desk. Main loop only, reads the shared store.
#pragma once

#include <memory>
#include <nlohmann/json.hpp>
#include <optional>
#include <string>
#include <vector>

#include "tavro_dbmgr.h"

struct SvcVocDeleter {
  void operator()(svc_voc_data *voc) const { tavro_dbmgr_free_voc_data(voc); }
};
using SvcVoc = std::unique_ptr<svc_voc_data, SvcVocDeleter>;

struct SvcFile {
  int number;  // at the desk; 1 is the first. Fixed by the report, so a resumed upload finds its files again
  std::string path;
  std::string kind;  // "attachment", "device_status", "system_log" or "crash_dump"
};

struct SvcReport {
  int voc_id = 0;
  std::string key;  // idempotency key: phone, record id and creation time, for a store may be made anew
  nlohmann::json body;
  std::vector<SvcFile> files;
  bool is_whole = true;  // false: the store did not tell all of it, and it must not go to the desk like this
};

// Whether the client has written all of a report: its extension row, which carries a title text, comes last.
bool svc_is_complete(int voc_id);

// Null when the record is not in the store.
std::optional<SvcReport> svc_read_report(int voc_id, const std::string &phone);

// The record id that such a key names, when it was made by this phone for the record that is in the store
// now; 0 otherwise.
int svc_voc_id_of_key(const std::string &key, const std::string &phone);

// The newest of the statuses of a record ("12#2" gives 2), and how many there are. -1 and 0 for none.
int svc_last_status(const svc_voc_data &voc);
int svc_status_count(const svc_voc_data &voc);

// A record id, 1 or more, from decimal text; 0 for anything else.
int svc_parse_voc_id(const char *text);

// The last part of a path.
std::string svc_base_name(const std::string &path);
