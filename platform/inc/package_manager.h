/* The packages of the machine: here a package is an application's desktop entry. */
#pragma once

#include <package_info.h>
#include <package_manager_error.h>

#ifdef __cplusplus
extern "C" {
#endif

int package_manager_get_package_info(const char *package, package_info_h *package_info);

#ifdef __cplusplus
}
#endif
