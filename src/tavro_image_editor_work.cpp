#include "tavro_image_editor_work.h"

#include <image_util.h>
#include <unistd.h>

#include <algorithm>
#include <cstring>

#include "tavro_deleted_files.h"
#include "tavro_image_file.h"
#include "tavro_log.h"

namespace {

constexpr int kSavedQuality = 95;
// A smaller miniature would show the squares of a blurred area larger than they are saved.
constexpr int kLeastShownSide = 480;
constexpr int kBoxThickness = 4;                                  // in the file
constexpr unsigned char kBoxColour[] = {0x28, 0x28, 0xC6, 0xFF};  // the palette's red

bool _new_pixels(int width, int height, tavro_pixels *pixels) {
  pixels->width = pixels->source_width = width;
  pixels->height = pixels->source_height = height;
  pixels->bytes.reset(static_cast<unsigned char *>(std::malloc(pixels->size())));
  return pixels->bytes != nullptr;
}

bool _copy(const tavro_pixels &pixels, tavro_pixels *copy) {
  if (!_new_pixels(pixels.width, pixels.height, copy)) return false;
  std::memcpy(copy->bytes.get(), pixels.bytes.get(), pixels.size());
  return true;
}

// How large the picture is looked at; never larger than it is.
ie::CPoint _shown_size(const tavro_pixels &pixels, int width, int height) {
  const double fitting =
      std::min(static_cast<double>(width) / pixels.width, static_cast<double>(height) / pixels.height);
  const double least = static_cast<double>(kLeastShownSide) / std::min(pixels.width, pixels.height);
  const double factor = std::min(1.0, std::max(fitting, least));
  return {std::max(1, static_cast<int>(pixels.width * factor)),
          std::max(1, static_cast<int>(pixels.height * factor))};
}

bool _make_shown(const tavro_pixels &pixels, int width, int height, tavro_pixels *shown) {
  const ie::CPoint size = _shown_size(pixels, width, height);
  if (size.X() == pixels.width) return _copy(pixels, shown);
  int made_width = size.X(), made_height = size.Y();
  return _new_pixels(size.X(), size.Y(), shown) &&
         image_util_resize(shown->bytes.get(), &made_width, &made_height, pixels.bytes.get(), pixels.width,
                           pixels.height, IMAGE_UTIL_COLORSPACE_BGRA8888) == IMAGE_UTIL_ERROR_NONE;
}

tavro_frame _in_miniature(const tavro_hidden_area &area, const tavro_edit_picture &picture,
                          const tavro_pixels &miniature) {
  const ie::CPoint size(picture.pixels.width, picture.pixels.height);
  const ie::CRect rect = tavro_edit_to_screen({area.x, area.y, area.x + area.width, area.y + area.height},
                                              size, {0, 0, miniature.width, miniature.height});
  return {rect.Left(), rect.Top(), rect.Right(), rect.Bottom()};
}

// A box that was left where it was marks nothing, and neither does one in what is cut off.
void _draw_box(tavro_pixels &saved, const tavro_edit_picture &picture, const tavro_edit &edit) {
  const ie::CRect box = tavro_edit_saved_box(picture, edit);
  if (!tavro_edit_is_box_moved(picture, edit) || box.Height() < 1) return;
  tavro_image_outline(saved, {box.Left(), box.Top(), box.Right(), box.Bottom()}, kBoxThickness, kBoxColour);
}

// In place: rows move to the front.
void _crop(tavro_pixels *pixels, const ie::CRect &box) {
  const size_t row = static_cast<size_t>(box.Width()) * 4;
  const size_t stride = static_cast<size_t>(pixels->width) * 4;
  unsigned char *bytes = pixels->bytes.get();
  for (int y = 0; y < box.Height(); ++y)
    std::memmove(bytes + static_cast<size_t>(y) * row,
                 bytes + static_cast<size_t>(box.Top() + y) * stride + static_cast<size_t>(box.Left()) * 4,
                 row);
  pixels->width = box.Width();
  pixels->height = box.Height();
}

}  // namespace

tavro_image_fault tavro_edit_load(const std::string &path, bool is_screenshot, int width, int height,
                                  tavro_edit_picture *picture) {
  tavro_image_fault fault = TAVRO_IMAGE_GOOD;
  picture->path = path;
  picture->is_screenshot = is_screenshot;
  if (!tavro_image_decode(path.c_str(), {}, &picture->pixels, &fault)) return fault;
  if (is_screenshot && picture->pixels.height <= kStatusBarRows) {
    TAVRO_LOGE("%s has no rows below the status bar", path.c_str());
    return TAVRO_IMAGE_OTHER_KIND;
  }
  return _make_shown(picture->pixels, width, height, &picture->shown) ? TAVRO_IMAGE_GOOD
                                                                      : TAVRO_IMAGE_NO_MEMORY;
}

tavro_edit tavro_edit_start(const tavro_edit_picture &picture) {
  const int width = picture.pixels.width, height = picture.pixels.height;
  if (!picture.is_screenshot) return {{0, 0, width, height}, {}};
  // A fifth of each side is left free around the middle of what is kept.
  const int rows = height - kStatusBarRows;
  return {{width / 5, kStatusBarRows + rows / 5, width - width / 5, height - rows / 5}, {}};
}

void tavro_edit_hide_in(tavro_pixels &miniature, const tavro_edit_picture &picture, const tavro_edit &edit) {
  std::vector<tavro_hidden_area> areas;
  for (const tavro_hidden_area &area : edit.areas) {
    const tavro_frame rect = _in_miniature(area, picture, miniature);
    areas.push_back({rect.left, rect.top, rect.right - rect.left, rect.bottom - rect.top, area.way});
  }
  tavro_image_hide(miniature, areas);
}

bool tavro_edit_is_box_moved(const tavro_edit_picture &picture, const tavro_edit &edit) {
  return !(tavro_edit{edit.box, {}} == tavro_edit_start(picture));
}

void tavro_edit_outline_in(tavro_pixels &miniature, const tavro_edit_picture &picture, const tavro_edit &edit,
                           int thickness) {
  constexpr unsigned char kDark[] = {0x48, 0x3B, 0x32, 0xFF}, kLight[] = {0xFF, 0xFF, 0xFF, 0xFF};
  for (const tavro_hidden_area &area : edit.areas) {
    if (area.way != TAVRO_HIDE_PIXELATE) continue;
    tavro_frame frame = _in_miniature(area, picture, miniature);
    tavro_image_outline(miniature, frame, thickness, kDark);
    frame = {frame.left + thickness, frame.top + thickness, frame.right - thickness,
             frame.bottom - thickness};
    tavro_image_outline(miniature, frame, thickness, kLight);
  }
}

std::string tavro_edit_save(const tavro_edit_picture &picture, const tavro_edit &edit) {
  tavro_pixels pixels;
  const std::string path = tavro_image_unused_path("jpg");
  if (path.empty() || !_copy(picture.pixels, &pixels)) {
    TAVRO_LOGE("no room for the edited picture");
    return "";
  }
  tavro_image_hide(pixels, edit.areas);
  if (picture.is_screenshot)
    return tavro_crop_image(pixels.bytes.get(), pixels.width, pixels.height, path.c_str(),
                            [&](tavro_pixels &saved) { _draw_box(saved, picture, edit); })
               ? path
               : "";
  _crop(&pixels, edit.box);
  if (!tavro_image_save_jpeg(pixels, kSavedQuality, path.c_str())) return "";
  tavro_tell_media_database(path.c_str());
  return path;
}

ie::CRect tavro_edit_saved_box(const tavro_edit_picture &picture, const tavro_edit &edit) {
  const ie::CPoint size(picture.pixels.width, picture.pixels.height - kStatusBarRows);
  ie::CRect box = edit.box;
  box.MoveBy(0, -kStatusBarRows);
  box.Top(std::max(0, box.Top()));
  box.Bottom(std::max(0, box.Bottom()));
  return tavro_edit_to_screen(box, size, {0, 0, kCroppedWidth, kCroppedHeight});
}

void tavro_edit_remove_file(const std::string &path) {
  tavro_deleted_files_note_copies({}, {path});
  tavro_deleted_files_remove();
  if (access(path.c_str(), F_OK) != 0) tavro_tell_media_database(path.c_str());
}
