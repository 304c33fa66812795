// The way of one report to the desk: announce it, send its files, complete it.
//
// Every step may be done again, by this process or the next: the desk knows the report by its key and says
// how much of a file it has. A file is read in pieces, never whole; its checksum is made on a worker thread.
// A file that cannot be sent is named as missing and does not stop the report. Main loop only; the object
// keeps itself alive until its end was told.
#pragma once

#include <functional>
#include <memory>
#include <string>
#include <vector>

#include "svc_content.h"
#include "svc_desk_link.h"
#include "svc_report.h"

struct SvcUploadEnd {
  enum class Kind { kSent, kRefused, kFailed };
  Kind kind = Kind::kFailed;
  int server_id = 0;               // kSent
  bool has_desk_answered = false;  // false: no desk, so that other reports need not be tried now
};

class SvcUpload : public std::enable_shared_from_this<SvcUpload> {
 public:
  using Ended = std::function<void(const SvcUploadEnd &)>;

  static void start(DeskLink &desk, SvcReport report, Ended ended);
  SvcUpload(DeskLink &desk, SvcReport report, Ended ended)
      : desk_(desk), report_(std::move(report)), ended_(std::move(ended)) {}

 private:
  // The file that is being sent.
  struct Current {
    SvcContent content;
    int64_t offset = 0;  // where the piece under way starts
    int faults = 0;      // times that the desk refused its content or position
  };

  void announce();
  void on_announced(const DeskReply &reply);
  void next_file();
  void open_file();
  void on_content(const SvcContent &content);
  void ask_state();
  void send_piece(int64_t offset);
  void on_piece(const DeskReply &reply);
  void skip_file(const char *why);
  void complete();
  void end(const DeskReply &reply, const char *step);
  DeskCall call_for_file(const char *method) const;

  DeskLink &desk_;
  SvcReport report_;
  Ended ended_;
  int server_id_ = 0;
  size_t position_ = 0;  // in report_.files
  Current current_;
  std::vector<int> arrived_;
  std::vector<std::string> missing_;
};
