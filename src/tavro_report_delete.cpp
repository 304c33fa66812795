#include "tavro_report_delete.h"

void tavro_delete_reports(appdata *, const std::vector<int> &, void (*)(appdata *ad)) {}

bool tavro_delete_is_waiting(int) {
  return false;
}

void tavro_delete_finish(appdata *) {}

void tavro_delete_register_screen(void (*)(appdata *ad)) {}
