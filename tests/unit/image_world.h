// Small pictures with known pixels, and files of each kind made of them, for tests.
#pragma once

#include <gmock/gmock.h>
#include <sys/stat.h>
#include <turbojpeg.h>
#include <webp/encode.h>

#include <filesystem>

#include "picture_files.h"
#include "tavro_image.h"

namespace fs = std::filesystem;
using namespace std::string_literals;

constexpr char kRoot[] = "/opt/usr/media/image-test/";
constexpr uint32_t kRed = 0xFFFF0000, kGreen = 0xFF00FF00, kBlue = 0xFF0000FF, kWhite = 0xFFFFFFFF,
                   kBlack = 0xFF000000;

inline std::string make_file(const std::string &name, const std::string &bytes) {
  return write_file(kRoot + name, bytes);
}

inline std::string in_root(const char *name) {
  return std::string(kRoot) + name;
}

inline tavro_pixels pixels_of(int width, int height, const std::function<uint32_t(int x, int y)> &colour) {
  tavro_pixels pixels;
  pixels.width = width;
  pixels.height = height;
  pixels.bytes.reset(static_cast<unsigned char *>(std::malloc(pixels.size())));
  auto *pixel = reinterpret_cast<uint32_t *>(pixels.bytes.get());
  for (int i = 0; i < width * height; ++i) pixel[i] = colour(i % width, i / width);
  return pixels;
}

inline uint32_t at(const tavro_pixels &pixels, int x, int y) {
  return reinterpret_cast<const uint32_t *>(pixels.bytes.get())[y * pixels.width + x];
}

// Red and green above blue and white.
inline tavro_pixels quarters(int width, int height) {
  return pixels_of(width, height, [=](int x, int y) {
    return y < height / 2 ? (x < width / 2 ? kRed : kGreen) : (x < width / 2 ? kBlue : kWhite);
  });
}

inline std::string jpeg_of(const tavro_pixels &pixels, int format = TJPF_BGRX, int flags = 0) {
  const TavroHandle<void, tjDestroy> codec(tjInitCompress());
  unsigned char *bytes = nullptr;
  unsigned long size = 0;
  EXPECT_EQ(tjCompress2(codec.get(), pixels.bytes.get(), pixels.width, 0, pixels.height, format, &bytes,
                        &size, TJSAMP_444, 95, flags),
            0);
  const TavroHandle<unsigned char, tjFree> owner(bytes);
  return {reinterpret_cast<char *>(bytes), size};
}

inline std::string png_of_16_bits(int side) {
  const std::vector<uint16_t> pixels(static_cast<size_t>(side * side) * 3, 0xFFFF);
  png_image png{};
  png.version = PNG_IMAGE_VERSION;
  png.width = png.height = static_cast<png_uint_32>(side);
  png.format = PNG_FORMAT_LINEAR_RGB;
  const std::string path = in_root("16.png");
  EXPECT_TRUE(png_image_write_to_file(&png, path.c_str(), 0, pixels.data(), 0, nullptr));
  return file_contents(path);
}

inline std::string webp_of(const tavro_pixels &pixels) {
  uint8_t *bytes = nullptr;
  const size_t size =
      WebPEncodeLosslessBGRA(pixels.bytes.get(), pixels.width, pixels.height, pixels.width * 4, &bytes);
  const TavroHandle<uint8_t, WebPFree> owner(bytes);
  return {reinterpret_cast<char *>(bytes), size};
}

class Image : public testing::Test {
 protected:
  void SetUp() override {
    fs::remove_all(kRoot);
    fs::create_directories(kRoot);
  }
};
