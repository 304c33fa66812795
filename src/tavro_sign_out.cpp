#include "tavro_sign_out.h"

#include <notification.h>

#include <utility>

#include "tavro-common.h"
#include "tavro-main.h"
#include "tavro_appdata.h"
#include "tavro_autosave.h"
#include "tavro_compose.h"
#include "tavro_compose_keeper.h"
#include "tavro_log.h"
#include "tavro_notifications.h"
#include "tavro_preferences.h"
#include "tavro_report_delete.h"
#include "tavro_screens.h"
#include "tavro_start.h"

namespace {

// What the person or the service stored for the account alone.
constexpr const char *kAccountKeys[] = {
    TAVRO_PREF_USERNAME,   TAVRO_PREF_PASSWORD,    TAVRO_PREF_ACCOUNT_DOMAIN,     TAVRO_PREF_DOMAIN,
    TAVRO_PREF_COOKIE_VAL, TAVRO_PREF_COOKIE_NAME, TAVRO_PREF_COOKIE_EXPIRY_TIME, TAVRO_PREF_BETA_TESTING_URL,
};

// While the account is still known: records are stored under its name. Whether the store took a draft.
bool _keep_what_is_written(appdata *ad) {
  if (!tavro_compose_view(ad)) return false;
  tavro_compose_keeper_flush();  // should the store refuse the draft
  const bool is_stored = tavro_autosave_at_end(ad);
  tavro_autosave_stop();
  return is_stored;
}

void _remove_account() {
  for (const char *key : kAccountKeys) {
    const int error = preference_remove(key);
    if (error != PREFERENCE_ERROR_NONE && error != PREFERENCE_ERROR_NO_KEY) {
      TAVRO_LOGE("%s cannot be removed: %d %s", key, error, get_error_message(error));
    }
  }
}

// A report that is still being sent reports back without a word, since nobody is signed in.
void _remove_notifications(appdata *ad) {
  tavro_remove_sending_notification(ad);
  const int error = notification_delete_all(NOTIFICATION_TYPE_NOTI);
  if (error != NOTIFICATION_ERROR_NONE) {
    TAVRO_LOGE("notification_delete_all failed: %d, %s", error, get_error_message(error));
  }
  ad->push_noti_count = 0;
  tavro_remove_noti_badge_on_appicon();
}

void _forget_in_memory(appdata *ad) {
  ad->load_urls_to_webview = 0;
  ad->cookie_set = 0;
  ad->bType = UNKNOWN_STATUS;
  ad->betaLType = BETA_TYPE_NA;
}

// A client that must be replaced is not used by the next person either.
void _close_popups(appdata *ad) {
  Evas_Object *update = std::exchange(ad->version_popup, nullptr);
  tavro_delete_all_popup(ad);
  ad->version_popup = update;
}

// The account page is pushed first: a naviframe without a page would paint one frame of nothing.
void _leave_all_pages(appdata *ad) {
  ad->landing_nf_it = nullptr;
  tavro_create_account_page(ad);
  const void *top = elm_naviframe_top_item_get(ad->nf);
  void *page = nullptr;
  Eina_List *pages = elm_naviframe_items_get(ad->nf);
  EINA_LIST_FREE(pages, page) {
    if (page != top) elm_object_item_del(static_cast<Elm_Object_Item *>(page));
  }
}

}  // namespace

void tavro_sign_out(appdata *ad) {
  tavro_delete_finish(ad);
  const bool is_draft_kept = _keep_what_is_written(ad);
  _remove_account();
  _remove_notifications(ad);
  _forget_in_memory(ad);
  if (tavro_is_ending()) return;
  if (ad->win) {
    _close_popups(ad);
    _leave_all_pages(ad);
  } else {
    tavro_handle_null_window(ad);
  }
  tavro_account_page_say(
      ad, tavro_text(is_draft_kept ? "IDS_OB_BODY_SIGNED_OUT_DRAFT" : "IDS_OB_BODY_SIGNED_OUT"));
}
