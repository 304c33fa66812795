#include "tavro_gallery.h"

#include <storage.h>
#include <strings.h>
#include <sys/stat.h>

#include <algorithm>
#include <cerrno>
#include <chrono>
#include <cstring>

#include "tavro_handles.h"
#include "tavro_memory.h"

namespace {

constexpr int kMaxDepth = 3;
constexpr char kMediaFolder[] = "/opt/usr/media";
constexpr std::chrono::milliseconds kReportInterval(150);

bool _ends_with_any(const char *name, std::initializer_list<const char *> endings) {
  const char *dot = std::strrchr(name, '.');
  return dot && std::any_of(endings.begin(), endings.end(),
                            [dot](const char *ending) { return strcasecmp(dot + 1, ending) == 0; });
}

class gallery_walk {
 public:
  explicit gallery_walk(const tavro_gallery_found &found) : found_(found) {}

  void enter(const std::string &folder, int depth) {
    const TavroDir dir(opendir(folder.c_str()));
    if (!dir && errno != ENOENT) ++unreadable_;
    while (const dirent *entry = dir && is_wanted_ ? readdir(dir.get()) : nullptr) {
      if (entry->d_name[0] != '.') look_at(folder + "/" + entry->d_name, depth);
    }
  }

  // Hand over what waits.
  void report() {
    std::sort(files_.begin(), files_.end(), tavro_gallery_is_before);
    is_wanted_ = found_(std::move(files_));
    files_.clear();
    last_report_ = std::chrono::steady_clock::now();
  }

  int unreadable() const { return unreadable_; }
  bool is_wanted() const { return is_wanted_; }

 private:
  void look_at(const std::string &path, int depth) {
    const bool is_video = tavro_gallery_is_video(path.c_str());
    struct stat info {};
    if (lstat(path.c_str(), &info) != 0) return;
    if (S_ISDIR(info.st_mode)) {
      if (depth < kMaxDepth) enter(path, depth + 1);
    } else if (S_ISREG(info.st_mode) &&
               (is_video || _ends_with_any(path.c_str(), {"jpg", "jpeg", "png", "webp"}))) {
      files_.push_back({path, info.st_mtim, is_video});
    }
    if (!files_.empty() && std::chrono::steady_clock::now() - last_report_ > kReportInterval) report();
  }

  const tavro_gallery_found &found_;
  std::vector<tavro_gallery_file> files_;  // since the last report
  std::chrono::steady_clock::time_point last_report_ = std::chrono::steady_clock::now();
  int unreadable_ = 0;
  bool is_wanted_ = true;
};

bool _is_within(const std::string &path, const std::string &folder) {
  return path == folder || path.compare(0, folder.size() + 1, folder + "/") == 0;
}

// Every folder that lies in no other one.
std::vector<std::string> _outermost(std::vector<std::string> folders) {
  std::sort(folders.begin(), folders.end());
  std::vector<std::string> outermost;
  for (std::string &folder : folders) {
    const auto holds = [&folder](const std::string &other) { return _is_within(folder, other); };
    if (std::none_of(outermost.begin(), outermost.end(), holds)) outermost.push_back(std::move(folder));
  }
  return outermost;
}

}  // namespace

bool tavro_gallery_is_before(const tavro_gallery_file &left, const tavro_gallery_file &right) {
  if (left.changed.tv_sec != right.changed.tv_sec) return left.changed.tv_sec > right.changed.tv_sec;
  if (left.changed.tv_nsec != right.changed.tv_nsec) return left.changed.tv_nsec > right.changed.tv_nsec;
  return left.path < right.path;
}

bool tavro_gallery_is_video(const char *path) {
  return _ends_with_any(path, {"mp4"});
}

std::vector<std::string> tavro_gallery_folders() {
  std::vector<std::string> folders{kMediaFolder};
  for (const storage_directory_e kind :
       {STORAGE_DIRECTORY_IMAGES, STORAGE_DIRECTORY_VIDEOS, STORAGE_DIRECTORY_CAMERA}) {
    char *path = nullptr;
    if (storage_get_directory(0, kind, &path) != STORAGE_ERROR_NONE || !path) continue;
    const TavroText owned(TAVRO_ADOPT(path));
    folders.push_back(path);
  }
  return _outermost(std::move(folders));
}

int tavro_gallery_walk(const std::vector<std::string> &folders, const tavro_gallery_found &found) {
  gallery_walk walk(found);
  for (const std::string &folder : _outermost(folders)) walk.enter(folder, 1);
  if (walk.is_wanted()) walk.report();
  return walk.unreadable();
}
