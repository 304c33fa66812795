#include "tavro_request.h"

#include <charconv>
#include <cstring>

TavroText tavro_request_text(app_control_h request, const char *key, int *error) {
  char *value = nullptr;
  const int ret = app_control_get_extra_data(request, key, &value);
  if (error) *error = ret;
  return TavroText(ret == APP_CONTROL_ERROR_NONE ? TAVRO_ADOPT(value) : nullptr);
}

int tavro_record_id_from_text(const char *text) {
  if (!text) return 0;
  int id = 0;
  const char *end = text + std::strlen(text);
  const auto parsed = std::from_chars(text, end, id);
  return parsed.ec == std::errc() && parsed.ptr == end && id > 0 ? id : 0;
}
