// What the crash service was asked to do, one thing after another in the order of the calls, on a worker
// thread, so that the bus is served meanwhile. A log is answered by a launch request to the client. Main loop
// only.
#pragma once

#include <deque>
#include <string>

#include "tavro_handles.h"

class CrashJobs {
 public:
  enum class Kind { kDumpLog, kDeleteDump };

  CrashJobs() = default;
  CrashJobs(const CrashJobs &) = delete;
  CrashJobs &operator=(const CrashJobs &) = delete;

  void add(Kind kind);

  // Wait for what is being done; what waits is forgotten, and nothing is answered any more: an answer would
  // start a client that the phone has just ended.
  void stop();

 private:
  struct Work;
  static void work_thread(GTask *task, gpointer, gpointer work, GCancellable *);
  static void done_cb(GObject *, GAsyncResult *result, gpointer self);
  static gboolean limit_cb(gpointer self);
  void start_next();

  std::deque<Kind> waiting_;
  bool is_working_ = false;
  bool is_stopped_ = false;
  TavroObject<GCancellable> journal_stop_;  // of the job in work
  guint limit_source_ = 0;
};
