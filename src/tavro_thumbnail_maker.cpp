#include "tavro_thumbnail_maker.h"

#include <image_util.h>
#include <sys/stat.h>

#include <algorithm>
#include <cstdlib>
#include <memory>
#include <mutex>

#include "tavro_handles.h"
#include "tavro_picture_info.h"
#include "tavro_thumbnail_cache.h"

namespace {

constexpr int64_t kMostBytes = 96 << 20;   // a picture that needs more is not decoded
constexpr int64_t kManyBytes = 24 << 20;   // of these one at a time
constexpr int64_t kCoefficientsBytes = 6;  // per pixel, of a progressive JPEG's three components
constexpr int64_t kPixelBytes = 4;

using Decoder = TavroHandle<std::remove_pointer_t<image_util_decode_h>, image_util_decode_destroy>;

// Pixels of a decoded picture: bytes blue, green, red, alpha.
struct decoded_picture {
  std::unique_ptr<unsigned char, TavroCall<std::free>> pixels;
  int width = 0, height = 0;
};

// The largest reduction at decoding that leaves enough pixels.
image_util_scale_e _downscale(const tavro_picture_info &info, int side) {
  int scale = IMAGE_UTIL_DOWNSCALE_1_1;
  if (info.format == TAVRO_PICTURE_JPEG)
    while (scale < IMAGE_UTIL_DOWNSCALE_1_8 && std::min(info.width, info.height) >> (scale + 1) >= side)
      ++scale;
  return static_cast<image_util_scale_e>(scale);
}

int64_t _bytes_to_decode(const tavro_picture_info &info, image_util_scale_e scale, int64_t file_size) {
  const int64_t pixels = static_cast<int64_t>(info.width) * info.height;
  return file_size + (pixels >> (2 * scale)) * kPixelBytes +
         (info.is_progressive ? pixels * kCoefficientsBytes : 0);
}

bool _decode(const std::string &path, image_util_scale_e scale, decoded_picture &picture) {
  Decoder decoder;
  unsigned char *pixels = nullptr;
  unsigned long width = 0, height = 0;
  if (image_util_decode_create(tavro_out(decoder)) != IMAGE_UTIL_ERROR_NONE) return false;
  image_util_decode_set_input_path(decoder.get(), path.c_str());
  image_util_decode_set_colorspace(decoder.get(), IMAGE_UTIL_COLORSPACE_BGRA8888);
  image_util_decode_set_jpeg_downscale(decoder.get(), scale);
  image_util_decode_set_output_buffer(decoder.get(), &pixels);
  if (image_util_decode_run(decoder.get(), &width, &height, nullptr) != IMAGE_UTIL_ERROR_NONE) return false;
  picture.pixels.reset(pixels);
  picture.width = static_cast<int>(width);
  picture.height = static_cast<int>(height);
  return picture.width > 0 && picture.height > 0;
}

// Mean colour of a rectangle, what is transparent on white.
uint32_t _mean_colour(const decoded_picture &picture, int left, int top, int right, int bottom) {
  uint64_t sums[3] = {};
  for (int y = top; y < bottom; ++y) {
    const unsigned char *pixel =
        picture.pixels.get() +
        (static_cast<size_t>(y) * static_cast<size_t>(picture.width) + static_cast<size_t>(left)) *
            kPixelBytes;
    for (int x = left; x < right; ++x, pixel += kPixelBytes)
      for (int channel = 0; channel < 3; ++channel)
        sums[channel] += static_cast<unsigned>(pixel[channel] * pixel[3] + 255 * (255 - pixel[3])) / 255;
  }
  const auto count = static_cast<uint64_t>(right - left) * static_cast<uint64_t>(bottom - top);
  const auto mean = [count](uint64_t sum) { return static_cast<uint32_t>((sum + count / 2) / count); };
  return 0xFF000000u | mean(sums[2]) << 16 | mean(sums[1]) << 8 | mean(sums[0]);
}

// Where the upright square's pixel lies in the square as it is stored.
void _place_in_stored(int orientation, int side, int &x, int &y) {
  const int last = side - 1;
  if (orientation >= 5) std::swap(x, y);
  if (orientation == 2 || orientation == 3 || orientation == 7 || orientation == 8) x = last - x;
  if (orientation == 3 || orientation == 4 || orientation == 6 || orientation == 7) y = last - y;
}

tavro_thumbnail_pixels _shrink(const decoded_picture &picture, int side, int orientation) {
  const int square = std::min(picture.width, picture.height);
  const int left = (picture.width - square) / 2, top = (picture.height - square) / 2;
  const auto edge = [square, side](int i) {
    return static_cast<int>(static_cast<int64_t>(i) * square / side);
  };
  tavro_thumbnail_pixels pixels;
  pixels.reserve(static_cast<size_t>(side) * static_cast<size_t>(side));
  for (int row = 0; row < side; ++row) {
    for (int column = 0; column < side; ++column) {
      int x = column, y = row;
      _place_in_stored(orientation, side, x, y);
      pixels.push_back(_mean_colour(picture, left + edge(x), top + edge(y),
                                    left + std::max(edge(x + 1), edge(x) + 1),
                                    top + std::max(edge(y + 1), edge(y) + 1)));
    }
  }
  return pixels;
}

tavro_thumbnail_pixels _make_anew(const std::string &path, int64_t file_size, int side) {
  static std::mutex large_pictures;  // held while a picture that needs much memory is decoded
  tavro_picture_info info{};
  if (!tavro_picture_info_read(path.c_str(), &info)) return {};
  const image_util_scale_e scale = _downscale(info, side);
  const int64_t bytes = _bytes_to_decode(info, scale, file_size);
  if (bytes > kMostBytes) return {};
  std::unique_lock<std::mutex> lock(large_pictures, std::defer_lock);
  if (bytes > kManyBytes) lock.lock();
  decoded_picture picture;
  if (!_decode(path, scale, picture)) return {};
  return _shrink(picture, side, info.orientation);
}

}  // namespace

tavro_thumbnail_pixels tavro_thumbnail_make(const std::string &path, int side) {
  const std::string entry = tavro_thumbnail_cache_path(path, side);
  struct stat file {};
  if (entry.empty() || side < 1 || stat(path.c_str(), &file) != 0) return {};
  tavro_thumbnail_pixels pixels;
  decoded_picture cached;
  if (tavro_thumbnail_cache_is_whole(entry) && _decode(entry, IMAGE_UTIL_DOWNSCALE_1_1, cached) &&
      cached.width == side && cached.height == side)
    return _shrink(cached, side, 1);
  pixels = _make_anew(path, file.st_size, side);
  if (!pixels.empty()) tavro_thumbnail_cache_store(entry, pixels, side);
  return pixels;
}
