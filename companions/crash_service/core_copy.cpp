#include "core_copy.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <sys/statvfs.h>
#include <zlib.h>

#include <array>
#include <cstring>

#include "crash_log.h"
#include "limited_process.h"

namespace {

constexpr int64_t kLargestCore = int64_t{4} << 30;      // bytes, unpacked: what is behind them is cut off
constexpr int64_t kLargestPacked = int64_t{250} << 20;  // bytes: more would push all other crashes out
constexpr int64_t kLargestPlain = int64_t{512} << 20;   // bytes on disk, for the debugger
constexpr uint64_t kKeptFree = uint64_t{512}
                               << 20;  // bytes of the disk that the debugger's copy leaves alone
constexpr int kUnpackSeconds = 120;
constexpr char kMode[] = "wb1";

using GzFile = TavroHandle<gzFile_s, gzclose>;

struct Format {
  const char *magic;
  size_t length;
  const char *tool;  // null: read here
};

constexpr Format kFormats[] = {{"\x7f"
                                "ELF",
                                4, nullptr},
                               {"\x1f\x8b", 2, nullptr},
                               {"\x28\xb5\x2f\xfd", 4, "zstd"},
                               {"\x04\x22\x4d\x18", 4, "lz4"},
                               {"\xfd"
                                "7zXZ",
                                5, "xz"}};

const Format *format_of(int fd) {
  std::array<char, 8> start;
  const ssize_t got = pread(fd, start.data(), start.size(), 0);
  for (const Format &format : kFormats) {
    if (got >= static_cast<ssize_t>(format.length) && memcmp(start.data(), format.magic, format.length) == 0)
      return &format;
  }
  return nullptr;
}

bool has_room_beside(int fd) {
  struct statvfs disk;
  return fstatvfs(fd, &disk) == 0 && uint64_t{disk.f_bavail} * disk.f_frsize > kKeptFree;
}

// Takes the core block by block and writes both copies.
class CoreSink {
 public:
  CoreSink(const std::string &packed_path, const std::string &plain_path)
      : plain_(create_private_file(plain_path)) {
    TavroFd packed = create_private_file(packed_path);
    packed_fd_ = packed.get();
    if (packed) gz_.reset(gzdopen(packed.release(), kMode));
    error_ = gz_ ? 0 : errno;
  }

  // False: no more is wanted.
  bool take(const char *bytes, size_t count) {
    if (error_ || is_too_large_) return false;
    if (taken_ + static_cast<int64_t>(count) > kLargestCore) return is_cut_ = true, false;
    if (gzwrite(gz_.get(), bytes, static_cast<unsigned>(count)) != static_cast<int>(count)) {
      error_ = errno ? errno : EIO;
      return false;
    }
    write_plain(bytes, count);
    taken_ += static_cast<int64_t>(count);
    struct stat info;
    is_too_large_ = fstat(packed_fd_, &info) == 0 && info.st_size > kLargestPacked;
    return !is_too_large_;
  }

  // Writes what is still in memory. 0, or the error.
  int finish() {
    if (!gz_ || error_) return error_ ? error_ : EIO;
    if (gzflush(gz_.get(), Z_FINISH) != Z_OK || fsync(packed_fd_) != 0) error_ = errno ? errno : EIO;
    if (!error_ && gzclose(gz_.release()) != Z_OK) error_ = EIO;
    if (plain_ && ftruncate(plain_.get(), taken_) != 0) plain_ = TavroFd();
    return error_;
  }

  int error() const { return error_; }
  bool is_cut() const { return is_cut_; }
  bool is_too_large() const { return is_too_large_; }
  bool is_unpacked() const { return static_cast<bool>(plain_); }
  int64_t taken() const { return taken_; }

 private:
  // Without what is zero. A debugger's copy that does not fit is given up: the core itself matters more.
  void write_plain(const char *bytes, size_t count) {
    if (!plain_ || (bytes[0] == 0 && memcmp(bytes, bytes + 1, count - 1) == 0)) return;
    plain_size_ += static_cast<int64_t>(count);
    if (plain_size_ > kLargestPlain || !has_room_beside(plain_.get()) ||
        pwrite(plain_.get(), bytes, count, taken_) != static_cast<ssize_t>(count)) {
      (void)!ftruncate(plain_.get(), 0);  // the room is wanted at once, but nothing depends on it
      plain_ = TavroFd();
    }
  }

  TavroFd plain_;
  GzFile gz_;
  int packed_fd_ = -1;  // gz_'s
  int error_ = 0;
  int64_t taken_ = 0, plain_size_ = 0;
  bool is_cut_ = false, is_too_large_ = false;
};

// Plain and gzip alike. False when the source broke off.
bool read_here(int source, GCancellable *stop, CoreSink *sink) {
  GzFile gz(gzdopen(fcntl(source, F_DUPFD_CLOEXEC, 3), "rb"));
  if (!gz) return false;
  std::array<char, 64 * 1024> block;
  int got;
  while ((got = gzread(gz.get(), block.data(), block.size())) > 0) {
    if (g_cancellable_is_cancelled(stop)) return false;
    if (!sink->take(block.data(), static_cast<size_t>(got))) return true;
  }
  int reason = Z_OK;
  gzerror(gz.get(), &reason);
  return got == 0 && reason == Z_OK;
}

bool read_with_tool(const char *tool, int source, GCancellable *stop, CoreSink *sink) {
  LimitedRun run;
  run.command = {tool, "-dc"};
  run.seconds = kUnpackSeconds;
  run.input = source;
  run.stop = stop;
  run.take = [sink](const char *bytes, size_t count) { return sink->take(bytes, count); };
  return run_limited(run);
}

CoreCopy judge(const CoreSink &sink, int error, bool is_whole) {
  CoreCopy copy;
  if (error) {
    CRASH_LOGE("a core is not kept: %s", g_strerror(error));
    copy.note = g_strerror(error);
  } else if (sink.taken() == 0) {
    copy.note = "it cannot be read";
  } else if (sink.is_too_large()) {
    copy.note = "too large to keep";
  } else {
    copy.is_kept = true;
    copy.is_unpacked = sink.is_unpacked();
    if (sink.is_cut()) copy.note = "cut off behind 4 GB";
    if (!is_whole) copy.note = "it breaks off";
  }
  return copy;
}

}  // namespace

CoreCopy copy_core(int source, const std::string &packed_path, const std::string &plain_path,
                   GCancellable *stop) {
  CoreCopy none;
  const Format *format = format_of(source);
  if (!format) return none.note = "it is no core", none;
  if (format->tool && !is_program_there(format->tool))
    return none.note = std::string("this machine has no ") + format->tool + " to unpack it", none;
  TavroUnfinishedFile unfinished(packed_path);
  CoreSink sink(packed_path, plain_path);
  bool is_whole = false;
  if (!sink.error()) {
    lseek(source, 0, SEEK_SET);
    is_whole =
        format->tool ? read_with_tool(format->tool, source, stop, &sink) : read_here(source, stop, &sink);
  }
  CoreCopy copy = judge(sink, sink.finish(), is_whole);
  if (copy.is_kept) unfinished.keep();
  return copy;
}

bool write_packed_text(const std::string &path, const std::string &text) {
  TavroFd file = create_private_file(path);
  if (!file) return false;
  const int fd = file.get();
  GzFile gz(gzdopen(file.release(), kMode));
  errno = 0;
  return gz &&
         gzwrite(gz.get(), text.data(), static_cast<unsigned>(text.size())) ==
             static_cast<int>(text.size()) &&
         gzflush(gz.get(), Z_FINISH) == Z_OK && fsync(fd) == 0;
}

TavroFd create_private_file(const std::string &path) {
  return TavroFd(open(path.c_str(), O_RDWR | O_CREAT | O_EXCL | O_CLOEXEC | O_NOFOLLOW, 0600));
}
