#include "badge.h"

#include <gio/gio.h>

#include <string>

#include "bus.h"
#include "database.h"

namespace {

using namespace platform;

constexpr const char *kLauncherPath = "/org/tavro/Badge";
constexpr const char *kLauncherInterface = "com.canonical.Unity.LauncherEntry";
constexpr unsigned int kLargestCount = 0x7fffffff;

bool is_app_id(const char *app_id) {
  return app_id && *app_id && g_utf8_validate(app_id, -1, nullptr);
}

// Launchers listen for the signal; nobody answers, and where there is no launcher nobody hears it.
void tell_launcher(const char *app_id, unsigned int count) {
  with_host_bus(HostBus::kSession, [entry = std::string(app_id), count](GDBusConnection *bus) {
    if (!bus) return;
    GVariantBuilder properties;
    g_variant_builder_init(&properties, G_VARIANT_TYPE_VARDICT);
    g_variant_builder_add(&properties, "{sv}", "count", g_variant_new_int64(count));
    g_variant_builder_add(&properties, "{sv}", "count-visible", g_variant_new_boolean(count > 0));
    const std::string uri = "application://" + entry + ".desktop";
    g_dbus_connection_emit_signal(bus, nullptr, kLauncherPath, kLauncherInterface, "Update",
                                  g_variant_new("(sa{sv})", uri.c_str(), &properties), nullptr);
  });
}

// Runs a statement that returns one row when it met the badge.
int change(const char *app_id, const char *sql, unsigned int count, int when_none) {
  if (!is_app_id(app_id) || count > kLargestCount) return BADGE_ERROR_INVALID_PARAMETER;
  bool is_met = false;
  const int code = preference_database().run(
      sql,
      [app_id, count](sqlite3_stmt *statement) {
        bind_text(statement, 1, app_id);
        sqlite3_bind_int64(statement, 2, count);
      },
      [&is_met](sqlite3_stmt *) { return is_met = true; });
  if (code != SQLITE_DONE) return BADGE_ERROR_IO_ERROR;
  if (!is_met) return when_none;
  tell_launcher(app_id, count);
  return BADGE_ERROR_NONE;
}

}  // namespace

int badge_add(const char *app_id) {
  return change(app_id, "INSERT INTO badge(app_id, count) VALUES(?1, ?2) ON CONFLICT DO NOTHING RETURNING 1",
                0, BADGE_ERROR_ALREADY_EXIST);
}

int badge_remove(const char *app_id) {
  return change(app_id, "DELETE FROM badge WHERE app_id = ?1 AND ?2 = 0 RETURNING 1", 0,
                BADGE_ERROR_NOT_EXIST);
}

int badge_set_count(const char *app_id, unsigned int count) {
  return change(app_id, "UPDATE badge SET count = ?2 WHERE app_id = ?1 RETURNING 1", count,
                BADGE_ERROR_NOT_EXIST);
}

int badge_get_count(const char *app_id, unsigned int *count) {
  if (!is_app_id(app_id) || !count) return BADGE_ERROR_INVALID_PARAMETER;
  int result = BADGE_ERROR_NOT_EXIST;
  const int code = preference_database().run(
      "SELECT count FROM badge WHERE app_id = ?1",
      [app_id](sqlite3_stmt *statement) { bind_text(statement, 1, app_id); },
      [&](sqlite3_stmt *statement) {
        *count = static_cast<unsigned int>(sqlite3_column_int64(statement, 0));
        result = BADGE_ERROR_NONE;
        return true;
      });
  return code == SQLITE_DONE ? result : BADGE_ERROR_IO_ERROR;
}
