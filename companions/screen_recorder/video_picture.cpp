#include "video_picture.h"

#include <turbojpeg.h>

#include <algorithm>
#include <cmath>

#include "recorder_log.h"
#include "tavro_handles.h"

namespace {

constexpr int kQuality = 80;      // percent
constexpr int kRowAlignment = 4;  // bytes, of the pipeline's frames

// Video leaves room at both ends of the range of values; JPEG uses all of it.
void widen(unsigned char *values, size_t count, int zero, int middle, int used) {
  unsigned char wide[256];
  for (int value = 0; value < 256; ++value) {
    const long scaled = middle + std::lround((value - zero) * 255.0 / used);
    wide[value] = static_cast<unsigned char>(std::clamp(scaled, 0L, 255L));
  }
  std::transform(values, values + count, values, [&wide](unsigned char value) { return wide[value]; });
}

}  // namespace

std::vector<unsigned char> make_video_picture(GstBuffer *frame, int width, int height) {
  using Compressor = TavroHandle<void, tjDestroy>;
  using JpegBytes = TavroHandle<unsigned char, tjFree>;
  const size_t size = tjBufSizeYUV2(width, kRowAlignment, height, TJSAMP_420);
  const size_t brightness_size = tjPlaneSizeYUV(0, width, (width + 3) / 4 * 4, height, TJSAMP_420);
  std::vector<unsigned char> pixels(size);
  if (!frame || gst_buffer_extract(frame, 0, pixels.data(), size) != size) {
    RECORDER_LOGE("a video has no picture: its frame is no whole one");
    return {};
  }
  widen(pixels.data(), brightness_size, 16, 0, 219);
  widen(pixels.data() + brightness_size, size - brightness_size, 128, 128, 224);
  const Compressor compressor(tjInitCompress());
  unsigned char *raw = nullptr;
  unsigned long jpeg_size = 0;
  const int result = compressor ? tjCompressFromYUV(compressor.get(), pixels.data(), width, kRowAlignment,
                                                    height, TJSAMP_420, &raw, &jpeg_size, kQuality, 0)
                                : -1;
  const JpegBytes jpeg(raw);
  if (result == 0) return {jpeg.get(), jpeg.get() + jpeg_size};
  RECORDER_LOGE("a video has no picture: %s", tjGetErrorStr2(compressor.get()));
  return {};
}
