#include "app_manager.h"

#include <algorithm>
#include <memory>
#include <string>
#include <utility>
#include <vector>

#include "bus.h"
#include "desktop_entry.h"

struct app_info_s {
  std::string id, label;
  platform::ScopedObject<GIcon> icon;  // null: none
  bool is_hidden = false;
};

namespace {

using namespace platform;

constexpr const char *kSuffix = ".desktop";
// Large first: lists show icons at 48 to 96 pixels, and shrinking looks better than stretching. Scalable
// icons are left out: Debian's toolkit reads no SVG.
constexpr const char *kIconFolders[] = {"icons/hicolor/128x128/apps",
                                        "icons/hicolor/256x256/apps",
                                        "icons/hicolor/96x96/apps",
                                        "icons/hicolor/64x64/apps",
                                        "icons/hicolor/48x48/apps",
                                        "icons/hicolor/32x32/apps",
                                        "pixmaps"};
constexpr const char *kIconEndings[] = {".png", ".xpm", ""};

bool is_usable(const std::string &path) {
  return !g_str_has_suffix(path.c_str(), ".svg") && g_file_test(path.c_str(), G_FILE_TEST_IS_REGULAR) &&
         access(path.c_str(), R_OK) == 0;
}

std::vector<std::string> data_folders() {
  std::vector<std::string> folders = {g_get_user_data_dir()};
  for (const char *const *folder = g_get_system_data_dirs(); *folder; ++folder) folders.push_back(*folder);
  return folders;
}

std::string find_themed_icon(const std::string &name) {
  // Names come from other people's files and must stay names.
  if (name.empty() || name.find('/') != std::string::npos) return "";
  for (const std::string &data : data_folders()) {
    for (const char *folder : kIconFolders) {
      for (const char *ending : kIconEndings) {
        const std::string path = data + "/" + folder + "/" + name + ending;
        if (is_usable(path)) return path;
      }
    }
  }
  return "";
}

std::string icon_path(GIcon *icon) {
  if (G_IS_FILE_ICON(icon)) {
    const ScopedGText path(g_file_get_path(g_file_icon_get_file(G_FILE_ICON(icon))));
    return path && is_usable(path.get()) ? path.get() : "";
  }
  if (!G_IS_THEMED_ICON(icon)) return "";
  for (const char *const *name = g_themed_icon_get_names(G_THEMED_ICON(icon)); *name; ++name) {
    const std::string path = find_themed_icon(*name);
    if (!path.empty()) return path;
  }
  return "";
}

std::unique_ptr<app_info_s> describe(GAppInfo *entry) {
  const char *entry_id = g_app_info_get_id(entry);
  auto info = std::make_unique<app_info_s>();
  info->id = entry_id ? entry_id : "";
  if (g_str_has_suffix(info->id.c_str(), kSuffix)) info->id.resize(info->id.size() - strlen(kSuffix));
  info->label = g_app_info_get_display_name(entry);
  GIcon *icon = g_app_info_get_icon(entry);
  if (icon) info->icon.reset(G_ICON(g_object_ref(icon)));
  info->is_hidden = !g_app_info_should_show(entry);
  return info;
}

std::vector<std::unique_ptr<app_info_s>> shown_applications() {
  std::vector<std::unique_ptr<app_info_s>> applications;
  GList *entries = g_app_info_get_all();
  for (GList *entry = entries; entry; entry = entry->next) {
    auto info = describe(G_APP_INFO(entry->data));
    if (!info->is_hidden && !info->id.empty()) applications.push_back(std::move(info));
  }
  g_list_free_full(entries, g_object_unref);
  std::sort(applications.begin(), applications.end(), [](const auto &left, const auto &right) {
    return g_utf8_collate(left->label.c_str(), right->label.c_str()) < 0;
  });
  return applications;
}

int give_text(const std::string &text, char **copy) {
  if (!copy) return APP_MANAGER_ERROR_INVALID_PARAMETER;
  *copy = duplicate(text.c_str());
  return *copy ? APP_MANAGER_ERROR_NONE : APP_MANAGER_ERROR_OUT_OF_MEMORY;
}

}  // namespace

int app_manager_foreach_app_info(app_manager_app_info_cb callback, void *user_data) {
  if (!callback) return APP_MANAGER_ERROR_INVALID_PARAMETER;
  for (const auto &info : shown_applications()) {
    if (!callback(info.get(), user_data)) break;
  }
  return APP_MANAGER_ERROR_NONE;
}

int app_manager_get_app_info(const char *app_id, app_info_h *app_info) {
  if (!app_id || !app_info) return APP_MANAGER_ERROR_INVALID_PARAMETER;
  const auto entry = find_desktop_entry(app_id);
  if (!entry) return APP_MANAGER_ERROR_NO_SUCH_APP;
  auto info = describe(G_APP_INFO(entry.get()));
  info->id = app_id;
  *app_info = info.release();
  return APP_MANAGER_ERROR_NONE;
}

int app_manager_is_running(const char *app_id, bool *running) {
  if (!app_id || !running || !g_dbus_is_name(app_id)) return APP_MANAGER_ERROR_INVALID_PARAMETER;
  ErrorSlot error;
  const ScopedVariant reply = call_bus_daemon("NameHasOwner", g_variant_new("(s)", app_id), "(b)", &error);
  if (!reply) return APP_MANAGER_ERROR_IO_ERROR;
  gboolean has_owner = FALSE;
  g_variant_get(reply.get(), "(b)", &has_owner);
  *running = has_owner;
  return APP_MANAGER_ERROR_NONE;
}

int app_info_destroy(app_info_h app_info) {
  if (!app_info) return APP_MANAGER_ERROR_INVALID_PARAMETER;
  delete app_info;
  return APP_MANAGER_ERROR_NONE;
}

int app_info_get_app_id(app_info_h app_info, char **app_id) {
  return app_info ? give_text(app_info->id, app_id) : APP_MANAGER_ERROR_INVALID_PARAMETER;
}

int app_info_get_package(app_info_h app_info, char **package) {
  return app_info ? give_text(app_info->id, package) : APP_MANAGER_ERROR_INVALID_PARAMETER;
}

int app_info_get_label(app_info_h app_info, char **label) {
  return app_info ? give_text(app_info->label, label) : APP_MANAGER_ERROR_INVALID_PARAMETER;
}

int app_info_get_icon(app_info_h app_info, char **path) {
  if (!app_info || !path) return APP_MANAGER_ERROR_INVALID_PARAMETER;
  const std::string found = app_info->icon ? icon_path(app_info->icon.get()) : "";
  if (!found.empty()) return give_text(found, path);
  *path = nullptr;
  return APP_MANAGER_ERROR_NONE;
}

int app_info_is_nodisplay(app_info_h app_info, bool *nodisplay) {
  if (!app_info || !nodisplay) return APP_MANAGER_ERROR_INVALID_PARAMETER;
  *nodisplay = app_info->is_hidden;
  return APP_MANAGER_ERROR_NONE;
}
