#include "tavro_lifecycle.h"

#include <cerrno>
#include <cstring>
#include <ctime>

#include "tavro-common.h"
#include "tavro-main.h"
#include "tavro_appdata.h"
#include "tavro_autosave.h"
#include "tavro_capture.h"
#include "tavro_compose_keeper.h"
#include "tavro_crash_report.h"
#include "tavro_dbmgr.h"
#include "tavro_log.h"
#include "tavro_memcheck.h"
#include "tavro_not_yet.h"
#include "tavro_preferences.h"
#include "tavro_recovery.h"
#include "tavro_report_delete.h"
#include "tavro_resume.h"
#include "tavro_service_bridge.h"
#include "tavro_version_check.h"

namespace {

constexpr int kAttachmentLimitKilobytes = 30720;

// A value of another type cannot be read and counts as absent.
void _seed_switch(const char *key, bool value) {
  bool stored = false;
  if (preference_get_boolean(key, &stored) != PREFERENCE_ERROR_NONE) preference_set_boolean(key, value);
}

// Each write waits for the disk, and a start has no time to lose: what is stored already is not written
// again.
void _write_number(const char *key, int value) {
  int stored = 0;
  const bool is_stored = preference_get_int(key, &stored) == PREFERENCE_ERROR_NONE && stored == value;
  if (!is_stored) preference_set_int(key, value);
}

void _seed_preferences() {
  _seed_switch(TAVRO_PREF_NOTIFY, true);
  _seed_switch(TAVRO_PREF_FEEDBACK, false);
  _seed_switch(TAVRO_PREF_ATTACH_LOGS, false);
}

// A half-made recording is stopped and dropped; a capture service that idles is told to end.
void _end_capture(appdata *ad) {
  if (!ad->minicontrol_win || ad->cType != VIDEO) return;
  if (ad->recording_status == 0) {
    if (ad->screen_recorder_is_latest == 1) send_cpmgr_shutdown(ad);
    return;
  }
  ad->add_video_to_tavro = 0;
  record_btn_clicked_cb(ad, nullptr, nullptr);
}

// Screens free their records with their widgets, so what the leak report names is a leak.
void _release_everything(appdata *ad) {
  if (ad->win) evas_object_del(ad->win);
  ad->win = nullptr;
  tavro_crash_report_at_end();
  tavro_dealloc_memory(ad);
}

}  // namespace

bool app_create(void *user_data) {
  auto *ad = static_cast<appdata *>(user_data);
  if (tavro_dbmgr_init_semaphore() == -1) return false;
  tavro_initialize_application_data(ad);
  const int update = check_version_update(ad);
  TAVRO_LOGD("ret value :%d", update);
  if (update == TAVRO_UPDATE_MANDATORY) {
    TAVRO_LOGD("update is mandatory");
    return true;
  }
  _seed_preferences();
  tavro_prepare_webview(ad);
  _write_number(TAVRO_PREF_MAX_SIZE_ATTACHMENT, kAttachmentLimitKilobytes);
  _write_number(TAVRO_PREF_FLASH_WINDOWS, 0);
  tavro_prepare_store();
  return true;
}

void app_pause(void *user_data) {
  TAVRO_LOGD("app pause");
  tavro_delete_finish(static_cast<appdata *>(user_data));
  tavro_compose_keeper_flush();
}

void app_resume(void *user_data) {
  auto *ad = static_cast<appdata *>(user_data);
  TAVRO_LOGD("app resume");
  _tavro_launch_upload_mgr_svc(TAVRO_OPERATION_TYPE_GET_BANNERS, 0);
  if (tavro_bind_locale() != 0) TAVRO_LOGD("tavro_bind_locale failed:%s", std::strerror(errno));
  tavro_resume_top_page(ad);
}

void app_terminate(void *user_data) {
  auto *ad = static_cast<appdata *>(user_data);
  TAVRO_LOGD("app terminate");
  tavro_delete_finish(ad);
  tavro_forget_due_version_popup();
  _end_capture(ad);
  if (preference_set_boolean(TAVRO_PREF_SYSLOGS, false) != PREFERENCE_ERROR_NONE) {
    TAVRO_LOGD("Preference reset value failed for TAVRO_PREF_SYSLOGS");
  }
  ewk_shutdown();
  tavro_compose_keeper_flush();  // should the store refuse the draft
  tavro_autosave_at_end(ad);
  _release_everything(ad);
  tavro_mem_report();
}

void tavro_register_event_handlers(appdata *ad) {
  app_event_handler_h handlers[4] = {};
  ui_app_add_event_handler(&handlers[0], APP_EVENT_LOW_BATTERY, ui_app_low_battery, ad);
  ui_app_add_event_handler(&handlers[1], APP_EVENT_LOW_MEMORY, ui_app_low_memory, ad);
  ui_app_add_event_handler(&handlers[2], APP_EVENT_DEVICE_ORIENTATION_CHANGED, ui_app_orient_changed, ad);
  ui_app_add_event_handler(&handlers[3], APP_EVENT_REGION_FORMAT_CHANGED, ui_app_region_changed, ad);
  // Kept: low memory is not handled. Language changes are handled on resume.
  ui_app_remove_event_handler(handlers[1]);
}

void ui_app_low_battery(app_event_info_h, void *) {}

void ui_app_low_memory(app_event_info_h, void *) {}

void ui_app_orient_changed(app_event_info_h, void *) {}

void ui_app_region_changed(app_event_info_h, void *) {}

void tavro_prepare_webview(appdata *ad) {
  int error = PREFERENCE_ERROR_NONE;
  const TavroText user_name = tavro_preference_text(TAVRO_PREF_USERNAME, &error);
  if (!user_name) {
    TAVRO_LOGD("failed to get username:%d %s", error, get_error_message(error));
    return;
  }
  if (!tavro_check_cookie_expiry()) return;
  ad->load_urls_to_webview = 0;
  _tavro_launch_upload_mgr_svc(TAVRO_OPERATION_TYPE_GET_BOARDS_URL, 0);
}

bool tavro_check_cookie_expiry() {
  return std::time(nullptr) > tavro_preference_int(TAVRO_PREF_COOKIE_EXPIRY_TIME, 0);
}
