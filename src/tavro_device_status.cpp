#include "tavro_device_status.h"

#include <device/battery.h>
#include <fcntl.h>
#include <storage.h>
#include <system_info.h>
#include <telephony.h>
#include <unistd.h>

#include <cerrno>
#include <cstring>
#include <string>

#include "tavro_handles.h"
#include "tavro_log.h"
#include "tavro_memory.h"

namespace {

// The path is the client's own, so a link that lies there is somebody else's doing and is not followed.
TavroFile _create_private_file(const char *filename) {
  const int fd = open(filename, O_WRONLY | O_CREAT | O_TRUNC | O_NOFOLLOW | O_CLOEXEC, 0600);
  if (fd < 0) return nullptr;
  FILE *file = fdopen(fd, "w");
  if (!file) close(fd);
  return TavroFile(file);
}

// One SIM. A value that cannot be read is written as 0.
void _add_sim(FILE *file, telephony_h sim) {
  telephony_network_rssi_e rssi = TELEPHONY_NETWORK_RSSI_0;
  telephony_network_service_state_e service_state = TELEPHONY_NETWORK_SERVICE_STATE_IN_SERVICE;
  char *name_text = nullptr;
  int cell_id = 0;
  int lac = 0;
  bool is_roaming = false;
  telephony_network_get_rssi(sim, &rssi);
  telephony_network_get_network_name(sim, &name_text);
  telephony_network_get_cell_id(sim, &cell_id);
  telephony_network_get_roaming_status(sim, &is_roaming);
  telephony_network_get_service_state(sim, &service_state);
  telephony_network_get_lac(sim, &lac);
  const TavroText name(TAVRO_ADOPT(name_text));
  // One fact is one line, whatever a network calls itself.
  if (name) g_strdelimit(name.get(), "\r\n", ' ');
  if (!name || !*name) {
    TAVRO_LOGD("Network name is NULL");
    return;
  }
  std::fprintf(
      file, "RSSI : %d, Network_info - Name : %s, Cell_Id : %d, Status : %d, Service_State : %d, LAC : %d\n",
      static_cast<int>(rssi), name.get(), cell_id, is_roaming ? 1 : 0, static_cast<int>(service_state), lac);
}

void _write_all(FILE *file) {
  _tavro_connmgr_add_hardware_status(file);
  _tavro_connmgr_add_performance_status(file);
  _tavro_connmgr_add_network_status(file);
}

}  // namespace

void _tavro_connmgr_add_system_info(FILE *file) {
  char *build_text = nullptr;
  int width = 0;
  int height = 0;
  system_info_get_platform_string(SYSTEM_INFO_KEY_BUILD_STRING, &build_text);
  system_info_get_platform_int(SYSTEM_INFO_KEY_SCREEN_WIDTH, &width);
  system_info_get_platform_int(SYSTEM_INFO_KEY_SCREEN_HEIGHT, &height);
  const TavroText build(TAVRO_ADOPT(build_text));
  std::fprintf(file, "System Info - Build Version : %s, Screen width : %d, Screen height : %d\n",
               build ? build.get() : "", width, height);
}

void _tavro_connmgr_add_battery_info(FILE *file) {
  int percent = 0;
  device_battery_level_e level = DEVICE_BATTERY_LEVEL_EMPTY;
  bool is_charging = false;
  device_battery_get_percent(&percent);
  device_battery_get_level_status(&level);
  device_battery_is_charging(&is_charging);
  std::fprintf(file, "Battery Info - Percent : %d, Battery Level : %d, %s\n", percent,
               static_cast<int>(level), is_charging ? "Charging" : "Not Charging");
}

void _tavro_connmgr_add_hardware_status(FILE *file) {
  _tavro_connmgr_add_system_info(file);
  _tavro_connmgr_add_battery_info(file);
}

bool storage_device_cb(int storage_id, storage_type_e type, storage_state_e, const char *, void *user_data) {
  if (type != STORAGE_TYPE_INTERNAL) return true;
  unsigned long long total = 0;
  unsigned long long available = 0;
  storage_get_total_space(storage_id, &total);
  storage_get_available_space(storage_id, &available);
  std::fprintf(static_cast<FILE *>(user_data),
               "Internal Memory - Total : %lld bytes, Available : %lld bytes\n",
               static_cast<long long>(total), static_cast<long long>(available));
  return false;
}

void _tavro_connmgr_add_storage_info(FILE *file) {
  storage_foreach_device_supported(storage_device_cb, file);
}

void _tavro_connmgr_add_performance_status(FILE *file) {
  _tavro_connmgr_add_storage_info(file);
}

void _tavro_connmgr_add_network_status(FILE *file) {
  telephony_handle_list_s sims = {};
  const int ret = telephony_init(&sims);
  if (ret != TELEPHONY_ERROR_NONE) {
    TAVRO_LOGD("telephony_init failed: %d, %s", ret, get_error_message(ret));
    return;
  }
  for (unsigned int i = 0; i < sims.count; ++i) _add_sim(file, sims.handle[i]);
  telephony_deinit(&sims);
}

std::string tavro_device_status_text() {
  char *text = nullptr;
  size_t size = 0;
  TavroFile stream(open_memstream(&text, &size));
  if (!stream) return {};
  _write_all(stream.get());
  stream.reset();  // closing puts the text in its place
  const TavroText owned(TAVRO_ADOPT(text));
  return owned ? std::string(owned.get(), size) : "";
}

void tavro_get_extra_device_data(const char *filename) {
  const std::string unfinished_name = std::string(filename) + ".part";
  const TavroFile file = _create_private_file(unfinished_name.c_str());
  if (!file) {
    TAVRO_LOGE("device status file %s: %s", filename, std::strerror(errno));
    return;
  }
  TavroUnfinishedFile unfinished(unfinished_name);
  _write_all(file.get());
  const bool is_whole = std::fflush(file.get()) == 0 && rename(unfinished_name.c_str(), filename) == 0;
  if (is_whole) {
    unfinished.keep();
  } else {
    TAVRO_LOGE("device status file %s: %s", filename, std::strerror(errno));
  }
}
