#include <libyuv/planar_functions.h>
#include <libyuv/rotate_argb.h>
#include <libyuv/scale_argb.h>

#include <climits>
#include <cstdint>

#include "image_util.h"
#include "image_util_codecs.h"

namespace {

constexpr int kPixel = static_cast<int>(platform::kBytesPerPixel);

int stride_of(int width) {
  return width * kPixel;
}

// Sizes whose bytes an int can count.
bool is_size(int width, int height) {
  return width > 0 && height > 0 && static_cast<int64_t>(width) * height <= INT_MAX / kPixel;
}

int check(const void *from, int width, int height, image_util_colorspace_e colorspace) {
  if (!from || !is_size(width, height)) return IMAGE_UTIL_ERROR_INVALID_PARAMETER;
  return colorspace == IMAGE_UTIL_COLORSPACE_BGRA8888 ? IMAGE_UTIL_ERROR_NONE
                                                      : IMAGE_UTIL_ERROR_NOT_SUPPORTED_FORMAT;
}

int result_of(int libyuv_result) {
  return libyuv_result == 0 ? IMAGE_UTIL_ERROR_NONE : IMAGE_UTIL_ERROR_INVALID_OPERATION;
}

// The result of libyuv; not 0 for a rotation that is none.
int rotate(unsigned char *dest, int to, image_util_rotation_e rotation, const unsigned char *src, int width,
           int height) {
  const int from = stride_of(width);
  switch (rotation) {
    case IMAGE_UTIL_ROTATION_NONE:
      return libyuv::ARGBCopy(src, from, dest, to, width, height);
    case IMAGE_UTIL_ROTATION_90:
      return libyuv::ARGBRotate(src, from, dest, to, width, height, libyuv::kRotate90);
    case IMAGE_UTIL_ROTATION_180:
      return libyuv::ARGBRotate(src, from, dest, to, width, height, libyuv::kRotate180);
    case IMAGE_UTIL_ROTATION_270:
      return libyuv::ARGBRotate(src, from, dest, to, width, height, libyuv::kRotate270);
    case IMAGE_UTIL_ROTATION_FLIP_HORZ:
      return libyuv::ARGBMirror(src, from, dest, to, width, height);
    case IMAGE_UTIL_ROTATION_FLIP_VERT:
      return libyuv::ARGBCopy(src, from, dest, to, width, -height);
  }
  return -1;
}

}  // namespace

int image_util_calculate_buffer_size(int width, int height, image_util_colorspace_e colorspace,
                                     unsigned int *size) {
  const int result = check(size, width, height, colorspace);
  if (result == IMAGE_UTIL_ERROR_NONE) *size = static_cast<unsigned>(width * height * kPixel);
  return result;
}

int image_util_resize(unsigned char *dest, int *dest_width, int *dest_height, const unsigned char *src,
                      int src_width, int src_height, image_util_colorspace_e colorspace) {
  if (!dest || !dest_width || !dest_height || !is_size(*dest_width, *dest_height))
    return IMAGE_UTIL_ERROR_INVALID_PARAMETER;
  const int result = check(src, src_width, src_height, colorspace);
  if (result != IMAGE_UTIL_ERROR_NONE) return result;
  return result_of(libyuv::ARGBScale(src, stride_of(src_width), src_width, src_height, dest,
                                     stride_of(*dest_width), *dest_width, *dest_height, libyuv::kFilterBox));
}

int image_util_rotate(unsigned char *dest, int *dest_width, int *dest_height,
                      image_util_rotation_e dest_rotation, const unsigned char *src, int src_width,
                      int src_height, image_util_colorspace_e colorspace) {
  if (!dest || !dest_width || !dest_height) return IMAGE_UTIL_ERROR_INVALID_PARAMETER;
  const int checked = check(src, src_width, src_height, colorspace);
  if (checked != IMAGE_UTIL_ERROR_NONE) return checked;
  const bool is_on_side = dest_rotation == IMAGE_UTIL_ROTATION_90 || dest_rotation == IMAGE_UTIL_ROTATION_270;
  const int width = is_on_side ? src_height : src_width, height = is_on_side ? src_width : src_height;
  if (rotate(dest, stride_of(width), dest_rotation, src, src_width, src_height) != 0)
    return IMAGE_UTIL_ERROR_INVALID_PARAMETER;
  *dest_width = width;
  *dest_height = height;
  return IMAGE_UTIL_ERROR_NONE;
}
