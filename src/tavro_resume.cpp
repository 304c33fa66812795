#include "tavro_resume.h"

#include <cstdint>
#include <cstring>

#include "tavro-common.h"
#include "tavro-main.h"
#include "tavro_accounts.h"
#include "tavro_log.h"
#include "tavro_not_yet.h"
#include "tavro_preferences.h"
#include "tavro_screens.h"
#include "tavro_service_bridge.h"

namespace {

unsigned _for_log(const void *pointer) {
  return static_cast<unsigned>(reinterpret_cast<uintptr_t>(pointer));
}

void _show_added_account(appdata *ad, GSList *accounts) {
  elm_object_item_del(ad->corvane_list_item);
  ad->corvane_list_item = nullptr;
  if (ad->account_layout) {
    tavro_free_account_list(accounts);
    if (tavro_add_account_result(ad) == 1) elm_naviframe_item_pop(ad->nf);
  } else {
    elm_naviframe_item_pop(ad->nf);
    tavro_create_account_page_ui(ad, accounts);
    tavro_free_account_list(accounts);
  }
}

// The entry "add the maker's account" had opened the platform's settings.
void _resume_add_account(appdata *ad) {
  elm_genlist_item_selected_set(ad->corvane_list_item, EINA_FALSE);
  GSList *accounts = tavro_find_mail_id();
  TAVRO_LOGD("account_list %x", _for_log(accounts));
  if (tavro_check_corvane_account_in_list(accounts)) {
    _show_added_account(ad, accounts);
  } else {
    tavro_free_account_list(accounts);
  }
  tavro_account_disconnect_db();
}

void _opt_in_from_details(appdata *ad) {
  Evas_Object *button = ad->beta_details_view ? tavro_beta_details_optin_button(ad) : nullptr;
  if (!button) return;
  elm_object_disabled_set(button, EINA_TRUE);
  const auto beta_id = static_cast<int>(reinterpret_cast<intptr_t>(evas_object_data_get(button, "betaid")));
  if (beta_id == 0) {
    TAVRO_LOGE("betaId is 0");
    return;
  }
  _tavro_launch_upload_mgr_svc(TAVRO_OPERATION_TYPE_OPT_IN_BETA, beta_id);
}

// The opt-in popup had sent the person to the settings for an account; with one, the opt-in goes on.
void _resume_optin(appdata *ad) {
  evas_object_del(ad->corvane_account_optin_popup);
  ad->corvane_account_optin_popup = nullptr;
  GSList *accounts = tavro_find_mail_id();
  const tavro_account_info *account = tavro_check_corvane_account_in_list(accounts);
  if (account && account->user_name) {
    preference_set_string(TAVRO_PREF_CORVANE_USER_NAME, account->user_name);
    _opt_in_from_details(ad);
  }
  tavro_free_account_list(accounts);
  tavro_account_disconnect_db();
}

bool _is_forum_title(const char *title) {
  return std::strcmp(title, "Discussions") == 0 || std::strcmp(title, "Start discussion") == 0;
}

}  // namespace

void tavro_resume_top_page(appdata *ad) {
  Elm_Object_Item *top = ad->nf ? elm_naviframe_top_item_get(ad->nf) : nullptr;
  if (!top) return;
  const char *shown_title = elm_object_item_part_text_get(top, "default");
  TAVRO_LOGD("item text : %s", shown_title ? shown_title : "(null)");
  const char *title = shown_title ? shown_title : "";
  if (std::strstr(title, tavro_text("IDS_OB_HEADER_ADD_ACCOUNT_ABB4")) && ad->corvane_list_item &&
      elm_genlist_item_selected_get(ad->corvane_list_item)) {
    _resume_add_account(ad);
  } else if (std::strcmp(title, "Select account") == 0) {
    tavro_refresh_account_page_items(ad);
  } else if (_is_forum_title(title)) {
    if (ad->webview) elm_object_focus_set(ad->webview, EINA_TRUE);
  } else if (ad->corvane_account_optin_popup) {
    _resume_optin(ad);
  }
}
