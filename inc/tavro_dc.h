// The diagnostic collector: finds the newest crash dump of the phone, packs it into a zip archive and tells
// where that is. One worker thread per collector; one collection per start.
//
// The handle belongs to the collector from tavro_dc_init until a cancel or deinit was handled; a handle that
// has ended, or never was one, is refused with -1 and a log line. (Like any address it may be used again by a
// later collector: forget it once a cancel or deinit was posted.) Start, cancel and deinit may be called on
// any thread, also from a callback. All callbacks but dc_init_cb run on the worker thread, which ends after
// dc_cancel_cb or dc_deinit_cb.
//
// Starts and a deinit are handled in their order. A cancel overtakes the starts: a collection in work is
// broken off within a moment, and neither it nor those that wait report done or error. A collection whose
// archive is whole already still does.
//
// The archive is in /opt/usr/media/Orbel/, readable by the user alone. It appears there under its name only
// when it is whole, in place of an older one of that name; what is not whole has a name that begins with ".".
#pragma once

struct tavro_dc_context;
struct tavro_dc_report_info;

// The handle, the collector's own copy of the report info, and the caller's user data.
using tavro_dc_cb = void (*)(tavro_dc_context *handle, tavro_dc_report_info *report_info, void *userdata);

struct tavro_dc_callbacks {
  tavro_dc_cb dc_done_cb;   // file_path is the archive, null when there is no crash folder at all
  tavro_dc_cb dc_error_cb;  // nothing could be archived
  tavro_dc_cb dc_init_cb;   // on the caller's thread, before tavro_dc_init returns
  tavro_dc_cb dc_deinit_cb;
  tavro_dc_cb dc_cancel_cb;
};

// Filled by the caller; texts may be null. The collector copies the pointers, not the texts, and frees only
// the texts that it puts into its own copy. Those live until the next collection or the end of the collector.
struct tavro_dc_report_info {
  char *model;
  char *tizen_version;
  char *build_number;
  char *build_date;
  char *platform;
  char *file_path;
  tavro_dc_callbacks listener;
};

// 0, also when no thread could be had: *handle_out is null then. -1 when one of the first two is null.
int tavro_dc_init(tavro_dc_context **handle_out, const tavro_dc_report_info *report_info, void *userdata);

// 0, or -1 for a handle that is null or has ended.
int tavro_dc_start(tavro_dc_context *handle, const tavro_dc_report_info *report_info);
int tavro_dc_cancel(tavro_dc_context *handle);
int tavro_dc_deinit(tavro_dc_context *handle);

// For the end of the process: break off every collection, end every collector and wait until their workers
// have left. Takes no longer than callbacks do and the disk needs for what was written. Not on a worker.
void tavro_dc_end_all();
