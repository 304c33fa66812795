// The inner half of a running phone: starts everything in order, keeps it running, ends it in order. It runs
// inside the sandbox, or in place in direct mode; the outer half (monitor.h) started it and holds the other
// end of its life line: when that closes, the phone ends. Main loop only.
#pragma once

#include <memory>
#include <string>
#include <vector>

#include "accessibility.h"
#include "applications.h"
#include "control.h"
#include "display.h"
#include "options.h"
#include "program.h"
#include "sandbox.h"

namespace phone {

struct StartOptions {
  Folder folder;
  Mode mode = Mode::kSandbox;
  bool is_headless = false;    // a virtual display also where the desktop has one
  bool is_detached = false;    // the starter's terminal is left alone once the phone is ready
  bool is_accessible = false;  // a screen reader, or a test that reads the windows, is there from the start
  bool has_client = true;
  std::string desk_url;  // empty: a desk of its own
  ScreenSize size;
};

// Descriptors that the inner half is given.
constexpr int kLifeLine = 3;    // written once when the phone is ready, read for its end
constexpr int kLockHandle = 4;  // only held: the phone is locked for as long as this process lives
constexpr int kTerminal = 5;    // what the person is told; standard error is the programs' file

// The words that start the inner half, and what it does with them.
std::vector<std::string> supervise_command(const StartOptions &options);
int command_supervise(int argc, char **argv);

class Supervisor {
 public:
  explicit Supervisor(StartOptions options) : options_(std::move(options)) {}
  Supervisor(const Supervisor &) = delete;
  Supervisor &operator=(const Supervisor &) = delete;

  // Runs the phone until it is told to end, or something that it cannot do without ended.
  ExitStatus run();

 private:
  static gboolean life_line_cb(gint fd, GIOCondition, gpointer self);
  static gboolean signal_cb(gpointer self);

  bool start_all();
  bool take_storage();
  bool open_control();
  void choose_display();
  bool start_display();
  bool start_desk();
  bool start_bus();
  bool start_helpers();
  bool wait_for_desk();
  void open_accessibility();
  void start_applications();
  void announce_ready();
  void shut_down();

  void note_bus_line(const std::string &line);
  void note_desk_line(const std::string &line);
  Program *add_program(Program::Recipe recipe);
  std::function<void()> fatal(const std::string &what);
  bool wait_for(const std::string &what, const std::function<bool()> &is_there);
  void end(ExitStatus status);
  std::string status_lines() const;
  void publish(const std::string &key, const std::string &value);

  StartOptions options_;
  State state_;
  Environment environment_;
  std::string socket_folder_;
  TavroFd storage_lock_;
  bool has_virtual_display_ = false;
  std::string display_number_;
  std::string bus_address_;
  bool is_ending_ = false;
  ExitStatus status_ = kDone;
  std::vector<std::unique_ptr<Program>> programs_;  // in the order of their start
  std::unique_ptr<AccessibilityForwarder> forwarder_;
  TavroObject<GDBusConnection> bus_;
  std::vector<std::unique_ptr<ServiceKeeper>> service_keepers_;
  std::unique_ptr<ControlServer> control_;
};

}  // namespace phone
