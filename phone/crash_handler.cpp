#include "crash_handler.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <sys/wait.h>
#include <sys/xattr.h>

#include <algorithm>
#include <array>
#include <cerrno>
#include <cstdio>
#include <cstring>
#include <filesystem>
#include <optional>

#include "folder.h"
#include "options.h"
#include "sandbox.h"
#include "tavro_cores.h"
#include "tavro_handles.h"

namespace phone {

namespace {

namespace fs = std::filesystem;

constexpr char kPattern[] = "/proc/sys/kernel/core_pattern";
constexpr char kSystemd[] = "systemd-coredump";
// Process, the same within its namespace, user, signal, time, whether its user may see it.
constexpr char kArguments[] = " %P %p %u %s %t %d";
constexpr int kProofTries = 50;  // for 5 seconds
constexpr char kNobodysPhone[] = "TAVRO_PHONE_DIR=trial";

// The kernel's own line, without its line break. Nothing when it cannot be read.
std::optional<std::string> read_line(const std::string &path) {
  TavroGText text;
  if (!g_file_get_contents(path.c_str(), tavro_out(text), nullptr, nullptr)) return std::nullopt;
  std::string line = text.get();
  if (!line.empty() && line.back() == '\n') line.pop_back();
  return line;
}

// In one write, as the kernel wants it. False after a message.
bool write_pattern(const std::string &path, const std::string &pattern) {
  const TavroFd file(open(path.c_str(), O_WRONLY | O_TRUNC | O_CLOEXEC));
  const std::string line = pattern + "\n";
  if (file && write(file.get(), line.data(), line.size()) == static_cast<ssize_t>(line.size())) return true;
  say("cannot change " + path + ": " + g_strerror(errno));
  return false;
}

std::string packed_program() {
  return fs::path(own_program()).parent_path() / "tavro-core-handler";
}

bool must_be_root(const std::string &what) {
  if (geteuid() == 0) return true;
  say("only root can " + what + " the machine's crash handler");
  return false;
}

void print(const std::string &line) {
  std::printf("%s\n", line.c_str());
  std::fflush(stdout);
}

// A shell that ends itself as a crash does, marked so that no phone takes it for one. Its process, 0 after a
// message.
int crash_on_purpose() {
  std::array<const char *, 4> words = {"/bin/sh", "-c", "kill -ABRT $$", nullptr};
  std::array<const char *, 2> environment = {kNobodysPhone, nullptr};
  TavroError error;
  GPid pid = 0;
  if (!g_spawn_async("/", const_cast<char **>(words.data()), const_cast<char **>(environment.data()),
                     G_SPAWN_DO_NOT_REAP_CHILD, nullptr, nullptr, &pid, tavro_out(error)))
    return say(error->message), 0;
  waitpid(pid, nullptr, 0);
  return pid;
}

// The handler's locks do not count.
bool has_cores(const std::string &folder) {
  std::error_code error;
  for (const fs::directory_entry &entry : fs::directory_iterator(folder, error)) {
    if (entry.path().filename().string()[0] != '.') return true;
  }
  return false;
}

// Removes the core of the process; whether there was one.
bool take_core_of(const std::string &folder, int pid) {
  std::error_code error;
  for (const fs::directory_entry &entry : fs::directory_iterator(folder, error)) {
    std::array<char, 32> value = {};
    const ssize_t length =
        lgetxattr(entry.path().c_str(), TAVRO_CORE_PHONE_PID, value.data(), value.size() - 1);
    if (length > 0 && entry.path().filename().string()[0] != '.' && std::to_string(pid) == value.data())
      return fs::remove(entry.path(), error);
  }
  return false;
}

}  // namespace

CrashHandler::CrashHandler(std::string root)
    : root_(std::move(root)),
      pattern_path_(root_ + kPattern),
      home_(root_ + TAVRO_CORE_HOME),
      program_(std::string(TAVRO_CORE_HOME) + "/core-handler"),
      our_pattern_("|" + program_ + kArguments) {}

CrashHandler::Kind CrashHandler::kind_of(const std::string &pattern) const {
  if (pattern == our_pattern_) return Kind::kOurs;
  if (pattern.empty()) return Kind::kNone;
  if (pattern[0] != '|') return Kind::kFile;
  return pattern.find(kSystemd) != std::string::npos ? Kind::kSystemd : Kind::kOther;
}

int CrashHandler::enable() {
  if (!must_be_root("change")) return kFailed;
  const auto before = read_line(pattern_path_);
  if (!before) return fail("cannot read " + pattern_path_);
  switch (kind_of(*before)) {
    case Kind::kOurs:
      // With the program as it is now, which may be newer than the copy.
      return copy_program() ? (print("already enabled"), kDone) : kFailed;
    case Kind::kSystemd:
      return print("systemd-coredump handles crashes here, and phones read what it keeps: nothing to change"),
             kDone;
    default:
      break;
  }
  if (!copy_program()) return kFailed;
  // Remembered before it is changed: whatever ends us in between, the way back is known.
  if (!write_private_file(home_ + "/crash-handler", "previous=" + *before + "\nours=" + our_pattern_ + "\n"))
    return kFailed;
  if (!write_pattern(pattern_path_, our_pattern_)) return forget(), kFailed;
  if (root_.empty() && !prove()) {
    if (write_pattern(pattern_path_, *before)) forget();
    return fail("no core arrived from a trial crash (is this a container?); everything is as it was");
  }
  print(pattern_path_ + " was \"" + *before + "\"");
  print(pattern_path_ + " is now \"" + our_pattern_ + "\"");
  print(home_ + "/core-handler keeps the newest 16 cores of all users' crashes, 1 GB at most, in " + home_ +
        "/cores");
  print("Until the next start of the machine, or \"tavro-phone crash-handler disable\".");
  return kDone;
}

int CrashHandler::disable() {
  if (!must_be_root("change")) return kFailed;
  State state;
  const auto now = read_line(pattern_path_);
  const auto text = read_line(home_ + "/crash-handler");
  if (!text && now && kind_of(*now) == Kind::kOurs)
    return fail(home_ + "/crash-handler is gone: write into " + pattern_path_ + " what is to be there");
  if (!text) return print("it is not enabled"), kDone;
  const TavroStrv lines(g_strsplit(text->c_str(), "\n", -1));
  for (char **line = lines.get(); *line; ++line) {
    if (const char *equals = std::strchr(*line, '='))
      state[std::string(*line, static_cast<size_t>(equals - *line))] = equals + 1;
  }
  if (!now || !state.count("previous"))
    return fail("cannot read " + pattern_path_ + " or what it was before");
  if (*now == state["ours"]) {
    if (!write_pattern(pattern_path_, state["previous"])) return kFailed;
    print(pattern_path_ + " is \"" + state["previous"] + "\" again");
  } else {
    print(pattern_path_ + " is \"" + *now + "\", which is not ours: left as it is");
  }
  forget();
  if (has_cores(home_ + "/cores")) print("Cores that were kept stay in " + home_ + "/cores");
  return kDone;
}

int CrashHandler::status() const {
  const auto now = read_line(pattern_path_);
  if (!now) return fail("cannot read " + pattern_path_);
  switch (kind_of(*now)) {
    case Kind::kOurs:
      print("enabled until the next start of the machine: crashes are kept in " + home_ + "/cores");
      break;
    case Kind::kSystemd:
      print("not enabled: systemd-coredump handles crashes, and phones read what it keeps");
      break;
    case Kind::kOther:
      print("not enabled: another program handles crashes, phones do not see them");
      break;
    default:
      print("not enabled: crashes leave a core file at most, phones do not see them");
  }
  print(pattern_path_ + " is \"" + *now + "\"");
  if (kind_of(*now) != Kind::kOurs && g_file_test((home_ + "/crash-handler").c_str(), G_FILE_TEST_EXISTS))
    print("It was enabled, and somebody, or a new start of the machine, has changed that since.");
  return kDone;
}

// The kernel starts it as root for whoever crashes: it must lie where only root can write, and must not go
// away with a build folder.
bool CrashHandler::copy_program() const {
  std::error_code error;
  const std::string copy = home_ + "/core-handler";
  fs::create_directories(home_, error);
  if (!error) fs::permissions(home_, fs::perms(0755), error);
  if (!error) fs::copy_file(packed_program(), copy + ".new", fs::copy_options::overwrite_existing, error);
  if (!error) fs::permissions(copy + ".new", fs::perms(0755), error);
  if (!error) fs::rename(copy + ".new", copy, error);
  if (error) say("the handler cannot be copied to " + copy + ": " + error.message());
  return !error;
}

bool CrashHandler::prove() const {
  const int pid = crash_on_purpose();
  for (int i = 0; pid && i < kProofTries; ++i) {
    if (take_core_of(home_ + "/cores", pid)) return true;
    g_usleep(100 * 1000);
  }
  return false;
}

void CrashHandler::forget() const {
  unlink((home_ + "/crash-handler").c_str());
  unlink((home_ + "/core-handler").c_str());
  std::error_code error;
  if (!has_cores(home_ + "/cores")) fs::remove_all(home_ + "/cores", error);
  rmdir(home_.c_str());  // unless something is left in it
}

}  // namespace phone
