// Installed applications, offered as targets of a report, and the time of the last crash report of each.
#include "tavro_dbmgr_internal.h"
#include "tavro_log.h"

namespace {

constexpr store_column<tavro_pkg_info> kAppColumns[] = {
    {"PKG_ID", &tavro_pkg_info::pkg_id, nullptr},
    {"APP_ID", &tavro_pkg_info::app_id, nullptr},
    {"APP_NAME", &tavro_pkg_info::pkg_name, nullptr},
    {"APP_ICON", &tavro_pkg_info::pkg_icon, nullptr},
    {"APP_DOWNLOADED", nullptr, &tavro_pkg_info::is_downloaded},
};

GSList *_get_app_list(int is_downloaded) {
  const store_session store;
  if (!store) return nullptr;
  statement_text sql;
  sa_strcat(sql, "SELECT * FROM APP_DATA WHERE APP_DOWNLOADED = ", is_downloaded, ";");
  const TavroStmt statement = store_prepare(store.db(), sql.c_str());
  if (!statement) return nullptr;
  const store_row_reader<tavro_pkg_info> reader(statement.get(), kAppColumns);
  GSList *apps = nullptr;
  while (store_next_row(statement.get())) {
    auto *app = TAVRO_ZALLOC(tavro_pkg_info);
    reader.read(app);
    apps = g_slist_prepend(apps, app);
  }
  return g_slist_reverse(apps);
}

}  // namespace

void tavro_dbmgr_update_app_list(const tavro_pkg_info *app) {
  if (!app) {
    TAVRO_LOGD("NO app data");
    return;
  }
  statement_text sql;
  sa_strcat(sql, "INSERT INTO APP_DATA(PKG_ID, APP_ID, APP_NAME, APP_ICON, APP_DOWNLOADED) VALUES(");
  sa_strcat_values(sql, {app->pkg_id, app->app_id, app->pkg_name, app->pkg_icon,
                         std::to_string(app->is_downloaded).c_str()});
  store_run(sa_strcat(sql, ");"));
}

void tavro_dbmgr_delete_uninstalled_app(const char *pkg_id) {
  if (!pkg_id) {
    TAVRO_LOGD("pkg id NULL");
    return;
  }
  statement_text sql;
  store_run(sa_strcat(sql, "DELETE FROM APP_DATA WHERE PKG_ID = ", quoted(pkg_id), ";"));
}

GSList *tavro_dbmgr_get_downloaded_app_list() {
  return _get_app_list(1);
}

GSList *tavro_dbmgr_get_native_app_list() {
  return _get_app_list(0);
}

void tavro_dbmgr_update_app_crash(const char *app_id) {
  if (!app_id) {
    TAVRO_LOGD("Crashed APP ID NULL");
    return;
  }
  statement_text sql;
  sa_strcat(sql, "INSERT INTO APP_CRASH(APP_ID, APP_CRASH_REPORTED_TIME) VALUES(");
  sa_strcat_values(sql, {app_id, store_now().c_str()});
  store_run(sa_strcat(sql, ");"));
}

void tavro_dbmgr_set_app_crash_time(const char *app_id) {
  if (!app_id) {
    TAVRO_LOGD("Crashed APP ID NULL");
    return;
  }
  statement_text sql;
  store_run(sa_strcat(sql, "UPDATE APP_CRASH SET APP_CRASH_REPORTED_TIME='", store_now().c_str(),
                      "' WHERE APP_ID=", quoted(app_id), ";"));
}
