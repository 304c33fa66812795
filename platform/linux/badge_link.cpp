#include "badge_link.h"

#include <set>
#include <string>
#include <utility>
#include <vector>

#include "database.h"

namespace platform {
namespace {

constexpr guint kSettleMs = 50;
constexpr const char *kLauncherName = "com.canonical.Unity";  // whoever shows badges owns it
constexpr const char *kLauncherInterface = "com.canonical.Unity.LauncherEntry";

struct BadgeLink {
  GDBusConnection *desktop = nullptr;  // borrowed
  guint launcher_watch = 0;
  std::set<std::string> changed;
  guint source = 0;  // while changes settle
};
BadgeLink &badges = *new BadgeLink;

using Badges = std::vector<std::pair<std::string, gint64>>;

Badges all_badges() {
  Badges all;
  preference_database().run("SELECT app_id, count FROM badge", nullptr, [&all](sqlite3_stmt *statement) {
    all.emplace_back(column_text(statement, 0), sqlite3_column_int64(statement, 1));
    return true;
  });
  return all;
}

gint64 count_of(const std::string &app_id) {
  for (const auto &[known, count] : all_badges()) {
    if (known == app_id) return count;
  }
  return 0;
}

// Launchers listen for the signal; nobody answers, and where there is no launcher nobody hears it.
void tell_launcher(const std::string &app_id, gint64 count) {
  if (!badges.desktop) return;
  GVariantBuilder properties;
  g_variant_builder_init(&properties, G_VARIANT_TYPE_VARDICT);
  g_variant_builder_add(&properties, "{sv}", "count", g_variant_new_int64(count));
  g_variant_builder_add(&properties, "{sv}", "count-visible", g_variant_new_boolean(count > 0));
  const std::string uri = "application://" + app_id + ".desktop";
  g_dbus_connection_emit_signal(badges.desktop, nullptr, kBadgePath, kLauncherInterface, "Update",
                                g_variant_new("(sa{sv})", uri.c_str(), &properties), nullptr);
}

void tell_all_badges() {
  for (const auto &[app_id, count] : all_badges()) tell_launcher(app_id, count);
}

void launcher_appeared_cb(GDBusConnection *, const char *, const char *, gpointer) {
  tell_all_badges();
}

gboolean badges_settled_cb(gpointer) {
  badges.source = 0;
  for (const std::string &app_id : std::exchange(badges.changed, {})) {
    tell_launcher(app_id, count_of(app_id));
  }
  return G_SOURCE_REMOVE;
}

// A badge that is removed and set again must not flicker on the icon.
void badge_changed_cb(GDBusConnection *, const char *, const char *, const char *, const char *,
                      GVariant *arguments, gpointer) {
  const char *app_id;
  if (!g_variant_is_of_type(arguments, G_VARIANT_TYPE("(s)"))) return;
  g_variant_get(arguments, "(&s)", &app_id);
  badges.changed.insert(app_id);
  if (!badges.source) badges.source = g_timeout_add(kSettleMs, badges_settled_cb, nullptr);
}

}  // namespace

void listen_for_badges(GDBusConnection *phone) {
  g_dbus_connection_signal_subscribe(phone, nullptr, kBadgeInterface, kBadgeChanged, kBadgePath, nullptr,
                                     G_DBUS_SIGNAL_FLAGS_NONE, badge_changed_cb, nullptr, nullptr);
}

void show_badges_on(GDBusConnection *desktop) {
  if (badges.launcher_watch) g_bus_unwatch_name(std::exchange(badges.launcher_watch, 0));
  badges.desktop = desktop;
  if (!desktop) return;
  badges.launcher_watch = g_bus_watch_name_on_connection(
      desktop, kLauncherName, G_BUS_NAME_WATCHER_FLAGS_NONE, launcher_appeared_cb, nullptr, nullptr, nullptr);
  tell_all_badges();
}

}  // namespace platform
