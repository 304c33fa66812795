#include "tavro_request.h"

#include <charconv>
#include <cstdlib>
#include <cstring>

#include "tavro_handles.h"

namespace {

template <typename Id>
Id _id_from_text(const char *text) {
  if (!text) return 0;
  Id id = 0;
  const char *end = text + std::strlen(text);
  const auto parsed = std::from_chars(text, end, id);
  return parsed.ec == std::errc() && parsed.ptr == end && id > 0 ? id : 0;
}

}  // namespace

TavroText tavro_request_text(app_control_h request, const char *key, int *error) {
  char *value = nullptr;
  const int ret = app_control_get_extra_data(request, key, &value);
  if (error) *error = ret;
  return TavroText(ret == APP_CONTROL_ERROR_NONE ? TAVRO_ADOPT(value) : nullptr);
}

std::vector<std::string> tavro_request_texts(app_control_h request, const char *key) {
  char **values = nullptr;
  int length = 0;
  if (app_control_get_extra_data_array(request, key, &values, &length) != APP_CONTROL_ERROR_NONE) {
    const TavroText single = tavro_request_text(request, key);
    return single ? std::vector<std::string>{single.get()} : std::vector<std::string>{};
  }
  const TavroHandle<char *, std::free> owned(values);
  std::vector<std::string> texts;
  for (int i = 0; i < length; i++) texts.emplace_back(TavroHandle<char, std::free>(values[i]).get());
  return texts;
}

int tavro_record_id_from_text(const char *text) {
  return _id_from_text<int>(text);
}

long tavro_server_id_from_text(const char *text) {
  return _id_from_text<long>(text);
}
