#include "journal_follower.h"

#include <gio/gunixinputstream.h>
#include <glib-unix.h>
#include <signal.h>
#include <sys/prctl.h>

#include <algorithm>
#include <array>

#include "crash_log.h"

namespace {

constexpr size_t kLongestLine = 4 * 1024 * 1024;  // bytes; the fields below, with room for escapes
constexpr guint kLongestDelaySeconds = 600;
// What systemd-coredump's records carry for good, and the fields that are read, in full.
constexpr char kRecords[] = "MESSAGE_ID=fc2e22bc6ee647b6b90729ab34a250b1";
constexpr char kFields[] =
    "--output-fields=MESSAGE,_UID,COREDUMP_PID,COREDUMP_UID,COREDUMP_SIGNAL,COREDUMP_TIMESTAMP,COREDUMP_COMM,"
    "COREDUMP_EXE,COREDUMP_FILENAME,COREDUMP_TRUNCATED,COREDUMP_ENVIRON,COREDUMP_PROC_STATUS";

}  // namespace

void JournalFollower::start(int64_t since_us) {
  since_us_ = since_us;
  start_child();
}

void JournalFollower::stop() {
  end_child();
  if (start_source_) g_source_remove(std::exchange(start_source_, 0));
}

void JournalFollower::start_child() {
  const std::string since = "--since=@" + std::to_string(since_us_ / 1000000);
  const std::array<const char *, 10> command = {"journalctl",    "--quiet",  "--no-pager", "--all",
                                                "--output=json", "--follow", "--no-tail",  since.c_str(),
                                                kFields,         kRecords};
  std::vector<const char *> words(command.begin(), command.end());
  words.push_back(nullptr);
  const TavroObject<GSubprocessLauncher> launcher(g_subprocess_launcher_new(
      static_cast<GSubprocessFlags>(G_SUBPROCESS_FLAGS_STDOUT_PIPE | G_SUBPROCESS_FLAGS_STDERR_SILENCE)));
  g_subprocess_launcher_set_child_setup(
      launcher.get(), [](gpointer) { prctl(PR_SET_PDEATHSIG, SIGKILL); }, nullptr, nullptr);
  TavroError error;
  child_.reset(g_subprocess_launcher_spawnv(launcher.get(), words.data(), tavro_out(error)));
  if (!child_) {
    CRASH_LOGI("there is no journal to follow: %s", error->message);
    return;
  }
  const int fd = g_unix_input_stream_get_fd(G_UNIX_INPUT_STREAM(g_subprocess_get_stdout_pipe(child_.get())));
  g_unix_set_fd_nonblocking(fd, TRUE, nullptr);
  output_source_ = g_unix_fd_add(fd, static_cast<GIOCondition>(G_IO_IN | G_IO_HUP), output_cb, this);
}

void JournalFollower::end_child() {
  if (output_source_) g_source_remove(std::exchange(output_source_, 0));
  if (child_) g_subprocess_force_exit(child_.get());
  child_.reset();
  line_.clear();
  is_line_too_long_ = false;
}

gboolean JournalFollower::output_cb(gint fd, GIOCondition, gpointer data) {
  auto *self = static_cast<JournalFollower *>(data);
  std::array<char, 64 * 1024> block;
  const ssize_t got = read(fd, block.data(), block.size());
  if (got < 0 && (errno == EAGAIN || errno == EINTR)) return G_SOURCE_CONTINUE;
  if (got > 0) {
    self->take(block.data(), static_cast<size_t>(got));
    return G_SOURCE_CONTINUE;
  }
  self->output_source_ = 0;
  self->end_child();
  self->start_source_ = g_timeout_add_seconds(self->delay_s_, start_cb, self);
  self->delay_s_ = std::min(self->delay_s_ * 2, kLongestDelaySeconds);
  return G_SOURCE_REMOVE;
}

gboolean JournalFollower::start_cb(gpointer data) {
  auto *self = static_cast<JournalFollower *>(data);
  self->start_source_ = 0;
  self->start_child();
  return G_SOURCE_REMOVE;
}

void JournalFollower::take(const char *bytes, size_t count) {
  for (const char *const end = bytes + count; bytes < end;) {
    const char *line_end = std::find(bytes, end, '\n');
    const auto length = static_cast<size_t>(line_end - bytes);
    is_line_too_long_ = is_line_too_long_ || line_.size() + length > kLongestLine;
    if (!is_line_too_long_) line_.append(bytes, length);
    bytes = line_end;
    if (line_end == end) return;
    ++bytes;
    take_line();
  }
}

void JournalFollower::take_line() {
  const std::string line = std::exchange(line_, {});
  if (std::exchange(is_line_too_long_, false)) {
    CRASH_LOGE("a record of the journal is too long to be a crash");
    return;
  }
  const auto crash = crash_of_record(line);
  if (!crash) return;
  delay_s_ = 5;
  on_crash_(*crash);
}
