// What a report can be about: the fixed categories and how a target is shown. Plain values, any thread.
#pragma once

#include <cstddef>

// `name` is stored in VOC_APP_NAME, as a string id or a plain word; never change one.
struct tavro_target_category {
  const char *name;
  const char *tile;  // picture of the target, see tavro_tile_add
};

extern const tavro_target_category kTargetCategories[];
extern const size_t kTargetCategoryCount;

// The tile for a stored target; "app" for an application, "bulb" for any idea.
const char *tavro_target_tile(const char *name, bool is_idea);
