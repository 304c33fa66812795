#include "image_util.h"

#include <png.h>
#include <sys/stat.h>
#include <turbojpeg.h>

#include <cerrno>
#include <cstdio>
#include <memory>
#include <new>
#include <string>
#include <vector>

#include "scoped.h"

struct image_util_decode_s {
  std::string path;
  int downscale = 1;
  unsigned char **destination = nullptr;
};

namespace {

using namespace platform;

constexpr size_t kBytesPerPixel = 4;

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

constexpr off_t kLargestFile = 1 << 30;

using Codec = std::unique_ptr<void, FreeWith<tjDestroy>>;
using ScopedFile = std::unique_ptr<FILE, FreeWith<fclose>>;

int error_of_errno() {
  if (errno == ENOENT || errno == ENOTDIR) return IMAGE_UTIL_ERROR_NO_SUCH_FILE;
  return errno == EACCES || errno == EPERM ? IMAGE_UTIL_ERROR_PERMISSION_DENIED
                                           : IMAGE_UTIL_ERROR_INVALID_OPERATION;
}

// What is not a plain file is not opened: a pipe would wait for a writer.
int read_file(const std::string &path, std::vector<unsigned char> &bytes) {
  struct stat info {};
  if (stat(path.c_str(), &info) != 0) return error_of_errno();
  if (!S_ISREG(info.st_mode) || info.st_size > kLargestFile) return IMAGE_UTIL_ERROR_NOT_SUPPORTED_FORMAT;
  const ScopedFile file(std::fopen(path.c_str(), "rbe"));
  if (!file) return error_of_errno();
  bytes.resize(static_cast<size_t>(info.st_size));
  bytes.resize(std::fread(bytes.data(), 1, bytes.size(), file.get()));
  return std::ferror(file.get()) ? IMAGE_UTIL_ERROR_INVALID_OPERATION : IMAGE_UTIL_ERROR_NONE;
}

// Decoders leave inverted ink values in such files as they are.
void inks_to_colours(Picture &picture) {
  unsigned char *pixel = picture.pixels.get();
  for (const unsigned char *end = pixel + picture.size(); pixel < end; pixel += kBytesPerPixel) {
    const int cyan = pixel[0], magenta = pixel[1], yellow = pixel[2], black = pixel[3];
    pixel[0] = static_cast<unsigned char>(yellow * black / 255);
    pixel[1] = static_cast<unsigned char>(magenta * black / 255);
    pixel[2] = static_cast<unsigned char>(cyan * black / 255);
    pixel[3] = 255;
  }
}

int decode_jpeg(const std::vector<unsigned char> &bytes, int downscale, Picture &picture) {
  const Codec codec(tjInitDecompress());
  int width = 0, height = 0, sampling = 0, colours = 0;
  if (!codec ||
      tjDecompressHeader3(codec.get(), bytes.data(), bytes.size(), &width, &height, &sampling, &colours) != 0)
    return IMAGE_UTIL_ERROR_NOT_SUPPORTED_FORMAT;
  const tjscalingfactor scale{1, downscale};
  picture.width = TJSCALED(width, scale);
  picture.height = TJSCALED(height, scale);
  if (!picture.allocate()) return IMAGE_UTIL_ERROR_OUT_OF_MEMORY;
  const bool has_inks = colours == TJCS_CMYK || colours == TJCS_YCCK;
  // Cameras write files with small faults: what could be decoded is kept.
  if (tjDecompress2(codec.get(), bytes.data(), bytes.size(), picture.pixels.get(), picture.width, 0,
                    picture.height, has_inks ? TJPF_CMYK : TJPF_BGRA, TJFLAG_FASTDCT) != 0 &&
      tjGetErrorCode(codec.get()) != TJERR_WARNING)
    return IMAGE_UTIL_ERROR_NOT_SUPPORTED_FORMAT;
  if (has_inks) inks_to_colours(picture);
  return IMAGE_UTIL_ERROR_NONE;
}

int decode_png(const std::vector<unsigned char> &bytes, Picture &picture) {
  png_image png{};
  png.version = PNG_IMAGE_VERSION;
  const std::unique_ptr<png_image, FreeWith<png_image_free>> owner(&png);
  if (!png_image_begin_read_from_memory(&png, bytes.data(), bytes.size()))
    return IMAGE_UTIL_ERROR_NOT_SUPPORTED_FORMAT;
  png.format = PNG_FORMAT_BGRA;
  picture.width = static_cast<int>(png.width);
  picture.height = static_cast<int>(png.height);
  if (!picture.allocate()) return IMAGE_UTIL_ERROR_OUT_OF_MEMORY;
  return png_image_finish_read(&png, nullptr, picture.pixels.get(), 0, nullptr)
             ? IMAGE_UTIL_ERROR_NONE
             : IMAGE_UTIL_ERROR_NOT_SUPPORTED_FORMAT;
}

int decode(const image_util_decode_s &request, Picture &picture) {
  std::vector<unsigned char> bytes;
  const int result = read_file(request.path, bytes);
  if (result != IMAGE_UTIL_ERROR_NONE) return result;
  if (bytes.size() > 2 && bytes[0] == 0xFF && bytes[1] == 0xD8)
    return decode_jpeg(bytes, request.downscale, picture);
  constexpr size_t kSignatureSize = 8;
  if (bytes.size() > kSignatureSize && png_sig_cmp(bytes.data(), 0, kSignatureSize) == 0)
    return decode_png(bytes, picture);
  return IMAGE_UTIL_ERROR_NOT_SUPPORTED_FORMAT;
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

int image_util_encode_jpeg(const unsigned char *buffer, int width, int height,
                           image_util_colorspace_e colorspace, int quality, const char *path) {
  if (!buffer || width < 1 || height < 1 || quality < 1 || quality > 100 || !path)
    return IMAGE_UTIL_ERROR_INVALID_PARAMETER;
  if (colorspace != IMAGE_UTIL_COLORSPACE_BGRA8888) return IMAGE_UTIL_ERROR_NOT_SUPPORTED_FORMAT;
  const Codec codec(tjInitCompress());
  unsigned char *bytes = nullptr;
  unsigned long size = 0;
  const bool is_encoded = codec && tjCompress2(codec.get(), buffer, width, 0, height, TJPF_BGRX, &bytes,
                                               &size, TJSAMP_420, quality, TJFLAG_FASTDCT) == 0;
  const std::unique_ptr<unsigned char, FreeWith<tjFree>> owner(bytes);
  if (!is_encoded) return IMAGE_UTIL_ERROR_INVALID_OPERATION;
  ScopedFile file(std::fopen(path, "wbe"));
  if (!file) return error_of_errno();
  const bool is_written = std::fwrite(bytes, 1, size, file.get()) == size;
  return fclose(file.release()) == 0 && is_written ? IMAGE_UTIL_ERROR_NONE
                                                   : IMAGE_UTIL_ERROR_INVALID_OPERATION;
}
