#include "monitor.h"

#include <fcntl.h>
#include <glib-unix.h>
#include <signal.h>
#include <sys/socket.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cerrno>
#include <cstdio>

#include "options.h"

namespace phone {

namespace {

// Longer than an orderly end takes when every program has to be killed.
constexpr guint kEndPatienceSeconds = 20;

struct Monitor {
  const StartOptions *options;
  TavroFd life_line;
  int ready_fd;
  GPid pid = 0;
  bool is_ending = false;
  bool is_over = false;
  int wait_status = 0;
};

// In a session of its own, so that Ctrl-C reaches only this process, which ends the phone in order.
void leave_terminal(gpointer) {
  setsid();
}

TavroFd open_output(const Folder &folder, int more_flags) {
  const int flags = O_WRONLY | O_CREAT | O_APPEND | O_CLOEXEC | more_flags;
  return TavroFd(open(folder.run("output.log").c_str(), flags, 0600));
}

bool start_inner_half(Monitor *monitor, int inner_end, int lock) {
  std::vector<std::string> command =
      sandboxed(monitor->options->mode, monitor->options->folder, supervise_command(*monitor->options));
  // Standard output and error are those of all the phone's programs; what the person is told goes apart.
  const TavroFd output = open_output(monitor->options->folder, O_TRUNC);
  // A copy, because the child's standard error is replaced before the others are handed over.
  const TavroFd terminal(fcntl(STDERR_FILENO, F_DUPFD_CLOEXEC, kTerminal + 1));
  const int sources[] = {inner_end, lock, terminal.get()};
  const int targets[] = {kLifeLine, kLockHandle, kTerminal};
  const auto flags = static_cast<GSpawnFlags>(G_SPAWN_SEARCH_PATH | G_SPAWN_DO_NOT_REAP_CHILD);
  TavroError error;
  const bool is_started = g_spawn_async_with_pipes_and_fds(
      nullptr, exec_arguments(command).data(), nullptr, flags, leave_terminal, nullptr, -1, output.get(),
      output.get(), sources, targets, G_N_ELEMENTS(sources), &monitor->pid, nullptr, nullptr, nullptr,
      tavro_out(error));
  if (!is_started) say(error->message);
  return is_started;
}

gboolean kill_cb(gpointer data) {
  const auto *monitor = static_cast<Monitor *>(data);
  say("the phone did not end in time and is killed");
  kill(monitor->pid, SIGKILL);
  return G_SOURCE_CONTINUE;
}

gboolean signal_cb(gpointer data) {
  auto *monitor = static_cast<Monitor *>(data);
  if (monitor->is_ending) {
    kill(monitor->pid, SIGKILL);  // asked twice
  } else {
    monitor->is_ending = true;
    shutdown(monitor->life_line.get(), SHUT_WR);
    g_timeout_add_seconds(kEndPatienceSeconds, kill_cb, monitor);
  }
  return G_SOURCE_CONTINUE;
}

// The starter's terminal or pipe is not held open by a phone that runs on by itself.
void leave_outputs(const Folder &folder) {
  const TavroFd log = open_output(folder, 0);
  dup2(log.get(), STDOUT_FILENO);
  dup2(log.get(), STDERR_FILENO);
}

gboolean ready_cb(gint fd, GIOCondition, gpointer data) {
  auto *monitor = static_cast<Monitor *>(data);
  char mark;
  if (read(fd, &mark, 1) != 1) return G_SOURCE_REMOVE;
  std::fputs(public_lines(read_state(monitor->options->folder)).c_str(), stdout);
  std::fflush(stdout);
  if (monitor->ready_fd >= 0) {
    leave_outputs(monitor->options->folder);
    if (write(monitor->ready_fd, &mark, 1) != 1) say("the starter is gone");
    close(monitor->ready_fd);
    monitor->ready_fd = -1;
  }
  return G_SOURCE_CONTINUE;
}

void ended_cb(GPid, gint status, gpointer data) {
  auto *monitor = static_cast<Monitor *>(data);
  monitor->wait_status = status;
  monitor->is_over = true;
}

ExitStatus outcome(const Monitor &monitor) {
  if (WIFEXITED(monitor.wait_status) && WEXITSTATUS(monitor.wait_status) <= kFailed)
    return static_cast<ExitStatus>(WEXITSTATUS(monitor.wait_status));
  const int status = monitor.wait_status;
  say("the phone was ended by force (" +
      (WIFSIGNALED(status) ? "signal " + std::to_string(WTERMSIG(status))
                           : "status " + std::to_string(WEXITSTATUS(status))) +
      ")");
  return kFailed;
}

}  // namespace

ExitStatus run_monitor(const StartOptions &options, const TavroFd &lock, int ready_fd) {
  int ends[2];
  if (socketpair(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC, 0, ends) != 0) {
    say(std::string("no life line: ") + g_strerror(errno));
    return kFailed;
  }
  TavroFd inner_end(ends[1]);
  Monitor monitor = {&options, TavroFd(ends[0]), ready_fd};
  if (!start_inner_half(&monitor, inner_end.get(), lock.get())) return kFailed;
  inner_end = TavroFd();
  g_child_watch_add(monitor.pid, ended_cb, &monitor);
  g_unix_fd_add(monitor.life_line.get(), static_cast<GIOCondition>(G_IO_IN | G_IO_HUP), ready_cb, &monitor);
  for (const int number : {SIGINT, SIGTERM, SIGHUP}) g_unix_signal_add(number, signal_cb, &monitor);
  while (!monitor.is_over) g_main_context_iteration(nullptr, TRUE);
  withdraw_ready(options.folder);  // the inner half did, unless it was killed
  kill_remains(options.folder);
  return outcome(monitor);
}

}  // namespace phone
