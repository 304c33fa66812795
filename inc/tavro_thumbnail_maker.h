// The work behind thumbnails, for worker threads: a square, upright miniature of a picture file, out of the
// cache or made anew with bounded memory and then cached. Any thread, several at once; blocks for as long as
// disk and decoder take.
//
// The cache is TAVRO_THUMBNAIL_FOLDER, which the caller has made: files of this user alone, written under a
// temporary name and renamed. An entry that cannot be used counts as absent and is replaced.
#pragma once

#include <cstddef>
#include <cstdint>
#include <string>
#include <vector>

// More than the gallery picker shows, so that a walk through it does not push out its own entries.
constexpr size_t kThumbnailMostCached = 3000;

// `side` times `side` pixels, each 0xFFRRGGBB; cropped to fill. Empty where the file is no picture that can
// be decoded within the memory that a thumbnail may cost.
using tavro_thumbnail_pixels = std::vector<uint32_t>;
tavro_thumbnail_pixels tavro_thumbnail_make(const std::string &path, int side);

// Path of the cache's entry for a file as it is now; empty when there is no such file.
std::string tavro_thumbnail_cache_path(const std::string &path, int side);

// Remove the oldest entries of a cache folder until `most` are left; also what an ended process left
// half-made. Returns how many are there now.
size_t tavro_thumbnail_cache_trim(const std::string &folder, size_t most);
