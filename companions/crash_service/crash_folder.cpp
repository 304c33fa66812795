#include "crash_folder.h"

#include <fcntl.h>
#include <sys/stat.h>

#include <algorithm>
#include <array>
#include <ctime>
#include <filesystem>
#include <vector>

#include "core_copy.h"
#include "crash_application.h"
#include "crash_log.h"
#include "crash_stack.h"
#include "crash_summary.h"
#include "log_sources.h"
#include "tavro_crash_service.h"

namespace {

namespace fs = std::filesystem;

// Beside the dump folder, on the same disk: whatever lies in that one counts as a crash.
constexpr char kUnfinishedFolder[] = "/opt/usr/share/crash/unfinished/";
constexpr size_t kLongestProgram = 64;  // bytes of its name in a file's name
constexpr size_t kMostFolders = 20;
constexpr uintmax_t kMostBytes = 500 * 1000 * 1000;

std::string file_name_of(const std::string &program) {
  std::string name = program.substr(0, kLongestProgram);
  for (char &byte : name) {
    if (!g_ascii_isalnum(byte) && byte != '+') byte = '-';
  }
  return name.empty() ? "program" : name;
}

std::string stamp_of(const Crash &crash) {
  const time_t seconds = static_cast<time_t>(crash.time_us / 1000000);
  struct tm local = {};
  localtime_r(&seconds, &local);
  std::array<char, 64> stamp;
  return {stamp.data(), strftime(stamp.data(), stamp.size(), "%Y%m%d%H%M%S", &local)};
}

bool is_last_token_taken(const std::string &token) {
  std::error_code error;
  for (const fs::directory_entry &entry : fs::directory_iterator(TAVRO_CRASH_DUMP_FOLDER, error)) {
    const std::string name = entry.path().filename();
    if (name.substr(name.rfind('_') + 1) == token) return true;
  }
  return false;
}

std::string unused_name(const std::string &start, const std::string &stamp) {
  std::string token = stamp;
  for (int number = 2; is_last_token_taken(token); ++number) token = stamp + "-" + std::to_string(number);
  return start + token;
}

// The folder that is being made; removed unless it was moved to its place.
class Unfinished {
 public:
  Unfinished() : path_(std::string(kUnfinishedFolder) + "folder/") {
    std::error_code error;
    fs::remove_all(kUnfinishedFolder, error);
    is_made_ = g_mkdir_with_parents(path_.c_str(), 0700) == 0;
  }
  Unfinished(const Unfinished &) = delete;
  Unfinished &operator=(const Unfinished &) = delete;
  ~Unfinished() {
    const TavroKeptErrno kept;
    std::error_code error;
    fs::remove_all(kUnfinishedFolder, error);
  }

  bool is_made() const { return is_made_; }
  std::string file(const std::string &name) const { return path_ + name; }
  // For what is not part of the folder.
  std::string beside(const std::string &name) const { return kUnfinishedFolder + name; }

  bool move_to(const std::string &name) const {
    const TavroFd folder(open(path_.c_str(), O_RDONLY | O_DIRECTORY | O_CLOEXEC));
    if (!folder || fsync(folder.get()) != 0) return false;
    if (rename(path_.c_str(), (TAVRO_CRASH_DUMP_FOLDER + name).c_str()) != 0) return false;
    const TavroFd place(open(TAVRO_CRASH_DUMP_FOLDER, O_RDONLY | O_DIRECTORY | O_CLOEXEC));
    return place && fsync(place.get()) == 0;
  }

 private:
  std::string path_;
  bool is_made_ = false;
};

// A crash is told of without its core too, so nothing here fails.
CoreCopy add_core(const Crash &crash, const Unfinished &folder, const std::string &base, GCancellable *stop) {
  const TavroFd core(open(crash.core.c_str(), O_RDONLY | O_CLOEXEC | O_NOFOLLOW | O_NONBLOCK));
  const auto said = core ? crash_of_open_core(core.get(), crash.core) : std::nullopt;
  if (!said || said->id() != crash.id()) {
    CoreCopy none;
    none.note = !crash.core.empty()  ? "it is gone"
                : crash.note.empty() ? "the machine kept none"
                                     : crash.note;
    return none;
  }
  return copy_core(core.get(), folder.file(base + ".coredump.gz"), folder.beside("plain.core"), stop);
}

std::string stack_of(const Crash &crash, const Unfinished &folder, const CoreCopy &copy, GCancellable *stop) {
  if (!crash.stack.empty()) return crash.stack;
  // A debugger is a lot of code: it reads what our own user's programs left, nobody else's.
  if (!copy.is_unpacked || crash.uid != static_cast<int64_t>(getuid())) return "";
  return read_stack(folder.beside("plain.core"), crash.executable, stop);
}

bool write_text(const std::string &path, const std::string &text) {
  const TavroFd file = create_private_file(path);
  return file && write(file.get(), text.data(), text.size()) == static_cast<ssize_t>(text.size()) &&
         fsync(file.get()) == 0;
}

// The stack of what was unpacked is read, then that is removed, before the rest is written. False with errno
// when the disk does not take the log and the summary.
bool fill(const Crash &crash, int uncounted, const CrashApplication &application, const Unfinished &folder,
          GCancellable *stop) {
  const std::string base = file_name_of(crash.program);
  const CoreCopy copy = add_core(crash, folder, base, stop);
  CrashSummary summary{crash, application, uncounted, "", stack_of(crash, folder, copy, stop)};
  unlink(folder.beside("plain.core").c_str());
  const std::string note = copy.note.empty() ? crash.note : copy.note;
  summary.core = (copy.is_kept ? "kept" : "not kept") + (note.empty() ? "" : ", " + note);
  const std::string log = collect_program_log(crash, application.is_of_phone || !crash.phone.empty(), stop);
  return write_packed_text(folder.file(base + ".log.gz"), log) &&
         write_text(folder.file(base + ".cs"), text_of(summary));
}

// Also when somebody has removed it meanwhile.
bool prepare_dump_folder() {
  return g_mkdir_with_parents(TAVRO_CRASH_DUMP_FOLDER, 0700) == 0;
}

struct Found {
  fs::path path;
  timespec changed;
  uintmax_t bytes;
};

uintmax_t size_of_folder(const fs::path &path) {
  uintmax_t bytes = 0;
  std::error_code error;
  for (fs::recursive_directory_iterator entry(path, error), end; !error && entry != end;
       entry.increment(error)) {
    struct stat info;
    if (lstat(entry->path().c_str(), &info) == 0 && S_ISREG(info.st_mode)) {
      bytes += static_cast<uintmax_t>(info.st_size);
    }
  }
  return bytes;
}

// Newest first. Links and files in the dump folder are nobody's crash and are left alone.
std::vector<Found> all_folders() {
  std::vector<Found> folders;
  std::error_code error;
  for (fs::directory_iterator entry(TAVRO_CRASH_DUMP_FOLDER, error), end; !error && entry != end;
       entry.increment(error)) {
    struct stat info;
    if (lstat(entry->path().c_str(), &info) != 0 || !S_ISDIR(info.st_mode)) continue;
    folders.push_back({entry->path(), info.st_mtim, size_of_folder(entry->path())});
  }
  std::sort(folders.begin(), folders.end(), [](const Found &left, const Found &right) {
    return std::make_pair(left.changed.tv_sec, left.changed.tv_nsec) >
           std::make_pair(right.changed.tv_sec, right.changed.tv_nsec);
  });
  return folders;
}

}  // namespace

bool prepare_crash_folders() {
  std::error_code error;
  fs::remove_all(kUnfinishedFolder, error);
  if (prepare_dump_folder()) return true;
  CRASH_LOGE("%s: %s", TAVRO_CRASH_DUMP_FOLDER, g_strerror(errno));
  return false;
}

CrashFolder make_crash_folder(const Crash &crash, int uncounted, GCancellable *stop) {
  const CrashApplication application = application_of(crash);
  CrashFolder folder{"", application.id, application.name, crash.time_us / 1000};
  const std::string start = file_name_of(crash.program) + "_" + std::to_string(crash.pid) + "_";
  const std::string stamp = stamp_of(crash);
  if (g_file_test((TAVRO_CRASH_DUMP_FOLDER + start + stamp).c_str(), G_FILE_TEST_IS_DIR)) {
    folder.name = start + stamp;
    return folder;
  }
  const std::string name = unused_name(start, stamp);
  errno = 0;
  const Unfinished unfinished;
  if (prepare_dump_folder() && unfinished.is_made() &&
      fill(crash, uncounted, application, unfinished, stop) && !g_cancellable_is_cancelled(stop) &&
      unfinished.move_to(name)) {
    folder.name = name;
  } else if (!g_cancellable_is_cancelled(stop)) {
    CRASH_LOGE("no crash folder %s: %s", name.c_str(), g_strerror(errno));
  }
  return folder;
}

void keep_newest_crash_folders() {
  size_t count = 0;
  uintmax_t bytes = 0;
  for (const Found &folder : all_folders()) {
    bytes += folder.bytes;
    if (++count == 1 || (count <= kMostFolders && bytes <= kMostBytes)) continue;
    std::error_code error;
    fs::remove_all(folder.path, error);
    if (error) CRASH_LOGE("%s: %s", folder.path.c_str(), error.message().c_str());
  }
}
