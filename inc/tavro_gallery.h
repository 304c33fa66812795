// The pictures and videos on the phone that can be attached. Plain values; any thread. A walk reads folders,
// so it blocks for as long as the disk takes: it belongs on a worker.
#pragma once

#include <ctime>
#include <functional>
#include <string>
#include <vector>

constexpr size_t kGalleryMostFiles = 2000;

struct tavro_gallery_file {
  std::string path;
  timespec changed;
  bool is_video;
};

// Whether `left` is shown before `right`: what was changed last comes first.
bool tavro_gallery_is_before(const tavro_gallery_file &left, const tavro_gallery_file &right);

// Whether the name is that of a video.
bool tavro_gallery_is_video(const char *path);

// The phone's folders of pictures and videos, none inside another. Main loop only: the platform may make one.
std::vector<std::string> tavro_gallery_folders();

// Receives what was found since its last call, in the order of showing; false ends the walk.
using tavro_gallery_found = std::function<bool(std::vector<tavro_gallery_file>)>;

// Walk the folders three levels deep for JPEG, PNG, WebP and MP4 files. Hidden files and folders and symbolic
// links are left out. `found` is called at the end of the walk and, while it takes long, several times a
// second. Returns how many folders were there but could not be read.
int tavro_gallery_walk(const std::vector<std::string> &folders, const tavro_gallery_found &found);
