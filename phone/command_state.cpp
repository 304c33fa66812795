#include <signal.h>

#include <cstdio>

#include "commands.h"
#include "control.h"
#include "options.h"
#include "sandbox.h"

namespace phone {

namespace {

constexpr int kPollMilliseconds = 20;

std::string value_of(const State &state, const std::string &key) {
  const auto found = state.find(key);
  return found == state.end() ? "" : found->second;
}

// Also over when a start that waited for the end has the folder: its phone is not the one to stop.
bool is_over(const Folder &folder, const State &stopped) {
  if (!is_running(folder)) return true;
  const State now = read_state(folder);
  return value_of(now, "pid") != value_of(stopped, "pid") ||
         value_of(now, "pid_start") != value_of(stopped, "pid_start");
}

bool wait_until_over(const Folder &folder, const State &stopped, int patience_ms) {
  for (int waited = 0; !is_over(folder, stopped); waited += kPollMilliseconds) {
    if (waited >= patience_ms) return false;
    g_usleep(kPollMilliseconds * 1000);
  }
  return true;
}

void signal_monitor(const State &state, int number) {
  if (const int pid = monitor_pid(state)) kill(pid, number);
}

// A start has the lock before it has written who it is; the state of the last run must not be taken for it.
State await_owner(const Folder &folder) {
  constexpr int kPatienceMilliseconds = 1000;
  State state = read_state(folder);
  for (int waited = 0; !monitor_pid(state) && is_running(folder) && waited < kPatienceMilliseconds;
       waited += kPollMilliseconds) {
    g_usleep(kPollMilliseconds * 1000);
    state = read_state(folder);
  }
  return state;
}

int stop_phone(const Folder &folder) {
  constexpr int kOrderlyMilliseconds = 20000;
  constexpr int kForcedMilliseconds = 5000;
  const State state = await_owner(folder);
  // A phone that is still starting has no control socket yet; its outer half takes a signal at any time.
  if (!request_stop(value_of(state, "control"))) signal_monitor(state, SIGTERM);
  if (wait_until_over(folder, state, kOrderlyMilliseconds)) return kDone;
  signal_monitor(state, SIGKILL);
  if (wait_until_over(folder, state, kForcedMilliseconds))
    return fail("the phone did not end and was killed");
  return fail("the phone in " + folder.dir + " cannot be ended");
}

bool read_folder(int argc, char **argv, const char *summary, Folder *folder) {
  std::string dir;
  CommandLine line("", summary);
  line.text("dir", &dir, kDirHelp, "DIR");
  if (!line.parse(argc, argv)) return false;
  if (!line.arguments.empty()) return misuse("no arguments here"), false;
  return find_folder(dir, folder);
}

}  // namespace

int command_stop(int argc, char **argv) {
  Folder folder;
  if (!read_folder(argc, argv, "End the phone and everything that it started.", &folder)) return kUsage;
  if (is_running(folder)) return stop_phone(folder);
  kill_remains(folder);
  say("no phone runs in " + folder.dir);
  return kDone;
}

int command_status(int argc, char **argv) {
  Folder folder;
  if (!read_folder(argc, argv, "Say what runs. Exit status 1 when the phone does not run.", &folder))
    return kUsage;
  if (!is_running(folder)) return fail("no phone runs in " + folder.dir);
  const State state = read_state(folder);
  std::string parts;
  if (!request_status(value_of(state, "control"), &parts)) return fail("the phone is starting or ending");
  std::fputs((public_lines(state) + parts).c_str(), stdout);
  return kDone;
}

bool find_running_phone(const std::string &dir_option, State *state) {
  Folder folder;
  if (!find_folder(dir_option, &folder)) return false;
  *state = read_state(folder);
  if (is_running(folder) && state->count("ready")) return true;
  say("no phone runs in " + folder.dir + " (tavro-phone start)");
  return false;
}

}  // namespace phone
