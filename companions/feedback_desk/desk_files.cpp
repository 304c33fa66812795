#include "desk_files.h"

#include <fcntl.h>
#include <glib/gstdio.h>
#include <sys/stat.h>

#include <cstring>

#include "secret.h"

namespace {

constexpr int kFolderMode = 0700;
constexpr int kFileMode = 0600;

std::string _part_of(const std::string &path) {
  return path + ".part";
}

int64_t _size_of(const std::string &path) {
  struct stat found {};
  return stat(path.c_str(), &found) == 0 ? found.st_size : -1;
}

}  // namespace

bool DeskFiles::open(const std::string &folder) {
  root_ = folder + "/reports";
  if (g_mkdir_with_parents(root_.c_str(), kFolderMode) == 0) return true;
  g_warning("%s cannot be made: %s", root_.c_str(), g_strerror(errno));
  return false;
}

std::string DeskFiles::folder_of(int64_t report) const {
  return root_ + "/" + std::to_string(report);
}

std::string DeskFiles::path(int64_t report, int64_t number) const {
  return folder_of(report) + "/" + std::to_string(number);
}

bool DeskFiles::is_whole(int64_t report, int64_t number) const {
  return _size_of(path(report, number)) >= 0;
}

int64_t DeskFiles::received(int64_t report, int64_t number) const {
  const std::string whole = path(report, number);
  const int64_t size = _size_of(whole);
  return size >= 0 ? size : std::max<int64_t>(_size_of(_part_of(whole)), 0);
}

UniqueFd DeskFiles::open_part(int64_t report, int64_t number, int64_t offset) const {
  const std::string part = _part_of(path(report, number));
  if (g_mkdir(folder_of(report).c_str(), kFolderMode) == 0) sync_folder(root_);
  UniqueFd file(::open(part.c_str(), O_RDWR | O_CREAT | O_CLOEXEC, kFileMode));
  if (file && ftruncate(file.get(), offset) == 0 && lseek(file.get(), offset, SEEK_SET) == offset)
    return file;
  g_warning("%s cannot be written: %s", part.c_str(), g_strerror(errno));
  return UniqueFd();
}

bool DeskFiles::drop_part(int64_t report, int64_t number) const {
  return g_unlink(_part_of(path(report, number)).c_str()) == 0 || errno == ENOENT;
}

DeskFiles::Finish DeskFiles::finish(int64_t report, int64_t number, int64_t size,
                                    const std::string &sha256) const {
  const std::string whole = path(report, number), part = _part_of(whole);
  UniqueFd file(::open(part.c_str(), O_RDONLY | O_CLOEXEC));
  const auto checksum = file ? sha256_of_file(file.get(), size) : std::nullopt;
  if (!checksum) return Finish::kFailed;
  if (*checksum != sha256) return drop_part(report, number) ? Finish::kWrongChecksum : Finish::kFailed;
  if (fsync(file.get()) != 0 || g_rename(part.c_str(), whole.c_str()) != 0) {
    g_warning("%s cannot be kept: %s", whole.c_str(), g_strerror(errno));
    return Finish::kFailed;
  }
  return sync_folder(folder_of(report)) ? Finish::kDone : Finish::kFailed;
}

const char *content_type_of(const void *bytes, size_t size) {
  const auto *start = static_cast<const char *>(bytes);
  struct Signature {
    size_t offset;
    const char *bytes;
    size_t length;
    const char *type;
  };
  static const Signature kSignatures[] = {
      {0, "\x89PNG\r\n\x1a\n", 8, "image/png"},
      {0, "\xff\xd8\xff", 3, "image/jpeg"},
      {0, "GIF8", 4, "image/gif"},
      {8, "WEBP", 4, "image/webp"},
      {4, "ftyp", 4, "video/mp4"},
  };
  for (const auto &known : kSignatures)
    if (size >= known.offset + known.length &&
        std::memcmp(start + known.offset, known.bytes, known.length) == 0)
      return known.type;
  return "application/octet-stream";
}
