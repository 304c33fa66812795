// Picture files without metadata, in memory. Plain values; any thread.
#pragma once

#include <cstddef>
#include <vector>

// So many bytes of a file's beginning tell what it is.
constexpr size_t kTellingBytes = 4096;

// Whether a file that begins so is a picture in the box format of videos, in which metadata cannot be told
// from pixels so simply: one of the brands that it names is of such pictures.
bool tavro_is_boxed_picture(const std::vector<unsigned char> &head);

enum tavro_strip_result {
  TAVRO_STRIP_DONE = 0,
  TAVRO_STRIP_NO_PICTURE,  // no picture by its first bytes: nothing to strip here
  TAVRO_STRIP_BROKEN,      // a picture whose metadata cannot be told apart
};

// `stripped` receives the JPEG, PNG or WebP file `content` without what it says beside its pixels: EXIF, XMP,
// comments, texts, times, previews, and whatever follows its end. Pixels stay as they are compressed; colour
// profile and transparency stay; of EXIF only the orientation does. The result depends on `content` alone,
// and stripping it again changes nothing. A file that breaks off is taken for what it still shows.
tavro_strip_result tavro_image_strip(const std::vector<unsigned char> &content,
                                     std::vector<unsigned char> *stripped);
