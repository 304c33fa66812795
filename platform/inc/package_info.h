/* One installed package. */
#pragma once

#include <package_manager_error.h>
#include <stdbool.h>

#ifdef __cplusplus
extern "C" {
#endif

typedef struct package_info_s *package_info_h;

/* The caller destroys the handle and frees the texts. */
int package_info_destroy(package_info_h package_info);
int package_info_get_package(package_info_h package_info, char **package);
/* NO_SUCH_PACKAGE when the package does not tell its version. */
int package_info_get_version(package_info_h package_info, char **version);
/* Whether it came with the machine; what its user installed did not. */
int package_info_is_preload_package(package_info_h package_info, bool *preload);

#ifdef __cplusplus
}
#endif
