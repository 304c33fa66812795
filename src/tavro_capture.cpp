#include "tavro_capture.h"

#include <package_manager.h>
#include <system_info.h>

#include <cstdio>
#include <cstring>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

#include "tavro-common.h"
#include "tavro_app_control_handle.h"
#include "tavro_deleted_files.h"
#include "tavro_drafts.h"
#include "tavro_handles.h"
#include "tavro_log.h"
#include "tavro_preferences.h"
#include "tavro_request.h"

// "xserver", or "GStreamer" where the capture manager keeps no sessions.
#ifndef TAVRO_CAPTURE_METHOD
#define TAVRO_CAPTURE_METHOD "xserver"
#endif

namespace {

constexpr std::string_view kMethod = TAVRO_CAPTURE_METHOD;
constexpr bool kKeepsSessions = kMethod != "GStreamer";
constexpr int kLastOldMicro = 13;  // of the capture manager's version

// Keys and values of a message, in the order of sending.
using extras = std::vector<std::pair<const char *, std::string>>;

// Devices that keep up with more pictures a second than the others.
constexpr struct {
  const char *model;
  const char *fps;
} kFastModels[] = {{"Vantor V10", "10"}};
constexpr char kUsualFps[] = "2";

// Before the first capture there are no windows, though any program may report a failed one.
constexpr auto kNothing = [](appdata *) {};
constexpr auto kNoFile = [](appdata *, const char *) {};
constexpr auto kNoFlag = [](appdata *, bool) {};
constexpr tavro_capture_windows kNoWindows = {[](appdata *) { return false; },
                                              kNothing,
                                              kNothing,
                                              kNothing,
                                              kNothing,
                                              kNothing,
                                              kNothing,
                                              kNothing,
                                              kNothing,
                                              kNoFlag,
                                              [](appdata *) -> const char * { return nullptr; },
                                              kNoFile,
                                              kNoFlag,
                                              kNothing,
                                              kNothing,
                                              kNoFile,
                                              [](appdata *, const char *) { return false; }};
const tavro_capture_windows *_windows = &kNoWindows;

std::string _file;  // that is under way

void _replace(char *&text, const char *value) {
  TAVRO_FREE(text);
  text = TAVRO_STRDUP(value);
}

// The name becomes the open record's. Empty when the folder cannot be made.
std::string _new_file(appdata *ad, const char *extension) {
  char name[kGeneratedFilenameSize] = {};
  tavro_generate_filename(name, extension);
  _file = name;
  tavro_deleted_files_set_unfinished(_file);
  if (compose_view_win *view = tavro_capture_view(ad)) _replace(view->filename, name);
  return name;
}

// ---- Values ----

const char *_quality() {
  int quality = 0;
  const int ret = preference_get_int(TAVRO_PREF_QUALITY, &quality);
  if (ret != PREFERENCE_ERROR_NONE) {
    TAVRO_LOGD("failed to get preference_string, tavro_hoverstyle:%d", ret);
    quality = 0;
  }
  return quality == 0 ? "HIGH" : quality == 1 ? "MID" : "LOW";
}

const char *_fps() {
  char *text = nullptr;
  if (system_info_get_platform_string(SYSTEM_INFO_KEY_MODEL_NAME, &text) != SYSTEM_INFO_ERROR_NONE)
    return kUsualFps;
  const TavroText model(TAVRO_ADOPT(text));
  for (const auto &fast : kFastModels)
    if (model && std::strcmp(model.get(), fast.model) == 0) return fast.fps;
  return kUsualFps;
}

void _add_video_values(extras *values, const std::string &file) {
  values->insert(values->end(), {{"outfilename", file},
                                 {"video_quality", _quality()},
                                 {"video_fps", _fps()},
                                 {"video_width", "480"},
                                 {"video_height", "640"}});
}

// ---- Sending ----

bool _fill(app_control_h request, const extras &values) {
  for (const auto &[key, value] : values) {
    if (app_control_add_extra_data(request, key, value.c_str()) == APP_CONTROL_ERROR_NONE) continue;
    TAVRO_LOGE("App control add extra data failed");
    return false;
  }
  // Kept: a message without its operation is still sent.
  if (app_control_set_operation(request, APP_CONTROL_OPERATION_DEFAULT) != APP_CONTROL_ERROR_NONE)
    TAVRO_LOGE("App control set operation failed");
  if (app_control_set_app_id(request, TAVRO_CPMGR_ID) == APP_CONTROL_ERROR_NONE) return true;
  TAVRO_LOGE("App control set app id failed");
  return false;
}

bool _send(appdata *ad, const extras &values, app_control_reply_cb replied = tavro_cpmgr_cb) {
  int error = APP_CONTROL_ERROR_NONE;
  const TavroRequest request = tavro_request_create(&error);
  if (!request) {
    TAVRO_LOGE("App control create failed");
    return false;
  }
  if (!_fill(request.get(), values)) return false;
  if (app_control_send_launch_request(request.get(), replied, ad) == APP_CONTROL_ERROR_NONE) return true;
  TAVRO_LOGE("App control send launch request failed");
  return false;
}

// ---- The capture manager's version ----

using PackageInfo = TavroHandle<std::remove_pointer_t<package_info_h>, package_info_destroy>;

// False after a log line. The version may be absent all the same.
bool _read_version(TavroText *version) {
  PackageInfo info;
  if (package_manager_get_package_info(TAVRO_CPMGR_ID, tavro_out(info)) != PACKAGE_MANAGER_ERROR_NONE) {
    TAVRO_LOGD("Unable to get the package info");
    return false;
  }
  char *text = nullptr;
  if (package_info_get_version(info.get(), &text) != PACKAGE_MANAGER_ERROR_NONE) {
    TAVRO_LOGD("Unable to get the package version");
    return false;
  }
  version->reset(TAVRO_ADOPT(text));
  return true;
}

// Kept: the third number alone decides, so 1.0.14 is new and 2.0.13 is old.
bool _is_latest(const char *version) {
  int major = 0, minor = 0, micro = 0;
  std::sscanf(version, "%9d.%9d.%9d", &major, &minor, &micro);
  return micro > kLastOldMicro;
}

}  // namespace

void tavro_capture_set_windows(const tavro_capture_windows *windows) {
  _windows = windows;
}

const tavro_capture_windows &tavro_capture_get_windows() {
  return *_windows;
}

compose_view_win *tavro_capture_view(const appdata *ad) {
  if (ad->type == IDEA) return ad->idea_view;
  return ad->problem_view;
}

bool tavro_capture_is_under_way(const char *path) {
  return _file == path;
}

std::string tavro_capture_release_file() {
  tavro_deleted_files_set_unfinished("");
  return std::exchange(_file, {});
}

void send_cpmgr_init(appdata *ad) {
  if (!kKeepsSessions) {
    TAVRO_LOGD("Init event called for GStreamer.. Returning");
    return;
  }
  TavroText version;
  if (!_read_version(&version)) return;
  ad->screen_recorder_is_latest = 0;
  if (!version) {
    TAVRO_LOGD("version info is null");
    return;
  }
  if (!_is_latest(version.get())) {
    TAVRO_LOGD("Older version of binary present .. Returning");
    return;
  }
  ad->screen_recorder_is_latest = 1;
  if (ad->cpmgr_handle != 0) {
    send_cpmgr_drop(ad, ad->cpmgr_handle);
    ad->cpmgr_handle = 0;
  }
  extras values = {{"action_type", "Video_Init"}, {"impl_method", std::string(kMethod)}};
  _add_video_values(&values, _new_file(ad, "mp4"));
  if (_send(ad, values)) TAVRO_LOGD("Sent video init event");
}

void send_cpmgr_drop(appdata *ad, int handle) {
  _send(ad, {{"action_type", "Video_Stop"}, {"handle", std::to_string(handle)}}, nullptr);
}

void send_cpmgr_shutdown(appdata *ad) {
  if (!kKeepsSessions) {
    TAVRO_LOGD("cpmgr shutdown called for GStreamer ... Returning");
  } else if (ad->screen_recorder_is_latest == 0) {
    TAVRO_LOGD("Not the latest binary");
  } else if (ad->cpmgr_handle == 0) {
    TAVRO_LOGD("Video shutdown already done");
  } else if (send_cpmgr_action(ad, "Video_Shutdown")) {
    tavro_capture_wait(ad, TAVRO_CAPTURE_END);
    ad->cpmgr_handle = 0;
    TAVRO_LOGD("Sent Video Shutdown event");
  }
}

bool send_cpmgr_start(appdata *ad) {
  if (compose_view_win *view = tavro_capture_view(ad)) _replace(view->file_type, "mp4");
  extras values = {{"action_type", "Video_Start"},
                   {"impl_method", std::string(kMethod)},
                   {"handle", std::to_string(ad->cpmgr_handle)}};
  if (ad->screen_recorder_is_latest == 0) _add_video_values(&values, _new_file(ad, "mp4"));
  return _send(ad, values);
}

bool send_cpmgr_action(appdata *ad, const char *action_type) {
  return _send(ad, {{"action_type", action_type}, {"handle", std::to_string(ad->cpmgr_handle)}});
}

void take_snapshot(appdata *ad) {
  _windows->delete_control(ad);
  compose_view_win *view = tavro_capture_view(ad);
  if (!view) {
    TAVRO_LOGD("%s", ad->type == IDEA ? "idea_view is NULL" : "problem_view is NULL");
    _windows->come_back(ad);
    return;
  }
  const std::string file = _new_file(ad, "jpg");
  _replace(view->file_type, "jpg");
  const bool is_sent = _send(ad, {{"impl_method", std::string(kMethod)},
                                  {"action_type", "Screenshot"},
                                  {"orientation", std::to_string(ad->device_orientation)},
                                  {"outfilename", file}});
  // Otherwise no reply will come, and nobody else would bring the client back.
  if (is_sent)
    tavro_capture_wait(ad, TAVRO_CAPTURE_PICTURE);
  else
    tavro_cpmgr_on_get_error_cb(0, ad);
}
