#include "app_control_internal.h"

#include <algorithm>
#include <new>

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

platform::ExtraData::iterator find_key(app_control_h app_control, const char *key) {
  auto &pairs = app_control->extra_data;
  return std::find_if(pairs.begin(), pairs.end(), [key](const auto &pair) { return pair.first == key; });
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
  if (!app_control || !key || !*key || !value || !is_text(key) || !is_text(value)) {
    return APP_CONTROL_ERROR_INVALID_PARAMETER;
  }
  const auto existing = find_key(app_control, key);
  if (existing != app_control->extra_data.end()) {
    existing->second = value;
  } else {
    app_control->extra_data.emplace_back(key, value);
  }
  return APP_CONTROL_ERROR_NONE;
}

int app_control_remove_extra_data(app_control_h app_control, const char *key) {
  if (!app_control || !key) return APP_CONTROL_ERROR_INVALID_PARAMETER;
  const auto existing = find_key(app_control, key);
  if (existing == app_control->extra_data.end()) return APP_CONTROL_ERROR_KEY_NOT_FOUND;
  app_control->extra_data.erase(existing);
  return APP_CONTROL_ERROR_NONE;
}

int app_control_get_extra_data(app_control_h app_control, const char *key, char **value) {
  if (!app_control || !key || !value) return APP_CONTROL_ERROR_INVALID_PARAMETER;
  const auto existing = find_key(app_control, key);
  if (existing == app_control->extra_data.end()) return APP_CONTROL_ERROR_KEY_NOT_FOUND;
  *value = duplicate(existing->second.c_str());
  return *value ? APP_CONTROL_ERROR_NONE : APP_CONTROL_ERROR_OUT_OF_MEMORY;
}

int app_control_foreach_extra_data(app_control_h app_control, app_control_extra_data_cb callback,
                                   void *user_data) {
  if (!app_control || !callback) return APP_CONTROL_ERROR_INVALID_PARAMETER;
  // A copy, so that the callback may change the request.
  const platform::ExtraData pairs = app_control->extra_data;
  for (const auto &pair : pairs) {
    if (!callback(app_control, pair.first.c_str(), user_data)) break;
  }
  return APP_CONTROL_ERROR_NONE;
}
