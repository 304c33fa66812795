// Sending a stored report again from the history: a failed one, or a draft.
//
// The details screen that offers the action registers what is to happen to it; this file knows no screen.
// Main loop only.
#pragma once

#include <Elementary.h>

struct appdata;

struct tavro_resend_screen {
  void (*show_no_file_accessible)(appdata *ad);  // nothing of the report can be read any more
  void (*close)(appdata *ad);                    // end the details page and release the history's data
};

// The functions must outlive every use; null fields are skipped.
void tavro_resend_register_screen(const tavro_resend_screen &screen);

// Smart callback of the send action: `data` is the report (svc_voc_data, may be null), `obj` carries the
// appdata under the key "app_data". Ends the details screen, unless no file of the report can be read.
void tavro_send_cb(void *data, Evas_Object *obj, void *event_info);
