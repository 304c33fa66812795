// The pictures on the phone that can be attached. Plain values; reads folders, so it may block for as long as
// the disk takes.
#pragma once

#include <string>
#include <vector>

constexpr size_t kGalleryMaxPictures = 2000;

// Paths of JPEG and PNG files in the phone's picture and media folders, three levels deep, changed last
// first, at most kGalleryMaxPictures. Hidden files and folders and symbolic links to folders are left out.
std::vector<std::string> tavro_gallery_pictures();

// The same for given folders.
std::vector<std::string> tavro_gallery_pictures_in(const std::vector<std::string> &folders);
