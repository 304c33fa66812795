#include "desktop_entry.h"

#include "app_core.h"

namespace platform {

ScopedObject<GDesktopAppInfo> find_desktop_entry(const std::string &id) {
  if (id.empty() || id.find('/') != std::string::npos) return nullptr;
  // The phone's applications lie side by side, each in a folder with its entry.
  const std::string beside = application_folder() + "/../" + id + "/" + id + ".desktop";
  if (g_file_test(beside.c_str(), G_FILE_TEST_IS_REGULAR)) {
    return ScopedObject<GDesktopAppInfo>(g_desktop_app_info_new_from_filename(beside.c_str()));
  }
  return ScopedObject<GDesktopAppInfo>(g_desktop_app_info_new((id + ".desktop").c_str()));
}

}  // namespace platform
