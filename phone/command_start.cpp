#include <fcntl.h>
#include <sys/stat.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cerrno>
#include <cstdio>
#include <optional>

#include "commands.h"
#include "monitor.h"
#include "options.h"
#include "process.h"

namespace phone {

namespace {

bool read_options(int argc, char **argv, StartOptions *options) {
  std::string dir, size;
  bool has_no_client = false;
  CommandLine line("",
                   "Start the phone, with a feedback desk of its own, and show the client. Prints key=value "
                   "lines once it is ready; Ctrl-C or \"stop\" ends everything that it started.");
  line.text("dir", &dir, kDirHelp, "DIR");
  line.flag("headless", &options->is_headless, "Use a virtual display even where there is a desktop");
  line.flag("detach", &options->is_detached, "Return once the phone is ready");
  line.flag("no-client", &has_no_client, "Do not show the client");
  line.flag("accessible", &options->is_accessible, "Publish windows to screen readers from the start");
  line.text("desk", &options->desk_url, "Use the desk at this address instead of one of its own", "URL");
  line.text("size", &size, "Size of the virtual display in pixels, 720x1280 by default", "WIDTHxHEIGHT");
  if (!line.parse(argc, argv)) return false;
  options->has_client = !has_no_client;
  if (!line.arguments.empty()) return misuse("start takes no arguments"), false;
  if (!size.empty() && !parse_size(size, &options->size)) return misuse("no such size: " + size), false;
  const std::string &url = options->desk_url;
  if (!url.empty() && url.compare(0, 7, "http://") != 0 && url.compare(0, 8, "https://") != 0)
    return misuse("the desk's address must begin with http:// or https://"), false;
  return find_folder(dir, &options->folder);
}

// The lock, or an empty handle and the state of the phone that runs. Another process may be starting or
// ending the phone: its end is waited for. Nothing, after a message, when neither comes about.
std::optional<TavroFd> take_or_find_phone(const Folder &folder, State *running) {
  constexpr int kPatienceMilliseconds = 30000;
  constexpr int kPollMilliseconds = 50;
  for (int waited = 0; waited < kPatienceMilliseconds; waited += kPollMilliseconds) {
    std::optional<TavroFd> lock = lock_folder(folder);
    if (!lock || *lock) return lock;
    *running = read_state(folder);
    // One that was killed could not take back that it was ready; what remains of it is ending.
    if (running->count("ready") && monitor_pid(*running)) return lock;
    g_usleep(kPollMilliseconds * 1000);
  }
  say("the phone in " + folder.dir + " is starting or ending; try again");
  return std::nullopt;
}

int report_running(const State &state) {
  say("the phone in " + state.at("dir") + " already runs");
  std::fputs(public_lines(state).c_str(), stdout);
  return kDone;
}

int run_phone(StartOptions options, const TavroFd &lock, int ready_fd) {
  // What a phone that was killed left behind must not meet the new one.
  kill_remains(options.folder);
  const auto mode = choose_mode(options.folder);
  if (!mode) return kFailed;
  options.mode = *mode;
  const State state = {{"dir", options.folder.dir},
                       {"mode", *mode == Mode::kDirect ? "direct" : "sandbox"},
                       {"pid", std::to_string(getpid())},
                       {"pid_start", process_start_time(getpid())}};
  return write_state(options.folder, state) ? run_monitor(options, lock, ready_fd) : kFailed;
}

// The phone runs on in a process of its own; returns when it is ready or has failed.
int start_detached(const StartOptions &options, const TavroFd &lock) {
  int ends[2];
  if (pipe2(ends, O_CLOEXEC) != 0) return fail(std::string("no pipe: ") + g_strerror(errno));
  TavroFd ready_read(ends[0]), ready_write(ends[1]);
  const pid_t pid = fork();
  if (pid < 0) return fail(std::string("cannot start a process: ") + g_strerror(errno));
  if (pid == 0) {
    setsid();
    ready_read = TavroFd();
    TavroFd nothing(open("/dev/null", O_RDONLY | O_CLOEXEC));
    dup2(nothing.get(), STDIN_FILENO);
    _exit(run_phone(options, lock, ready_write.release()));
  }
  ready_write = TavroFd();
  char mark;
  if (read(ready_read.get(), &mark, 1) == 1) return kDone;
  waitpid(pid, nullptr, 0);
  return fail("the phone did not start; what its programs said is in " + options.folder.run("output.log"));
}

}  // namespace

int command_start(int argc, char **argv) {
  StartOptions options;
  if (!read_options(argc, argv, &options)) return kUsage;
  umask(077);
  if (!create_folder(options.folder)) return kFailed;
  State running;
  const std::optional<TavroFd> lock = take_or_find_phone(options.folder, &running);
  if (!lock) return kFailed;
  if (!*lock) return report_running(running);
  return options.is_detached ? start_detached(options, *lock) : run_phone(options, *lock, -1);
}

}  // namespace phone
