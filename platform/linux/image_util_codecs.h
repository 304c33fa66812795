// Pixels of a picture and the decoders that fill them, for the image utility's own files. Any thread.
#pragma once

#include <turbojpeg.h>

#include <cstdlib>
#include <memory>
#include <vector>

#include "scoped.h"

namespace platform {

constexpr size_t kBytesPerPixel = 4;

using JpegCodec = std::unique_ptr<void, FreeWith<tjDestroy>>;

// Bytes blue, green, red, alpha.
struct Picture {
  int width = 0, height = 0;
  std::unique_ptr<unsigned char, FreeWith<free>> pixels;

  size_t size() const { return static_cast<size_t>(width) * static_cast<size_t>(height) * kBytesPerPixel; }
  // Zeroed: a damaged file fills only a part.
  bool allocate() {
    pixels.reset(static_cast<unsigned char *>(std::calloc(1, size())));
    return pixels != nullptr;
  }
};

// Decode a whole file, of the kind that its first bytes say; the result is an image_util_error_e. A JPEG is
// scaled down by `downscale`: 1, 2, 4 or 8.
int decode_picture(const std::vector<unsigned char> &file, int downscale, Picture &picture);

// What image_util_error_e the last failed call on a file means.
int image_error_of_errno();

}  // namespace platform
