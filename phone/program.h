// One program that the phone keeps running: the message bus, the display server, the desk and their like.
// Lines that it prints are handed over as they come; its standard error goes where the phone's own goes. It
// is killed by the kernel when the phone itself is killed. Main loop only.
#pragma once

#include <functional>
#include <string>
#include <vector>

#include "environment.h"

namespace phone {

class Program {
 public:
  struct Recipe {
    std::string name;  // for messages
    std::vector<std::string> command;
    Environment environment;
    // Called for each line of its standard output, without the line break.
    std::function<void(const std::string &)> on_line;
    // Called when it ended by itself. Without it the program is started again, later each time it fails.
    std::function<void()> on_end;
  };

  explicit Program(Recipe recipe) : recipe_(std::move(recipe)) {}
  Program(const Program &) = delete;
  Program &operator=(const Program &) = delete;
  ~Program();

  // False, after a message, when it cannot be executed.
  bool start();
  // End it: SIGTERM, and SIGKILL when it is still there after `patience_ms`. Blocks until it is gone.
  void stop(int patience_ms);

  bool is_running() const { return pid_ > 0; }
  int pid() const { return pid_; }
  const std::string &name() const { return recipe_.name; }

 private:
  static void ended_cb(GPid pid, gint status, gpointer self);
  static gboolean output_cb(gint fd, GIOCondition condition, gpointer self);
  static gboolean restart_cb(gpointer self);
  void handle_end(int status);
  void close_output();
  void schedule_restart();

  Recipe recipe_;
  GPid pid_ = 0;
  TavroFd output_;
  std::string partial_line_;
  guint ended_source_ = 0;
  guint output_source_ = 0;
  guint restart_source_ = 0;
  guint restart_delay_s_ = 1;
  gint64 started_us_ = 0;
};

// Forked child of a program that must not outlive the phone: own session, no signals blocked, ended by the
// kernel with its parent. For GLib's child set-up.
void tie_to_parent(gpointer parent_pid);

// Whether the process is gone within `patience_ms`; it is not our child.
bool wait_for_end_of(int pid, int patience_ms);

}  // namespace phone
