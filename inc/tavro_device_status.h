// The device status file that travels with a sent problem report: build and screen, battery, internal storage
// and the mobile network of each SIM, one line a fact. Main loop only; each value may take the platform up to
// half a second where the machine has no such hardware.
#pragma once

#include <cstdio>

// Write the file anew, readable by the owner alone. When it cannot be opened, nothing is written.
void tavro_get_extra_device_data(const char *filename);

// The groups of lines, each into an open file.
void _tavro_connmgr_add_hardware_status(FILE *file);
void _tavro_connmgr_add_system_info(FILE *file);
void _tavro_connmgr_add_battery_info(FILE *file);
void _tavro_connmgr_add_performance_status(FILE *file);
void _tavro_connmgr_add_storage_info(FILE *file);
void _tavro_connmgr_add_network_status(FILE *file);
