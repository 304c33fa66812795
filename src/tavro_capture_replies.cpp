// What the capture manager answers, and what becomes of the file.
#include <notification.h>
#include <notification_status.h>

#include <charconv>
#include <cstdio>
#include <cstring>
#include <set>
#include <utility>

#include "tavro-common.h"
#include "tavro_capture.h"
#include "tavro_compose.h"
#include "tavro_deleted_files.h"
#include "tavro_drafts.h"
#include "tavro_image_file.h"
#include "tavro_log.h"
#include "tavro_memory.h"
#include "tavro_request.h"
#include "tavro_video_info.h"

namespace {

compose_view_win *_any_view(const appdata *ad) {
  return ad->problem_view ? static_cast<compose_view_win *>(ad->problem_view) : ad->idea_view;
}

// Sessions that failed, or did not end in time.
std::set<int> _given_up;

// 0 for what is no positive number; a handle is only ever sent back.
int _handle_from(const char *text) {
  int handle = 0;
  const char *end = text + std::strlen(text);
  const auto parsed = std::from_chars(text, end, handle);
  return parsed.ec == std::errc() && parsed.ptr == end && handle > 0 ? handle : 0;
}

// The reply to a request for another file than the one that is waited for, or of a session that was given up.
bool _is_late(const TavroText &asked, const TavroText &session, const appdata *ad) {
  const compose_view_win *view = tavro_capture_view(ad);
  if (asked) return !view || !view->filename || std::strcmp(asked.get(), view->filename) != 0;
  return session && _given_up.count(_handle_from(session.get())) != 0;
}

void _take_handle(appdata *ad, const char *text) {
  const int handle = _handle_from(text);
  if (handle == 0) {
    TAVRO_LOGE("the capture manager's handle is no positive number");
    return tavro_cpmgr_on_get_error_cb(0, ad);
  }
  ad->cpmgr_handle = handle;
  _given_up.erase(handle);
  tavro_capture_watch(ad);
}

// Nothing can be asked of a session that has gone, and one that goes on would film for nobody.
void _give_up_session(appdata *ad) {
  const int handle = ad->cpmgr_handle != 0 ? ad->cpmgr_handle : tavro_capture_ending_handle();
  if (handle != 0) _given_up.insert(handle);
  if (ad->cpmgr_handle != 0 && tavro_capture_manager_is_running()) send_cpmgr_drop(ad, ad->cpmgr_handle);
}

// What was recorded until it failed is the person's, who finds it among the pictures.
void _settle_file(bool may_stay) {
  const std::string path = tavro_capture_release_file();
  if (path.empty()) return;
  if (may_stay && tavro_video_is_playable(path.c_str()))
    tavro_deleted_files_keep(path);
  else
    tavro_deleted_files_remove();
}

void _take_late(appdata *ad, const TavroText &asked, const TavroText &handle) {
  TAVRO_LOGD("late reply of the capture manager");
  if (handle) {
    if (_handle_from(handle.get()) != 0) send_cpmgr_drop(ad, _handle_from(handle.get()));
    return;
  }
  // The report was closed meanwhile, and the client is still aside.
  const bool is_awaited =
      asked && tavro_capture_is_under_way(asked.get()) && !ad->minicontrol_win && ad->recording_status == 0;
  if (is_awaited) {
    tavro_capture_stop_waiting();
    tavro_capture_release_file();
  }
  // A picture that nobody waits for any more goes at once: nothing is hidden in it.
  if (asked) tavro_deleted_files_note_copies({}, {asked.get()});
  tavro_deleted_files_remove();
  if (is_awaited) tavro_capture_get_windows().come_back(ad);
}

void _say_reason(app_control_h reply) {
  const TavroText reason = reply ? tavro_request_text(reply, "reason") : nullptr;
  if (reason && std::strcmp(reason.get(), TAVRO_CPMGR_STORAGE_FULL) == 0)
    notification_status_message_post(tavro_text("IDS_OB_TPOP_STORAGE_FULL"));
}

void _remove_video(const char *path) {
  if (std::remove(path) != 0) TAVRO_LOGD("Unable to delete empty mp4 file");
  std::remove(tavro_video_picture_path(path).c_str());  // one that was recorded has a picture
  const int ret = tavro_tell_media_database(path);
  if (ret != 0) TAVRO_LOGD("Unable to scan deleted file : %d, %s", ret, get_error_message(ret));
}

// A session has ended in which nothing was recorded: its file is empty.
void _drop_empty_video(appdata *ad) {
  const compose_view_win *view = tavro_capture_view(ad);
  if (!view || !view->filename || ad->cType != VIDEO) return;
  _remove_video(view->filename);
  ad->add_video_to_tavro = 0;
}

// Whoever has ended it.
void _end_session(appdata *ad) {
  const tavro_capture_windows &windows = tavro_capture_get_windows();
  tavro_capture_stop_waiting();
  device_remove_callback(DEVICE_CALLBACK_DISPLAY_STATE, on_device_changed_cb);  // it may be there
  windows.wait_for_panel(ad, false);
  windows.delete_control(ad);
  windows.delete_time(ad);
  ad->cpmgr_handle = 0;
  ad->recording_status = 0;
  ad->pause_on_lock = ad->video_paused = false;
  ad->cancel_video_recording = 0;
}

void _add_file(appdata *ad, const char *path, const char *file_type) {
  const bool is_video = file_type && std::strstr(file_type, "mp4");
  const tavro_capture_windows &windows = tavro_capture_get_windows();
  if (is_video && !windows.add_video(ad, path)) return tavro_deleted_files_keep(path);
  ad->image_list = g_slist_append(ad->image_list, TAVRO_STRDUP(path));
  if (is_video)
    notification_status_message_post(tavro_text("IDS_OB_TPOP_VIDEO_SAVED_IN_ORBEL"));
  else
    windows.add_picture(ad, path);
}

}  // namespace

void tavro_cpmgr_cb(app_control_h request, app_control_h reply, app_control_result_e result, void *data) {
  appdata *ad = static_cast<appdata *>(data);
  const TavroText handle = reply ? tavro_request_text(reply, "handle") : nullptr;
  const TavroText asked = request ? tavro_request_text(request, "outfilename") : nullptr;
  const TavroText session = request ? tavro_request_text(request, "handle") : nullptr;
  if (_is_late(asked, session, ad)) return _take_late(ad, asked, handle);
  if (handle) return _take_handle(ad, handle.get());
  if (ad->screen_recorder_is_latest == 1 && ad->recording_status == 0) _drop_empty_video(ad);
  if (result == APP_CONTROL_RESULT_SUCCEEDED) return tavro_cpmgr_on_get_eos_cb(0, ad);
  tavro_cpmgr_on_get_error_cb(0, ad);
  _say_reason(reply);
}

void tavro_cpmgr_on_get_eos_cb(int, appdata *ad) {
  if (ad->cType == IMAGE)
    notification_status_message_post(tavro_text("IDS_OB_TPOP_SCREENSHOT_SAVED_IN_ORBEL"));
  compose_view_win *view = tavro_capture_view(ad);
  const TavroText path(view ? std::exchange(view->filename, nullptr) : nullptr);
  const bool is_wanted = path && ad->add_video_to_tavro == 1;
  if (path && !is_wanted && ad->recording_status == 1) _remove_video(path.get());
  if (path) ad->add_video_to_tavro = 1;
  _end_session(ad);
  tavro_capture_get_windows().come_back(ad);
  // The client is in front by now: the picture opens a page.
  if (is_wanted) {
    tavro_capture_release_file();
    _add_file(ad, path.get(), view->file_type);
  } else {
    _settle_file(false);
  }
}

void tavro_cpmgr_on_get_error_cb(int, appdata *ad) {
  const tavro_capture_windows &windows = tavro_capture_get_windows();
  TAVRO_LOGE("ERROR from tavro_cpmgr");
  _give_up_session(ad);
  const bool is_wanted = ad->cancel_video_recording == 0 && ad->add_video_to_tavro != 0;
  _end_session(ad);
  ad->add_video_to_tavro = 1;
  _settle_file(is_wanted);
  tavro_capture_forget_file(ad);
  windows.come_back(ad);
  windows.show_failure(ad);
}

void tavro_capture_forget_file(appdata *ad) {
  if (compose_view_win *view = _any_view(ad)) TAVRO_FREE(view->filename);
  _settle_file(false);
}
