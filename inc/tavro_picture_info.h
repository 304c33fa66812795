// What a picture file says about itself in its header, read without decoding: enough to choose how to decode
// it and to know what that will cost. Plain values; any thread; reads a few kilobytes at most.
#pragma once

#include <cstddef>

enum tavro_picture_format {
  TAVRO_PICTURE_JPEG,
  TAVRO_PICTURE_PNG,
  TAVRO_PICTURE_WEBP,
};

struct tavro_picture_info {
  tavro_picture_format format;
  int width, height;    // as stored, before the orientation is applied; what a header claims may be a lie
  bool is_progressive;  // a JPEG in several scans, which can only be decoded with all of it in memory
  int orientation;      // how a camera was held, 1 (upright) to 8, as EXIF counts
};

// The orientation that the body of EXIF data says, behind the name that a JPEG puts before it; 1 for none.
int tavro_exif_orientation(const unsigned char *exif, size_t size);

// False when the path is no plain file, cannot be read, or is no picture of a known format.
bool tavro_picture_info_read(const char *path, tavro_picture_info *info);
