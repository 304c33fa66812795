// Whatever a picture file holds: it is decoded within bounds or refused, and stripping leaves a picture of
// the same size that says nothing more and that stripping again leaves alone.
//
// An input is the file. Runs in a fresh phone (tests/support/in_phone): under libFuzzer in the preset "fuzz",
// over the seeds alone in every other build.
#include <unistd.h>

#include <algorithm>
#include <cstdio>
#include <cstdlib>
#include <fstream>
#include <iterator>
#include <string>

#include "fuzz_expect.h"
#include "tavro_image.h"
#include "tavro_image_strip.h"

namespace {

constexpr char kGiven[] = "/opt/usr/fuzz_given", kStripped[] = "/opt/usr/fuzz_stripped";
constexpr tavro_image_limits kLimits{256 << 10};

using Bytes = std::vector<unsigned char>;

void write_file(const char *path, const Bytes &bytes) {
  std::ofstream(path, std::ios::binary)
      .write(reinterpret_cast<const char *>(bytes.data()), static_cast<std::streamsize>(bytes.size()));
}

tavro_pixels decoded(const char *path) {
  tavro_pixels pixels;
  tavro_image_fault fault = TAVRO_IMAGE_GOOD;
  const bool is_decoded = tavro_image_decode(path, kLimits, &pixels, &fault);
  expect(is_decoded == (fault == TAVRO_IMAGE_GOOD), "a failure has its reason");
  expect(is_decoded == (pixels.bytes != nullptr), "pixels when decoded alone");
  expect(!is_decoded || static_cast<int64_t>(pixels.size()) <= kLimits.most_bytes, "within the limits");
  return pixels;
}

bool has(const Bytes &bytes, const std::string &text) {
  return std::search(bytes.begin(), bytes.end(), text.begin(), text.end()) != bytes.end();
}

void expect_stripped(const Bytes &given, const tavro_pixels &before) {
  Bytes stripped, again;
  if (tavro_image_strip(given, &stripped) != TAVRO_STRIP_DONE)
    return expect(stripped.empty(), "no leftovers");
  expect(tavro_image_strip(stripped, &again) == TAVRO_STRIP_DONE && again == stripped,
         "stripped once for all");
  expect(!has(stripped, "http://ns.adobe.com/xap/1.0/") || !has(given, "\xFF\xE1"), "no XMP");
  write_file(kStripped, stripped);
  const tavro_pixels after = decoded(kStripped);
  // Of a file with several faults the decoder may give up where it muddled on before.
  if (before.bytes && after.bytes)
    expect(after.width == before.width && after.height == before.height, "the picture stays as large");
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t *data, std::size_t size) {
  const Bytes given(data, data + size);
  write_file(kGiven, given);
  tavro_pixels pixels = decoded(kGiven);
  expect_stripped(given, pixels);
  if (pixels.bytes)
    tavro_image_hide(pixels, {{-1, 1, 40, 9, TAVRO_HIDE_PIXELATE}, {3, 3, 99, 99, TAVRO_HIDE_FILL}});
  return 0;
}
