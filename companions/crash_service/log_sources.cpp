#include "log_sources.h"

#include <fcntl.h>
#include <sys/stat.h>

#include <algorithm>
#include <array>
#include <ctime>

#include "crash_log.h"
#include "limited_process.h"
#include "tavro_handles.h"

namespace {

constexpr size_t kLargestSource = 1024 * 1024;  // bytes
constexpr time_t kSeconds = 60 * 60;            // how far back a log reaches
constexpr size_t kLongestLineStart = 256;       // bytes: time, priority, tag and process
constexpr char kPlatformLog[] = "/opt/usr/share/log/platform.log";

// Lines are bounded too: a journal is read from its old end.
constexpr std::array kJournalCommand = {"journalctl",
                                        "--quiet",
                                        "--no-pager",
                                        "--output=short-iso",
                                        "--since=-60m",
                                        "--lines=20000",
                                        static_cast<const char *>(nullptr)};

void keep_newest(std::string *text) {
  if (text->size() <= kLargestSource) return;
  const size_t line_end = text->find('\n', text->size() - kLargestSource - 1);
  text->erase(0, line_end == std::string::npos ? text->size() : line_end + 1);
}

std::string read_journal(GCancellable *stop) {
  TavroError error;
  const auto flags =
      static_cast<GSubprocessFlags>(G_SUBPROCESS_FLAGS_STDOUT_PIPE | G_SUBPROCESS_FLAGS_STDERR_SILENCE);
  const TavroObject<GSubprocess> journal(g_subprocess_newv(kJournalCommand.data(), flags, tavro_out(error)));
  if (!journal) return {};  // a machine without a journal
  GInputStream *output = g_subprocess_get_stdout_pipe(journal.get());
  std::string text;
  std::array<char, 64 * 1024> block;
  gssize got;
  while ((got = g_input_stream_read(output, block.data(), block.size(), stop, tavro_out(error))) > 0) {
    text.append(block.data(), static_cast<size_t>(got));
    // Trimmed now and then only, since each time moves what is left.
    if (text.size() > 4 * kLargestSource) keep_newest(&text);
  }
  if (got < 0) CRASH_LOGE("the journal was not read to its end: %s", error->message);
  g_subprocess_force_exit(journal.get());
  keep_newest(&text);
  return text;
}

// The end of a file, as much of it as can be kept.
std::string read_end(const std::string &path) {
  const TavroFd file(open(path.c_str(), O_RDONLY | O_CLOEXEC | O_NOFOLLOW | O_NONBLOCK));
  struct stat info;
  if (!file || fstat(file.get(), &info) != 0 || !S_ISREG(info.st_mode)) return {};
  // One byte more than fits: it tells whether the first line is whole.
  const off_t size = std::min<off_t>(info.st_size, kLargestSource + 1);
  std::string text(static_cast<size_t>(size), '\0');
  size_t filled = 0;
  while (filled < text.size()) {
    const ssize_t got = pread(file.get(), text.data() + filled, text.size() - filled,
                              info.st_size - size + static_cast<off_t>(filled));
    if (got <= 0) break;
    filled += static_cast<size_t>(got);
  }
  text.resize(filled);
  return text;
}

// Each line begins with its local time, in a form whose order is that of the text.
void drop_older_lines(std::string *text) {
  const time_t since = std::time(nullptr) - kSeconds;
  struct tm local;
  localtime_r(&since, &local);
  std::array<char, 32> stamp;
  const size_t length = strftime(stamp.data(), stamp.size(), "%Y-%m-%d %H:%M:%S", &local);
  size_t line = 0;
  while (line < text->size() && text->compare(line, length, stamp.data()) < 0) {
    const size_t line_end = text->find('\n', line);
    line = line_end == std::string::npos ? text->size() : line_end + 1;
  }
  text->erase(0, line);
}

std::string read_platform_log() {
  std::string text = read_end(std::string(kPlatformLog) + ".1") + read_end(kPlatformLog);
  keep_newest(&text);
  drop_older_lines(&text);
  return text;
}

std::string under_heading(const char *heading, const std::string &text) {
  return text.empty() ? text : std::string("---- ") + heading + " ----\n" + text;
}

// The lines "<time> <priority>/<tag>(<pid>): …" of one process; all when it wrote none, since what the others
// did then is all there is to see.
std::string lines_of(const std::string &text, int64_t pid) {
  const std::string mark = "(" + std::to_string(pid) + "): ";
  std::string lines;
  for (size_t line = 0; line < text.size();) {
    const size_t end = std::min(text.find('\n', line), text.size() - 1) + 1;
    const std::string_view whole(text.data() + line, end - line);
    if (whole.substr(0, kLongestLineStart).find(mark) != std::string_view::npos) lines += whole;
    line = end;
  }
  return lines.empty() ? text : lines;
}

std::string read_program_journal(const std::string &executable, GCancellable *stop) {
  if (executable.empty()) return "";
  LimitedRun run;
  run.command = {"journalctl",   "--quiet",     "--no-pager",    "--output=short-iso",
                 "--since=-60m", "--lines=500", "--no-hostname", "_EXE=" + executable};
  run.stop = stop;
  return output_of(std::move(run), kLargestSource);
}

}  // namespace

std::string collect_log(GCancellable *stop) {
  return under_heading("journal", read_journal(stop)) + under_heading("platform log", read_platform_log());
}
std::string collect_program_log(const Crash &crash, bool is_of_phone, GCancellable *stop) {
  const int64_t pid = crash.phone_pid ? crash.phone_pid : crash.pid;
  return under_heading("journal", read_program_journal(crash.executable, stop)) +
         under_heading("platform log", is_of_phone ? lines_of(read_platform_log(), pid) : "");
}
