#include <cstdio>

#include "image_util.h"
#include "image_util_codecs.h"

using namespace platform;

int image_util_encode_jpeg(const unsigned char *buffer, int width, int height,
                           image_util_colorspace_e colorspace, int quality, const char *path) {
  if (!buffer || width < 1 || height < 1 || quality < 1 || quality > 100 || !path)
    return IMAGE_UTIL_ERROR_INVALID_PARAMETER;
  if (colorspace != IMAGE_UTIL_COLORSPACE_BGRA8888) return IMAGE_UTIL_ERROR_NOT_SUPPORTED_FORMAT;
  const JpegCodec codec(tjInitCompress());
  unsigned char *bytes = nullptr;
  unsigned long size = 0;
  const bool is_encoded = codec && tjCompress2(codec.get(), buffer, width, 0, height, TJPF_BGRX, &bytes,
                                               &size, TJSAMP_420, quality, TJFLAG_FASTDCT) == 0;
  const std::unique_ptr<unsigned char, FreeWith<tjFree>> owner(bytes);
  if (!is_encoded) return IMAGE_UTIL_ERROR_INVALID_OPERATION;
  std::unique_ptr<FILE, FreeWith<fclose>> file(std::fopen(path, "wbe"));
  if (!file) return image_error_of_errno();
  const bool is_written = std::fwrite(bytes, 1, size, file.get()) == size;
  return fclose(file.release()) == 0 && is_written ? IMAGE_UTIL_ERROR_NONE
                                                   : IMAGE_UTIL_ERROR_INVALID_OPERATION;
}
