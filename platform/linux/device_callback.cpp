#include "device_callback.h"

#include <algorithm>
#include <cstdint>
#include <vector>

#include "host_service.h"

namespace {

using namespace platform;

struct Listener {
  device_callback_e type;
  device_changed_cb callback;
  void *user_data;
};

std::vector<Listener> &listeners() {
  static std::vector<Listener> &all = *new std::vector<Listener>;
  return all;
}

std::function<void(bool)> &display_state_source() {
  static std::function<void(bool)> &source = *new std::function<void(bool)>;
  return source;
}

bool is_wanted(device_callback_e type) {
  return std::any_of(listeners().begin(), listeners().end(),
                     [type](const Listener &listener) { return listener.type == type; });
}

void update_display_state_source() {
  if (display_state_source()) display_state_source()(is_wanted(DEVICE_CALLBACK_DISPLAY_STATE));
}

auto find_listener(device_callback_e type, device_changed_cb callback) {
  return std::find_if(listeners().begin(), listeners().end(), [&](const Listener &known) {
    return known.type == type && known.callback == callback;
  });
}

}  // namespace

void platform::report_device_change(device_callback_e type, int value) {
  // A copy: callbacks may remove themselves.
  const std::vector<Listener> told = listeners();
  for (const Listener &listener : told) {
    if (listener.type != type) continue;
    listener.callback(type, reinterpret_cast<void *>(static_cast<intptr_t>(value)), listener.user_data);
  }
}

void platform::set_display_state_source(std::function<void(bool)> source) {
  display_state_source() = std::move(source);
  update_display_state_source();
}

int device_add_callback(device_callback_e type, device_changed_cb callback, void *user_data) {
  const bool is_known = type == DEVICE_CALLBACK_BATTERY_CAPACITY || type == DEVICE_CALLBACK_DISPLAY_STATE;
  if (!is_known || !callback) return DEVICE_ERROR_INVALID_PARAMETER;
  if (find_listener(type, callback) != listeners().end()) return DEVICE_ERROR_ALREADY_IN_PROGRESS;
  listeners().push_back({type, callback, user_data});
  if (type == DEVICE_CALLBACK_BATTERY_CAPACITY) with_host_bus(HostBus::kSystem, watch_battery);
  if (type == DEVICE_CALLBACK_DISPLAY_STATE) update_display_state_source();
  return DEVICE_ERROR_NONE;
}

int device_remove_callback(device_callback_e type, device_changed_cb callback) {
  const auto known = find_listener(type, callback);
  if (known == listeners().end()) return DEVICE_ERROR_INVALID_PARAMETER;
  listeners().erase(known);
  if (type == DEVICE_CALLBACK_DISPLAY_STATE) update_display_state_source();
  return DEVICE_ERROR_NONE;
}
