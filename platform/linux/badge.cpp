#include "badge.h"

#include <gio/gio.h>

#include "badge_link.h"
#include "bus.h"
#include "database.h"

namespace {

using namespace platform;

constexpr unsigned int kLargestCount = 0x7fffffff;

bool is_app_id(const char *app_id) {
  return app_id && *app_id && g_utf8_validate(app_id, -1, nullptr);
}

// Launchers forget what a program told them when it ends, so the desktop link speaks for all.
void tell_desktop_link(const char *app_id) {
  if (GDBusConnection *bus = phone_bus()) {
    g_dbus_connection_emit_signal(bus, nullptr, kBadgePath, kBadgeInterface, kBadgeChanged,
                                  g_variant_new("(s)", app_id), nullptr);
  }
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
  tell_desktop_link(app_id);
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
