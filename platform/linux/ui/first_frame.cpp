#include "first_frame.h"

#include <Ecore_Evas.h>
#include <unistd.h>

#include <cstdlib>

namespace platform {
namespace {

int descriptor = -1;

void painted_cb(void *, Evas *canvas, void *event_info) {
  const auto *painted = static_cast<Evas_Event_Render_Post *>(event_info);
  if (descriptor < 0 || !painted || !painted->updated_area) return;
  const char done = 1;
  if (write(descriptor, &done, 1) == 1) close(descriptor);
  descriptor = -1;
  evas_event_callback_del(canvas, EVAS_CALLBACK_RENDER_POST, painted_cb);
}

}  // namespace

void report_first_frame() {
  const char *asked = std::getenv("TAVRO_FIRST_FRAME_FD");
  if (!asked) return;
  Eina_List *windows = ecore_evas_ecore_evas_list_get();
  if (!windows) return;
  descriptor = std::atoi(asked);
  unsetenv("TAVRO_FIRST_FRAME_FD");
  void *window = nullptr;
  EINA_LIST_FREE(windows, window) {
    evas_event_callback_add(ecore_evas_get(static_cast<Ecore_Evas *>(window)), EVAS_CALLBACK_RENDER_POST,
                            painted_cb, nullptr);
  }
}

}  // namespace platform
