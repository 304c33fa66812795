#include "app_preference.h"

#include <gio/gio.h>

#include <functional>
#include <map>
#include <string>
#include <vector>

#include "bus.h"
#include "database.h"

namespace {

using namespace platform;

constexpr const char *kPath = "/org/tavro/Preference";
constexpr const char *kInterface = "org.tavro.Preference1";
constexpr const char *kChangedSignal = "Changed";

bool is_text(const char *text) {
  return text && g_utf8_validate(text, -1, nullptr);
}
bool is_key(const char *key) {
  return is_text(key) && *key;
}

void announce(const char *key) {
  GDBusConnection *bus = phone_bus();
  if (!bus) return;
  g_dbus_connection_emit_signal(bus, nullptr, kPath, kInterface, kChangedSignal, g_variant_new("(s)", key),
                                nullptr);
}

template <typename BindValue>
int set_value(const char *key, preference_type_e type, BindValue bind_value) {
  if (!is_key(key)) return PREFERENCE_ERROR_INVALID_PARAMETER;
  const int code = preference_database().run(
      "INSERT INTO preference(key, type, value) VALUES(?1, ?2, ?3) "
      "ON CONFLICT(key) DO UPDATE SET type = excluded.type, value = excluded.value",
      [&](sqlite3_stmt *statement) {
        bind_text(statement, 1, key);
        sqlite3_bind_int(statement, 2, type);
        bind_value(statement);
      });
  if (code != SQLITE_DONE) return PREFERENCE_ERROR_IO_ERROR;
  announce(key);
  return PREFERENCE_ERROR_NONE;
}

// `read` takes the row; its columns are type and value.
int read_row(const char *key, const std::function<int(sqlite3_stmt *)> &read) {
  if (!is_key(key)) return PREFERENCE_ERROR_INVALID_PARAMETER;
  int result = PREFERENCE_ERROR_NO_KEY;
  const int code = preference_database().run(
      "SELECT type, value FROM preference WHERE key = ?1",
      [key](sqlite3_stmt *statement) { bind_text(statement, 1, key); },
      [&](sqlite3_stmt *statement) {
        result = read(statement);
        return false;
      });
  return code == SQLITE_DONE || code == SQLITE_ROW ? result : PREFERENCE_ERROR_IO_ERROR;
}

template <typename Take>
int get_value(const char *key, preference_type_e type, Take take) {
  return read_row(key, [&](sqlite3_stmt *statement) -> int {
    if (sqlite3_column_int(statement, 0) != type) return PREFERENCE_ERROR_INVALID_PARAMETER;
    return take(statement);
  });
}

struct Listener {
  guint subscription;
  preference_changed_cb callback;
  void *user_data;
};

std::map<std::string, Listener> &listeners() {
  static std::map<std::string, Listener> &all = *new std::map<std::string, Listener>;
  return all;
}

void changed_cb(GDBusConnection *, const char *, const char *, const char *, const char *,
                GVariant *arguments, gpointer) {
  const char *key = nullptr;
  if (!g_variant_is_of_type(arguments, G_VARIANT_TYPE("(s)"))) return;
  g_variant_get(arguments, "(&s)", &key);
  const auto known = listeners().find(key);
  if (known == listeners().end()) return;
  // The callback may unset itself.
  const Listener listener = known->second;
  listener.callback(key, listener.user_data);
}

}  // namespace

int preference_set_int(const char *key, int value) {
  return set_value(key, PREFERENCE_TYPE_INT,
                   [value](sqlite3_stmt *statement) { sqlite3_bind_int(statement, 3, value); });
}

int preference_get_int(const char *key, int *value) {
  if (!value) return PREFERENCE_ERROR_INVALID_PARAMETER;
  return get_value(key, PREFERENCE_TYPE_INT, [value](sqlite3_stmt *statement) {
    *value = sqlite3_column_int(statement, 1);
    return PREFERENCE_ERROR_NONE;
  });
}

int preference_set_double(const char *key, double value) {
  return set_value(key, PREFERENCE_TYPE_DOUBLE,
                   [value](sqlite3_stmt *statement) { sqlite3_bind_double(statement, 3, value); });
}

int preference_get_double(const char *key, double *value) {
  if (!value) return PREFERENCE_ERROR_INVALID_PARAMETER;
  return get_value(key, PREFERENCE_TYPE_DOUBLE, [value](sqlite3_stmt *statement) {
    *value = sqlite3_column_double(statement, 1);
    return PREFERENCE_ERROR_NONE;
  });
}

int preference_set_string(const char *key, const char *value) {
  if (!is_text(value)) return PREFERENCE_ERROR_INVALID_PARAMETER;
  return set_value(key, PREFERENCE_TYPE_STRING,
                   [value](sqlite3_stmt *statement) { bind_text(statement, 3, value); });
}

int preference_get_string(const char *key, char **value) {
  if (!value) return PREFERENCE_ERROR_INVALID_PARAMETER;
  return get_value(key, PREFERENCE_TYPE_STRING, [value](sqlite3_stmt *statement) -> int {
    char *copy = duplicate(column_text(statement, 1));
    if (!copy) return PREFERENCE_ERROR_OUT_OF_MEMORY;
    *value = copy;
    return PREFERENCE_ERROR_NONE;
  });
}

int preference_set_boolean(const char *key, bool value) {
  return set_value(key, PREFERENCE_TYPE_BOOLEAN,
                   [value](sqlite3_stmt *statement) { sqlite3_bind_int(statement, 3, value); });
}

int preference_get_boolean(const char *key, bool *value) {
  if (!value) return PREFERENCE_ERROR_INVALID_PARAMETER;
  return get_value(key, PREFERENCE_TYPE_BOOLEAN, [value](sqlite3_stmt *statement) {
    *value = sqlite3_column_int(statement, 1) != 0;
    return PREFERENCE_ERROR_NONE;
  });
}

int preference_is_existing(const char *key, bool *existing) {
  if (!existing) return PREFERENCE_ERROR_INVALID_PARAMETER;
  const int result = read_row(key, [](sqlite3_stmt *) { return PREFERENCE_ERROR_NONE; });
  if (result != PREFERENCE_ERROR_NONE && result != PREFERENCE_ERROR_NO_KEY) return result;
  *existing = result == PREFERENCE_ERROR_NONE;
  return PREFERENCE_ERROR_NONE;
}

int preference_get_type(const char *key, preference_type_e *type) {
  if (!type) return PREFERENCE_ERROR_INVALID_PARAMETER;
  return read_row(key, [type](sqlite3_stmt *statement) {
    *type = static_cast<preference_type_e>(sqlite3_column_int(statement, 0));
    return PREFERENCE_ERROR_NONE;
  });
}

int preference_remove(const char *key) {
  if (!is_key(key)) return PREFERENCE_ERROR_INVALID_PARAMETER;
  bool was_there = false;
  const int code = preference_database().run(
      "DELETE FROM preference WHERE key = ?1 RETURNING 1",
      [key](sqlite3_stmt *statement) { bind_text(statement, 1, key); },
      [&was_there](sqlite3_stmt *) { return was_there = true; });
  if (code != SQLITE_DONE) return PREFERENCE_ERROR_IO_ERROR;
  if (!was_there) return PREFERENCE_ERROR_NO_KEY;
  announce(key);
  return PREFERENCE_ERROR_NONE;
}

int preference_foreach_item(preference_item_cb callback, void *user_data) {
  if (!callback) return PREFERENCE_ERROR_INVALID_PARAMETER;
  std::vector<std::string> keys;
  const int code = preference_database().run("SELECT key FROM preference ORDER BY key", nullptr,
                                             [&keys](sqlite3_stmt *statement) {
                                               keys.emplace_back(column_text(statement, 0));
                                               return true;
                                             });
  if (code != SQLITE_DONE) return PREFERENCE_ERROR_IO_ERROR;
  for (const std::string &key : keys) {
    if (!callback(key.c_str(), user_data)) break;
  }
  return PREFERENCE_ERROR_NONE;
}

int preference_set_changed_cb(const char *key, preference_changed_cb callback, void *user_data) {
  if (!is_key(key) || !callback) return PREFERENCE_ERROR_INVALID_PARAMETER;
  if (!phone_bus()) return PREFERENCE_ERROR_IO_ERROR;
  preference_unset_changed_cb(key);
  const guint subscription =
      g_dbus_connection_signal_subscribe(phone_bus(), nullptr, kInterface, kChangedSignal, kPath, key,
                                         G_DBUS_SIGNAL_FLAGS_NONE, changed_cb, nullptr, nullptr);
  listeners()[key] = {subscription, callback, user_data};
  return PREFERENCE_ERROR_NONE;
}

int preference_unset_changed_cb(const char *key) {
  if (!is_key(key)) return PREFERENCE_ERROR_INVALID_PARAMETER;
  const auto known = listeners().find(key);
  if (known == listeners().end()) return PREFERENCE_ERROR_NO_KEY;
  g_dbus_connection_signal_unsubscribe(phone_bus(), known->second.subscription);
  listeners().erase(known);
  return PREFERENCE_ERROR_NONE;
}
