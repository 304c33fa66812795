// Leaving out what a picture file says beside its pixels: each format is walked piece by piece, and only the
// pieces that are known to make the picture are copied.
#include "tavro_image_strip.h"

#include <algorithm>
#include <string>

#include "tavro_byte_reader.h"
#include "tavro_picture_info.h"

namespace {

using bytes = std::vector<unsigned char>;

void _append(bytes *to, const tavro_byte_reader &file, size_t place, size_t length) {
  const size_t start = std::min(place, file.size()), end = start + std::min(length, file.size() - start);
  to->insert(to->end(), file.data(start), file.data(start) + (end - start));
}

void _append(bytes *to, std::string_view text) {
  to->insert(to->end(), text.begin(), text.end());
}

// The body of EXIF data that says nothing but how the picture is to be turned.
std::string _orientation_alone(int orientation) {
  using namespace std::string_literals;
  return "MM\0*\0\0\0\x08\0\x01\x01\x12\0\x03\0\0\0\x01\0"s + static_cast<char>(orientation) +
         std::string(6, '\0');
}

// ---- JPEG ----

constexpr std::string_view kExifName("Exif\0\0", 6);
constexpr unsigned int kEnd = 0xD9, kScan = 0xDA;

bool _is_bare(unsigned int marker) {
  return marker == 0x01 || (marker >= 0xD0 && marker <= 0xD8);
}

// Tables, frames and scans; of the segments for applications only those that decide about colours.
bool _makes_jpeg(const tavro_byte_reader &file, size_t place, size_t length) {
  constexpr std::string_view kProfile("ICC_PROFILE\0", 12), kAdobe("Adobe");
  const unsigned int marker = file.at(place + 1);
  if (marker == 0xE2) return length >= 2 + kProfile.size() && file.has(place + 4, kProfile);
  if (marker == 0xEE) return length >= 2 + kAdobe.size() && file.has(place + 4, kAdobe);
  return marker >= 0xC0 && marker <= 0xDF;
}

// Where the compressed data ends that starts here: at the next marker that is no part of it.
size_t _end_of_scan(const tavro_byte_reader &file, size_t place) {
  for (; place + 1 < file.size(); ++place) {
    if (file.at(place) != 0xFF) continue;
    const unsigned int next = file.at(place + 1);
    if (next != 0 && next != 0xFF && (next < 0xD0 || next > 0xD7)) return place;
  }
  return file.size();
}

// The segments that are rewritten rather than copied or left out.
void _append_rewritten(bytes *to, const tavro_byte_reader &file, size_t place, size_t length,
                       bool *has_orientation) {
  using namespace std::string_literals;
  const unsigned int marker = file.at(place + 1);
  // Without the miniature that may follow the densities.
  if (marker == 0xE0 && length >= 16 && file.has(place + 4, std::string_view("JFIF\0", 5))) {
    _append(to, "\xFF\xE0\0\x10"s);
    _append(to, file, place + 4, 12);
    _append(to, "\0\0"s);
  }
  if (marker != 0xE1 || *has_orientation || length < 2 + kExifName.size() || !file.has(place + 4, kExifName))
    return;
  const int orientation =
      tavro_exif_orientation(file.data(place + 4 + kExifName.size()), length - 2 - kExifName.size());
  if (orientation == 1) return;
  *has_orientation = true;
  const std::string exif = _orientation_alone(orientation);
  _append(to, "\xFF\xE1\0"s + static_cast<char>(2 + kExifName.size() + exif.size()));
  _append(to, kExifName);
  _append(to, exif);
}

// A file that breaks off within its pixels is one that shows less; it gets an end.
bool _strip_jpeg(const tavro_byte_reader &file, bytes *to) {
  bool has_scan = false, has_orientation = false;
  _append(to, "\xFF\xD8");
  for (size_t place = 2; place + 1 < file.size();) {
    const unsigned int marker = file.at(place + 1);
    if (file.at(place) != 0xFF || marker == 0 || marker == 0xFF || _is_bare(marker)) {
      place += file.at(place) == 0xFF && _is_bare(marker) ? 2 : 1;
      continue;
    }
    if (marker == kEnd) break;
    const size_t length = file.big16(place + 2);
    if (length < 2 || place + 2 + length > file.size()) break;
    if (_makes_jpeg(file, place, length)) _append(to, file, place, 2 + length);
    _append_rewritten(to, file, place, length, &has_orientation);
    place += 2 + length;
    if (marker != kScan) continue;
    const size_t end = _end_of_scan(file, place);
    _append(to, file, place, end - place);
    has_scan = true;
    place = end;
  }
  _append(to, "\xFF\xD9");
  return has_scan;
}

// ---- PNG ----

// What makes the pixels, the colours and the proportions. An animation shows its first picture.
bool _makes_png(const tavro_byte_reader &file, size_t type) {
  return file.has_any(type, {"IHDR", "PLTE", "IDAT", "IEND", "tRNS", "cHRM", "gAMA", "iCCP", "sBIT", "sRGB",
                             "cICP", "bKGD", "pHYs"});
}

bool _strip_png(const tavro_byte_reader &file, bytes *to) {
  constexpr size_t kSignature = 8, kAround = 12;  // length, type and checksum of a chunk
  if (!file.has(kSignature + 4, "IHDR")) return false;
  bool has_pixels = false;
  _append(to, file, 0, kSignature);
  for (size_t place = kSignature; place + kAround <= file.size();) {
    const size_t whole = kAround + file.big32(place);
    const bool is_whole = whole <= file.size() - place, is_pixels = file.has(place + 4, "IDAT");
    has_pixels = has_pixels || is_pixels;
    if (_makes_png(file, place + 4) && (is_whole || is_pixels)) _append(to, file, place, whole);
    if (!is_whole || file.has(place + 4, "IEND")) break;
    place += whole;
  }
  return has_pixels;
}

// ---- WebP ----

std::string _little32(size_t number) {
  std::string text;
  for (int shift = 0; shift < 32; shift += 8) text += static_cast<char>(number >> shift & 0xFF);
  return text;
}

void _append_webp_orientation(bytes *to, int orientation) {
  const std::string exif = _orientation_alone(orientation);
  _append(to, "EXIF" + _little32(exif.size()));
  _append(to, exif);
}

// An animation is refused: its pictures have chunks of their own, which may say anything.
bool _strip_webp(const tavro_byte_reader &file, bytes *to) {
  constexpr size_t kHead = 12, kChunkHead = 8, kFlags = 20;
  constexpr unsigned int kHasExif = 0x08, kHasXmp = 0x04;
  int orientation = 1;
  bool has_pixels = false;
  _append(to, file, 0, kHead);
  for (size_t place = kHead; place + kChunkHead <= file.size();) {
    const size_t length = file.little32(place + 4), whole = kChunkHead + length + length % 2;
    if (file.has_any(place, {"ANIM", "ANMF"})) return false;
    if (file.has(place, "EXIF"))
      orientation = tavro_exif_orientation(file.data(place + kChunkHead),
                                           std::min(length, file.size() - place - kChunkHead));
    if (file.has_any(place, {"VP8 ", "VP8L", "VP8X", "ALPH", "ICCP"})) _append(to, file, place, whole);
    has_pixels = has_pixels || file.has_any(place, {"VP8 ", "VP8L"});
    place += whole;
  }
  if (!has_pixels || to->size() < kFlags + 1) return false;
  const bool is_extended = tavro_byte_reader(*to).has(kHead, "VP8X");
  if (is_extended) (*to)[kFlags] &= static_cast<unsigned char>(~(kHasExif | kHasXmp));
  if (is_extended && orientation != 1) {
    (*to)[kFlags] |= kHasExif;
    if (to->size() % 2) to->push_back(0);
    _append_webp_orientation(to, orientation);
  }
  const std::string size = _little32(to->size() - 8);
  std::copy(size.begin(), size.end(), to->begin() + 4);
  return true;
}

}  // namespace

// A box without a length of its own may be as long as the file.
bool tavro_is_boxed_picture(const std::vector<unsigned char> &head) {
  constexpr size_t kBrand = 8, kBrandSize = 4, kShortest = 16;  // of the box that names the brands
  const tavro_byte_reader file(head);
  if (!file.has(4, "ftyp")) return false;
  const size_t length = file.big32(0);
  const size_t end = std::min({length < kShortest ? kTellingBytes : length, kTellingBytes, file.size()});
  for (size_t place = kBrand; place < end; place += kBrandSize)
    if (file.has_any(place, {"hei", "hevc", "hevm", "hevs", "hevx", "avi", "mif1", "mif2", "msf1", "mia",
                             "MA1", "crx "}))
      return true;
  return false;
}

tavro_strip_result tavro_image_strip(const std::vector<unsigned char> &content,
                                     std::vector<unsigned char> *stripped) {
  const tavro_byte_reader file(content);
  stripped->clear();
  bool is_followed = false;
  if (file.has(0, "\xFF\xD8\xFF"))
    is_followed = _strip_jpeg(file, stripped);
  else if (file.has(0, "\x89PNG\r\n\x1A\n"))
    is_followed = _strip_png(file, stripped);
  else if (file.has(0, "RIFF") && file.has(8, "WEBP"))
    is_followed = _strip_webp(file, stripped);
  else if (!tavro_is_boxed_picture(content))
    return TAVRO_STRIP_NO_PICTURE;
  if (!is_followed) stripped->clear();
  return is_followed ? TAVRO_STRIP_DONE : TAVRO_STRIP_BROKEN;
}
