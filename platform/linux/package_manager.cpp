#include "package_manager.h"

#include <new>
#include <string>

#include "desktop_entry.h"

struct package_info_s {
  std::string package;
  std::string version;  // empty: not told
};

namespace {

constexpr const char *kVersionKey = "X-Tavro-Version";

int give_text(const std::string &text, char **copy) {
  *copy = platform::duplicate(text.c_str());
  return *copy ? PACKAGE_MANAGER_ERROR_NONE : PACKAGE_MANAGER_ERROR_OUT_OF_MEMORY;
}

}  // namespace

int package_manager_get_package_info(const char *package, package_info_h *package_info) {
  if (!package || !package_info) return PACKAGE_MANAGER_ERROR_INVALID_PARAMETER;
  const auto entry = platform::find_desktop_entry(package);
  if (!entry) return PACKAGE_MANAGER_ERROR_NO_SUCH_PACKAGE;
  const platform::ScopedGText version(g_desktop_app_info_get_string(entry.get(), kVersionKey));
  *package_info = new (std::nothrow) package_info_s{package, version ? version.get() : ""};
  return *package_info ? PACKAGE_MANAGER_ERROR_NONE : PACKAGE_MANAGER_ERROR_OUT_OF_MEMORY;
}

int package_info_destroy(package_info_h package_info) {
  if (!package_info) return PACKAGE_MANAGER_ERROR_INVALID_PARAMETER;
  delete package_info;
  return PACKAGE_MANAGER_ERROR_NONE;
}

int package_info_get_package(package_info_h package_info, char **package) {
  if (!package_info || !package) return PACKAGE_MANAGER_ERROR_INVALID_PARAMETER;
  return give_text(package_info->package, package);
}

int package_info_get_version(package_info_h package_info, char **version) {
  if (!package_info || !version) return PACKAGE_MANAGER_ERROR_INVALID_PARAMETER;
  if (package_info->version.empty()) return PACKAGE_MANAGER_ERROR_NO_SUCH_PACKAGE;
  return give_text(package_info->version, version);
}
