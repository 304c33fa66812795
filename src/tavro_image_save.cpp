// Pictures into files: whole or not at all, and never over another file.
#include <fcntl.h>
#include <image_util.h>
#include <media_content.h>

#include <cerrno>
#include <cstdio>
#include <cstring>

#include "tavro_image.h"
#include "tavro_image_file.h"
#include "tavro_log.h"

namespace {

constexpr int kCropQuality = 100;
constexpr image_util_colorspace_e kColours = IMAGE_UTIL_COLORSPACE_BGRA8888;

using Buffer = std::unique_ptr<unsigned char, TavroCall<std::free>>;

bool _rename_new(const std::string &from, const char *path) {
  if (renameat2(AT_FDCWD, from.c_str(), AT_FDCWD, path, RENAME_NOREPLACE) == 0) return true;
  // Not every file system knows this; a second name for a file never takes the place of another.
  return errno == EINVAL && link(from.c_str(), path) == 0 && unlink(from.c_str()) == 0;
}

bool _encode(const unsigned char *pixels, int width, int height, int quality, const char *path) {
  return tavro_image_write_new(path, [&](int, const char *unfinished) {
    return image_util_encode_jpeg(pixels, width, height, kColours, quality, unfinished) ==
           IMAGE_UTIL_ERROR_NONE;
  });
}

Buffer _buffer(int width, int height) {
  unsigned int size = 0;
  if (image_util_calculate_buffer_size(width, height, kColours, &size) != IMAGE_UTIL_ERROR_NONE) return {};
  return Buffer(static_cast<unsigned char *>(std::malloc(size)));
}

}  // namespace

bool tavro_image_write_new(const char *path, const std::function<bool(int, const char *)> &write) {
  const char *slash = std::strrchr(path, '/');
  std::string name = std::string(path, slash ? static_cast<size_t>(slash + 1 - path) : 0) + ".new_XXXXXX";
  const TavroFd file(mkostemp(name.data(), O_CLOEXEC));
  if (!file) {
    TAVRO_LOGE("%s: %s", path, std::strerror(errno));
    return false;
  }
  TavroUnfinishedFile unfinished(name);
  errno = 0;
  if (!write(file.get(), name.c_str()) || fsync(file.get()) != 0 || !_rename_new(name, path)) {
    TAVRO_LOGE("%s is not written: %s", path, std::strerror(errno));
    return false;
  }
  unfinished.keep();
  return true;
}

int tavro_tell_media_database(const char *path) {
  int result = media_content_connect();
  if (result != MEDIA_CONTENT_ERROR_NONE) return result;
  result = media_content_scan_file(path);
  media_content_disconnect();
  return result;
}

bool tavro_image_save_jpeg(const tavro_pixels &pixels, int quality, const char *path) {
  return _encode(pixels.bytes.get(), pixels.width, pixels.height, quality, path);
}

bool tavro_crop_image(const unsigned char *buffer, int width, int height, const char *path) {
  return tavro_crop_image(buffer, width, height, path, [](tavro_pixels &) {});
}

bool tavro_crop_image(const unsigned char *buffer, int width, int height, const char *path,
                      const std::function<void(tavro_pixels &)> &draw) {
  tavro_pixels resized;
  unsigned int cut = 0;  // bytes of the status bar
  resized.width = resized.source_width = kCroppedWidth;
  resized.height = resized.source_height = kCroppedHeight;
  resized.bytes = _buffer(resized.width, resized.height);
  // The rows below it are one piece of memory of the full width: cropping them needs no copy.
  const bool is_made =
      resized.bytes && height > kStatusBarRows &&
      image_util_calculate_buffer_size(width, kStatusBarRows, kColours, &cut) == IMAGE_UTIL_ERROR_NONE &&
      image_util_resize(resized.bytes.get(), &resized.width, &resized.height, buffer + cut, width,
                        height - kStatusBarRows, kColours) == IMAGE_UTIL_ERROR_NONE;
  if (!is_made) {
    TAVRO_LOGE("a screenshot of %d x %d cannot be cropped", width, height);
    return false;
  }
  draw(resized);
  if (!tavro_image_save_jpeg(resized, kCropQuality, path)) return false;
  tavro_tell_media_database(path);
  return true;
}
