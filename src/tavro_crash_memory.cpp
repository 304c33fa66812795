#include "tavro_crash_memory.h"

#include <app_preference.h>
#include <unistd.h>

#include "tavro_dbmgr.h"
#include "tavro_log.h"
#include "tavro_memory.h"
#include "tavro_preferences.h"

namespace {

std::string _read(const char *key) {
  const TavroText text = tavro_preference_text(key);
  return text ? text.get() : "";
}

void _write(const char *key, const std::string &text) {
  const int error = preference_set_string(key, text.c_str());
  if (error != PREFERENCE_ERROR_NONE) TAVRO_LOGE("%s cannot be stored: %d", key, error);
}

void _free_app(gpointer app) {
  tavro_db_free_app_info(static_cast<tavro_pkg_info *>(app));
}

}  // namespace

gint64 tavro_crash_now() {
  return g_get_real_time() / 1000;
}

int tavro_crash_note(const tavro_crash &crash) {
  const std::string before = _read(TAVRO_PREF_CRASH_TIMES);
  std::string times = before;
  const int count = tavro_crash_count(&times, crash, tavro_crash_now());
  if (times != before) _write(TAVRO_PREF_CRASH_TIMES, times);
  return count;
}

const char *tavro_crash_silence(const std::string &app_id) {
  if (tavro_crash_list_has(_read(TAVRO_PREF_CRASH_NEVER), app_id)) return "the person said never";
  const TavroText asked(tavro_dbmgr_get_app_crash_time_by_id(app_id.c_str()));
  return tavro_crash_was_asked_lately(asked.get(), tavro_crash_now()) ? "it was asked about today" : nullptr;
}

void tavro_crash_note_asked(const std::string &app_id) {
  const TavroText asked(tavro_dbmgr_get_app_crash_time_by_id(app_id.c_str()));
  if (asked)
    tavro_dbmgr_set_app_crash_time(app_id.c_str());
  else
    tavro_dbmgr_update_app_crash(app_id.c_str());
}

void tavro_crash_set_never(const std::string &app_id, bool is_never) {
  const std::string list = _read(TAVRO_PREF_CRASH_NEVER);
  _write(TAVRO_PREF_CRASH_NEVER,
         is_never ? tavro_crash_list_with(list, app_id) : tavro_crash_list_without(list, app_id));
}

void tavro_crash_look_up(const std::string &app_id, std::string *name, std::string *icon) {
  GSList *apps = g_slist_concat(tavro_dbmgr_get_downloaded_app_list(), tavro_dbmgr_get_native_app_list());
  for (const GSList *link = apps; link; link = link->next) {
    const auto *app = static_cast<const tavro_pkg_info *>(link->data);
    if (!app->app_id || app_id != app->app_id) continue;
    if (app->pkg_name && *app->pkg_name) *name = app->pkg_name;
    if (app->pkg_icon && access(app->pkg_icon, R_OK) == 0) *icon = app->pkg_icon;
  }
  g_slist_free_full(apps, _free_app);
}
