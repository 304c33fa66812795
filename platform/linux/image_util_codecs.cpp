#include "image_util_codecs.h"

#include <png.h>
#include <webp/decode.h>

#include <cerrno>
#include <cstring>

#include "image_util.h"

namespace platform {

namespace {

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

// Cameras write files with small faults: what could be decoded is kept.
bool has_worked(const JpegCodec &codec, int result) {
  return result == 0 || tjGetErrorCode(codec.get()) == TJERR_WARNING;
}

int decode_jpeg(const std::vector<unsigned char> &bytes, int downscale, Picture &picture) {
  const JpegCodec codec(tjInitDecompress());
  int width = 0, height = 0, sampling = 0, colours = 0;
  if (!codec || !has_worked(codec, tjDecompressHeader3(codec.get(), bytes.data(), bytes.size(), &width,
                                                       &height, &sampling, &colours)))
    return IMAGE_UTIL_ERROR_NOT_SUPPORTED_FORMAT;
  const tjscalingfactor scale{1, downscale};
  if (width < 1 || height < 1) return IMAGE_UTIL_ERROR_NOT_SUPPORTED_FORMAT;
  picture.width = TJSCALED(width, scale);
  picture.height = TJSCALED(height, scale);
  if (!picture.allocate()) return IMAGE_UTIL_ERROR_OUT_OF_MEMORY;
  const bool has_inks = colours == TJCS_CMYK || colours == TJCS_YCCK;
  if (!has_worked(codec,
                  tjDecompress2(codec.get(), bytes.data(), bytes.size(), picture.pixels.get(), picture.width,
                                0, picture.height, has_inks ? TJPF_CMYK : TJPF_BGRA, TJFLAG_FASTDCT)))
    return IMAGE_UTIL_ERROR_NOT_SUPPORTED_FORMAT;
  if (has_inks) inks_to_colours(picture);
  return IMAGE_UTIL_ERROR_NONE;
}

// The decoder believes a length, and takes up to 2 GB for it, before it finds that the file ends.
bool has_whole_png_chunks(const std::vector<unsigned char> &bytes) {
  constexpr size_t kSignature = 8, kAround = 12;  // length, type and checksum of a chunk
  for (size_t place = kSignature; place + kAround <= bytes.size();) {
    const size_t length = png_get_uint_32(bytes.data() + place);
    if (length > bytes.size() - place - kAround) return false;
    if (std::memcmp(bytes.data() + place + 4, "IEND", 4) == 0) return true;
    place += kAround + length;
  }
  return false;
}

int decode_png(const std::vector<unsigned char> &bytes, Picture &picture) {
  if (!has_whole_png_chunks(bytes)) return IMAGE_UTIL_ERROR_NOT_SUPPORTED_FORMAT;
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

// An animation is refused by the decoder.
int decode_webp(const std::vector<unsigned char> &bytes, Picture &picture) {
  if (!WebPGetInfo(bytes.data(), bytes.size(), &picture.width, &picture.height))
    return IMAGE_UTIL_ERROR_NOT_SUPPORTED_FORMAT;
  if (!picture.allocate()) return IMAGE_UTIL_ERROR_OUT_OF_MEMORY;
  return WebPDecodeBGRAInto(bytes.data(), bytes.size(), picture.pixels.get(), picture.size(),
                            picture.width * static_cast<int>(kBytesPerPixel))
             ? IMAGE_UTIL_ERROR_NONE
             : IMAGE_UTIL_ERROR_NOT_SUPPORTED_FORMAT;
}

bool starts_with(const std::vector<unsigned char> &bytes, size_t place, const char *mark, size_t length) {
  return bytes.size() > place + length && std::memcmp(bytes.data() + place, mark, length) == 0;
}

}  // namespace

int decode_picture(const std::vector<unsigned char> &file, int downscale, Picture &picture) {
  if (starts_with(file, 0, "\xFF\xD8", 2)) return decode_jpeg(file, downscale, picture);
  if (starts_with(file, 0, "\x89PNG\r\n\x1A\n", 8)) return decode_png(file, picture);
  if (starts_with(file, 0, "RIFF", 4) && starts_with(file, 8, "WEBP", 4)) return decode_webp(file, picture);
  return IMAGE_UTIL_ERROR_NOT_SUPPORTED_FORMAT;
}

int image_error_of_errno() {
  if (errno == ENOENT || errno == ENOTDIR) return IMAGE_UTIL_ERROR_NO_SUCH_FILE;
  return errno == EACCES || errno == EPERM ? IMAGE_UTIL_ERROR_PERMISSION_DENIED
                                           : IMAGE_UTIL_ERROR_INVALID_OPERATION;
}

}  // namespace platform
