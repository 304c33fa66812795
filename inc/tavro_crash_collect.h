// Collects the dump of a crash on the collector's worker thread and hands the result to the main loop. One
// collection at a time. Main loop only, but for the five callbacks.
#pragma once

#include <string>

#include "tavro_dc.h"

struct appdata;

struct tavro_crash_result {
  std::string archive;  // path; empty: the crash has no dump any more, or collecting failed
  bool has_failed;
};

// `folder` is the name of the crash folder, which is made the newest one meanwhile; empty: whichever is the
// newest.
// `collected` is called once on the main loop, unless the collection is cancelled before. It takes charge of
// the archive.
using tavro_crash_collected = void (*)(appdata *ad, const tavro_crash_result &result);
void tavro_crash_collect(appdata *ad, const std::string &folder, tavro_crash_collected collected);

// Give the collection up: nothing of it stays. Nothing when none is under way.
void tavro_crash_collect_cancel();
// The application ends: give up, and wait until the collector's worker has left.
void tavro_crash_collect_at_end();

// What the collector calls. Done and error run on its worker: they copy the result, end the collector and
// leave the rest to the main loop; the others log.
void tavro_dc_on_done_cb(tavro_dc_context *handle, tavro_dc_report_info *report_info, void *userdata);
void tavro_dc_on_error_cb(tavro_dc_context *handle, tavro_dc_report_info *report_info, void *userdata);
void tavro_dc_on_init_cb(tavro_dc_context *handle, tavro_dc_report_info *report_info, void *userdata);
void tavro_dc_on_deinit_cb(tavro_dc_context *handle, tavro_dc_report_info *report_info, void *userdata);
void tavro_dc_on_cancel_cb(tavro_dc_context *handle, tavro_dc_report_info *report_info, void *userdata);
