/* One installed package. */
#pragma once

#include <package_manager_error.h>

#ifdef __cplusplus
extern "C" {
#endif

typedef struct package_info_s *package_info_h;

/* The caller destroys the handle and frees the texts. */
int package_info_destroy(package_info_h package_info);
int package_info_get_package(package_info_h package_info, char **package);
/* NO_SUCH_PACKAGE when the package does not tell its version. */
int package_info_get_version(package_info_h package_info, char **version);

#ifdef __cplusplus
}
#endif
