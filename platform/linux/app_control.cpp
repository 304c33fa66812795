#include "app_control_caller.h"

#include <algorithm>
#include <cstdlib>
#include <new>
#include <set>

#include "app_control_internal.h"
#include "scoped.h"

namespace platform {

PendingAnswer::~PendingAnswer() {
  answer(APP_CONTROL_RESULT_SUCCEEDED, extra_data_to_variant({}));
}

bool PendingAnswer::answer(app_control_result_e result, GVariant *extra_data) {
  const ScopedVariant pairs(g_variant_ref_sink(extra_data));
  if (!invocation_) return false;
  g_dbus_method_invocation_return_value(std::exchange(invocation_, nullptr),
                                        g_variant_new("(i@a(ss))", static_cast<int>(result), pairs.get()));
  return true;
}

GVariant *extra_data_to_variant(const ExtraData &extra_data) {
  GVariantBuilder pairs;
  g_variant_builder_init(&pairs, G_VARIANT_TYPE("a(ss)"));
  for (const auto &[key, value] : extra_data) {
    g_variant_builder_add(&pairs, "(ss)", key.c_str(), value.c_str());
  }
  return g_variant_builder_end(&pairs);
}

ExtraData extra_data_from_variant(GVariant *pairs) {
  ExtraData extra_data;
  GVariantIter iterator;
  const char *key, *value;
  g_variant_iter_init(&iterator, pairs);
  while (g_variant_iter_next(&iterator, "(&s&s)", &key, &value)) extra_data.emplace_back(key, value);
  return extra_data;
}

}  // namespace platform

namespace {

using platform::duplicate;
using Text = std::optional<std::string> app_control_s::*;

bool is_text(const char *value) {
  return g_utf8_validate(value, -1, nullptr);
}

int set_text(app_control_h app_control, Text field, const char *value) {
  if (!app_control || (value && !is_text(value))) return APP_CONTROL_ERROR_INVALID_PARAMETER;
  if (value) {
    app_control->*field = value;
  } else {
    (app_control->*field).reset();
  }
  return APP_CONTROL_ERROR_NONE;
}

int get_text(app_control_h app_control, Text field, char **value) {
  if (!app_control || !value) return APP_CONTROL_ERROR_INVALID_PARAMETER;
  const auto &text = app_control->*field;
  *value = text ? duplicate(text->c_str()) : nullptr;
  return text && !*value ? APP_CONTROL_ERROR_OUT_OF_MEMORY : APP_CONTROL_ERROR_NONE;
}

bool is_valid(const char *key, const char *value) {
  return key && *key && value && is_text(key) && is_text(value);
}

// The values under a key, in order; none when there is no such key.
std::vector<const char *> values_of(app_control_h app_control, const char *key) {
  std::vector<const char *> values;
  for (const auto &pair : app_control->extra_data)
    if (pair.first == key) values.push_back(pair.second.c_str());
  return values;
}

// Put the values where the key's first value was, or at the end.
void replace_values(app_control_h app_control, const std::string &key,
                    const std::vector<std::string> &values) {
  auto &pairs = app_control->extra_data;
  const auto has_key = [&key](const auto &pair) { return pair.first == key; };
  const auto place = std::find_if(pairs.begin(), pairs.end(), has_key) - pairs.begin();
  pairs.erase(std::remove_if(pairs.begin(), pairs.end(), has_key), pairs.end());
  platform::ExtraData added;
  for (const std::string &value : values) added.emplace_back(key, value);
  pairs.insert(pairs.begin() + place, added.begin(), added.end());
}

}  // namespace

int app_control_create(app_control_h *app_control) {
  if (!app_control) return APP_CONTROL_ERROR_INVALID_PARAMETER;
  *app_control = new (std::nothrow) app_control_s;
  return *app_control ? APP_CONTROL_ERROR_NONE : APP_CONTROL_ERROR_OUT_OF_MEMORY;
}

int app_control_destroy(app_control_h app_control) {
  if (!app_control) return APP_CONTROL_ERROR_INVALID_PARAMETER;
  delete app_control;
  return APP_CONTROL_ERROR_NONE;
}

int app_control_clone(app_control_h *clone, app_control_h app_control) {
  if (!clone || !app_control) return APP_CONTROL_ERROR_INVALID_PARAMETER;
  *clone = new (std::nothrow) app_control_s(*app_control);
  return *clone ? APP_CONTROL_ERROR_NONE : APP_CONTROL_ERROR_OUT_OF_MEMORY;
}

int app_control_set_operation(app_control_h app_control, const char *operation) {
  return set_text(app_control, &app_control_s::operation, operation);
}

int app_control_get_operation(app_control_h app_control, char **operation) {
  return get_text(app_control, &app_control_s::operation, operation);
}

int app_control_set_uri(app_control_h app_control, const char *uri) {
  return set_text(app_control, &app_control_s::uri, uri);
}

int app_control_get_uri(app_control_h app_control, char **uri) {
  return get_text(app_control, &app_control_s::uri, uri);
}

int app_control_set_mime(app_control_h app_control, const char *mime) {
  return set_text(app_control, &app_control_s::mime, mime);
}

int app_control_get_mime(app_control_h app_control, char **mime) {
  return get_text(app_control, &app_control_s::mime, mime);
}

int app_control_set_app_id(app_control_h app_control, const char *app_id) {
  return set_text(app_control, &app_control_s::app_id, app_id);
}

int app_control_get_app_id(app_control_h app_control, char **app_id) {
  return get_text(app_control, &app_control_s::app_id, app_id);
}

int app_control_add_extra_data(app_control_h app_control, const char *key, const char *value) {
  if (!app_control || !is_valid(key, value)) return APP_CONTROL_ERROR_INVALID_PARAMETER;
  replace_values(app_control, key, {value});
  return APP_CONTROL_ERROR_NONE;
}

int app_control_add_extra_data_array(app_control_h app_control, const char *key, const char *value[],
                                     int length) {
  if (!app_control || !value || length < 1) return APP_CONTROL_ERROR_INVALID_PARAMETER;
  if (!std::all_of(value, value + length, [key](const char *text) { return is_valid(key, text); }))
    return APP_CONTROL_ERROR_INVALID_PARAMETER;
  replace_values(app_control, key, {value, value + length});
  return APP_CONTROL_ERROR_NONE;
}

int app_control_remove_extra_data(app_control_h app_control, const char *key) {
  if (!app_control || !key) return APP_CONTROL_ERROR_INVALID_PARAMETER;
  if (values_of(app_control, key).empty()) return APP_CONTROL_ERROR_KEY_NOT_FOUND;
  replace_values(app_control, key, {});
  return APP_CONTROL_ERROR_NONE;
}

int app_control_get_extra_data(app_control_h app_control, const char *key, char **value) {
  if (!app_control || !key || !value) return APP_CONTROL_ERROR_INVALID_PARAMETER;
  const auto values = values_of(app_control, key);
  if (values.empty()) return APP_CONTROL_ERROR_KEY_NOT_FOUND;
  if (values.size() > 1) return APP_CONTROL_ERROR_INVALID_DATA_TYPE;
  *value = duplicate(values[0]);
  return *value ? APP_CONTROL_ERROR_NONE : APP_CONTROL_ERROR_OUT_OF_MEMORY;
}

int app_control_get_extra_data_array(app_control_h app_control, const char *key, char ***value, int *length) {
  if (!app_control || !key || !value || !length) return APP_CONTROL_ERROR_INVALID_PARAMETER;
  const auto values = values_of(app_control, key);
  if (values.empty()) return APP_CONTROL_ERROR_KEY_NOT_FOUND;
  if (values.size() == 1) return APP_CONTROL_ERROR_INVALID_DATA_TYPE;
  std::vector<platform::ScopedGText> copies;
  for (const char *text : values) copies.emplace_back(duplicate(text));
  *value = static_cast<char **>(std::calloc(values.size(), sizeof(char *)));
  if (!*value || std::any_of(copies.begin(), copies.end(), [](const auto &copy) { return !copy; })) {
    std::free(*value);
    return APP_CONTROL_ERROR_OUT_OF_MEMORY;
  }
  std::transform(copies.begin(), copies.end(), *value, [](auto &copy) { return copy.release(); });
  *length = static_cast<int>(values.size());
  return APP_CONTROL_ERROR_NONE;
}

int app_control_is_extra_data_array(app_control_h app_control, const char *key, bool *array) {
  if (!app_control || !key || !array) return APP_CONTROL_ERROR_INVALID_PARAMETER;
  const auto values = values_of(app_control, key);
  if (values.empty()) return APP_CONTROL_ERROR_KEY_NOT_FOUND;
  *array = values.size() > 1;
  return APP_CONTROL_ERROR_NONE;
}

int app_control_foreach_extra_data(app_control_h app_control, app_control_extra_data_cb callback,
                                   void *user_data) {
  if (!app_control || !callback) return APP_CONTROL_ERROR_INVALID_PARAMETER;
  // A copy, so that the callback may change the request.
  const platform::ExtraData pairs = app_control->extra_data;
  std::set<std::string> done;
  for (const auto &pair : pairs) {
    if (done.insert(pair.first).second && !callback(app_control, pair.first.c_str(), user_data)) break;
  }
  return APP_CONTROL_ERROR_NONE;
}

int app_control_get_caller(app_control_h app_control, char **name) {
  const char *caller = app_control && app_control->pending ? app_control->pending->caller() : nullptr;
  if (!name || !caller) return APP_CONTROL_ERROR_INVALID_PARAMETER;
  *name = duplicate(caller);
  return *name ? APP_CONTROL_ERROR_NONE : APP_CONTROL_ERROR_OUT_OF_MEMORY;
}
