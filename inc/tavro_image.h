// Pictures as pixels, without a screen: decode a file upright and with bounded memory, hide what is private,
// cut a screenshot to the size in which it is sent, save, and copy a picture into a format that support can
// open. Plain values; any thread, several at once; blocks for as long as disk and codecs take.
//
// Files that are made are readable by their owner alone, appear under their name only when they are whole,
// and never take the place of another file. Nothing here changes or removes a file that was there before.
#pragma once

#include <cstddef>
#include <cstdint>
#include <cstdlib>
#include <functional>
#include <memory>
#include <string>
#include <vector>

#include "tavro_handles.h"

// Why a picture cannot be had.
enum tavro_image_fault {
  TAVRO_IMAGE_GOOD = 0,
  TAVRO_IMAGE_UNREADABLE,  // gone, not a plain file, or not readable
  TAVRO_IMAGE_OTHER_KIND,  // no JPEG, PNG or WebP picture, or one that cannot be decoded at all
  TAVRO_IMAGE_TOO_LARGE,   // would need more memory than allowed; known before anything is decoded
  TAVRO_IMAGE_NO_MEMORY,
  TAVRO_IMAGE_NOT_WRITTEN,  // the copy could not be written: full disk, no folder
};

// The string id of a sentence that tells a user so; null for TAVRO_IMAGE_GOOD.
const char *tavro_image_fault_text(tavro_image_fault fault);

struct tavro_image_limits {
  int64_t most_bytes = 64 << 20;  // of the decoded pixels
};

// Upright pixels in rows without gaps: bytes blue, green, red, 255. What was transparent is on white.
struct tavro_pixels {
  std::unique_ptr<unsigned char, TavroCall<std::free>> bytes;
  int width = 0, height = 0;
  // Upright size of the picture in the file; larger than the above when it was scaled down while decoding.
  int source_width = 0, source_height = 0;

  size_t size() const { return static_cast<size_t>(width) * static_cast<size_t>(height) * 4; }
};

// Decode a JPEG, PNG or WebP file and turn it upright. A JPEG that would break the limits is scaled down by
// 2, 4 or 8 while decoding; what still breaks them is refused. A damaged JPEG shows as much as it holds.
// `fault` may be null. On failure `pixels` are left as they were.
bool tavro_image_decode(const char *path, const tavro_image_limits &limits, tavro_pixels *pixels,
                        tavro_image_fault *fault = nullptr);
// The same within the usual limits.
bool decode_image(const char *path, tavro_pixels *pixels);

// What is cut off a screenshot at its top: the rows of the status bar.
constexpr int kStatusBarRows = 146;
constexpr int kCroppedWidth = 720, kCroppedHeight = 1200;

// Cut the status bar off a screenshot (pixels as above), scale the rest to 720 x 1200 whatever its
// proportions, write it as a JPEG file of quality 100 and tell the media database. False, with a log line and
// nothing written, when there are no rows below the status bar or the file cannot be written or is there
// already.
bool tavro_crop_image(const unsigned char *buffer, int width, int height, const char *path);

// The same with something drawn into the 720 x 1200 pixels before they are written.
bool tavro_crop_image(const unsigned char *buffer, int width, int height, const char *path,
                      const std::function<void(tavro_pixels &)> &draw);

enum tavro_hide_way {
  TAVRO_HIDE_FILL,      // black
  TAVRO_HIDE_PIXELATE,  // squares of one colour, too large for text to be read or guessed from them
};

// In pixels of the picture it is put on; may reach beyond it. Empty ones hide nothing.
struct tavro_hidden_area {
  int x, y, width, height;
  tavro_hide_way way;
};

// Overwrite the pixels of the areas, one after the other.
void tavro_image_hide(tavro_pixels &pixels, const std::vector<tavro_hidden_area> &areas);

// A rectangle in pixels, right and bottom outside.
struct tavro_frame {
  int left, top, right, bottom;
};
// Draw the outline of a rectangle, of this thickness and within it, in blue, green, red, 255. What reaches
// beyond the picture is left out.
void tavro_image_outline(tavro_pixels &pixels, const tavro_frame &frame, int thickness,
                         const unsigned char (&colour)[4]);

// The quality is 1 to 100. False with a log line when the file cannot be written or is there already.
bool tavro_image_save_jpeg(const tavro_pixels &pixels, int quality, const char *path);

// The path of a new picture in the folder of generated files; empty when that folder cannot be made.
std::string tavro_image_unused_path(const char *ending);

// A JPEG copy of the picture to attach in its place, without metadata, under a new name in the folder of
// generated files: its path; empty when there is none.
std::string tavro_image_attachable_copy(const char *path, tavro_image_fault *fault = nullptr);
