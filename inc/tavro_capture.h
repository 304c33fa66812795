// The exchange with the capture manager, the application that takes pictures and videos of the screen, and
// the state of a capture: idle, control shown, recording, paused, ending. It is kept in appdata, and in
// `filename` and `file_type` of the open compose record: the file that is to come. No window is touched here:
// what they have to do is asked of the functions that the floating control has set. Main loop only. On disk:
// the names of the files are made here, the capture manager writes them; one that nobody wants is removed.
#pragma once

#include <Ecore.h>
#include <app_control.h>
#include <device/callback.h>

#include <string>

#include "tavro-main.h"
#include "tavro_drafts.h"

#define TAVRO_CPMGR_ID "corvane.tavro-screen-recorder"
#define TAVRO_CPMGR_STORAGE_FULL "storage_full"  // the "reason" of a failure, mostly there is none

// What a capture asks of the windows. What is to be taken away may be gone already.
struct tavro_capture_windows {
  bool (*hide_control)(appdata *ad);  // false: it cannot be hidden
  void (*delete_hint)(appdata *ad);
  void (*delete_control)(appdata *ad);  // the hint with it
  void (*show_recording)(appdata *ad);  // and start the timer
  void (*show_paused)(appdata *ad);
  void (*show_resumed)(appdata *ad);
  void (*show_stopping)(appdata *ad);
  void (*allow_stopping)(appdata *ad);
  void (*delete_time)(appdata *ad);
  void (*blink)(appdata *ad, bool is_on);
  const char *(*time_text)(appdata *ad);  // as it is shown; null when it cannot be read
  void (*show_time)(appdata *ad, const char *text);
  void (*wait_for_panel)(appdata *ad, bool is_waiting);  // then tavro_capture_panel_is_off
  // No border, the client in front, buttons enabled; nothing when that is so already.
  void (*come_back)(appdata *ad);
  void (*show_failure)(appdata *ad);
  void (*add_picture)(appdata *ad, const char *path);
  bool (*add_video)(appdata *ad, const char *path);  // false: refused, and the person was told
};
// `windows` stay the caller's, for the process's life.
void tavro_capture_set_windows(const tavro_capture_windows *windows);
const tavro_capture_windows &tavro_capture_get_windows();

// The open record that the file is for, which a crash shares with problems; null when it was closed.
compose_view_win *tavro_capture_view(const appdata *ad);

// ---- Messages to the capture manager, and its replies ----

// Open a session for a video, when the capture manager is new enough to hold one.
void send_cpmgr_init(appdata *ad);
void send_cpmgr_shutdown(appdata *ad);
// End a session without waiting for what comes of it.
void send_cpmgr_drop(appdata *ad, int handle);
// True: the capture manager has it.
bool send_cpmgr_start(appdata *ad);
bool send_cpmgr_action(appdata *ad, const char *action_type);  // "Video_Pause", "Video_Resume", "Video_Stop"
// Ask for a picture of the screen, with nothing of the control before it.
void take_snapshot(appdata *ad);

void tavro_cpmgr_cb(app_control_h request, app_control_h reply, app_control_result_e result, void *data);
// The file is complete; the capture has failed. `handle` is always 0.
void tavro_cpmgr_on_get_eos_cb(int handle, appdata *ad);
void tavro_cpmgr_on_get_error_cb(int handle, appdata *ad);
// Nobody waits for the file any more: a reply that comes after all changes nothing.
void tavro_capture_forget_file(appdata *ad);
// Whether this is the file that is under way: it has been asked for, and is settled by nobody yet.
bool tavro_capture_is_under_way(const char *path);
// The path of the file that is under way, empty for none: it is from now on like any other.
std::string tavro_capture_release_file();

// ---- What a capture waits for (tavro_capture_wait.cpp) ----

enum tavro_capture_awaited {
  TAVRO_CAPTURE_SESSION,  // ten seconds, looked for twenty times a second; then the recording starts
  TAVRO_CAPTURE_END,      // ten seconds: the last reply of the session `cpmgr_handle`
  TAVRO_CAPTURE_PICTURE,  // 35 seconds: a desktop may ask its user first
  TAVRO_CAPTURE_PANEL,    // three seconds: the control to be off the screen; then it is taken to be
};
// Wait for this instead of anything else. What has not come by then has failed, but for the panel.
void tavro_capture_wait(appdata *ad, tavro_capture_awaited what);
void tavro_capture_stop_waiting();
Eina_Bool tavro_capture_waited_cb(void *data);
// Of the session whose last reply is awaited; 0 for none.
int tavro_capture_ending_handle();

// True also when the bus does not tell.
bool tavro_capture_manager_is_running();
// A capture manager that has gone takes the capture with it: all is put away, and the person told.
bool tavro_capture_has_died(appdata *ad);
// Ask that every second as long as there is a session.
void tavro_capture_watch(appdata *ad);
Eina_Bool tavro_capture_watch_cb(void *data);

// ---- What the person does (tavro_capture_buttons.cpp); `data` is the appdata ----

void record_btn_clicked_cb(void *data, Evas_Object *obj, void *event_info);  // stop
void pause_btn_clicked_cb(void *data, Evas_Object *obj, void *event_info);
void video_btn_clicked_cb(void *data, Evas_Object *obj, void *event_info);  // start, or go on
// The control and the hint are gone from the screen, and not waited for any more: take the picture, or start
// the video.
void tavro_capture_panel_is_off(appdata *ad);
void camera_btn_clicked_cb(void *data, Evas_Object *obj, void *event_info);
void back_btn_clicked_cb(void *data, Evas_Object *obj, void *event_info);
// Stop a running recording and drop it; before that, as the back button.
void cancel_btn_clicked_cb(void *data, Evas_Object *obj, void *event_info);
// The panel has hidden the control.
void tavro_capture_control_hidden(appdata *ad);
// The client's own window is in front again while a capture is open.
void tavro_capture_client_returned(appdata *ad);

// Twice a second while a video is recorded.
constexpr double kVideoTickSeconds = 0.5;
Eina_Bool timer_func(void *data);

// Pause with the display.
void add_lock_cb(appdata *ad);
void on_device_changed_cb(device_callback_e type, void *value, void *user_data);
