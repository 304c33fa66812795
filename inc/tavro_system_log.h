// The phone's system log for the problem report that is being written: asked for from the crash service,
// which writes it as an archive and answers with the launch request "DUMP_LOG_PROCESS". Main loop only.
//
// One log at a time, that of the open problem screen. When it is there it stands in syslog_filepath and
// syslog_filename of problem_view.
#pragma once

#include <app_control.h>
#include <glib.h>

struct appdata;

enum tavro_system_log_state {
  TAVRO_SYSTEM_LOG_OFF = 0,
  TAVRO_SYSTEM_LOG_COLLECTING,
  TAVRO_SYSTEM_LOG_READY,   // syslog_filepath of the open problem screen names a file that is there
  TAVRO_SYSTEM_LOG_FAILED,  // no crash service, no answer within 30 s, or nothing could be written
};

// Called after each change of state but that of tavro_system_log_end. One watcher, the problem screen; null
// takes it off.
using tavro_system_log_changed = void (*)(appdata *ad);
void tavro_system_log_watch(tavro_system_log_changed changed);

tavro_system_log_state tavro_system_log_current(const appdata *ad);

// Ask for the log of the open problem screen; before, old logs that no stored report needs are deleted.
// Nothing when it is there or under way.
void tavro_system_log_collect(appdata *ad);

// Give the log up: an answer that is still to come is thrown away, a file that was collected for this screen
// is deleted.
void tavro_system_log_drop(appdata *ad);

// The screen ends with its content stored or discarded: an answer that is still to come is not its any more.
void tavro_system_log_end(appdata *ad);

// The answer of the crash service.
void tavro_take_dump_log(app_control_h request, appdata *ad);
