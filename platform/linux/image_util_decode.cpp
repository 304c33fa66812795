#include <sys/stat.h>

#include <cstdio>
#include <new>
#include <string>

#include "image_util.h"
#include "image_util_codecs.h"

struct image_util_decode_s {
  std::string path;
  int downscale = 1;
  unsigned char **destination = nullptr;
};

namespace {

using namespace platform;

constexpr off_t kLargestFile = 1 << 30;

using ScopedFile = std::unique_ptr<FILE, FreeWith<fclose>>;

// What is not a plain file is not opened: a pipe would wait for a writer.
int read_file(const std::string &path, std::vector<unsigned char> &bytes) {
  struct stat info {};
  if (stat(path.c_str(), &info) != 0) return image_error_of_errno();
  if (!S_ISREG(info.st_mode) || info.st_size > kLargestFile) return IMAGE_UTIL_ERROR_NOT_SUPPORTED_FORMAT;
  const ScopedFile file(std::fopen(path.c_str(), "rbe"));
  if (!file) return image_error_of_errno();
  bytes.resize(static_cast<size_t>(info.st_size));
  bytes.resize(std::fread(bytes.data(), 1, bytes.size(), file.get()));
  return std::ferror(file.get()) ? IMAGE_UTIL_ERROR_INVALID_OPERATION : IMAGE_UTIL_ERROR_NONE;
}

int decode(const image_util_decode_s &request, Picture &picture) {
  std::vector<unsigned char> bytes;
  const int result = read_file(request.path, bytes);
  return result == IMAGE_UTIL_ERROR_NONE ? decode_picture(bytes, request.downscale, picture) : result;
}

}  // namespace

int image_util_decode_create(image_util_decode_h *handle) {
  if (!handle) return IMAGE_UTIL_ERROR_INVALID_PARAMETER;
  *handle = new (std::nothrow) image_util_decode_s;
  return *handle ? IMAGE_UTIL_ERROR_NONE : IMAGE_UTIL_ERROR_OUT_OF_MEMORY;
}

int image_util_decode_destroy(image_util_decode_h handle) {
  if (!handle) return IMAGE_UTIL_ERROR_INVALID_PARAMETER;
  delete handle;
  return IMAGE_UTIL_ERROR_NONE;
}

int image_util_decode_set_input_path(image_util_decode_h handle, const char *path) {
  if (!handle || !path) return IMAGE_UTIL_ERROR_INVALID_PARAMETER;
  handle->path = path;
  return IMAGE_UTIL_ERROR_NONE;
}

int image_util_decode_set_colorspace(image_util_decode_h handle, image_util_colorspace_e colorspace) {
  if (!handle) return IMAGE_UTIL_ERROR_INVALID_PARAMETER;
  return colorspace == IMAGE_UTIL_COLORSPACE_BGRA8888 ? IMAGE_UTIL_ERROR_NONE
                                                      : IMAGE_UTIL_ERROR_NOT_SUPPORTED_FORMAT;
}

int image_util_decode_set_jpeg_downscale(image_util_decode_h handle, image_util_scale_e downscale) {
  if (!handle || downscale < IMAGE_UTIL_DOWNSCALE_1_1 || downscale > IMAGE_UTIL_DOWNSCALE_1_8)
    return IMAGE_UTIL_ERROR_INVALID_PARAMETER;
  handle->downscale = 1 << downscale;
  return IMAGE_UTIL_ERROR_NONE;
}

int image_util_decode_set_output_buffer(image_util_decode_h handle, unsigned char **dst_buffer) {
  if (!handle || !dst_buffer) return IMAGE_UTIL_ERROR_INVALID_PARAMETER;
  handle->destination = dst_buffer;
  return IMAGE_UTIL_ERROR_NONE;
}

int image_util_decode_run(image_util_decode_h handle, unsigned long *width, unsigned long *height,
                          unsigned long long *size) {
  if (!handle || handle->path.empty() || !handle->destination) return IMAGE_UTIL_ERROR_INVALID_PARAMETER;
  // The callers are C: no exception may leave.
  try {
    Picture picture;
    const int result = decode(*handle, picture);
    if (result != IMAGE_UTIL_ERROR_NONE) return result;
    if (width) *width = static_cast<unsigned long>(picture.width);
    if (height) *height = static_cast<unsigned long>(picture.height);
    if (size) *size = picture.size();
    *handle->destination = picture.pixels.release();
    return IMAGE_UTIL_ERROR_NONE;
  } catch (const std::exception &) {
    return IMAGE_UTIL_ERROR_OUT_OF_MEMORY;
  }
}
