#include "app_common.h"

#include <package_manager.h>

#include "app_core.h"
#include "places.h"
#include "scoped.h"

namespace {

char *own_data_folder(const char *below) {
  const std::string folder =
      std::string(platform::kApplicationData) + "/" + platform::application_id() + below;
  if (!platform::make_folder(folder)) return nullptr;
  return platform::duplicate((folder + "/").c_str());
}

}  // namespace

int app_get_id(char **id) {
  if (!id) return APP_ERROR_INVALID_PARAMETER;
  *id = platform::duplicate(platform::application_id().c_str());
  return *id ? APP_ERROR_NONE : APP_ERROR_OUT_OF_MEMORY;
}

int app_get_version(char **version) {
  if (!version) return APP_ERROR_INVALID_PARAMETER;
  package_info_h package = nullptr;
  const char *id = platform::application_id().c_str();
  if (package_manager_get_package_info(id, &package) != PACKAGE_MANAGER_ERROR_NONE) {
    return APP_ERROR_INVALID_CONTEXT;
  }
  const int result = package_info_get_version(package, version);
  package_info_destroy(package);
  return result == PACKAGE_MANAGER_ERROR_NONE ? APP_ERROR_NONE : APP_ERROR_INVALID_CONTEXT;
}

char *app_get_resource_path(void) {
  return platform::duplicate((platform::application_folder() + "/res/").c_str());
}

char *app_get_data_path(void) {
  return own_data_folder("/data");
}

char *app_get_shared_data_path(void) {
  return own_data_folder("/shared/data");
}
