// The device status file that travels with a sent problem report: build and screen, battery, internal storage
// and the mobile network of each SIM, one line a fact. What the machine does not have is written as 0, a SIM
// without a network as nothing. Main loop only; a power or modem service that does not answer takes half a
// second each.
#pragma once

#include <storage.h>

#include <cstdio>
#include <string>

// What the file would hold if it were written now; empty when there is no memory for it.
std::string tavro_device_status_text();

// Write the file anew, readable by the owner alone. When it cannot be opened, nothing is written.
void tavro_get_extra_device_data(const char *filename);

// The groups of lines, each into an open file.
void _tavro_connmgr_add_hardware_status(FILE *file);
void _tavro_connmgr_add_system_info(FILE *file);
void _tavro_connmgr_add_battery_info(FILE *file);
void _tavro_connmgr_add_performance_status(FILE *file);
void _tavro_connmgr_add_storage_info(FILE *file);
// One storage; `user_data` is the open file. Writes a line for an internal one, and ends the walk with it.
bool storage_device_cb(int storage_id, storage_type_e type, storage_state_e state, const char *path,
                       void *user_data);
void _tavro_connmgr_add_network_status(FILE *file);
