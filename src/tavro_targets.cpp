#include "tavro_targets.h"

#include <cstring>

#include "tavro-common.h"
#include "tavro_handles.h"

const tavro_target_category kTargetCategories[] = {
    {"IDS_OB_MBODY_BATTERY", "IDS_OB_MBODY_BATTERY", "battery"},
    {"Hardware", "IDS_OB_BODY_HARDWARE", "chip"},
    {"IDS_OB_MBODY_NETWORK", "IDS_OB_MBODY_NETWORK", "network"},
    {"IDS_OB_SOFTWARE_UPDATE", "IDS_OB_SOFTWARE_UPDATE", "update"},
    {kPerformanceCategory, "IDS_OB_BODY_PERFORMANCE", "gauge"},
    {"IDS_OB_BODY_SOMETHING_ELSE", "IDS_OB_BODY_SOMETHING_ELSE", "chat"},
};
const size_t kTargetCategoryCount = sizeof kTargetCategories / sizeof *kTargetCategories;

const tavro_target_category kPerformanceTargets[] = {
    {"Performance - slow", "IDS_OB_BODY_PERFORMANCE_SLOW", "gauge"},
    {"Performance - start", "IDS_OB_BODY_PERFORMANCE_START", "app"},
    {"Performance - freeze", "IDS_OB_BODY_PERFORMANCE_FREEZE", "bug"},
    {"Performance - heat", "IDS_OB_BODY_PERFORMANCE_HEAT", "heat"},
    {"Performance - memory", "IDS_OB_BODY_PERFORMANCE_MEMORY", "chip"},
    {kPerformanceCategory, "IDS_OB_BODY_PERFORMANCE_OTHER", "chat"},
};
const size_t kPerformanceTargetCount = sizeof kPerformanceTargets / sizeof *kPerformanceTargets;

namespace {

// "Performance" itself is found as the category, not as the last entry of its page.
const tavro_target_category *_category_of(const char *name) {
  if (!name) return nullptr;
  for (const tavro_target_category &category : kTargetCategories)
    if (std::strcmp(category.name, name) == 0) return &category;
  for (const tavro_target_category &category : kPerformanceTargets)
    if (std::strcmp(category.name, name) == 0) return &category;
  return nullptr;
}

}  // namespace

const char *tavro_target_tile(const char *name, bool is_idea) {
  if (is_idea) return "bulb";
  const tavro_target_category *category = _category_of(name);
  return category ? category->tile : "app";
}

const char *tavro_target_text(const char *name) {
  const tavro_target_category *category = _category_of(name);
  return category ? tavro_text(category->text) : name;
}

std::string tavro_search_key(const char *text) {
  if (!text || !g_utf8_validate(text, -1, nullptr)) return "";
  const TavroGText folded(g_utf8_casefold(text, -1));
  const TavroGText parts(g_utf8_normalize(folded.get(), -1, G_NORMALIZE_ALL));  // letters apart from accents
  std::string key;
  for (const char *at = parts.get(), *next; *at; at = next) {
    next = g_utf8_next_char(at);
    if (!g_unichar_ismark(g_utf8_get_char(at))) key.append(at, next);
  }
  const size_t first = key.find_first_not_of(" \t\n");
  return first == std::string::npos ? "" : key.substr(first, key.find_last_not_of(" \t\n") - first + 1);
}
