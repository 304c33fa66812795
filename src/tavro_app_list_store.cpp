// Brings the store's table of applications into step with what is installed.
#include <Ecore.h>

#include <algorithm>
#include <deque>

#include "tavro_app_list.h"
#include "tavro_dbmgr.h"
#include "tavro_memory.h"

namespace {

constexpr double kFirstReadSeconds = 5.0;    // after the start, which has better things to do
constexpr double kBeginSeconds = 1.0;        // until the page that asked is long painted
constexpr double kBetweenOperations = 0.05;  // seconds; each operation is a commit

// What is left to be done, and the timer that does it, null when nothing is.
std::vector<tavro_application> _installed;
std::deque<std::string> _gone;
std::deque<tavro_application> _added;
Ecore_Timer *_timer = nullptr;

void _append_stored(GSList *stored, std::vector<tavro_application> &applications) {
  const auto text = [](const char *value) { return std::string(value ? value : ""); };
  for (GSList *link = stored; link; link = link->next) {
    auto *app = static_cast<tavro_pkg_info *>(link->data);
    applications.push_back({text(app->app_id), text(app->pkg_id), text(app->pkg_name), text(app->pkg_icon),
                            app->is_downloaded == 1});
    tavro_db_free_app_info(app);
  }
  g_slist_free(stored);
}

void _insert(const tavro_application &application) {
  std::string package = application.package, id = application.id, name = application.name,
              icon = application.icon;
  const tavro_pkg_info record{application.is_downloaded ? 1 : 0, package.data(), id.data(), name.data(),
                              icon.data()};
  tavro_dbmgr_update_app_list(&record);
}

Eina_Bool _work_off_one_cb(void *) {
  if (!_gone.empty()) {
    tavro_dbmgr_delete_uninstalled_app(_gone.front().c_str());
    _gone.pop_front();
  } else if (!_added.empty()) {
    _insert(_added.front());
    _added.pop_front();
  }
  if (!_gone.empty() || !_added.empty()) return ECORE_CALLBACK_RENEW;
  _timer = nullptr;
  return ECORE_CALLBACK_CANCEL;
}

Eina_Bool _begin_cb(void *) {
  std::vector<tavro_application> stored;
  _append_stored(tavro_dbmgr_get_downloaded_app_list(), stored);
  _append_stored(tavro_dbmgr_get_native_app_list(), stored);
  tavro_app_list_changes changes = tavro_app_list_compare(stored, _installed);
  _gone.assign(changes.gone_packages.begin(), changes.gone_packages.end());
  _added.assign(changes.added.begin(), changes.added.end());
  _timer = ecore_timer_add(kBetweenOperations, _work_off_one_cb, nullptr);
  return ECORE_CALLBACK_CANCEL;
}

Eina_Bool _read_for_store_cb(void *) {
  tavro_app_list_read_later(
      [](void *, std::vector<tavro_application> applications) {
        tavro_app_list_store(std::move(applications));
      },
      nullptr);
  return ECORE_CALLBACK_CANCEL;
}

bool _is_same(const tavro_application &left, const tavro_application &right) {
  return left.id == right.id && left.package == right.package && left.name == right.name &&
         left.icon == right.icon && left.is_downloaded == right.is_downloaded;
}

bool _has(const std::vector<tavro_application> &list, const tavro_application &application) {
  return std::any_of(list.begin(), list.end(),
                     [&application](const auto &other) { return _is_same(other, application); });
}

}  // namespace

tavro_app_list_changes tavro_app_list_compare(const std::vector<tavro_application> &stored,
                                              const std::vector<tavro_application> &installed) {
  tavro_app_list_changes changes;
  for (const tavro_application &application : stored)
    if (!_has(installed, application)) changes.gone_packages.push_back(application.package);
  for (const tavro_application &application : installed) {
    const auto &gone = changes.gone_packages;
    // The table loses whole packages, so what shares a package with something gone is added anew.
    if (!_has(stored, application) || std::find(gone.begin(), gone.end(), application.package) != gone.end())
      changes.added.push_back(application);
  }
  return changes;
}

void tavro_app_list_store(std::vector<tavro_application> installed) {
  if (_timer) ecore_timer_del(_timer);
  _gone.clear();
  _added.clear();
  _installed = std::move(installed);
  _timer = ecore_timer_add(kBeginSeconds, _begin_cb, nullptr);
}

void tavro_app_list_store_soon() {
  ecore_timer_add(kFirstReadSeconds, _read_for_store_cb, nullptr);
}
