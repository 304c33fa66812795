// Watches the folders into which crash handlers put cores, for new files with the attributes of a core. Both
// handlers name a core only when it is whole. A folder need not be there yet. Main loop only.
#pragma once

#include <functional>
#include <memory>
#include <set>
#include <string>
#include <vector>

#include "crash_record.h"
#include "tavro_handles.h"

class CoreFolder {
 public:
  CoreFolder(std::string path, std::function<void(const Crash &)> on_crash);
  CoreFolder(const CoreFolder &) = delete;
  CoreFolder &operator=(const CoreFolder &) = delete;
  ~CoreFolder();

  // Tells of what changed since then, now and from now on.
  void start(int64_t since_us);

 private:
  static void changed_cb(GFileMonitor *, GFile *, GFile *, GFileMonitorEvent, gpointer self);
  static gboolean scan_cb(gpointer self);
  void scan();

  const std::string path_;
  std::function<void(const Crash &)> on_crash_;
  TavroObject<GFileMonitor> monitor_;
  std::set<std::string> known_;  // names of cores that were told or are too old
  int64_t since_us_ = 0;
  guint scan_source_ = 0;
};

// TAVRO_CORE_FOLDERS, separated by colons, where a machine keeps its cores elsewhere; else our handler's
// folder and systemd-coredump's.
std::vector<std::string> core_folder_paths();
