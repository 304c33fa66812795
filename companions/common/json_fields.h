// Reading JSON that others wrote: a missing field or one of another type gives the fallback, nothing throws.
#pragma once

#include <cstdint>
#include <nlohmann/json.hpp>
#include <string>

// The parsed value, or a discarded one (`is_discarded()`) for anything that is not JSON in valid UTF-8.
inline nlohmann::json parse_json(const char *data, size_t size) {
  return nlohmann::json::parse(data, data + size, nullptr, false);
}

inline std::string text_field(const nlohmann::json &object, const char *name) {
  if (!object.is_object()) return {};
  const auto field = object.find(name);
  return field != object.end() && field->is_string() ? field->get<std::string>() : std::string();
}

inline int64_t number_field(const nlohmann::json &object, const char *name, int64_t fallback = 0) {
  if (!object.is_object()) return fallback;
  const auto field = object.find(name);
  return field != object.end() && field->is_number_integer() ? field->get<int64_t>() : fallback;
}

inline bool flag_field(const nlohmann::json &object, const char *name) {
  if (!object.is_object()) return false;
  const auto field = object.find(name);
  return field != object.end() && field->is_boolean() && field->get<bool>();
}

// One line of JSON; bytes that are no UTF-8 become replacement characters.
inline std::string json_line(const nlohmann::json &value) {
  return value.dump(-1, ' ', false, nlohmann::json::error_handler_t::replace);
}
