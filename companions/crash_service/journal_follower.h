// Follows the journal's records of systemd-coredump: `journalctl --follow` as a child that is started again,
// later each time, when it ends. Lines that are no such record, or are longer than a record of ours can be,
// are skipped. Main loop only.
#pragma once

#include <functional>
#include <string>

#include "crash_record.h"
#include "tavro_handles.h"

class JournalFollower {
 public:
  explicit JournalFollower(std::function<void(const Crash &)> on_crash) : on_crash_(std::move(on_crash)) {}
  JournalFollower(const JournalFollower &) = delete;
  JournalFollower &operator=(const JournalFollower &) = delete;
  ~JournalFollower() { stop(); }

  // What was recorded since then is told too.
  void start(int64_t since_us);
  void stop();

 private:
  static gboolean output_cb(gint fd, GIOCondition, gpointer self);
  static gboolean start_cb(gpointer self);
  void start_child();
  void end_child();
  void take(const char *bytes, size_t count);
  void take_line();

  std::function<void(const Crash &)> on_crash_;
  TavroObject<GSubprocess> child_;
  std::string line_;
  bool is_line_too_long_ = false;
  int64_t since_us_ = 0;
  guint output_source_ = 0, start_source_ = 0;
  guint delay_s_ = 5;
};
