#include "dlog.h"

#include <fcntl.h>
#include <sys/file.h>
#include <sys/stat.h>
#include <time.h>
#include <unistd.h>

#include <algorithm>
#include <cstdarg>
#include <cstdio>
#include <cstdlib>
#include <mutex>
#include <string>

#include "places.h"
#include "scoped.h"

namespace {

using platform::ScopedFd;

constexpr size_t kLongestMessage = 16 * 1024;  // bytes
constexpr off_t kRotateAt = 4 * 1024 * 1024;   // bytes
constexpr const char *kCutMark = "…";

std::string log_path() {
  return std::string(platform::kLogFolder) + "/platform.log";
}

char priority_letter(log_priority priority) {
  constexpr char kLetters[] = "??VDIWEFS";
  const bool known = priority >= DLOG_UNKNOWN && priority <= DLOG_SILENT;
  return kLetters[known ? priority : DLOG_UNKNOWN];
}

// One message is one line and cannot play another: line ends and control characters are written out.
void append_escaped(std::string *line, const char *text, size_t length) {
  for (size_t i = 0; i < length; ++i) {
    const auto byte = static_cast<unsigned char>(text[i]);
    if (byte == '\n') {
      *line += "\\n";
    } else if (byte < 0x20 || byte == 0x7f) {
      char code[8];
      snprintf(code, sizeof(code), "\\x%02x", byte);
      *line += code;
    } else {
      *line += text[i];
    }
  }
}

// The longest prefix of at most `limit` bytes that does not end inside a UTF-8 character.
size_t cut_length(const char *text, size_t limit) {
  while (limit > 0 && (static_cast<unsigned char>(text[limit]) & 0xc0) == 0x80) --limit;
  return limit;
}

std::string make_line(log_priority priority, const char *tag, const char *text, size_t length) {
  timespec now;
  clock_gettime(CLOCK_REALTIME, &now);
  tm local;
  localtime_r(&now.tv_sec, &local);
  char stamp[64];
  const size_t stamp_length = strftime(stamp, sizeof(stamp), "%Y-%m-%d %H:%M:%S", &local);
  snprintf(stamp + stamp_length, sizeof(stamp) - stamp_length, ".%03ld %c/", now.tv_nsec / 1000000,
           priority_letter(priority));

  std::string line = stamp;
  line.reserve(length + 128);
  append_escaped(&line, tag, strlen(tag));
  line += "(" + std::to_string(getpid()) + "): ";
  const bool is_cut = length > kLongestMessage;
  append_escaped(&line, text, is_cut ? cut_length(text, kLongestMessage) : length);
  if (is_cut) line += kCutMark;
  return line += '\n';
}

// The open log file of this process. Other processes write to the same file and may rotate it.
class LogFile {
 public:
  bool write_line(const std::string &line) {
    const std::lock_guard<std::mutex> lock(mutex_);
    if (!reopen_if_replaced()) return false;
    rotate_if_full();
    // O_APPEND and a single write keep the lines of several processes apart.
    return write(fd_.get(), line.data(), line.size()) == static_cast<ssize_t>(line.size());
  }

 private:
  bool is_current() const {
    struct stat own, named;
    return fd_ && fstat(fd_.get(), &own) == 0 && stat(path_.c_str(), &named) == 0 &&
           own.st_ino == named.st_ino && own.st_dev == named.st_dev;
  }

  bool reopen_if_replaced() {
    if (is_current()) return true;
    constexpr int kFlags = O_WRONLY | O_APPEND | O_CREAT | O_CLOEXEC | O_NOFOLLOW;
    fd_.reset(open(path_.c_str(), kFlags, platform::kPrivateFileMode));
    if (!fd_ && errno == ENOENT && platform::make_folder(platform::kLogFolder)) {
      fd_.reset(open(path_.c_str(), kFlags, platform::kPrivateFileMode));
    }
    return static_cast<bool>(fd_);
  }

  void rotate_if_full() {
    struct stat own;
    if (fstat(fd_.get(), &own) != 0 || own.st_size < kRotateAt) return;
    // The lock decides which process renames; the others find the new file when they get it.
    const ScopedFd locked(fcntl(fd_.get(), F_DUPFD_CLOEXEC, 0));
    if (!locked || flock(locked.get(), LOCK_EX) != 0) return;
    if (is_current()) rename(path_.c_str(), (path_ + ".1").c_str());
    flock(locked.get(), LOCK_UN);
    reopen_if_replaced();
  }

  std::mutex mutex_;  // guards fd_
  ScopedFd fd_;
  const std::string path_ = log_path();
};

void write_log(const std::string &line) {
  // Never destroyed: threads may log while the process ends.
  static LogFile &file = *new LogFile;
  static const bool echoes = getenv("TAVRO_LOG_STDERR") || isatty(STDERR_FILENO);
  const bool is_written = file.write_line(line);
  if (echoes || !is_written) {
    const ssize_t ignored = write(STDERR_FILENO, line.data(), line.size());
    static_cast<void>(ignored);
  }
}

}  // namespace

int dlog_print(log_priority priority, const char *tag, const char *format, ...) {
  if (!format) return -EINVAL;
  const int saved_errno = errno;
  // Room for one byte above the limit, so that a message of just the limit is not taken for a longer one.
  char text[kLongestMessage + 2];
  va_list arguments;
  va_start(arguments, format);
  const int wanted = vsnprintf(text, sizeof(text), format, arguments);
  va_end(arguments);
  if (wanted < 0) {
    errno = saved_errno;
    return -EINVAL;
  }
  const size_t length = std::min(static_cast<size_t>(wanted), sizeof(text) - 1);
  const std::string line = make_line(priority, tag ? tag : "", text, length);
  write_log(line);
  errno = saved_errno;
  return static_cast<int>(line.size());
}
