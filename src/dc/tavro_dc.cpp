#include "tavro_dc.h"

int tavro_dc_init(tavro_dc_context **handle_out, const tavro_dc_report_info *, void *) {
  *handle_out = nullptr;
  return 0;
}

int tavro_dc_start(tavro_dc_context *, const tavro_dc_report_info *) {
  return -1;
}

int tavro_dc_cancel(tavro_dc_context *) {
  return -1;
}

int tavro_dc_deinit(tavro_dc_context *) {
  return -1;
}
