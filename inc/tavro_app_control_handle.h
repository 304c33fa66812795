// Owning handle of a launch request that the client makes, known to the allocation tracker while it lives.
#pragma once

#include <app_control.h>

#include <memory>
#include <type_traits>

#include "tavro_memcheck.h"

struct tavro_request_deleter {
  void operator()(app_control_h request) const {
    tavro_mem_remove(request, __LINE__, __FILE__);
    app_control_destroy(request);
  }
};
using TavroRequest = std::unique_ptr<std::remove_pointer_t<app_control_h>, tavro_request_deleter>;

// A new, empty request; null when the platform has none to give, its code in `error`.
inline TavroRequest tavro_request_create(int *error) {
  app_control_h request = nullptr;
  *error = app_control_create(&request);
  if (*error != APP_CONTROL_ERROR_NONE) return nullptr;
  tavro_mem_insert(request, __LINE__, __FILE__);
  return TavroRequest(request);
}
