#include "crash_application.h"

#include <app_info.h>
#include <app_manager.h>
#include <gio/gdesktopappinfo.h>
#include <package_manager.h>

#include "tavro_handles.h"

namespace {

constexpr size_t kLongestName = 200;  // bytes
constexpr char kSuffix[] = ".desktop";

using Text = TavroHandle<char, free>;
using AppInfo = TavroHandle<app_info_s, app_info_destroy>;

// The phone's own applications lie in <any>/apps/<id>/bin/<id>.
bool is_laid_out_as_application(const Crash &crash) {
  const std::string ending = "/apps/" + crash.program + "/bin/" + crash.program;
  return g_str_has_suffix(crash.executable.c_str(), ending.c_str());
}

std::string label_of(const std::string &app_id) {
  AppInfo info;
  if (app_manager_get_app_info(app_id.c_str(), tavro_out(info)) != APP_MANAGER_ERROR_NONE) return "";
  Text label;
  app_info_get_label(info.get(), tavro_out(label));
  return label ? label.get() : "";
}

std::string version_of(const std::string &package) {
  package_info_h raw = nullptr;
  if (package_manager_get_package_info(package.c_str(), &raw) != PACKAGE_MANAGER_ERROR_NONE) return "";
  const TavroHandle<package_info_s, package_info_destroy> info(raw);
  Text version;
  package_info_get_version(info.get(), tavro_out(version));
  return version ? version.get() : "";
}

// Whether the entry starts this very file.
bool starts(GAppInfo *entry, const std::string &executable) {
  const char *first = g_app_info_get_executable(entry);
  if (!first || !g_app_info_should_show(entry)) return false;
  const TavroGText found(g_find_program_in_path(first));
  const Text real(found ? realpath(found.get(), nullptr) : nullptr);
  return real && executable == real.get();
}

void find_desktop_application(const std::string &executable, CrashApplication *application) {
  GList *entries = g_app_info_get_all();
  for (GList *entry = entries; entry; entry = entry->next) {
    const char *id = g_app_info_get_id(G_APP_INFO(entry->data));
    if (!id || !g_str_has_suffix(id, kSuffix) || !starts(G_APP_INFO(entry->data), executable)) continue;
    application->id.assign(id, strlen(id) - strlen(kSuffix));
    application->name = g_app_info_get_display_name(G_APP_INFO(entry->data));
    break;
  }
  g_list_free_full(entries, g_object_unref);
}

}  // namespace

CrashApplication application_of(const Crash &crash) {
  CrashApplication application;
  if (is_laid_out_as_application(crash)) {
    application.id = crash.program;
    application.name = label_of(crash.program);
    application.is_of_phone = true;
  } else if (!crash.executable.empty()) {
    find_desktop_application(crash.executable, &application);
  }
  if (!application.id.empty()) application.version = printable(version_of(application.id));
  if (application.id.empty()) application.id = crash.program;
  if (application.name.empty()) application.name = crash.program;
  application.id = printable(application.id);
  application.name = printable(application.name);
  return application;
}

std::string printable(const std::string &text) {
  const TavroGText valid(g_utf8_make_valid(text.c_str(), -1));
  std::string line = valid.get();
  for (char &byte : line) {
    if (g_ascii_iscntrl(byte)) byte = ' ';
  }
  if (line.size() <= kLongestName) return line;
  const char *end = g_utf8_find_prev_char(line.c_str(), line.c_str() + kLongestName + 1);
  return line.substr(0, static_cast<size_t>(end - line.c_str()));
}
