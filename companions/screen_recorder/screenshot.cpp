#include "screenshot.h"

#include <turbojpeg.h>

#include <cstring>

#include "recorder_log.h"
#include "screen_picture.h"

namespace {

constexpr int kQuality = 90;  // percent; text stays sharp

using Compressor = TavroHandle<void, tjDestroy>;
using JpegBytes = TavroHandle<unsigned char, tjFree>;

// A copy turned clockwise by a quarter once, twice or three times.
Picture turn(const Picture &picture, int quarters) {
  const int bytes = tjPixelSize[picture.format];
  Picture turned = picture;
  if (quarters % 2) std::swap(turned.width, turned.height);
  turned.stride = turned.width * bytes;
  const size_t size = static_cast<size_t>(turned.stride) * static_cast<size_t>(turned.height);
  const std::shared_ptr<uint8_t> pixels(static_cast<uint8_t *>(g_malloc(size)), g_free);
  for (int y = 0; y < picture.height; ++y) {
    for (int x = 0; x < picture.width; ++x) {
      const int across = quarters == 1 ? picture.height - 1 - y : quarters == 2 ? picture.width - 1 - x : y;
      const int down = quarters == 1 ? x : quarters == 2 ? picture.height - 1 - y : picture.width - 1 - x;
      std::memcpy(pixels.get() + static_cast<ptrdiff_t>(down) * turned.stride + across * bytes,
                  picture.pixels.get() + static_cast<ptrdiff_t>(y) * picture.stride + x * bytes,
                  static_cast<size_t>(bytes));
    }
  }
  turned.pixels = pixels;
  return turned;
}

bool save_jpeg(const Picture &picture, const MediaFile &file) {
  const Compressor compressor(tjInitCompress());
  unsigned char *raw = nullptr;
  unsigned long size = 0;
  const int result = compressor
                         ? tjCompress2(compressor.get(), picture.pixels.get(), picture.width, picture.stride,
                                       picture.height, picture.format, &raw, &size, TJSAMP_420, kQuality, 0)
                         : -1;
  const JpegBytes jpeg(raw);
  if (result != 0) {
    RECORDER_LOGE("the picture of the screen cannot be compressed: %s", tjGetErrorStr2(compressor.get()));
    return false;
  }
  return file.save(jpeg.get(), size);
}

bool save_turned(const Picture &picture, const MediaFile &file, int orientation) {
  if (!picture.pixels) return false;
  const int quarters = orientation / 90;
  return save_jpeg(quarters ? turn(picture, quarters) : picture, file);
}

}  // namespace

void take_screenshot(MediaFile file, int orientation, std::function<void(bool is_saved)> then) {
  if (has_x_screen()) return then(save_turned(take_screen_picture(), file, orientation));
  const auto shared_file = std::make_shared<MediaFile>(std::move(file));
  take_portal_picture([shared_file, orientation, then](const Picture &picture) {
    then(save_turned(picture, *shared_file, orientation));
  });
}
