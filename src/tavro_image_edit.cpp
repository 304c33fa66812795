// What is changed in a picture's pixels: parts that are hidden, and a screenshot's cut.
#include <algorithm>
#include <cstring>

#include "tavro_image.h"

namespace {

constexpr size_t kPixelBytes = 4;

// A part of a picture, right and bottom outside.
struct part {
  int left, top, right, bottom;
};

int _clip(int64_t edge, int size) {
  return static_cast<int>(std::clamp<int64_t>(edge, 0, size));
}

part _clip(const tavro_hidden_area &area, const tavro_pixels &pixels) {
  return {_clip(area.x, pixels.width), _clip(area.y, pixels.height),
          _clip(static_cast<int64_t>(area.x) + area.width, pixels.width),
          _clip(static_cast<int64_t>(area.y) + area.height, pixels.height)};
}

unsigned char *_row(tavro_pixels &pixels, int x, int y) {
  return pixels.bytes.get() +
         (static_cast<size_t>(y) * static_cast<size_t>(pixels.width) + static_cast<size_t>(x)) * kPixelBytes;
}

void _fill(tavro_pixels &pixels, const part &part, const unsigned char (&colour)[kPixelBytes]) {
  for (int y = part.top; y < part.bottom; ++y) {
    unsigned char *pixel = _row(pixels, part.left, y);
    for (int x = part.left; x < part.right; ++x, pixel += kPixelBytes)
      std::memcpy(pixel, colour, kPixelBytes);
  }
}

// Coarse as well as averaged, so that there is little to compare a guess with.
void _fill_with_mean(tavro_pixels &pixels, const part &part) {
  constexpr uint64_t kSteps = 15;
  uint64_t sums[3] = {};
  for (int y = part.top; y < part.bottom; ++y) {
    const unsigned char *pixel = _row(pixels, part.left, y);
    for (int x = part.left; x < part.right; ++x, pixel += kPixelBytes)
      for (int channel = 0; channel < 3; ++channel) sums[channel] += pixel[channel];
  }
  const auto count =
      static_cast<uint64_t>(part.right - part.left) * static_cast<uint64_t>(part.bottom - part.top);
  unsigned char mean[kPixelBytes] = {0, 0, 0, 255};
  for (int channel = 0; channel < 3; ++channel) {
    const uint64_t step = (sums[channel] * kSteps + count * 255 / 2) / (count * 255);
    mean[channel] = static_cast<unsigned char>(step * 255 / kSteps);
  }
  _fill(pixels, part, mean);
}

// Squares higher than a line of text and wider than two letters; a smaller area is one square.
void _pixelate(tavro_pixels &pixels, const part &area) {
  constexpr int kLeastSide = 32;
  const int width = area.right - area.left, height = area.bottom - area.top;
  const int side =
      std::max({kLeastSide, std::min(pixels.width, pixels.height) / 15, std::min(width, height) / 8});
  // None is smaller than the others: what does not fill a square of its own is spread over all.
  const int columns = std::max(1, width / side), rows = std::max(1, height / side);
  const auto edge = [](int start, int size, int i, int count) {
    return start + static_cast<int>(static_cast<int64_t>(size) * i / count);
  };
  for (int row = 0; row < rows; ++row)
    for (int column = 0; column < columns; ++column)
      _fill_with_mean(pixels,
                      {edge(area.left, width, column, columns), edge(area.top, height, row, rows),
                       edge(area.left, width, column + 1, columns), edge(area.top, height, row + 1, rows)});
}

}  // namespace

void tavro_image_outline(tavro_pixels &pixels, const tavro_frame &frame, int thickness,
                         const unsigned char (&colour)[kPixelBytes]) {
  const int left = std::min(frame.left + thickness, frame.right);
  const int top = std::min(frame.top + thickness, frame.bottom);
  const int right = std::max(frame.right - thickness, left), bottom = std::max(frame.bottom - thickness, top);
  const part sides[] = {{frame.left, frame.top, frame.right, top},
                        {frame.left, bottom, frame.right, frame.bottom},
                        {frame.left, top, left, bottom},
                        {right, top, frame.right, bottom}};
  for (const part &side : sides)
    _fill(pixels,
          {_clip(side.left, pixels.width), _clip(side.top, pixels.height), _clip(side.right, pixels.width),
           _clip(side.bottom, pixels.height)},
          colour);
}

void tavro_image_hide(tavro_pixels &pixels, const std::vector<tavro_hidden_area> &areas) {
  constexpr unsigned char kBlack[] = {0, 0, 0, 255};
  for (const tavro_hidden_area &area : areas) {
    const part part = _clip(area, pixels);
    if (part.left >= part.right || part.top >= part.bottom) continue;
    if (area.way == TAVRO_HIDE_PIXELATE)
      _pixelate(pixels, part);
    else
      _fill(pixels, part, kBlack);
  }
}
