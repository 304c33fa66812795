// Modems and their networks, as ModemManager tells them. telephony_init reads everything at once; the getters
// read that picture.

#include "telephony.h"

#include <algorithm>
#include <string>
#include <utility>
#include <vector>

#include "host_service.h"

struct telephony_handle_s {
  std::string path;
  platform::ScopedVariant modem, network;  // properties, a{sv}; the network's may be null
  std::string location;                    // "MCC,MNC,LAC,CI,TAC", empty when it is not told
};

namespace {

using namespace platform;

constexpr const char *kService = "org.freedesktop.ModemManager1";
constexpr const char *kPath = "/org/freedesktop/ModemManager1";
constexpr const char *kModem = "org.freedesktop.ModemManager1.Modem";
constexpr const char *kNetwork = "org.freedesktop.ModemManager1.Modem.Modem3gpp";
constexpr const char *kLocation = "org.freedesktop.ModemManager1.Modem.Location";
constexpr guint32 kCellLocation = 1;       // key of GetLocation's answer
constexpr gint32 kModemStateDisabled = 3;  // this state and those below: the radio is off

enum Registration : guint32 {
  kHome = 1,
  kRoaming = 5,
  kHomeSmsOnly = 6,
  kRoamingSmsOnly = 7,
  kEmergencyOnly = 8,
  kHomeNoFallback = 9,
  kRoamingNoFallback = 10,
};

std::string read_location(const std::string &path) {
  const ScopedVariant reply =
      call_host_service(kService, path.c_str(), kLocation, "GetLocation", nullptr, "(a{uv})");
  if (!reply) return "";
  GVariantIter *entries;
  g_variant_get(reply.get(), "(a{uv})", &entries);
  std::string location;
  guint32 key;
  GVariant *value;
  while (g_variant_iter_next(entries, "{uv}", &key, &value)) {
    const ScopedVariant owned(value);
    if (key == kCellLocation && g_variant_is_of_type(value, G_VARIANT_TYPE_STRING)) {
      location = g_variant_get_string(value, nullptr);
    }
  }
  g_variant_iter_free(entries);
  return location;
}

std::vector<telephony_h> read_modems() {
  std::vector<telephony_h> modems;
  const ScopedVariant reply = call_host_service(kService, kPath, "org.freedesktop.DBus.ObjectManager",
                                                "GetManagedObjects", nullptr, "(a{oa{sa{sv}}})");
  if (!reply) return modems;
  GVariantIter *objects;
  const char *path;
  GVariant *interfaces;
  g_variant_get(reply.get(), "(a{oa{sa{sv}}})", &objects);
  while (g_variant_iter_next(objects, "{&o@a{sa{sv}}}", &path, &interfaces)) {
    const ScopedVariant owned(interfaces);
    ScopedVariant modem = lookup(interfaces, kModem, G_VARIANT_TYPE_VARDICT);
    if (!modem) continue;
    modems.push_back(new telephony_handle_s{
        path, std::move(modem), lookup(interfaces, kNetwork, G_VARIANT_TYPE_VARDICT), read_location(path)});
  }
  g_variant_iter_free(objects);
  // The paths end in a number: the shorter one is the lower one.
  std::sort(modems.begin(), modems.end(), [](const auto *left, const auto *right) {
    return std::pair(left->path.size(), left->path) < std::pair(right->path.size(), right->path);
  });
  return modems;
}

guint32 registration_of(telephony_h handle) {
  const ScopedVariant state = lookup(handle->network.get(), "RegistrationState", G_VARIANT_TYPE_UINT32);
  return state ? g_variant_get_uint32(state.get()) : 0;
}

bool is_roaming(guint32 registration) {
  return registration == kRoaming || registration == kRoamingSmsOnly || registration == kRoamingNoFallback;
}

bool is_home(guint32 registration) {
  return registration == kHome || registration == kHomeSmsOnly || registration == kHomeNoFallback;
}

// One part of the location, a hexadecimal number; false when it is missing.
bool location_part(telephony_h handle, size_t index, int *value) {
  size_t start = 0;
  for (size_t i = 0; i < index; ++i) {
    start = handle->location.find(',', start);
    if (start == std::string::npos) return false;
    ++start;
  }
  guint64 number = 0;
  const std::string part = handle->location.substr(start, handle->location.find(',', start) - start);
  if (!g_ascii_string_to_unsigned(part.c_str(), 16, 0, G_MAXINT, &number, nullptr)) return false;
  *value = static_cast<int>(number);
  return true;
}

}  // namespace

int telephony_init(telephony_handle_list_s *list) {
  if (!list) return TELEPHONY_ERROR_INVALID_PARAMETER;
  *list = {0, nullptr};
  const std::vector<telephony_h> modems = read_modems();
  if (modems.empty()) return TELEPHONY_ERROR_NOT_SUPPORTED;
  list->handle = new telephony_h[modems.size()];
  list->count = static_cast<unsigned int>(modems.size());
  std::copy(modems.begin(), modems.end(), list->handle);
  return TELEPHONY_ERROR_NONE;
}

int telephony_deinit(telephony_handle_list_s *list) {
  if (!list) return TELEPHONY_ERROR_INVALID_PARAMETER;
  for (unsigned int i = 0; i < list->count; ++i) delete list->handle[i];
  delete[] list->handle;
  *list = {0, nullptr};
  return TELEPHONY_ERROR_NONE;
}

int telephony_network_get_rssi(telephony_h handle, telephony_network_rssi_e *rssi) {
  if (!handle || !rssi) return TELEPHONY_ERROR_INVALID_PARAMETER;
  const ScopedVariant quality = lookup(handle->modem.get(), "SignalQuality", G_VARIANT_TYPE("(ub)"));
  if (!quality) return TELEPHONY_ERROR_OPERATION_FAILED;
  guint32 percent;
  g_variant_get(quality.get(), "(ub)", &percent, nullptr);
  // Steps of equal width, rounded up: any signal at all is more than none.
  *rssi = static_cast<telephony_network_rssi_e>((std::min(percent, 100u) * 6 + 99) / 100);
  return TELEPHONY_ERROR_NONE;
}

int telephony_network_get_network_name(telephony_h handle, char **network_name) {
  if (!handle || !network_name) return TELEPHONY_ERROR_INVALID_PARAMETER;
  const ScopedVariant name = lookup(handle->network.get(), "OperatorName", G_VARIANT_TYPE_STRING);
  if (!name) return TELEPHONY_ERROR_OPERATION_FAILED;
  *network_name = duplicate(g_variant_get_string(name.get(), nullptr));
  return *network_name ? TELEPHONY_ERROR_NONE : TELEPHONY_ERROR_OUT_OF_MEMORY;
}

int telephony_network_get_cell_id(telephony_h handle, int *cell_id) {
  if (!handle || !cell_id) return TELEPHONY_ERROR_INVALID_PARAMETER;
  return location_part(handle, 3, cell_id) ? TELEPHONY_ERROR_NONE : TELEPHONY_ERROR_OPERATION_FAILED;
}

int telephony_network_get_lac(telephony_h handle, int *lac) {
  if (!handle || !lac) return TELEPHONY_ERROR_INVALID_PARAMETER;
  return location_part(handle, 2, lac) ? TELEPHONY_ERROR_NONE : TELEPHONY_ERROR_OPERATION_FAILED;
}

int telephony_network_get_roaming_status(telephony_h handle, bool *status) {
  if (!handle || !status) return TELEPHONY_ERROR_INVALID_PARAMETER;
  if (!handle->network) return TELEPHONY_ERROR_OPERATION_FAILED;
  *status = is_roaming(registration_of(handle));
  return TELEPHONY_ERROR_NONE;
}

int telephony_network_get_service_state(telephony_h handle,
                                        telephony_network_service_state_e *network_service_state) {
  if (!handle || !network_service_state) return TELEPHONY_ERROR_INVALID_PARAMETER;
  const ScopedVariant state = lookup(handle->modem.get(), "State", G_VARIANT_TYPE_INT32);
  if (!state) return TELEPHONY_ERROR_OPERATION_FAILED;
  const guint32 registration = registration_of(handle);
  if (g_variant_get_int32(state.get()) <= kModemStateDisabled) {
    *network_service_state = TELEPHONY_NETWORK_SERVICE_STATE_RADIO_OFF;
  } else if (is_home(registration) || is_roaming(registration)) {
    *network_service_state = TELEPHONY_NETWORK_SERVICE_STATE_IN_SERVICE;
  } else if (registration == kEmergencyOnly) {
    *network_service_state = TELEPHONY_NETWORK_SERVICE_STATE_EMERGENCY_ONLY;
  } else {
    *network_service_state = TELEPHONY_NETWORK_SERVICE_STATE_OUT_OF_SERVICE;
  }
  return TELEPHONY_ERROR_NONE;
}
