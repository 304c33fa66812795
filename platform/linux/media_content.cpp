#include "media_content.h"

#include <atomic>

#include "dlog.h"

namespace {

std::atomic<int> connections{0};

}  // namespace

int media_content_connect() {
  ++connections;
  return MEDIA_CONTENT_ERROR_NONE;
}

int media_content_disconnect() {
  int count = connections;
  while (count > 0)
    if (connections.compare_exchange_weak(count, count - 1)) return MEDIA_CONTENT_ERROR_NONE;
  return MEDIA_CONTENT_ERROR_INVALID_OPERATION;
}

int media_content_scan_file(const char *path) {
  if (!path) return MEDIA_CONTENT_ERROR_INVALID_PARAMETER;
  if (connections < 1) return MEDIA_CONTENT_ERROR_INVALID_OPERATION;
  dlog_print(DLOG_DEBUG, "MEDIA_CONTENT", "scanned %s", path);
  return MEDIA_CONTENT_ERROR_NONE;
}
