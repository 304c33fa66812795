#include "tavro_thumbnail_cache.h"

#include <fcntl.h>
#include <image_util.h>
#include <sys/stat.h>

#include <algorithm>
#include <cstdio>
#include <cstring>
#include <mutex>

#include "tavro_handles.h"
#include "tavro_thumbnails.h"

namespace {

constexpr int kQuality = 85;
constexpr char kUnfinished[] = ".unfinished.";

struct cache_entry {
  std::string path;
  timespec changed;
};

bool _is_older(const cache_entry &left, const cache_entry &right) {
  return left.changed.tv_sec != right.changed.tv_sec ? left.changed.tv_sec < right.changed.tv_sec
                                                     : left.changed.tv_nsec < right.changed.tv_nsec;
}

std::vector<cache_entry> _entries_in(const std::string &folder) {
  constexpr time_t kLongestWriteSeconds = 60;
  std::vector<cache_entry> entries;
  const TavroDir dir(opendir(folder.c_str()));
  while (const dirent *found = dir ? readdir(dir.get()) : nullptr) {
    const std::string path = folder + "/" + found->d_name;
    struct stat info {};
    if (lstat(path.c_str(), &info) != 0 || !S_ISREG(info.st_mode)) continue;
    if (std::strncmp(found->d_name, kUnfinished, sizeof kUnfinished - 1) != 0)
      entries.push_back({path, info.st_mtim});
    else if (info.st_mtim.tv_sec + kLongestWriteSeconds < std::time(nullptr))
      unlink(path.c_str());
  }
  return entries;
}

// The folder is listed once at first, then after every tenth of its size in new entries.
void _count_new_entry() {
  static std::mutex mutex;  // guards `until_trim`
  static size_t until_trim = 0;
  const std::lock_guard<std::mutex> lock(mutex);
  if (until_trim > 0) {
    --until_trim;
    return;
  }
  constexpr size_t kRoom = kThumbnailMostCached / 10;
  tavro_thumbnail_cache_trim(TAVRO_THUMBNAIL_FOLDER, kThumbnailMostCached - kRoom);
  until_trim = kRoom;
}

}  // namespace

std::string tavro_thumbnail_cache_path(const std::string &path, int side) {
  struct stat info {};
  if (stat(path.c_str(), &info) != 0 || !S_ISREG(info.st_mode)) return "";
  const std::string key = path + '\n' + std::to_string(info.st_size) + '\n' +
                          std::to_string(info.st_mtim.tv_sec) + '.' + std::to_string(info.st_mtim.tv_nsec) +
                          '\n' + std::to_string(side);
  const TavroGText name(g_compute_checksum_for_string(G_CHECKSUM_SHA256, key.c_str(), -1));
  return std::string(TAVRO_THUMBNAIL_FOLDER "/") + name.get() + ".jpg";
}

bool tavro_thumbnail_cache_is_whole(const std::string &entry) {
  const TavroFile file(std::fopen(entry.c_str(), "rbe"));
  unsigned char end[2] = {};
  return file && std::fseek(file.get(), -2, SEEK_END) == 0 && std::fread(end, 1, 2, file.get()) == 2 &&
         end[0] == 0xFF && end[1] == 0xD9;
}

void tavro_thumbnail_cache_store(const std::string &entry, const tavro_thumbnail_pixels &pixels, int side) {
  std::string unfinished = std::string(TAVRO_THUMBNAIL_FOLDER "/") + kUnfinished + "XXXXXX";
  if (const TavroFd made{mkstemp(unfinished.data())}; !made) return;  // mode 0600
  TavroUnfinishedFile guard(unfinished);
  if (image_util_encode_jpeg(reinterpret_cast<const unsigned char *>(pixels.data()), side, side,
                             IMAGE_UTIL_COLORSPACE_BGRA8888, kQuality,
                             unfinished.c_str()) != IMAGE_UTIL_ERROR_NONE ||
      std::rename(unfinished.c_str(), entry.c_str()) != 0)
    return;
  guard.keep();
  _count_new_entry();
}

size_t tavro_thumbnail_cache_trim(const std::string &folder, size_t most) {
  std::vector<cache_entry> entries = _entries_in(folder);
  if (entries.size() <= most) return entries.size();
  std::sort(entries.begin(), entries.end(), _is_older);
  const size_t surplus = entries.size() - most;
  for (size_t i = 0; i < surplus; ++i) unlink(entries[i].path.c_str());
  return most;
}
