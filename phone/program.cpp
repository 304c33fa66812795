#include "program.h"

#include <glib-unix.h>
#include <signal.h>
#include <sys/prctl.h>
#include <sys/wait.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>

#include "options.h"
#include "sandbox.h"

namespace phone {

namespace {

constexpr guint kLongestRestartDelaySeconds = 30;
constexpr gint64 kSteadyAfterMicroseconds = 30 * G_USEC_PER_SEC;
constexpr int kPollMilliseconds = 5;

std::string describe(int status) {
  if (WIFSIGNALED(status)) return "was ended by signal " + std::to_string(WTERMSIG(status));
  return "ended with status " + std::to_string(WEXITSTATUS(status));
}

// Returns whether the child was collected within the time.
bool collect(GPid pid, int patience_ms) {
  for (int waited = 0; waitpid(pid, nullptr, WNOHANG) == 0; waited += kPollMilliseconds) {
    if (waited >= patience_ms) return false;
    g_usleep(kPollMilliseconds * 1000);
  }
  return true;
}

}  // namespace

void tie_to_parent(gpointer parent_pid) {
  setsid();
  sigset_t none;
  sigemptyset(&none);
  sigprocmask(SIG_SETMASK, &none, nullptr);
  prctl(PR_SET_PDEATHSIG, SIGKILL);
  // The parent may have died before the line above took effect.
  if (getppid() != GPOINTER_TO_INT(parent_pid)) _exit(127);
}

bool wait_for_end_of(int pid, int patience_ms) {
  for (int waited = 0; kill(pid, 0) == 0 || errno == EPERM; waited += kPollMilliseconds) {
    if (waited >= patience_ms) return false;
    g_usleep(kPollMilliseconds * 1000);
  }
  return true;
}

Program::~Program() {
  stop(0);
}

bool Program::start() {
  TavroStrv environment = recipe_.environment.to_strv();
  TavroError error;
  int output = -1;
  const auto flags = static_cast<GSpawnFlags>(G_SPAWN_SEARCH_PATH | G_SPAWN_DO_NOT_REAP_CHILD);
  if (!g_spawn_async_with_pipes(nullptr, exec_arguments(recipe_.command).data(), environment.get(), flags,
                                tie_to_parent, GINT_TO_POINTER(getpid()), &pid_, nullptr,
                                recipe_.on_line ? &output : nullptr, nullptr, tavro_out(error))) {
    pid_ = 0;
    say(recipe_.name + " cannot be started: " + error->message);
    return false;
  }
  started_us_ = g_get_monotonic_time();
  ended_source_ = g_child_watch_add(pid_, ended_cb, this);
  if (output >= 0) {
    output_ = TavroFd(output);
    g_unix_set_fd_nonblocking(output, TRUE, nullptr);
    output_source_ = g_unix_fd_add(output, static_cast<GIOCondition>(G_IO_IN | G_IO_HUP), output_cb, this);
  }
  return true;
}

void Program::stop(int patience_ms) {
  if (restart_source_) g_source_remove(restart_source_);
  restart_source_ = 0;
  if (pid_ > 0) {
    g_source_remove(ended_source_);
    ended_source_ = 0;
    kill(pid_, patience_ms > 0 ? SIGTERM : SIGKILL);
    if (!collect(pid_, patience_ms)) {
      kill(pid_, SIGKILL);
      waitpid(pid_, nullptr, 0);
    }
    pid_ = 0;
  }
  close_output();
}

void Program::close_output() {
  if (output_source_) g_source_remove(output_source_);
  output_source_ = 0;
  output_ = TavroFd();
  partial_line_.clear();
}

gboolean Program::output_cb(gint fd, GIOCondition, gpointer self) {
  auto *program = static_cast<Program *>(self);
  char buffer[4096];
  const ssize_t count = read(fd, buffer, sizeof buffer);
  if (count < 0 && (errno == EAGAIN || errno == EINTR)) return G_SOURCE_CONTINUE;
  if (count <= 0) {
    program->output_source_ = 0;
    return G_SOURCE_REMOVE;
  }
  std::string &text = program->partial_line_;
  text.append(buffer, static_cast<size_t>(count));
  for (size_t end; (end = text.find('\n')) != std::string::npos;) {
    const std::string line = text.substr(0, end);
    text.erase(0, end + 1);
    program->recipe_.on_line(line);
  }
  if (text.size() > sizeof buffer) text.clear();  // no line of ours is that long
  return G_SOURCE_CONTINUE;
}

void Program::ended_cb(GPid pid, gint status, gpointer self) {
  g_spawn_close_pid(pid);
  static_cast<Program *>(self)->handle_end(status);
}

void Program::handle_end(int status) {
  pid_ = 0;
  ended_source_ = 0;
  close_output();
  say(recipe_.name + " " + describe(status));
  if (recipe_.on_end) {
    recipe_.on_end();
  } else {
    schedule_restart();
  }
}

void Program::schedule_restart() {
  if (g_get_monotonic_time() - started_us_ > kSteadyAfterMicroseconds) restart_delay_s_ = 1;
  restart_source_ = g_timeout_add_seconds(restart_delay_s_, restart_cb, this);
  restart_delay_s_ = std::min(restart_delay_s_ * 2, kLongestRestartDelaySeconds);
}

gboolean Program::restart_cb(gpointer self) {
  auto *program = static_cast<Program *>(self);
  program->restart_source_ = 0;
  if (!program->start()) program->schedule_restart();
  return G_SOURCE_REMOVE;
}

}  // namespace phone
