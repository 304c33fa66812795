// Makes crash folders, one after another on a worker thread, and tells the client of each. A program that
// crashes again and again gets three folders in ten minutes; its other crashes are counted in its next one.
// What does not fit into the queue is forgotten with a log line. Main loop only.
#pragma once

#include <deque>
#include <functional>
#include <map>
#include <set>
#include <string>

#include "crash_book.h"
#include "crash_folder.h"
#include "tavro_handles.h"

class CrashCollector {
 public:
  explicit CrashCollector(CrashBook &book) : book_(book) {}
  CrashCollector(const CrashCollector &) = delete;
  CrashCollector &operator=(const CrashCollector &) = delete;

  void add(const Crash &crash);
  bool is_working() const { return is_working_; }

  // Ends what is being made, which the next start makes anew; waits for it.
  void stop();

 private:
  struct Work;
  struct Recent {
    std::deque<int64_t> folders_us;  // times of the crashes that got one
    int uncounted = 0;
  };
  static void work_thread(GTask *task, gpointer, gpointer work, GCancellable *stop);
  static void done_cb(GObject *, GAsyncResult *result, gpointer self);
  bool may_have_folder(const Crash &crash);
  void start_next();

  CrashBook &book_;
  std::deque<Crash> waiting_;
  std::set<std::string> taken_;           // ids of what waits or is in work
  std::map<std::string, Recent> recent_;  // by program
  TavroObject<GCancellable> stop_{g_cancellable_new()};
  bool is_working_ = false;
};

// The book's id of a crash folder, whatever bytes are in its name.
std::string folder_id(const std::string &name);

void tell_client(const CrashFolder &folder);
