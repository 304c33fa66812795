// Small picture files for tests, as bytes.
#pragma once

#include <gmock/gmock.h>
#include <image_util.h>
#include <png.h>

#include <cstdlib>
#include <string>
#include <vector>

#include "files.h"

MATCHER_P(IsNear, expected, "") {
  for (int shift = 0; shift < 32; shift += 8)
    if (std::abs(static_cast<int>(arg >> shift & 0xFF) - static_cast<int>(expected >> shift & 0xFF)) > 12)
      return false;
  return true;
}

// A JPEG whose left half has one colour and whose right half another.
inline std::string jpeg_bytes(int width, int height, uint32_t left, uint32_t right) {
  std::vector<uint32_t> pixels;
  for (int i = 0; i < width * height; ++i) pixels.push_back(i % width < width / 2 ? left : right);
  const std::string path = "/opt/usr/jpeg_bytes.jpg";
  EXPECT_EQ(image_util_encode_jpeg(reinterpret_cast<unsigned char *>(pixels.data()), width, height,
                                   IMAGE_UTIL_COLORSPACE_BGRA8888, 95, path.c_str()),
            IMAGE_UTIL_ERROR_NONE);
  return file_contents(path);
}

inline std::string with_orientation(const std::string &jpeg, char orientation) {
  const std::string exif = std::string("Exif\0\0MM\0*\0\0\0\x08\0\x01\x01\x12\0\x03\0\0\0\x01\0", 25) +
                           orientation + std::string(6, '\0');
  return jpeg.substr(0, 2) + "\xFF\xE1" + std::string(1, '\0') + static_cast<char>(exif.size() + 2) + exif +
         jpeg.substr(2);
}

// The header claims a size that nobody made.
inline std::string with_claimed_side(std::string jpeg, unsigned char marker, char high, char low) {
  const size_t frame = jpeg.find("\xFF\xC0");
  jpeg[frame + 1] = static_cast<char>(marker);
  jpeg[frame + 5] = jpeg[frame + 7] = high;
  jpeg[frame + 6] = jpeg[frame + 8] = low;
  return jpeg;
}

inline std::string transparent_png(int side) {
  const std::vector<uint32_t> pixels(static_cast<size_t>(side) * static_cast<size_t>(side), 0x00FF0000);
  png_image png{};
  png.version = PNG_IMAGE_VERSION;
  png.width = png.height = static_cast<png_uint_32>(side);
  png.format = PNG_FORMAT_BGRA;
  const std::string path = "/opt/usr/transparent.png";
  EXPECT_TRUE(png_image_write_to_file(&png, path.c_str(), 0, pixels.data(), 0, nullptr));
  return file_contents(path);
}
