#include "package_manager.h"

#include <new>
#include <string>

#include "app_core.h"
#include "desktop_entry.h"

struct package_info_s {
  std::string package;
  std::string version;  // empty: not told
  bool is_preload;
};

namespace {

constexpr const char *kVersionKey = "X-Tavro-Version";
constexpr const char *kMachinesEntries = "/usr/share/applications/";

// The machine's own packages put their entries there; what people install, by hand or from a store, lies in
// their home folder, under /usr/local or in the store's own tree. The phone's applications came with it.
bool came_with_machine(GDesktopAppInfo *entry) {
  const char *file = g_desktop_app_info_get_filename(entry);
  if (!file || g_str_has_prefix(file, kMachinesEntries)) return true;
  const platform::ScopedGText applications(
      g_canonicalize_filename((platform::application_folder() + "/..").c_str(), nullptr));
  const platform::ScopedGText own(g_canonicalize_filename(file, nullptr));
  return g_str_has_prefix(own.get(), applications.get());
}

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
  *package_info = new (std::nothrow)
      package_info_s{package, version ? version.get() : "", came_with_machine(entry.get())};
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

int package_info_is_preload_package(package_info_h package_info, bool *preload) {
  if (!package_info || !preload) return PACKAGE_MANAGER_ERROR_INVALID_PARAMETER;
  *preload = package_info->is_preload;
  return PACKAGE_MANAGER_ERROR_NONE;
}
