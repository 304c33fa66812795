#include "tavro_version_check.h"

#include <app.h>
#include <efl_extension.h>

#include <cstdlib>
#include <cstring>
#include <ctime>

#include "tavro-common.h"
#include "tavro-main.h"
#include "tavro_appdata.h"
#include "tavro_log.h"
#include "tavro_preferences.h"
#include "tavro_service_bridge.h"
#include "tavro_start.h"

namespace {

constexpr long kResultNeedsUpdate = 2;
constexpr unsigned long long kMillisecondsPerSecond = 1000;
constexpr unsigned long long kOfferAgainMilliseconds = 86400000;
constexpr char kMajor[] = "MAJOR";
constexpr char kMinor[] = "MINOR";
constexpr char kStorePage[] = "tizenstore://ProductDetail/corvane.tavro-lite";

// The kind of the popup that waits for a window; null when none does.
const char *due_kind = nullptr;

TavroText _own_version() {
  char *version = nullptr;
  const int ret = app_get_version(&version);
  if (ret != APP_ERROR_NONE || !version) {
    TAVRO_LOGE("no version of this application: %d %s", ret, get_error_message(ret));
    return nullptr;
  }
  return TavroText(TAVRO_ADOPT(version));
}

TavroText _read_logged(const char *key, const char *what) {
  int error = PREFERENCE_ERROR_NONE;
  TavroText value = tavro_preference_text(key, &error);
  if (!value) TAVRO_LOGD("failed to get %s:%d %s", what, error, get_error_message(error));
  return value;
}

// Wall-clock milliseconds since the epoch, the time base in which the service writes its answer.
unsigned long long _now_milliseconds() {
  return static_cast<unsigned long long>(std::time(nullptr)) * kMillisecondsPerSecond;
}

bool _a_day_passed_since_offer() {
  const unsigned long long now = _now_milliseconds();
  TAVRO_LOGD("Current time: %llu", now);
  const TavroText last_text = _read_logged(TAVRO_PREF_APP_UPDATE_TIME, "update_time");
  TAVRO_LOGD("Last updated time: %s", last_text ? last_text.get() : "(null)");
  const unsigned long long last = last_text ? std::strtoull(last_text.get(), nullptr, 10) : 0;
  // A time ahead of the clock (the clock was set back) is no passed day; unsigned subtraction would say so.
  return now >= last && now - last >= kOfferAgainMilliseconds;
}

void _offer_minor_update(appdata *ad) {
  int error = PREFERENCE_ERROR_NONE;
  const TavroText offered = tavro_preference_text(TAVRO_PREF_UPDATE, &error);
  if (offered) {
    if (_a_day_passed_since_offer()) tavro_create_version_update_popup(ad, kMinor);
    return;
  }
  TAVRO_LOGD("Failed to get preference: %d %s", error, get_error_message(error));
  error = preference_set_string(TAVRO_PREF_UPDATE, "updated");
  if (error != PREFERENCE_ERROR_NONE) {
    TAVRO_LOGE("%s cannot be stored: %d %s", TAVRO_PREF_UPDATE, error, get_error_message(error));
  }
  tavro_create_version_update_popup(ad, kMinor);
}

int _compare_versions(appdata *ad) {
  TAVRO_LOGD("need to update");
  const TavroText kind = _read_logged(TAVRO_PREF_APP_VERSION_CHANGE, "version_change");
  const TavroText offered = _read_logged(TAVRO_PREF_APP_VERSION, "version");
  TAVRO_LOGD("update_version_available:%s", offered ? offered.get() : "(null)");
  const TavroText current = _own_version();
  TAVRO_LOGD("current_version_available:%s", current ? current.get() : "(null)");
  if (!kind || !offered || !current) return TAVRO_UPDATE_OPTIONAL;
  if (std::strcmp(offered.get(), current.get()) == 0) return TAVRO_UPDATE_OPTIONAL;
  if (std::strcmp(kind.get(), "major") == 0) {
    tavro_create_version_update_popup(ad, kMajor);
    return TAVRO_UPDATE_MANDATORY;
  }
  if (std::strcmp(kind.get(), "minor") == 0) _offer_minor_update(ad);
  return TAVRO_UPDATE_OPTIONAL;
}

void _leave_clicked(appdata *ad) {
  tavro_request_exit(ad);
}

void _leave_back_cb(void *data, Evas_Object *, void *) {
  tavro_request_exit(static_cast<appdata *>(data));
}

// A client that must be replaced is not used meanwhile: the back key does not lead past this popup.
void _show(appdata *ad, bool is_mandatory, const char *header_id, const char *body_id,
           std::initializer_list<tavro_popup_button> buttons) {
  Evas_Object *popup =
      tavro_popup_show(ad, &ad->version_popup, tavro_text(header_id), tavro_text(body_id), buttons);
  if (popup && is_mandatory) eext_object_event_callback_add(popup, EEXT_CALLBACK_BACK, _leave_back_cb, ad);
}

void _open_store(appdata *ad, bool is_mandatory) {
  const bool is_opened = _tavro_launch_app_store(kStorePage);
  if (is_opened && is_mandatory) tavro_request_exit(ad);
  if (is_opened) return;
  _show(ad, is_mandatory, "IDS_OB_HEADER_NO_APP_STORE", "IDS_OB_POP_NO_APP_STORE",
        {is_mandatory ? tavro_popup_button{tavro_text("IDS_OB_BUTTON_EXIT"), _leave_clicked}
                      : tavro_popup_button{tavro_text("IDS_OB_BUTTON_OK"), nullptr}});
}

void _mandatory_clicked(appdata *ad) {
  _open_store(ad, true);
}

void _optional_clicked(appdata *ad) {
  _open_store(ad, false);
}

}  // namespace

int check_version_update(appdata *ad) {
  const TavroText code_text = _read_logged(TAVRO_PREF_APP_RESULT_CODE, "result_code");
  if (!code_text) return TAVRO_UPDATE_UNKNOWN;
  const long code = std::strtol(code_text.get(), nullptr, 10);
  TAVRO_LOGD("result:%d", static_cast<int>(code));
  return code == kResultNeedsUpdate ? _compare_versions(ad) : TAVRO_UPDATE_NOT_NEEDED;
}

void tavro_create_version_update_popup(appdata *ad, const char *kind) {
  const bool is_major = std::strcmp(kind, kMajor) == 0;
  due_kind = nullptr;
  if (!ad->win) {
    due_kind = is_major ? kMajor : kMinor;
    return;
  }
  const tavro_popup_button leave = {tavro_text("IDS_OB_BUTTON_EXIT"), _leave_clicked};
  const tavro_popup_button later = {tavro_text("IDS_OB_BUTTON_LATER"), nullptr};
  _show(ad, is_major, "IDS_OB_HEADER_UPDATE_AVAILABLE",
        is_major ? "IDS_OB_POP_UPDATE_MANDATORY" : "IDS_OB_POP_UPDATE_OPTIONAL",
        {is_major ? leave : later,
         {tavro_text("IDS_OB_BUTTON_UPDATE"), is_major ? _mandatory_clicked : _optional_clicked}});
}

bool tavro_version_popup_is_up(const appdata *ad) {
  return ad->version_popup || due_kind;
}

void tavro_show_due_version_popup(appdata *ad) {
  if (!due_kind) return;
  tavro_handle_null_window(ad);
  tavro_create_version_update_popup(ad, due_kind);
}

void tavro_forget_due_version_popup() {
  if (!due_kind) return;
  due_kind = nullptr;
  preference_remove(TAVRO_PREF_UPDATE);
}
