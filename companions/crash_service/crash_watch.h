// Watches for crashes and decides which of them are this phone's business: those of the phone's user (all of
// them when that is root), but neither those of programs of another phone nor the crash service's own. The
// same crash from two sources is one. Main loop only.
#pragma once

#include <map>
#include <memory>
#include <string>
#include <vector>

#include "core_folders.h"
#include "crash_collector.h"
#include "drop_folder.h"
#include "journal_follower.h"

class CrashWatch {
 public:
  CrashWatch();
  CrashWatch(const CrashWatch &) = delete;
  CrashWatch &operator=(const CrashWatch &) = delete;

  // False, after a log line, when nothing can be remembered or kept here.
  bool start();
  void stop();

 private:
  void note_core(const Crash &crash, bool may_have_record);
  void note_record(const Crash &crash);
  bool is_ours(const Crash &crash) const;
  void hold(const Crash &crash);
  static gboolean held_cb(gpointer self);

  struct Held {
    Crash crash;
    int64_t until_us;
  };
  CrashBook book_;
  CrashCollector collector_;
  DropFolder drops_;
  JournalFollower journal_;
  std::vector<std::unique_ptr<CoreFolder>> folders_;
  std::map<std::string, Held> held_;  // cores whose record in the journal may tell more
  guint held_source_ = 0;
};
