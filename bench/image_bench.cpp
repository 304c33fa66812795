// A screenshot cut to the size in which it is sent, from file to file: the client's way, the codec alone
// doing the same decoding and encoding without anything in between, and ImageMagick's `convert`.
#include <benchmark/benchmark.h>
#include <image_util.h>
#include <spawn.h>
#include <sys/wait.h>
#include <turbojpeg.h>
#include <unistd.h>

#include <cstdlib>
#include <fstream>
#include <iterator>
#include <memory>
#include <string>
#include <vector>

#include "tavro_image.h"

namespace {

constexpr char kScreenshot[] = "/opt/usr/bench_screenshot.jpg", kCropped[] = "/opt/usr/bench_cropped.jpg";
constexpr int kScreenshotQuality = 90, kCropQuality = 100;

using Codec = TavroHandle<void, tjDestroy>;

// Plain areas with lines of text-like specks, as screens have.
void write_screenshot(int width, int height) {
  std::vector<uint32_t> pixels;
  for (int y = 0; y < height; ++y)
    for (int x = 0; x < width; ++x) {
      const bool is_line = y % 48 < 22 && x % (width / 3) > 40;
      const bool is_ink = is_line && (x * 7 + y / 3 * 13 + x * y / 5) % 11 < 4;
      pixels.push_back(is_ink ? 0xFF202428 : 0xFFF0F4F8 - static_cast<uint32_t>(y / (height / 8)) * 0x0A0806);
    }
  image_util_encode_jpeg(reinterpret_cast<unsigned char *>(pixels.data()), width, height,
                         IMAGE_UTIL_COLORSPACE_BGRA8888, kScreenshotQuality, kScreenshot);
}

void Crop_Client(benchmark::State &state) {
  write_screenshot(static_cast<int>(state.range(0)), static_cast<int>(state.range(1)));
  for (auto _ : state) {
    unlink(kCropped);
    tavro_pixels pixels;
    if (!decode_image(kScreenshot, &pixels) ||
        !tavro_crop_image(pixels.bytes.get(), pixels.width, pixels.height, kCropped))
      state.SkipWithError("not cropped");
  }
}

bool decode_and_encode(int width, int height, const std::vector<unsigned char> &cropped) {
  std::ifstream file(kScreenshot, std::ios::binary);
  const std::string bytes{std::istreambuf_iterator<char>(file), {}};
  const std::unique_ptr<unsigned char[]> pixels(new unsigned char[static_cast<size_t>(width * height) * 4]);
  const Codec decoder(tjInitDecompress()), encoder(tjInitCompress());
  unsigned char *encoded = nullptr;
  unsigned long size = 0;
  const bool is_done =
      tjDecompress2(decoder.get(), reinterpret_cast<const unsigned char *>(bytes.data()), bytes.size(),
                    pixels.get(), width, 0, height, TJPF_BGRA, TJFLAG_FASTDCT) == 0 &&
      tjCompress2(encoder.get(), cropped.data(), kCroppedWidth, 0, kCroppedHeight, TJPF_BGRX, &encoded, &size,
                  TJSAMP_420, kCropQuality, 0) == 0;
  const TavroHandle<unsigned char, tjFree> owner(encoded);
  std::ofstream(kCropped, std::ios::binary).write(reinterpret_cast<char *>(encoded), static_cast<long>(size));
  return is_done;
}

void Crop_Codec(benchmark::State &state) {
  const int width = static_cast<int>(state.range(0)), height = static_cast<int>(state.range(1));
  write_screenshot(width, height);
  tavro_pixels pixels;
  unlink(kCropped);
  if (!decode_image(kScreenshot, &pixels) || !tavro_crop_image(pixels.bytes.get(), width, height, kCropped) ||
      !decode_image(kCropped, &pixels))
    return state.SkipWithError("not cropped");
  const std::vector<unsigned char> cropped(pixels.bytes.get(), pixels.bytes.get() + pixels.size());
  for (auto _ : state)
    if (!decode_and_encode(width, height, cropped)) state.SkipWithError("no codec");
}

void Crop_Convert(benchmark::State &state) {
  const int width = static_cast<int>(state.range(0)), height = static_cast<int>(state.range(1));
  write_screenshot(width, height);
  const std::string crop = std::to_string(width) + "x" + std::to_string(height - kStatusBarRows) + "+0+" +
                           std::to_string(kStatusBarRows);
  const char *const arguments[] = {"convert",   kScreenshot, "-crop", crop.c_str(), "-resize",
                                   "720x1200!", "-quality",  "100",   kCropped,     nullptr};
  for (auto _ : state) {
    pid_t pid = 0;
    int status = -1;
    if (posix_spawnp(&pid, "convert", nullptr, nullptr, const_cast<char *const *>(arguments), environ) != 0 ||
        waitpid(pid, &status, 0) != pid || status != 0)
      state.SkipWithError("no ImageMagick");
  }
}

void sizes(benchmark::internal::Benchmark *benchmark) {
  benchmark->Args({1080, 1920})->Args({1440, 2560})->Unit(benchmark::kMillisecond)->UseRealTime();
}

BENCHMARK(Crop_Client)->Apply(sizes);
BENCHMARK(Crop_Codec)->Apply(sizes);
BENCHMARK(Crop_Convert)->Apply(sizes);

}  // namespace

BENCHMARK_MAIN();
