#include "tavro_targets.h"

#include <cstring>

const tavro_target_category kTargetCategories[] = {
    {"IDS_OB_MBODY_BATTERY", "battery"},  {"Hardware", "chip"},     {"IDS_OB_MBODY_NETWORK", "network"},
    {"IDS_OB_SOFTWARE_UPDATE", "update"}, {"Performance", "gauge"}, {"IDS_OB_BODY_SOMETHING_ELSE", "chat"},
};
const size_t kTargetCategoryCount = sizeof kTargetCategories / sizeof *kTargetCategories;

const char *tavro_target_tile(const char *name, bool is_idea) {
  if (is_idea) return "bulb";
  if (name)
    for (const tavro_target_category &category : kTargetCategories)
      if (std::strcmp(category.name, name) == 0) return category.tile;
  return "app";
}
