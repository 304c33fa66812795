// The floor of a cold start: an elementary window with nothing in it.
#include <Elementary.h>

#include "first_frame.h"

int main(int argc, char **argv) {
  if (!elm_init(argc, argv)) return 1;
  Evas_Object *win = elm_win_util_standard_add("empty", "empty");
  evas_object_resize(win, 360, 640);
  evas_object_show(win);
  platform::report_first_frame();
  elm_run();
  elm_shutdown();
  return 0;
}
