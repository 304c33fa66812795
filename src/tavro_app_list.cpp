#include "tavro_app_list.h"

#include <Ecore.h>
#include <app_manager.h>
#include <package_manager.h>

#include <algorithm>
#include <clocale>
#include <cstring>
#include <memory>

#include "tavro_handles.h"
#include "tavro_memory.h"
#include "tavro_targets.h"

struct tavro_app_list_reading {
  tavro_app_list_read_cb read;  // null: given up
  void *data;
  std::vector<tavro_application> applications;  // the worker's until it has ended
};

namespace {

using Package = TavroHandle<std::remove_pointer_t<package_info_h>, package_info_destroy>;

std::string _text_of(int (*get)(app_info_h, char **), app_info_h app) {
  char *text = nullptr;
  get(app, &text);
  const TavroText owned(TAVRO_ADOPT(text));
  return text ? text : "";
}

bool _is_downloaded(const std::string &package) {
  Package info;
  bool is_preload = true;
  if (package_manager_get_package_info(package.c_str(), tavro_out(info)) == PACKAGE_MANAGER_ERROR_NONE)
    package_info_is_preload_package(info.get(), &is_preload);
  return !is_preload;
}

bool _note_application(app_info_h app, void *data) {
  tavro_application found{_text_of(app_info_get_app_id, app), _text_of(app_info_get_package, app),
                          _text_of(app_info_get_label, app), _text_of(app_info_get_icon, app), false};
  if (found.id.empty() || found.name.empty()) return true;
  found.is_downloaded = _is_downloaded(found.package);
  static_cast<std::vector<tavro_application> *>(data)->push_back(std::move(found));
  return true;
}

bool _has_language() {
  const char *collation = std::setlocale(LC_COLLATE, nullptr);
  return collation && collation[0] != 'C' && std::strcmp(collation, "POSIX") != 0;
}

std::string _order_of(const std::string &name) {
  // Without a language the order would be that of the code points, capitals first and accents last.
  if (!_has_language()) return tavro_search_key(name.c_str());
  const TavroGText folded(g_utf8_casefold(name.c_str(), -1));
  const TavroGText key(g_utf8_collate_key(folded.get(), -1));
  return key.get();
}

void _read_work(void *data, Ecore_Thread *) {
  static_cast<tavro_app_list_reading *>(data)->applications = tavro_app_list_read();
}

void _read_ended_cb(void *data, Ecore_Thread *) {
  const std::unique_ptr<tavro_app_list_reading> reading(static_cast<tavro_app_list_reading *>(data));
  if (!reading->read) return;
  tavro_app_list_sort(reading->applications);
  reading->read(reading->data, std::move(reading->applications));
}

}  // namespace

std::vector<tavro_application> tavro_app_list_read() {
  std::vector<tavro_application> applications;
  app_manager_foreach_app_info(_note_application, &applications);
  return applications;
}

void tavro_app_list_sort(std::vector<tavro_application> &applications) {
  std::vector<std::pair<std::string, tavro_application>> ordered;
  for (tavro_application &application : applications)
    ordered.emplace_back(_order_of(application.name), std::move(application));
  std::stable_sort(ordered.begin(), ordered.end(),
                   [](const auto &left, const auto &right) { return left.first < right.first; });
  applications.clear();
  for (auto &entry : ordered) applications.push_back(std::move(entry.second));
}

tavro_app_list_reading *tavro_app_list_read_later(tavro_app_list_read_cb read, void *data) {
  auto *reading = new tavro_app_list_reading{read, data, {}};
  ecore_thread_run(_read_work, _read_ended_cb, _read_ended_cb, reading);
  return reading;
}

void tavro_app_list_give_up(tavro_app_list_reading *reading) {
  if (reading) reading->read = nullptr;
}
