// First run: what this application is, and under which of the phone's accounts to report.
#include <account.h>
#include <app.h>
#include <app_preference.h>
#include <elm_atspi.h>

#include <cstring>
#include <string>

#include "tavro-common.h"
#include "tavro-main.h"
#include "tavro_accounts.h"
#include "tavro_log.h"
#include "tavro_memory.h"
#include "tavro_preferences.h"
#include "tavro_screens.h"
#include "tavro_share.h"
#include "tavro_widgets.h"

namespace {

constexpr int kMaxNameLength = 120;
constexpr char kTitle[] = "Select account";  // fixed: coming back to the application looks for it

struct account_page;
account_page *_open_page = nullptr;  // there is one at most

struct account_page {
  appdata *ad;
  Evas_Object *page;
  Evas_Object *list;  // box of the rows
  Evas_Object *name_field;
  Evas_Object *name_entry;  // null until "Another account" is touched
  GSList *accounts;
  Ecore_Job *rebuild;                // null unless the list is about to be shown anew
  const tavro_account_info *chosen;  // null: the name that is typed
};

const char *_shown_name(const tavro_account_info *account) {
  return account->display_name && *account->display_name ? account->display_name : account->user_name;
}

void _show_rows(account_page *view);

// The clicked row goes with the rebuilt list, but not from inside its own callback.
void _rebuild_job(void *data) {
  account_page *view = static_cast<account_page *>(data);
  view->rebuild = nullptr;
  _show_rows(view);
}

void _row_clicked_cb(void *data, Evas_Object *row, void *) {
  account_page *view = static_cast<account_page *>(data);
  view->chosen = static_cast<const tavro_account_info *>(evas_object_data_get(row, "account"));
  if (!view->rebuild) view->rebuild = ecore_job_add(_rebuild_job, view);
}

Evas_Object *_build_account_row(account_page *view, const tavro_account_info *account) {
  const char *second = account->email && *account->email ? account->email : account->user_name;
  Evas_Object *mark = view->chosen == account ? tavro_icon_add(view->list, "check/accent") : nullptr;
  Evas_Object *row =
      tavro_row_add(view->list, "person", _shown_name(account), second, mark, _row_clicked_cb, view);
  evas_object_data_set(row, "account", account);
  elm_box_pack_end(view->list, row);
  return row;
}

void _build_name_field(account_page *view) {
  Evas_Object *margins = tavro_layout_add(view->list, "tavro/margins");
  tavro_fill_width(margins);
  Evas_Object *field = nullptr;
  view->name_entry = tavro_field_add(margins, tavro_text("IDS_OB_BODY_YOUR_NAME"), true, &field);
  elm_object_content_set(margins, field);
  elm_box_pack_end(view->list, margins);
  elm_object_focus_set(view->name_entry, EINA_TRUE);
}

void _show_rows(account_page *view) {
  const bool has_focus = elm_object_focus_get(view->list);
  elm_box_clear(view->list);
  view->name_entry = nullptr;
  for (const GSList *link = view->accounts; link; link = link->next) {
    const auto *account = static_cast<const tavro_account_info *>(link->data);
    Evas_Object *row = _build_account_row(view, account);
    if (has_focus && account == view->chosen) elm_object_focus_set(row, EINA_TRUE);
  }
  Evas_Object *other_mark = view->chosen ? nullptr : tavro_icon_add(view->list, "check/accent");
  elm_box_pack_end(view->list, tavro_row_add(view->list, "plus", tavro_text("IDS_OB_BODY_ANOTHER_ACCOUNT"),
                                             nullptr, other_mark, _row_clicked_cb, view));
  if (!view->chosen) _build_name_field(view);
}

// Add the typed name to the phone's accounts, so that it is offered again.
void _remember_account(const char *user_name) {
  account_h account = nullptr;
  if (account_create(&account) != ACCOUNT_ERROR_NONE) return;
  account_set_user_name(account, user_name);
  account_set_package_name(account, "corvane.tavro-lite");
  int id = 0;
  account_connect();
  const int error = account_insert_to_db(account, &id);
  if (error != ACCOUNT_ERROR_NONE && error != ACCOUNT_ERROR_DUPLICATED)
    TAVRO_LOGD("account_insert_to_db failed:%d", error);
  account_disconnect();
  account_destroy(account);
}

TavroText _typed_name(const account_page *view) {
  TavroText text(TAVRO_ADOPT(elm_entry_markup_to_utf8(elm_entry_entry_get(view->name_entry))));
  if (text) g_strstrip(text.get());
  return text;
}

void _continue_clicked_cb(void *data, Evas_Object *, void *) {
  account_page *view = static_cast<account_page *>(data);
  appdata *ad = view->ad;
  TavroText user_name(view->chosen ? TAVRO_STRDUP(view->chosen->user_name) : _typed_name(view).release());
  if (!user_name || !*user_name.get() || g_utf8_strlen(user_name.get(), -1) > kMaxNameLength) {
    tavro_popup_show(ad, &ad->signout_popup, tavro_text("IDS_OB_HEADER_NOT_YET"),
                     tavro_text("IDS_OB_BODY_GAP_NAME"), {{tavro_text("IDS_OB_BUTTON_OK"), nullptr}});
    return;
  }
  if (!view->chosen) _remember_account(user_name.get());
  const int error = preference_set_string(TAVRO_PREF_USERNAME, user_name.get());
  if (error != PREFERENCE_ERROR_NONE) {
    TAVRO_LOGE("the account cannot be stored: %d", error);
    tavro_popup_show(ad, &ad->signout_popup, tavro_text("IDS_OB_HEADER_NOT_STORED"),
                     tavro_text("IDS_OB_BODY_NAME_NOT_STORED"), {{tavro_text("IDS_OB_BUTTON_OK"), nullptr}});
    return;
  }
  preference_remove(TAVRO_PREF_PREFERENCE);
  tavro_create_landing_page(ad);
  // The landing page lies on top now; without this one below it, back leads out of the application.
  Elm_Object_Item *below = elm_naviframe_bottom_item_get(ad->nf);
  if (below != ad->landing_nf_it) elm_object_item_del(below);
  tavro_attach_waiting_files(ad);
}

void _page_deleted_cb(void *data, Evas *, Evas_Object *, void *) {
  account_page *view = static_cast<account_page *>(data);
  if (view->rebuild) ecore_job_del(view->rebuild);
  tavro_free_account_list(view->accounts);
  _open_page = nullptr;
  view->ad->account_layout = nullptr;
  TAVRO_FREE(view);
}

void _build_texts(Evas_Object *page) {
  elm_object_part_content_set(page, "mark_icon", tavro_icon_add(page, "chat/large"));
  elm_object_part_text_set(page, "elm.text.title", "Vantor Community");
  elm_object_part_text_set(page, "elm.text.sub", tavro_text("IDS_OB_BODY_WELCOME"));
  elm_object_part_text_set(page, "note", tavro_text("IDS_OB_BODY_ACCOUNT_NOTE"));
}

void _build_list(account_page *view) {
  Evas_Object *scroller = nullptr;
  Evas_Object *box = tavro_scrolled_box_add(view->page, &scroller);
  Evas_Object *caption = tavro_layout_add(box, "tavro/section");
  tavro_fill_width(caption);
  elm_object_text_set(caption, tavro_text("IDS_OB_HEADER_REPORT_AS"));
  elm_box_pack_end(box, caption);
  view->list = elm_box_add(box);
  tavro_fill_width(view->list);
  evas_object_show(view->list);
  elm_box_pack_end(box, view->list);
  elm_object_content_set(view->page, scroller);
}

}  // namespace

void tavro_refresh_account_page_items(appdata *) {
  account_page *view = _open_page;
  if (!view) return;
  const TavroText chosen(view->chosen ? TAVRO_STRDUP(view->chosen->user_name) : nullptr);
  tavro_free_account_list(view->accounts);
  view->accounts = tavro_find_mail_id();
  tavro_account_disconnect_db();
  // A name that is being typed stays; only a choice among the accounts is shown anew.
  if (!chosen) return;
  view->chosen = nullptr;
  for (const GSList *link = view->accounts; link && !view->chosen; link = link->next) {
    const auto *account = static_cast<const tavro_account_info *>(link->data);
    if (g_strcmp0(account->user_name, chosen.get()) == 0) view->chosen = account;
  }
  if (!view->chosen && view->accounts)
    view->chosen = static_cast<const tavro_account_info *>(view->accounts->data);
  _show_rows(view);
}

void tavro_account_page_say(appdata *ad, const char *text) {
  if (!ad->account_layout) return;
  tavro_layout_text_set(ad->account_layout, "elm.text.sub", text);
  elm_atspi_accessible_name_set(ad->account_layout, text);
}

void tavro_create_account_page(appdata *ad) {
  if (!ad->nf || ad->account_layout) return;
  account_page *view = _open_page = TAVRO_ZALLOC(account_page);
  view->ad = ad;
  view->accounts = tavro_find_mail_id();
  tavro_account_disconnect_db();
  if (view->accounts) view->chosen = static_cast<const tavro_account_info *>(view->accounts->data);
  view->page = ad->account_layout = tavro_layout_add(ad->nf, "tavro/account");
  evas_object_event_callback_add(view->page, EVAS_CALLBACK_FREE, _page_deleted_cb, view);
  _build_texts(view->page);
  _build_list(view);
  _show_rows(view);
  Evas_Object *button = tavro_button_add(view->page, "tavro_primary", tavro_text("IDS_OB_BUTTON_CONTINUE"),
                                         nullptr, nullptr, _continue_clicked_cb, view);
  elm_object_part_content_set(view->page, "tavro.swallow.button", button);
  Elm_Object_Item *item = tavro_page_push(ad, view->page, kTitle);
  elm_naviframe_item_pop_cb_set(
      item,
      [](void *, Elm_Object_Item *) -> Eina_Bool {
        ui_app_exit();
        return EINA_FALSE;
      },
      nullptr);
}
