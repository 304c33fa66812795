// What a report can be about: the fixed categories, how a stored target is shown, and how targets are sought.
// Plain values; what gives a text back belongs to the main loop.
#pragma once

#include <cstddef>
#include <string>

// `name` is stored in VOC_APP_NAME, as a string id or a plain word; never change one.
struct tavro_target_category {
  const char *name;
  const char *text;  // string id of what is shown
  const char *tile;  // picture of the target, see tavro_tile_add
};

extern const tavro_target_category kTargetCategories[];
extern const size_t kTargetCategoryCount;

// What "Performance" is divided into. Every name contains that word: a report with such a target carries the
// log.
extern const tavro_target_category kPerformanceTargets[];
extern const size_t kPerformanceTargetCount;
constexpr char kPerformanceCategory[] = "Performance";

// The tile for a stored target; "app" for an application, "bulb" for any idea.
const char *tavro_target_tile(const char *name, bool is_idea);

// What is shown for a stored target: a category's translation, an application's own name. Null stays null.
const char *tavro_target_text(const char *name);

// A text as it is compared in a search: without case, accents and blanks around it. Text that is no UTF-8 has
// the empty key.
std::string tavro_search_key(const char *text);
