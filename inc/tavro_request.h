// Reading what a launch request carries. The sender may be any program of the phone: every value is doubted.
#pragma once

#include <app_control.h>

#include <string>
#include <vector>

#include "tavro_memory.h"

// The value under a key; null when it is missing. `error` (may be null) gets the platform's code.
TavroText tavro_request_text(app_control_h request, const char *key, int *error = nullptr);

// All values under a key, in order: those of an array, or the single one; empty when it is missing.
std::vector<std::string> tavro_request_texts(app_control_h request, const char *key);

// A record id written as decimal text: 1 or more; 0 for null and for anything else.
int tavro_record_id_from_text(const char *text);

// An id that the server gave, the same way.
long tavro_server_id_from_text(const char *text);
