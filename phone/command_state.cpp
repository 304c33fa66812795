#include <signal.h>

#include <cstdio>

#include "commands.h"
#include "control.h"
#include "options.h"
#include "process.h"
#include "sandbox.h"

namespace phone {

namespace {

constexpr int kPollMilliseconds = 20;

bool wait_until_stopped(const Folder &folder, int patience_ms) {
  for (int waited = 0; is_running(folder); waited += kPollMilliseconds) {
    if (waited >= patience_ms) return false;
    g_usleep(kPollMilliseconds * 1000);
  }
  return true;
}

// The process that holds the phone, 0 when the recorded one is gone and its number belongs to another.
int monitor_pid(const State &state) {
  const auto pid_text = state.find("pid");
  const auto start = state.find("pid_start");
  if (pid_text == state.end() || start == state.end()) return 0;
  const int pid = static_cast<int>(g_ascii_strtoll(pid_text->second.c_str(), nullptr, 10));
  return pid > 1 && process_start_time(pid) == start->second ? pid : 0;
}

std::string value_of(const State &state, const std::string &key) {
  const auto found = state.find(key);
  return found == state.end() ? "" : found->second;
}

int stop_phone(const Folder &folder) {
  constexpr int kOrderlyMilliseconds = 20000;
  constexpr int kForcedMilliseconds = 5000;
  const State state = read_state(folder);
  const int pid = monitor_pid(state);
  // A phone that is still starting has no control socket yet; its outer half takes a signal at any time.
  if (!request_stop(value_of(state, "control")) && pid) kill(pid, SIGTERM);
  if (wait_until_stopped(folder, kOrderlyMilliseconds)) return kDone;
  if (pid) kill(pid, SIGKILL);
  if (wait_until_stopped(folder, kForcedMilliseconds)) return fail("the phone did not end and was killed");
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
  if (value_of(read_state(folder), "mode") == "direct") kill_remains(folder);
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
