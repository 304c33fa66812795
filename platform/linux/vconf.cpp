#include "vconf.h"

#include <app_preference.h>
#include <gio/gio.h>

#include <string>

#include "scoped.h"

namespace {

using namespace platform;

using ScopedSchema = std::unique_ptr<GSettingsSchema, FreeWith<g_settings_schema_unref>>;

constexpr const char *kDesktopSchema = "org.gnome.desktop.interface";
constexpr const char *kClockKey = "clock-format";

// The desktop's clock; 0 when the machine has no such desktop.
int clock_of_desktop() {
  GSettingsSchemaSource *source = g_settings_schema_source_get_default();
  if (!source) return 0;
  const ScopedSchema schema(g_settings_schema_source_lookup(source, kDesktopSchema, TRUE));
  if (!schema || !g_settings_schema_has_key(schema.get(), kClockKey)) return 0;
  const ScopedObject<GSettings> settings(g_settings_new(kDesktopSchema));
  const ScopedGText format(g_settings_get_string(settings.get(), kClockKey));
  return std::string(format.get()) == "12h" ? VCONFKEY_TIME_FORMAT_12 : VCONFKEY_TIME_FORMAT_24;
}

}  // namespace

int vconf_get_int(const char *key, int *value) {
  if (!key || !value) return -1;
  const int clock = std::string(key) == VCONFKEY_REGIONFORMAT_TIME1224 ? clock_of_desktop() : 0;
  if (clock != 0) {
    *value = clock;
    return 0;
  }
  return preference_get_int(key, value) == PREFERENCE_ERROR_NONE ? 0 : -1;
}
