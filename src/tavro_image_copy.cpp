// Pictures made fit to be attached: in a format that support can open.
#include <unistd.h>

#include <mutex>
#include <set>

#include "tavro_drafts.h"
#include "tavro_image.h"
#include "tavro_log.h"

namespace {

constexpr int kConvertedQuality = 95;
constexpr int kMostNames = 1000;  // for pictures of one second

tavro_image_fault _convert(const char *path, const char *converted_path) {
  tavro_pixels pixels;
  tavro_image_fault fault = TAVRO_IMAGE_GOOD;
  if (!tavro_image_decode(path, {}, &pixels, &fault)) return fault;
  return tavro_image_save_jpeg(pixels, kConvertedQuality, converted_path) ? TAVRO_IMAGE_GOOD
                                                                          : TAVRO_IMAGE_NOT_WRITTEN;
}

}  // namespace

// Names are as fine as a second, and files appear when they are whole: a name that was given away is not
// free, though there is nothing under it yet.
std::string tavro_image_unused_path(const char *ending) {
  static std::mutex _lock;
  static std::set<std::string> _given;
  const std::lock_guard<std::mutex> guard(_lock);
  char name[kGeneratedFilenameSize] = {};
  tavro_generate_filename(name, ending);
  std::string path = name;
  const size_t dot = path.rfind('.');
  const auto is_taken = [&path] { return _given.count(path) > 0 || access(path.c_str(), F_OK) == 0; };
  for (int i = 2; i < kMostNames && !path.empty() && is_taken(); ++i)
    path = std::string(name, dot) + "_" + std::to_string(i) + "." + ending;
  _given.insert(path);
  return path;
}

std::string tavro_image_attachable_copy(const char *path, tavro_image_fault *fault) {
  const std::string copy = tavro_image_unused_path("jpg");
  const tavro_image_fault result = copy.empty() ? TAVRO_IMAGE_NOT_WRITTEN : _convert(path, copy.c_str());
  if (fault) *fault = result;
  if (result != TAVRO_IMAGE_GOOD) TAVRO_LOGE("%s: no copy to attach: %d", path, result);
  return result == TAVRO_IMAGE_GOOD ? copy : "";
}
