// Watches the dump folder for crash folders that somebody else puts there, by hand or from another tool. One
// is told of once it holds a crash file and has not changed for a moment. Links and files in the dump folder
// are ignored. Main loop only.
#pragma once

#include <functional>
#include <map>
#include <string>

#include "crash_book.h"
#include "crash_folder.h"
#include "tavro_handles.h"

class DropFolder {
 public:
  // `is_busy` tells whether a folder of our own may be there that the book does not have yet.
  DropFolder(CrashBook &book, std::function<bool()> is_busy,
             std::function<void(const CrashFolder &)> on_folder);
  DropFolder(const DropFolder &) = delete;
  DropFolder &operator=(const DropFolder &) = delete;
  ~DropFolder();

  void start();

 private:
  struct Pending {
    std::string last_look;  // what was in it
    TavroObject<GFileMonitor> monitor;
  };
  static void changed_cb(GFileMonitor *, GFile *, GFile *, GFileMonitorEvent, gpointer self);
  static gboolean look_cb(gpointer self);
  TavroObject<GFileMonitor> watch(const std::string &path);
  void look_later();
  bool look();
  bool look_at(const std::string &name);

  CrashBook &book_;
  std::function<bool()> is_busy_;
  std::function<void(const CrashFolder &)> on_folder_;
  TavroObject<GFileMonitor> monitor_;
  std::map<std::string, Pending> pending_;  // by name
  guint look_source_ = 0;
};
