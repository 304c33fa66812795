#include "system_info.h"

#include <sys/stat.h>
#include <sys/utsname.h>
#include <time.h>

#include <string>

#include "scoped.h"
#include "system_info_source.h"

namespace {

using platform::duplicate;
using platform::ScopedGText;

// The phone's window where no display tells its size.
constexpr int kDefaultWidth = 720;    // pixels
constexpr int kDefaultHeight = 1280;  // pixels
constexpr const char *kUnknown = "unknown";

platform::ScreenSizeSource screen_size_source = nullptr;

// The first line of a small file of the system, empty when there is none.
std::string first_line(const char *path) {
  char *content = nullptr;
  if (!g_file_get_contents(path, &content, nullptr, nullptr)) return "";
  const ScopedGText owned(content);
  const std::string text = content;
  const std::string line = text.substr(0, text.find('\n'));
  return g_utf8_validate(line.c_str(), -1, nullptr) ? line : "";
}

std::string os_release(const char *key) {
  const ScopedGText value(g_get_os_info(key));
  return value ? value.get() : "";
}

std::string kernel(char (utsname::*field)[_UTSNAME_LENGTH]) {
  utsname names;
  return uname(&names) == 0 ? names.*field : "";
}

std::string build_string() {
  const std::string name = os_release(G_OS_INFO_KEY_PRETTY_NAME);
  const std::string release = kernel(&utsname::release);
  return name.empty() || release.empty() ? name + release : name + " " + release;
}

// When the system was last built or brought up to date: the age of its release file.
std::string build_moment(const char *format) {
  struct stat release;
  if (stat("/etc/os-release", &release) != 0) return "";
  tm local;
  localtime_r(&release.st_mtim.tv_sec, &local);
  char text[32];
  return strftime(text, sizeof(text), format, &local) > 0 ? text : "";
}

std::string build_date() {
  return build_moment("%Y.%m.%d");
}
std::string build_time() {
  return build_moment("%H:%M:%S");
}

std::string model_name() {
  constexpr const char *kSources[] = {"/sys/class/dmi/id/product_name", "/proc/device-tree/model"};
  for (const char *source : kSources) {
    const std::string model = first_line(source);
    if (!model.empty()) return model;
  }
  return kernel(&utsname::nodename);
}

std::string platform_name() {
  return os_release(G_OS_INFO_KEY_NAME);
}
std::string platform_version() {
  return os_release(G_OS_INFO_KEY_VERSION_ID);
}

struct Fact {
  const char *key;
  std::string (*read)();
};

constexpr Fact kFacts[] = {
    {SYSTEM_INFO_KEY_BUILD_STRING, build_string},   {SYSTEM_INFO_KEY_BUILD_DATE, build_date},
    {SYSTEM_INFO_KEY_BUILD_TIME, build_time},       {SYSTEM_INFO_KEY_MODEL_NAME, model_name},
    {SYSTEM_INFO_KEY_PLATFORM_NAME, platform_name}, {SYSTEM_INFO_KEY_PLATFORM_VERSION, platform_version},
};

}  // namespace

namespace platform {

void set_screen_size_source(ScreenSizeSource source) {
  screen_size_source = source;
}

}  // namespace platform

int system_info_get_platform_int(const char *key, int *value) {
  if (!key || !value) return SYSTEM_INFO_ERROR_INVALID_PARAMETER;
  int width = kDefaultWidth, height = kDefaultHeight;
  if (screen_size_source && !screen_size_source(&width, &height)) {
    width = kDefaultWidth;
    height = kDefaultHeight;
  }
  if (std::string(key) == SYSTEM_INFO_KEY_SCREEN_WIDTH) {
    *value = width;
  } else if (std::string(key) == SYSTEM_INFO_KEY_SCREEN_HEIGHT) {
    *value = height;
  } else {
    return SYSTEM_INFO_ERROR_INVALID_PARAMETER;
  }
  return SYSTEM_INFO_ERROR_NONE;
}

int system_info_get_platform_string(const char *key, char **value) {
  if (!key || !value) return SYSTEM_INFO_ERROR_INVALID_PARAMETER;
  for (const Fact &fact : kFacts) {
    if (std::string(key) != fact.key) continue;
    const std::string text = fact.read();
    *value = duplicate(text.empty() ? kUnknown : text.c_str());
    return *value ? SYSTEM_INFO_ERROR_NONE : SYSTEM_INFO_ERROR_OUT_OF_MEMORY;
  }
  return SYSTEM_INFO_ERROR_INVALID_PARAMETER;
}
