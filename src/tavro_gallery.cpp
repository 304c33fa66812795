#include "tavro_gallery.h"

#include <storage.h>
#include <strings.h>
#include <sys/stat.h>

#include <algorithm>

#include "tavro_handles.h"
#include "tavro_memory.h"

namespace {

constexpr int kMaxDepth = 3;
constexpr char kMediaFolder[] = "/opt/usr/media";

struct found_picture {
  std::string path;
  time_t changed;
};

bool _is_picture_name(const std::string &name) {
  const size_t dot = name.rfind('.');
  if (dot == std::string::npos) return false;
  const char *ending = name.c_str() + dot + 1;
  return strcasecmp(ending, "jpg") == 0 || strcasecmp(ending, "jpeg") == 0 || strcasecmp(ending, "png") == 0;
}

void _collect(const std::string &folder, int depth, std::vector<found_picture> &found) {
  const TavroDir dir(opendir(folder.c_str()));
  if (!dir) return;
  while (const dirent *entry = readdir(dir.get())) {
    if (entry->d_name[0] == '.') continue;
    const std::string path = folder + "/" + entry->d_name;
    struct stat info {};
    if (lstat(path.c_str(), &info) != 0) continue;
    if (S_ISDIR(info.st_mode)) {
      if (depth < kMaxDepth) _collect(path, depth + 1, found);
    } else if (S_ISREG(info.st_mode) && _is_picture_name(entry->d_name)) {
      found.push_back({path, info.st_mtime});
    }
  }
}

}  // namespace

std::vector<std::string> tavro_gallery_pictures_in(const std::vector<std::string> &folders) {
  std::vector<found_picture> found;
  for (const std::string &folder : folders) _collect(folder, 1, found);
  std::sort(found.begin(), found.end(), [](const found_picture &a, const found_picture &b) {
    return a.changed != b.changed ? a.changed > b.changed : a.path < b.path;
  });
  std::vector<std::string> paths;
  for (found_picture &picture : found) {
    if (paths.size() == kGalleryMaxPictures) break;
    if (std::find(paths.begin(), paths.end(), picture.path) == paths.end())
      paths.push_back(std::move(picture.path));
  }
  return paths;
}

std::vector<std::string> tavro_gallery_pictures() {
  std::vector<std::string> folders{kMediaFolder};
  char *pictures = nullptr;
  if (storage_get_directory(0, STORAGE_DIRECTORY_IMAGES, &pictures) == STORAGE_ERROR_NONE && pictures) {
    const TavroText owned(TAVRO_ADOPT(pictures));
    const std::string path = pictures;
    if (path.compare(0, sizeof kMediaFolder - 1, kMediaFolder) != 0) folders.push_back(path);
  }
  return tavro_gallery_pictures_in(folders);
}
