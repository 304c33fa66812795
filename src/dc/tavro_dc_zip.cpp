#include <fcntl.h>
#include <sys/file.h>
#include <sys/stat.h>

#include <algorithm>
#include <cerrno>
#include <climits>
#include <cstring>
#include <ctime>
#include <string>
#include <vector>

#include "tavro_dc_private.h"
#include "tavro_handles.h"
#include "tavro_log.h"

namespace {

constexpr size_t kChunk = 4096;     // bytes
constexpr int kFastestDeflate = 1;  // chosen for large core dumps
constexpr int kFirstYearOfZip = 1980;
// Compressed, what does not shrink grows a little; 4 GiB is what an entry holds without the larger fields.
constexpr off_t kMostOfSmallEntry = 0xf0000000;  // bytes

struct ZipCloser {
  void operator()(void *zip) const { zipClose(zip, nullptr); }
};
using Zip = std::unique_ptr<void, ZipCloser>;

const char *_name_in(const char *path) {
  const char *slash = std::strrchr(path, '/');
  return slash ? slash + 1 : path;
}

// Neither the file nor its folder may be a link: both are in a place where others put what they like. What is
// no regular file may have taken the place of one, and must not block.
TavroFd _open_dump_file(const char *path, struct stat *info) {
  const char *name = _name_in(path);
  const std::string folder_path(path, name == path ? 0 : static_cast<size_t>(name - path - 1));
  const TavroFd folder(name == path
                           ? open(".", O_PATH | O_DIRECTORY | O_CLOEXEC)
                           : open(folder_path.c_str(), O_PATH | O_DIRECTORY | O_NOFOLLOW | O_CLOEXEC));
  if (!folder) return TavroFd();
  TavroFd file(openat(folder.get(), name, O_RDONLY | O_NOFOLLOW | O_NONBLOCK | O_CLOEXEC));
  if (!file || fstat(file.get(), info) != 0 || !S_ISREG(info->st_mode)) return TavroFd();
  return file;
}

// The time of the file's last change; the format knows none before 1980.
zip_fileinfo _entry_info(time_t changed) {
  struct tm local = {};
  localtime_r(&changed, &local);
  zip_fileinfo info = {};
  // Unsigned in some versions of minizip, signed in others.
  const auto put = [](auto &field, int value) {
    field = static_cast<std::remove_reference_t<decltype(field)>>(value);
  };
  put(info.tmz_date.tm_year, std::max(local.tm_year + 1900, kFirstYearOfZip));
  put(info.tmz_date.tm_mon, local.tm_mon);
  put(info.tmz_date.tm_mday, local.tm_mday);
  put(info.tmz_date.tm_hour, local.tm_hour);
  put(info.tmz_date.tm_min, local.tm_min);
  put(info.tmz_date.tm_sec, local.tm_sec);
  return info;
}

// At most `size` bytes, which the file had when it was opened: one that grows might never end. As
// _tavro_dc_add_file_to_zip.
int _copy(int file, off_t size, zipFile zip) {
  const TavroGText chunk(static_cast<char *>(g_try_malloc(kChunk)));
  if (!chunk) {
    TAVRO_LOGE("Allocation failed");
    return kTavroDcBrokenOff;
  }
  while (size > 0) {
    if (tavro_dc_is_cancelled()) return kTavroDcBrokenOff;
    const ssize_t count = read(file, chunk.get(), std::min(kChunk, static_cast<size_t>(size)));
    if (count == 0) return 0;
    if (count < 0) {
      TAVRO_LOGE("Reading failed: %s", std::strerror(errno));
      return kTavroDcBrokenOff;
    }
    const int error = zipWriteInFileInZip(zip, chunk.get(), static_cast<unsigned>(count));
    if (error != ZIP_OK) return error;
    size -= count;
  }
  return 0;
}

bool _is_open_folder(const char *path) {
  return TavroFd(open(path, O_RDONLY | O_DIRECTORY | O_CLOEXEC)).get() >= 0;
}

// The archive while it is written. Its lock tells what a collection works on from what a killed one left,
// which is written over.
class UnfinishedArchive {
 public:
  bool open_unused() {
    for (int number = 0; number < kMostAtOnce; ++number) {
      path_ = std::string(kTavroDcArchiveFolder) + ".tavro_dc." + std::to_string(number) + ".part";
      file_ = TavroFd(open(path_.c_str(), O_WRONLY | O_CREAT | O_CLOEXEC | O_NOFOLLOW | O_NONBLOCK, 0600));
      // What somebody else has put there is left alone.
      if (file_ && flock(file_.get(), LOCK_EX | LOCK_NB) == 0 && has_its_name())
        return fchmod(file_.get(), 0600) == 0;
    }
    return false;
  }
  const std::string &path() const { return path_; }
  bool sync() const { return fsync(file_.get()) == 0; }

 private:
  static constexpr int kMostAtOnce = 100;

  // Whoever held the lock before may have given the file its final name.
  bool has_its_name() const {
    struct stat own, named;
    return fstat(file_.get(), &own) == 0 && lstat(path_.c_str(), &named) == 0 && S_ISREG(own.st_mode) &&
           own.st_ino == named.st_ino && own.st_dev == named.st_dev;
  }

  std::string path_;
  TavroFd file_;
};

enum class Attempt { kWritten, kBrokenOff, kNotOpened };

// One attempt to write an archive of the files; those that could not be added leave the list. Once one broke
// off half-way the archive is to be written anew, of those that are left. `write_error` is minizip's.
Attempt _write_archive(const std::string &path, std::vector<const char *> *files, int *write_error) {
  Zip zip(zipOpen(path.c_str(), APPEND_STATUS_CREATE));
  if (!zip) return Attempt::kNotOpened;
  for (auto file = files->begin(); file != files->end();) {
    const int error = _tavro_dc_add_file_to_zip(zip.get(), *file);
    if (error < 0) *write_error = error;
    if (error != 0) file = files->erase(file);
    if (error < 0 || error == kTavroDcBrokenOff) return Attempt::kBrokenOff;
    if (error == 0) ++file;
  }
  const int error = zipClose(zip.release(), nullptr);
  if (error == ZIP_OK) return Attempt::kWritten;
  if (!files->empty()) *write_error = error;
  files->clear();
  return Attempt::kWritten;
}

// Until an attempt succeeds with what is left, or nothing is left. A disk that is full refuses file after
// file: it gets one log line, and none that says the same of the archive.
Attempt _write_what_can_be_written(const std::string &path, std::vector<const char *> *files) {
  int write_error = ZIP_OK;
  Attempt result = Attempt::kBrokenOff;
  while (result == Attempt::kBrokenOff && !tavro_dc_is_cancelled())
    result = _write_archive(path, files, &write_error);
  if (write_error != ZIP_OK) {
    TAVRO_LOGE("Writing into zip failed: %d", write_error);
  } else if (result == Attempt::kWritten && files->empty()) {
    TAVRO_LOGE("not able to zip any file");
  }
  return result;
}

// The name is a folder's, but this is what keeps the archive in its folder.
std::string _archive_name(const char *folder) {
  const TavroGText token(_tavro_dc_split_folder_name(folder));
  const std::string name = std::string("tavro_") + (token ? token.get() : "") + ".zip";
  return name.size() <= NAME_MAX && name.find('/') == std::string::npos ? name : "";
}

// Both, so that a machine that loses its power keeps the old archive or has the new one.
bool _give_name(const UnfinishedArchive &archive, const std::string &name) {
  const std::string path = kTavroDcArchiveFolder + name;
  if (!archive.sync() || rename(archive.path().c_str(), path.c_str()) != 0) {
    TAVRO_LOGE("%s: %s", path.c_str(), std::strerror(errno));
    return false;
  }
  const TavroFd folder(open(kTavroDcArchiveFolder, O_RDONLY | O_DIRECTORY | O_CLOEXEC));
  if (!folder || fsync(folder.get()) != 0) TAVRO_LOGE("%s: %s", kTavroDcArchiveFolder, std::strerror(errno));
  return true;
}

}  // namespace

int _tavro_dc_add_file_to_zip(zipFile zip, const char *path) {
  if (!path) {
    TAVRO_LOGE("Path Null");
    return kTavroDcNotAdded;
  }
  struct stat info;
  const TavroFd file = _open_dump_file(path, &info);
  if (!file) {
    TAVRO_LOGE("Open failed");
    return kTavroDcNotAdded;
  }
  const zip_fileinfo entry = _entry_info(info.st_mtime);
  int error = zipOpenNewFileInZip64(zip, _name_in(path), &entry, nullptr, 0, nullptr, 0, nullptr, Z_DEFLATED,
                                    kFastestDeflate, info.st_size > kMostOfSmallEntry);
  if (error != ZIP_OK) {
    TAVRO_LOGE("zipOpenNewFileInZip failed");
    return kTavroDcBrokenOff;
  }
  error = _copy(file.get(), info.st_size, zip);
  return error == 0 ? zipCloseFileInZip(zip) : error;
}

int _tavro_dc_zip_files(const char *core, const char *summary, const char *log, const char *folder) {
  if (!_is_open_folder(kTavroDcArchiveFolder) &&
      (g_mkdir_with_parents(kTavroDcArchiveFolder, 0700) != 0 || !_is_open_folder(kTavroDcArchiveFolder))) {
    TAVRO_LOGE("Could not create a directory");
    return -1;
  }
  const std::string name = _archive_name(folder);
  UnfinishedArchive archive;
  if (name.empty() || !archive.open_unused()) {
    TAVRO_LOGE("zipOpen failed");
    return -1;
  }
  TavroUnfinishedFile unfinished(archive.path());
  std::vector<const char *> files = {core, summary, log};
  files.erase(std::remove(files.begin(), files.end(), nullptr), files.end());
  const Attempt result = _write_what_can_be_written(archive.path(), &files);
  if (tavro_dc_is_cancelled()) return -1;
  if (result == Attempt::kNotOpened) {
    TAVRO_LOGE("zipOpen failed");
    return -1;
  }
  if (files.empty() || !_give_name(archive, name)) return -1;
  unfinished.keep();
  return 0;
}
