// Picture files into upright pixels, with what that may cost known beforehand.
#include <image_util.h>
#include <sys/stat.h>
#include <unistd.h>

#include <utility>

#include "tavro_image.h"
#include "tavro_log.h"
#include "tavro_picture_info.h"

namespace {

constexpr int64_t kPixelBytes = 4;
constexpr int64_t kCoefficientsBytes = 6;           // per pixel, of a progressive JPEG's three components
constexpr int64_t kMostCoefficients = 192ll << 20;  // bytes

using Decoder = TavroHandle<std::remove_pointer_t<image_util_decode_h>, image_util_decode_destroy>;

constexpr const char *kFaultTexts[] = {
    nullptr,
    "IDS_OB_BODY_PICTURE_NOT_READABLE",
    "IDS_OB_BODY_PICTURE_NOT_READABLE",
    "IDS_OB_BODY_PICTURE_TOO_LARGE",
    "IDS_OB_BODY_PICTURE_TOO_LARGE",
    "IDS_OB_BODY_PICTURE_NOT_SAVED",
};

// The steps of image_util_rotate that turn a picture upright which was stored with an EXIF orientation.
struct turn {
  image_util_rotation_e first, second;
};
constexpr turn kTurns[] = {
    {IMAGE_UTIL_ROTATION_NONE, IMAGE_UTIL_ROTATION_NONE},
    {IMAGE_UTIL_ROTATION_FLIP_HORZ, IMAGE_UTIL_ROTATION_NONE},
    {IMAGE_UTIL_ROTATION_180, IMAGE_UTIL_ROTATION_NONE},
    {IMAGE_UTIL_ROTATION_FLIP_VERT, IMAGE_UTIL_ROTATION_NONE},
    {IMAGE_UTIL_ROTATION_90, IMAGE_UTIL_ROTATION_FLIP_HORZ},
    {IMAGE_UTIL_ROTATION_90, IMAGE_UTIL_ROTATION_NONE},
    {IMAGE_UTIL_ROTATION_90, IMAGE_UTIL_ROTATION_FLIP_VERT},
    {IMAGE_UTIL_ROTATION_270, IMAGE_UTIL_ROTATION_NONE},
};

tavro_image_fault _fault_of(int image_util_error) {
  switch (image_util_error) {
    case IMAGE_UTIL_ERROR_NONE:
      return TAVRO_IMAGE_GOOD;
    case IMAGE_UTIL_ERROR_OUT_OF_MEMORY:
      return TAVRO_IMAGE_NO_MEMORY;
    case IMAGE_UTIL_ERROR_NOT_SUPPORTED_FORMAT:
      return TAVRO_IMAGE_OTHER_KIND;
    default:
      return TAVRO_IMAGE_UNREADABLE;
  }
}

// The least reduction at decoding that keeps the limits.
tavro_image_fault _choose_scale(const tavro_picture_info &info, const tavro_image_limits &limits,
                                image_util_scale_e *scale) {
  const int64_t pixels = static_cast<int64_t>(info.width) * info.height;
  if (info.is_progressive && pixels * kCoefficientsBytes > kMostCoefficients) return TAVRO_IMAGE_TOO_LARGE;
  const int most = info.format == TAVRO_PICTURE_JPEG ? IMAGE_UTIL_DOWNSCALE_1_8 : IMAGE_UTIL_DOWNSCALE_1_1;
  for (int i = IMAGE_UTIL_DOWNSCALE_1_1; i <= most; ++i) {
    const int64_t width = (info.width + (1 << i) - 1) >> i, height = (info.height + (1 << i) - 1) >> i;
    *scale = static_cast<image_util_scale_e>(i);
    if (width * height * kPixelBytes <= limits.most_bytes) return TAVRO_IMAGE_GOOD;
  }
  return TAVRO_IMAGE_TOO_LARGE;
}

tavro_image_fault _check(const char *path, const tavro_image_limits &limits, tavro_picture_info *info,
                         image_util_scale_e *scale) {
  struct stat file {};
  if (stat(path, &file) != 0 || !S_ISREG(file.st_mode) || access(path, R_OK) != 0)
    return TAVRO_IMAGE_UNREADABLE;
  if (!tavro_picture_info_read(path, info)) return TAVRO_IMAGE_OTHER_KIND;
  return file.st_size > limits.most_bytes ? TAVRO_IMAGE_TOO_LARGE : _choose_scale(*info, limits, scale);
}

tavro_image_fault _decode(const char *path, image_util_scale_e scale, tavro_pixels *pixels) {
  Decoder decoder;
  unsigned char *bytes = nullptr;
  unsigned long width = 0, height = 0;
  if (image_util_decode_create(tavro_out(decoder)) != IMAGE_UTIL_ERROR_NONE) return TAVRO_IMAGE_NO_MEMORY;
  image_util_decode_set_input_path(decoder.get(), path);
  image_util_decode_set_colorspace(decoder.get(), IMAGE_UTIL_COLORSPACE_BGRA8888);
  image_util_decode_set_jpeg_downscale(decoder.get(), scale);
  image_util_decode_set_output_buffer(decoder.get(), &bytes);
  const int result = image_util_decode_run(decoder.get(), &width, &height, nullptr);
  pixels->bytes.reset(bytes);
  pixels->width = static_cast<int>(width);
  pixels->height = static_cast<int>(height);
  return _fault_of(result);
}

void _put_on_white(tavro_pixels *pixels) {
  unsigned char *pixel = pixels->bytes.get();
  for (const unsigned char *end = pixel + pixels->size(); pixel < end; pixel += kPixelBytes) {
    const int alpha = pixel[3];
    if (alpha == 255) continue;
    for (int channel = 0; channel < 3; ++channel)
      pixel[channel] = static_cast<unsigned char>((pixel[channel] * alpha + 255 * (255 - alpha)) / 255);
    pixel[3] = 255;
  }
}

tavro_image_fault _turn(image_util_rotation_e rotation, tavro_pixels *pixels) {
  if (rotation == IMAGE_UTIL_ROTATION_NONE) return TAVRO_IMAGE_GOOD;
  tavro_pixels turned;
  turned.bytes.reset(static_cast<unsigned char *>(std::malloc(pixels->size())));
  if (!turned.bytes) return TAVRO_IMAGE_NO_MEMORY;
  const int result =
      image_util_rotate(turned.bytes.get(), &turned.width, &turned.height, rotation, pixels->bytes.get(),
                        pixels->width, pixels->height, IMAGE_UTIL_COLORSPACE_BGRA8888);
  if (result == IMAGE_UTIL_ERROR_NONE) *pixels = std::move(turned);
  return _fault_of(result);
}

tavro_image_fault _decode_upright(const char *path, const tavro_image_limits &limits, tavro_pixels *pixels) {
  tavro_picture_info info{};
  image_util_scale_e scale = IMAGE_UTIL_DOWNSCALE_1_1;
  tavro_image_fault fault = _check(path, limits, &info, &scale);
  if (fault == TAVRO_IMAGE_GOOD) fault = _decode(path, scale, pixels);
  if (fault != TAVRO_IMAGE_GOOD) return fault;
  if (info.format != TAVRO_PICTURE_JPEG) _put_on_white(pixels);
  const turn &needed = kTurns[info.orientation - 1];
  for (const image_util_rotation_e rotation : {needed.first, needed.second})
    if (fault == TAVRO_IMAGE_GOOD) fault = _turn(rotation, pixels);
  const bool is_on_side = info.orientation >= 5;
  pixels->source_width = is_on_side ? info.height : info.width;
  pixels->source_height = is_on_side ? info.width : info.height;
  return fault;
}

}  // namespace

const char *tavro_image_fault_text(tavro_image_fault fault) {
  return kFaultTexts[fault];
}

bool tavro_image_decode(const char *path, const tavro_image_limits &limits, tavro_pixels *pixels,
                        tavro_image_fault *fault) {
  tavro_pixels decoded;
  const tavro_image_fault result = _decode_upright(path, limits, &decoded);
  if (fault) *fault = result;
  if (result == TAVRO_IMAGE_GOOD)
    *pixels = std::move(decoded);
  else
    TAVRO_LOGE("%s: no pixels: %d", path, result);
  return result == TAVRO_IMAGE_GOOD;
}

bool decode_image(const char *path, tavro_pixels *pixels) {
  return tavro_image_decode(path, {}, pixels);
}
