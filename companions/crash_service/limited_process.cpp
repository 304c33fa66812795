#include "limited_process.h"

#include <fcntl.h>
#include <gio/gunixinputstream.h>
#include <poll.h>
#include <signal.h>
#include <sys/prctl.h>
#include <sys/resource.h>

#include <array>

#include "tavro_handles.h"

namespace {

// Waits for output. False when the time is over or the work was cancelled.
bool wait_for_output(int fd, GCancellable *stop, gint64 end_us) {
  GPollFD waited[2] = {{fd, G_IO_IN, 0}, {}};
  const bool has_stop = stop && g_cancellable_make_pollfd(stop, &waited[1]);
  const gint64 left_ms = (end_us - g_get_monotonic_time()) / 1000;
  const int ready = left_ms > 0 ? g_poll(waited, has_stop ? 2 : 1, static_cast<gint>(left_ms)) : 0;
  if (has_stop) g_cancellable_release_fd(stop);
  return (ready > 0 || (ready < 0 && errno == EINTR)) && !g_cancellable_is_cancelled(stop);
}

enum class End { kWhole, kEnough, kFailed };

End read_all(int fd, const LimitedRun &run) {
  const gint64 end_us = g_get_monotonic_time() + run.seconds * G_USEC_PER_SEC;
  std::array<char, 64 * 1024> block;
  while (wait_for_output(fd, run.stop, end_us)) {
    const ssize_t got = read(fd, block.data(), block.size());
    if (got == 0) return End::kWhole;
    if (got < 0 && errno != EINTR && errno != EAGAIN) return End::kFailed;
    if (got > 0 && !run.take(block.data(), static_cast<size_t>(got))) return End::kEnough;
  }
  return End::kFailed;
}

// A tool that crashes over a core must not become the next crash that it is used for: this value alone means
// "no core" to a handler that the kernel starts.
void set_limits(gpointer) {
  const rlimit no_core = {1, 1};
  setrlimit(RLIMIT_CORE, &no_core);
  prctl(PR_SET_PDEATHSIG, SIGKILL);
}

TavroObject<GSubprocess> start(const LimitedRun &run) {
  const TavroObject<GSubprocessLauncher> launcher(g_subprocess_launcher_new(
      static_cast<GSubprocessFlags>(G_SUBPROCESS_FLAGS_STDOUT_PIPE | G_SUBPROCESS_FLAGS_STDERR_SILENCE)));
  const char *path = g_getenv("PATH");
  std::string variable = std::string("PATH=") + (path ? path : "/usr/bin:/bin");
  std::array<char *, 2> environment = {variable.data(), nullptr};
  g_subprocess_launcher_set_environ(launcher.get(), environment.data());
  g_subprocess_launcher_set_cwd(launcher.get(), "/");
  if (run.input >= 0) {
    g_subprocess_launcher_take_stdin_fd(launcher.get(), fcntl(run.input, F_DUPFD_CLOEXEC, 3));
  }
  g_subprocess_launcher_set_child_setup(launcher.get(), set_limits, nullptr, nullptr);
  std::vector<const char *> words;
  for (const std::string &word : run.command) words.push_back(word.c_str());
  words.push_back(nullptr);
  TavroError error;
  return TavroObject<GSubprocess>(
      g_subprocess_launcher_spawnv(launcher.get(), words.data(), tavro_out(error)));
}

}  // namespace

bool run_limited(const LimitedRun &run) {
  const TavroObject<GSubprocess> program = start(run);
  if (!program) return false;
  auto *output = G_UNIX_INPUT_STREAM(g_subprocess_get_stdout_pipe(program.get()));
  const End end = read_all(g_unix_input_stream_get_fd(output), run);
  if (end != End::kWhole) g_subprocess_force_exit(program.get());
  g_subprocess_wait(program.get(), nullptr, nullptr);
  return end == End::kEnough || (end == End::kWhole && g_subprocess_get_if_exited(program.get()) &&
                                 g_subprocess_get_exit_status(program.get()) == 0);
}

bool is_program_there(const char *name) {
  return TavroGText(g_find_program_in_path(name)) != nullptr;
}

std::string output_of(LimitedRun run, size_t most) {
  std::string text;
  run.take = [&text, most](const char *bytes, size_t count) {
    text.append(bytes, std::min(count, most - text.size()));
    return text.size() < most;
  };
  run_limited(run);
  return text;
}
