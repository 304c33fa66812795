#include "tavro_theme.h"

#include <Elementary.h>
#include <app.h>

#include <cstring>
#include <string>

#include "tavro_log.h"
#include "tavro_memory.h"
#include "tavro_preferences.h"

namespace {

struct dark_colour {
  const char *colour_class;
  int red, green, blue;
};

// The light values stand in the layout file; these replace them.
constexpr dark_colour kDarkPalette[] = {
    {"tavro/background", 0x12, 0x16, 0x1C}, {"tavro/surface", 0x1C, 0x22, 0x2B},
    {"tavro/text", 0xEE, 0xF2, 0xF7},       {"tavro/secondary", 0xA7, 0xB2, 0xC0},
    {"tavro/primary", 0x24, 0x56, 0xC7},    {"tavro/on-primary", 0xFF, 0xFF, 0xFF},
    {"tavro/divider", 0x2C, 0x34, 0x40},    {"tavro/positive", 0x57, 0xC7, 0x8A},
    {"tavro/danger", 0xFF, 0x8A, 0x80},     {"tavro/accent", 0x8F, 0xB0, 0xFF},
    {"tavro/tint", 0x22, 0x30, 0x52},
};

bool _is_dark = false;

void _use_dark_palette() {
  _is_dark = true;
  for (const dark_colour &colour : kDarkPalette)
    edje_color_class_set(colour.colour_class, colour.red, colour.green, colour.blue, 255, 0, 0, 0, 0, 0, 0, 0,
                         0);
}

std::string _layout_path() {
  const TavroText folder(TAVRO_ADOPT(app_get_resource_path()));
  return std::string(folder ? folder.get() : "") + "edje/tavro.edj";
}

}  // namespace

const char *tavro_theme_file() {
  static const std::string path = _layout_path();
  return path.c_str();
}

bool tavro_theme_load() {
  static bool is_loaded = false;
  if (is_loaded) return true;
  if (!edje_file_group_exists(tavro_theme_file(), "tavro/page")) {
    TAVRO_LOGE("layouts cannot be read from %s; the toolkit's default look is used", tavro_theme_file());
    return false;
  }
  elm_theme_overlay_add(nullptr, tavro_theme_file());
  elm_config_first_item_focus_on_first_focusin_set(EINA_TRUE);  // or a list would take a key to begin at
  const TavroText theme = tavro_preference_text(TAVRO_PREF_THEME);
  if (theme && std::strcmp(theme.get(), "dark") == 0) _use_dark_palette();
  is_loaded = true;
  return true;
}

const char *tavro_theme_danger_colour() {
  return _is_dark ? "#FF8A80" : "#C62828";
}
