#include "core_store.h"

#include <fcntl.h>
#include <linux/posix_acl.h>
#include <linux/posix_acl_xattr.h>
#include <poll.h>
#include <sys/file.h>
#include <sys/stat.h>
#include <sys/statvfs.h>
#include <sys/xattr.h>
#include <syslog.h>
#include <time.h>
#include <zlib.h>

#include <algorithm>
#include <array>
#include <cctype>
#include <cstring>
#include <map>
#include <vector>

#include "tavro_cores.h"
#include "tavro_handles.h"

namespace phone {

namespace {

constexpr int64_t kLargestCore = int64_t{2} << 30;      // bytes, unpacked
constexpr int64_t kLargestPacked = int64_t{250} << 20;  // bytes
constexpr uint64_t kKeptFree = uint64_t{256} << 20;     // bytes of the disk
constexpr size_t kMostCores = 16;
constexpr int64_t kMostBytes = int64_t{1} << 30;
constexpr int64_t kLookEvery = 16 << 20;  // bytes between two looks at the disk
constexpr int kLockTries = 50;            // for 5 seconds: a crash holds its process that long
constexpr int64_t kLongestPacking = 120;  // seconds; memory behind a stalled file system never comes
constexpr int64_t kStaleAfter = 60 * 60;  // seconds; no handler works that long
constexpr size_t kLongestAttribute = 1024;
constexpr char kLockPrefix[] = ".lock-";

using GzFile = TavroHandle<gzFile_s, gzclose>;

TavroFd open_folder(const std::string &path) {
  // Others may see that there was a crash, as with the machine's other handlers, but not into it.
  if (mkdir(path.c_str(), 0755) == 0 && chmod(path.c_str(), 0755) != 0) return TavroFd();
  return TavroFd(open(path.c_str(), O_RDONLY | O_DIRECTORY | O_NOFOLLOW | O_CLOEXEC));
}

// One core of a user at a time: a crash loop takes one processor, not all, and keeps no other user waiting.
// The lock is a file that only root can open; the folder could be locked by whoever reads it. Empty when it
// was not to be had.
TavroFd lock(int folder, uid_t user) {
  TavroFd file(openat(folder, (kLockPrefix + std::to_string(user)).c_str(),
                      O_RDWR | O_CREAT | O_NOFOLLOW | O_CLOEXEC, 0600));
  for (int i = 0; file && i < kLockTries; ++i) {
    if (flock(file.get(), LOCK_EX | LOCK_NB) == 0) return file;
    poll(nullptr, 0, 100);
  }
  return TavroFd();
}

bool has_room(int fd) {
  struct statvfs disk;
  return fstatvfs(fd, &disk) == 0 && uint64_t{disk.f_bavail} * disk.f_frsize > kKeptFree;
}

int64_t size_of(int fd) {
  struct stat info;
  return fstat(fd, &info) == 0 ? info.st_size : 0;
}

int64_t seconds_now() {
  timespec now = {};
  clock_gettime(CLOCK_MONOTONIC, &now);
  return now.tv_sec;
}

// False when the time is over.
bool wait_for_input(int input, int64_t until) {
  pollfd waited = {input, POLLIN, 0};
  for (int64_t left; (left = until - seconds_now()) > 0;) {
    const int ready = poll(&waited, 1, static_cast<int>(left * 1000));
    if (ready > 0 || (ready < 0 && errno != EINTR)) return ready > 0;
  }
  return false;
}

// Packs what comes until then. Empty when all was taken, else why it was not.
std::string pack_into(gzFile gz, int input, int file, int64_t until, bool *is_disk_full) {
  std::array<char, 64 * 1024> block;
  int64_t taken = 0;
  while (wait_for_input(input, until)) {
    const ssize_t got = read(input, block.data(), block.size());
    if (got == 0) return "";
    if (got < 0 && errno == EINTR) continue;
    if (got < 0) return "it broke off";
    *is_disk_full = taken % kLookEvery < got && !has_room(file);
    if (*is_disk_full) return "the disk is nearly full";
    *is_disk_full = gzwrite(gz, block.data(), static_cast<unsigned>(got)) != got;
    if (*is_disk_full) return "the disk is full";
    taken += got;
    if (taken > kLargestCore || size_of(file) > kLargestPacked) return "cut off, it is too large";
  }
  return "cut off, it took too long";
}

// Packs `input` into `file`. Empty when it is whole, else why it is not. Nothing stays of one that the disk
// does not take.
std::string pack(int input, int file) {
  GzFile gz(gzdopen(dup(file), "wb1"));
  if (!gz) return "no memory";
  bool is_disk_full = false;
  std::string note = pack_into(gz.get(), input, file, seconds_now() + kLongestPacking, &is_disk_full);
  // Writes what it still holds, so the file is emptied behind it.
  if (gzclose(gz.release()) != Z_OK && !is_disk_full) {
    is_disk_full = true;
    note = "the disk is full";
  }
  return is_disk_full && ftruncate(file, 0) != 0 ? "it cannot be emptied" : note;
}

bool set_attribute(int file, const char *name, const std::string &value) {
  return value.empty() ||
         fsetxattr(file, name, value.data(), std::min(value.size(), kLongestAttribute), 0) == 0;
}

bool describe(int file, const CoreFacts &facts, const std::string &note) {
  return set_attribute(file, TAVRO_CORE_PID, facts.pid) &&
         set_attribute(file, TAVRO_CORE_UID, std::to_string(facts.uid)) &&
         set_attribute(file, TAVRO_CORE_SIGNAL, facts.signal) &&
         set_attribute(file, TAVRO_CORE_TIME, facts.seconds + "000000") &&
         set_attribute(file, TAVRO_CORE_PROGRAM, facts.program) &&
         set_attribute(file, TAVRO_CORE_EXECUTABLE, facts.executable) &&
         set_attribute(file, TAVRO_CORE_PHONE, facts.phone) &&
         set_attribute(file, TAVRO_CORE_PHONE_PID, facts.phone_pid) &&
         set_attribute(file, TAVRO_CORE_NOTE, note);
}

// The file stays root's, so that what is written beside it stays what the kernel said; its user may read it.
bool allow_user(int file, uid_t user) {
  if (user == geteuid()) return true;
  const auto entry = [](unsigned tag, unsigned rights,
                        unsigned id = static_cast<unsigned>(ACL_UNDEFINED_ID)) {
    return posix_acl_xattr_entry{htole16(static_cast<uint16_t>(tag)), htole16(static_cast<uint16_t>(rights)),
                                 htole32(id)};
  };
  struct {
    posix_acl_xattr_header header;
    posix_acl_xattr_entry entries[5];
  } list = {{htole32(POSIX_ACL_XATTR_VERSION)},
            {entry(ACL_USER_OBJ, ACL_READ | ACL_WRITE), entry(ACL_USER, ACL_READ, user),
             entry(ACL_GROUP_OBJ, 0), entry(ACL_MASK, ACL_READ), entry(ACL_OTHER, 0)}};
  return fsetxattr(file, "system.posix_acl_access", &list, sizeof list, 0) == 0;
}

// The program has chosen its name itself.
std::string plain_name(const std::string &program) {
  std::string name = program.substr(0, 64);
  for (char &byte : name) {
    if (!isalnum(static_cast<unsigned char>(byte))) byte = '-';
  }
  return name;
}

std::string name_of(const CoreFacts &facts) {
  return "core." + plain_name(facts.program) + "." + std::to_string(facts.uid) + "." + facts.pid + "." +
         facts.seconds + ".gz";
}

struct Core {
  std::string name, user;
  int64_t changed, bytes;
};

// As name_of() made it.
std::string user_in(const std::string &name) {
  const size_t start = name.find('.', strlen("core.")) + 1;
  return start ? name.substr(start, name.find('.', start) - start) : "";
}

// Oldest first. What begins with "." is being written, or goes when it has been lying there for long; locks
// stay, since one that is held looks as old as when it was made.
std::vector<Core> cores_in(int folder) {
  std::vector<Core> cores;
  const TavroDir dir(fdopendir(openat(folder, ".", O_RDONLY | O_DIRECTORY | O_CLOEXEC)));
  while (const dirent *entry = dir ? readdir(dir.get()) : nullptr) {
    struct stat info;
    if (fstatat(folder, entry->d_name, &info, AT_SYMLINK_NOFOLLOW) != 0 || !S_ISREG(info.st_mode)) continue;
    if (entry->d_name[0] == '.') {
      if (strncmp(entry->d_name, kLockPrefix, strlen(kLockPrefix)) != 0 &&
          info.st_mtim.tv_sec < time(nullptr) - kStaleAfter)
        unlinkat(folder, entry->d_name, 0);
      continue;
    }
    cores.push_back({entry->d_name, user_in(entry->d_name),
                     int64_t{info.st_mtim.tv_sec} * 1000 + info.st_mtim.tv_nsec / 1000000, info.st_size});
  }
  std::sort(cores.begin(), cores.end(),
            [](const Core &left, const Core &right) { return left.changed < right.changed; });
  return cores;
}

// Who has the most gives first, so that nobody's crash loop costs another user's cores; of all cores the
// newest stays.
void keep_newest(int folder) {
  std::vector<Core> cores = cores_in(folder);
  while (cores.size() > 1) {
    const bool is_too_many = cores.size() > kMostCores;
    int64_t bytes = 0;
    std::map<std::string, int64_t> shares;
    for (const Core &core : cores) {
      bytes += core.bytes;
      shares[core.user] += is_too_many ? 1 : core.bytes;
    }
    if (!is_too_many && bytes <= kMostBytes) return;
    const auto first = std::max_element(
        cores.begin(), cores.end() - 1,
        [&shares](const Core &left, const Core &right) { return shares[left.user] < shares[right.user]; });
    unlinkat(folder, first->name.c_str(), 0);
    cores.erase(first);
  }
}

bool report(const CoreFacts &facts, const char *what) {
  const int reason = errno;
  syslog(LOG_ERR, "the core of %s (%s): %s: %s", plain_name(facts.program).c_str(), facts.pid.c_str(), what,
         strerror(reason));
  return false;
}

}  // namespace

bool store_core(const std::string &folder, const CoreFacts &facts, int input) {
  const TavroFd place = open_folder(folder);
  if (!place) return report(facts, "no folder");
  const TavroFd locked = lock(place.get(), facts.uid);
  const std::string unfinished = "." + facts.pid;
  unlinkat(place.get(), unfinished.c_str(), 0);  // what a killed handler left
  const TavroFd file(
      openat(place.get(), unfinished.c_str(), O_RDWR | O_CREAT | O_EXCL | O_NOFOLLOW | O_CLOEXEC, 0600));
  if (!file) return report(facts, "no file");
  const std::string note = locked ? pack(input, file.get()) : "too many crashes at once";
  const bool is_stored = describe(file.get(), facts, note) &&
                         (!facts.is_for_user || allow_user(file.get(), facts.uid)) &&
                         fsync(file.get()) == 0 &&
                         renameat(place.get(), unfinished.c_str(), place.get(), name_of(facts).c_str()) == 0;
  if (!is_stored) {
    report(facts, "not kept");
    unlinkat(place.get(), unfinished.c_str(), 0);
  }
  keep_newest(place.get());
  return is_stored;
}

}  // namespace phone
