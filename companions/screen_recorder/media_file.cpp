#include "media_file.h"

#include <fcntl.h>
#include <sys/stat.h>

#include <cstring>

#include "recorder_log.h"
#include "tavro_video_info.h"

namespace {

constexpr char kMediaFolder[] = "/opt/usr/media/";
constexpr mode_t kFolderMode = 0700;
constexpr mode_t kFileMode = 0600;
constexpr int kOpenFolder = O_RDONLY | O_DIRECTORY | O_NOFOLLOW | O_CLOEXEC;
constexpr int kMakeFile = O_RDWR | O_CREAT | O_EXCL | O_NOFOLLOW | O_CLOEXEC;

bool is_plain_name(const std::string &name) {
  return !name.empty() && name[0] != '.' && name.find('/') == std::string::npos;
}

TavroFd enter_folder(const TavroFd &parent, const std::string &name) {
  if (!is_plain_name(name)) {
    errno = EINVAL;
    return TavroFd();
  }
  if (mkdirat(parent.get(), name.c_str(), kFolderMode) != 0 && errno != EEXIST) return TavroFd();
  return TavroFd(openat(parent.get(), name.c_str(), kOpenFolder));
}

// The folder at `below`, which ends with a slash or is empty, seen from the media folder.
TavroFd open_folder(const std::string &below) {
  TavroFd folder(open(kMediaFolder, O_RDONLY | O_DIRECTORY | O_CLOEXEC));
  for (size_t start = 0; folder && start < below.size();) {
    const size_t end = below.find('/', start);
    folder = enter_folder(folder, below.substr(start, end - start));
    start = end + 1;
  }
  return folder;
}

bool has_extension(const std::string &name, const char *extension) {
  const size_t length = std::strlen(extension);
  return name.size() > length && name.compare(name.size() - length, length, extension) == 0;
}

bool write_all(int fd, const char *bytes, size_t size) {
  while (size > 0) {
    const ssize_t written = write(fd, bytes, size);
    if (written < 0 && errno == EINTR) continue;
    if (written < 0) return false;
    bytes += written;
    size -= static_cast<size_t>(written);
  }
  return true;
}

// Videos are removed by others as well, who may not know of the hidden pictures.
void remove_lonely_pictures(const TavroFd &folder) {
  constexpr char kEnd[] = ".mp4.jpg";
  constexpr size_t kPictureEnd = 4;
  const TavroDir entries(fdopendir(openat(folder.get(), ".", kOpenFolder)));
  while (const dirent *entry = entries ? readdir(entries.get()) : nullptr) {
    const std::string name = entry->d_name;
    if (name[0] != '.' || !has_extension(name, kEnd)) continue;
    const std::string video = name.substr(1, name.size() - 1 - kPictureEnd);
    struct stat status;
    if (fstatat(folder.get(), video.c_str(), &status, AT_SYMLINK_NOFOLLOW) != 0 && errno == ENOENT)
      unlinkat(folder.get(), name.c_str(), 0);
  }
}

}  // namespace

MediaFile::MediaFile(std::string path, TavroFd folder)
    : path_(std::move(path)), name_(path_.substr(path_.rfind('/') + 1)), folder_(std::move(folder)) {}

std::optional<MediaFile> MediaFile::find(const std::string &path, const char *extension) {
  const size_t slash = path.rfind('/');
  const std::string name = slash == std::string::npos ? "" : path.substr(slash + 1);
  if (path.compare(0, std::strlen(kMediaFolder), kMediaFolder) != 0 || !is_plain_name(name) ||
      !has_extension(name, extension)) {
    RECORDER_LOGE("\"%.200s\" is no %s file below %s", path.c_str(), extension, kMediaFolder);
    return std::nullopt;
  }
  const size_t root = std::strlen(kMediaFolder);
  TavroFd folder = open_folder(path.substr(root, slash + 1 - root));
  if (!folder) {
    RECORDER_LOGE("no folder for %.200s: %s", path.c_str(), g_strerror(errno));
    return std::nullopt;
  }
  struct stat status;
  if (fstatat(folder.get(), name.c_str(), &status, AT_SYMLINK_NOFOLLOW) == 0) {
    RECORDER_LOGE("%.200s is there already", path.c_str());
    return std::nullopt;
  }
  return MediaFile(path, std::move(folder));
}

bool MediaFile::create() {
  remove_lonely_pictures(folder_);
  fd_ = TavroFd(openat(folder_.get(), name_.c_str(), kMakeFile, kFileMode));
  if (!fd_) RECORDER_LOGE("%s cannot be made: %s", path_.c_str(), g_strerror(errno));
  return static_cast<bool>(fd_);
}

void MediaFile::remove() const {
  struct stat own, named;
  if (fstat(fd_.get(), &own) == 0 &&
      fstatat(folder_.get(), name_.c_str(), &named, AT_SYMLINK_NOFOLLOW) == 0 && own.st_ino == named.st_ino &&
      own.st_dev == named.st_dev) {
    unlinkat(folder_.get(), name_.c_str(), 0);
  }
}

bool MediaFile::save_as(const std::string &name, const void *bytes, size_t size) const {
  // A name of its own each time: what a killed recorder left behind is in nobody's way.
  const std::string unfinished = "." + name_ + "." + std::to_string(g_random_int()) + ".part";
  const TavroFd file(openat(folder_.get(), unfinished.c_str(), kMakeFile, kFileMode));
  if (file && write_all(file.get(), static_cast<const char *>(bytes), size) &&
      renameat2(folder_.get(), unfinished.c_str(), folder_.get(), name.c_str(), RENAME_NOREPLACE) == 0)
    return true;
  RECORDER_LOGE("%s cannot be written: %s", name.c_str(), g_strerror(errno));
  unlinkat(folder_.get(), unfinished.c_str(), 0);
  return false;
}

bool MediaFile::save(const void *bytes, size_t size) const {
  return save_as(name_, bytes, size);
}

bool MediaFile::save_picture(const void *bytes, size_t size) const {
  return save_as(tavro_video_picture_name(name_), bytes, size);
}
