#include "tavro_preferences.h"

#include <cstring>

TavroText tavro_preference_text(const char *key, int *error) {
  char *value = nullptr;
  const int ret = preference_get_string(key, &value);
  if (error) *error = ret;
  return TavroText(ret == PREFERENCE_ERROR_NONE ? TAVRO_ADOPT(value) : nullptr);
}

int tavro_preference_int(const char *key, int fallback) {
  int value = fallback;
  return preference_get_int(key, &value) == PREFERENCE_ERROR_NONE ? value : fallback;
}

bool tavro_preference_flag(const char *key, bool fallback) {
  bool value = fallback;
  return preference_get_boolean(key, &value) == PREFERENCE_ERROR_NONE ? value : fallback;
}

TavroText tavro_get_username_from_preference() {
  return tavro_preference_text(TAVRO_PREF_USERNAME);
}

bool tavro_is_for_signed_in_user(const char *user_name) {
  if (!user_name || !*user_name) return true;
  const TavroText signed_in = tavro_get_username_from_preference();
  return signed_in && std::strcmp(signed_in.get(), user_name) == 0;
}
