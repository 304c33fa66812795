// What the desk remembers: devices, reports, their files, and the answers of support staff.
//
// One SQLite file in the desk's data folder. A writer returns only when its change is durable; a report is
// visible to staff once it is complete. Files lie beside it under numbers (desk_files.h); names that devices
// give to them are only ever data. Main loop only.
#pragma once

#include <memory>
#include <optional>
#include <string>
#include <vector>

#include "database.h"

// Status of a report as staff set it and devices store it: the values are append-only.
enum DeskStatus {
  DESK_STATUS_SUBMITTED = 1,
  DESK_STATUS_IN_PROCESS = 2,
  DESK_STATUS_SOLVED = 3,
  DESK_STATUS_COMPLETED = 4,
  DESK_STATUS_DECLINED = 5,
};

// What a follow-up says of the report that it names. Devices send and the store keeps these words.
constexpr char DESK_VERDICT_STILL_HAPPENS[] = "still_happens";
constexpr char DESK_VERDICT_WORKS_NOW[] = "works_now";

struct DeskReport {
  int64_t id = 0;
  std::string device;
  std::string kind;  // "problem" or "idea"
  std::string title;
  std::string text;
  std::string app;
  std::string severity;
  std::string user;
  int64_t created_ms = 0;   // on the device
  int64_t received_ms = 0;  // when it was complete here
  int status = DESK_STATUS_SUBMITTED;
  bool is_complete = false;
  bool is_read = false;      // by staff
  std::string model_json;    // object of texts about the device
  std::string missing_json;  // list of file names that the device could not send
  int64_t follow_up_of = 0;  // the report of the same device that this one is a follow-up to; 0: none
  std::string verdict;       // of a follow-up, else empty
  std::string last_verdict;  // of the newest follow-up to this report, while no answer came behind it
};

struct DeskAttachment {
  int64_t number = 0;  // 1 is the first
  std::string name;    // as the device gave it
  std::string kind;    // "attachment", "device_status", "system_log" or "crash_dump"
  std::string sha256;
  int64_t size = 0;  // bytes
  bool is_complete = false;
};

struct DeskAnswer {
  int64_t cursor = 0;
  int64_t report = 0;
  std::string key;  // the report's idempotency key
  int status = 0;
  std::string reply;  // empty: status only
  int64_t time_ms = 0;
};

class DeskStore {
 public:
  bool open(const std::string &folder);

  // The device with this phone id, new or known, with the token of that hash as its only valid one.
  std::optional<std::string> register_device(const std::string &phone, const std::string &token_hash);
  std::optional<std::string> device_of_token(const std::string &token_hash);

  // The id of the report with this key; a report that is known stays as it was first sent. Null when the
  // key belongs to another device or the store cannot be written.
  std::optional<int64_t> add_report(const std::string &key, const DeskReport &report);
  // Null when the device has no report with this key.
  std::optional<int64_t> report_of_key(const std::string &key, const std::string &device);
  std::optional<DeskReport> report(int64_t id);
  int64_t report_count(const std::string &device);
  // A follow-up that says "still happens" makes the report that it names unread again.
  bool complete_report(int64_t id, const std::string &missing_json);
  // Complete follow-ups to a report, oldest first.
  std::vector<DeskReport> follow_ups(int64_t first);
  bool mark_read(int64_t id);
  // Complete reports below the id `before` (0: from the newest), newest first; `status` 0 means any.
  std::vector<DeskReport> reports(int64_t before, int status, int limit);

  bool put_attachment(int64_t report, const DeskAttachment &attachment);
  std::optional<DeskAttachment> attachment(int64_t report, int64_t number);
  std::vector<DeskAttachment> attachments(int64_t report);

  // Sets the status and queues the answer for the report's device.
  bool add_answer(int64_t report, int status, const std::string &reply);
  std::vector<DeskAnswer> answers(int64_t report);
  std::vector<DeskAnswer> answers_for_device(const std::string &device, int64_t after, int limit);

 private:
  Database database_;
};

int64_t now_ms();
