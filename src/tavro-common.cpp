#include "tavro-common.h"

#include <app.h>
#include <efl_extension.h>
#include <sys/stat.h>

#include <cerrno>
#include <cstring>
#include <string>
#include <vector>

#include "tavro-main.h"
#include "tavro_focus.h"
#include "tavro_log.h"
#include "tavro_theme.h"
#include "tavro_widgets.h"

namespace {

constexpr int kWindowWidthUnits = 360;
constexpr int kWindowHeightUnits = 640;

tavro_page_guard _guard{};

void _close_requested_cb(void *data, Evas_Object *, void *) {
  appdata *ad = static_cast<appdata *>(data);
  if (!_guard.may_close || _guard.may_close(ad)) ui_app_exit();
}

void _win_deleted_cb(void *data, Evas *, Evas_Object *, void *) {
  appdata *ad = static_cast<appdata *>(data);
  ad->win = ad->conform = ad->layout = ad->nf = nullptr;
  ad->landing_nf_it = nullptr;
}

Evas_Object *_build_window(appdata *ad) {
  Evas_Object *win = elm_win_add(nullptr, "corvane.tavro-lite", ELM_WIN_BASIC);
  if (!win) return nullptr;
  elm_win_title_set(win, "Vantor Community");
  evas_object_smart_callback_add(win, "delete,request", _close_requested_cb, ad);
  evas_object_event_callback_add(win, EVAS_CALLBACK_DEL, _win_deleted_cb, ad);
  tavro_focus_hide_at_touch(win);
  const double scale = elm_config_scale_get();
  evas_object_resize(win, static_cast<int>(kWindowWidthUnits * scale),
                     static_cast<int>(kWindowHeightUnits * scale));
  return win;
}

void _back_key_cb(void *data, Evas_Object *, void *) {
  appdata *ad = static_cast<appdata *>(data);
  elm_naviframe_item_pop(ad->nf);
}

std::vector<Evas_Object **> _slots(appdata *ad) {
  return {
      &ad->version_popup,      &ad->delete_fd_popup, &ad->delete_popup,     &ad->history_edit_popup,
      &ad->history_file_popup, &ad->settings_popup,  &ad->imgedit_popup,    &ad->cancel_popup,
      &ad->connection_popup,   &ad->crash_popup,     &ad->signout_popup,    &ad->crashpopup_win,
      &ad->cpmgr_popup,        &ad->quit_beta_popup, &ad->next_steps_popup, &ad->corvane_account_optin_popup,
      &ad->opt_out_popup,
  };
}

}  // namespace

void tavro_set_page_guard(const tavro_page_guard &guard) {
  _guard = guard;
}

bool tavro_create_base_window(appdata *ad) {
  if (ad->win) return true;
  tavro_theme_load();
  ad->win = _build_window(ad);
  if (!ad->win) {
    TAVRO_LOGE("no window can be made: is there a display?");
    return false;
  }
  ad->conform = elm_conformant_add(ad->win);
  evas_object_size_hint_weight_set(ad->conform, EVAS_HINT_EXPAND, EVAS_HINT_EXPAND);
  elm_win_resize_object_add(ad->win, ad->conform);
  evas_object_show(ad->conform);
  ad->layout = tavro_layout_add(ad->conform, "tavro/base");
  elm_object_content_set(ad->conform, ad->layout);
  ad->nf = elm_naviframe_add(ad->layout);
  elm_naviframe_prev_btn_auto_pushed_set(ad->nf, EINA_FALSE);
  tavro_focus_follow_pages(ad->nf);
  eext_object_event_callback_add(ad->nf, EEXT_CALLBACK_BACK, _back_key_cb, ad);
  evas_object_show(ad->nf);
  elm_object_content_set(ad->layout, ad->nf);
  evas_object_show(ad->win);
  return true;
}

int tavro_create_dir(const char *path) {
  std::string made;
  for (const char *part = path; *part;) {
    const char *slash = std::strchr(part + 1, '/');
    made.assign(path, slash ? static_cast<size_t>(slash - path) : std::strlen(path));
    if (mkdir(made.c_str(), 0700) != 0 && errno != EEXIST) {
      TAVRO_LOGD("cannot make folder %s: %s", made.c_str(), std::strerror(errno));
      return -1;
    }
    if (!slash) break;
    part = slash;
  }
  struct stat info {};
  return stat(path, &info) == 0 && S_ISDIR(info.st_mode) ? 0 : -1;
}

void tavro_pop_naviframe_middle_items(appdata *ad) {
  if (!ad->nf || !ad->landing_nf_it) return;
  Elm_Object_Item *kept = _guard.kept_page ? _guard.kept_page(ad) : nullptr;
  elm_naviframe_item_pop_to(kept ? kept : ad->landing_nf_it);
}

void tavro_delete_all_popup(appdata *ad) {
  for (Evas_Object **slot : _slots(ad))
    if (*slot) {
      evas_object_del(*slot);
      *slot = nullptr;
    }
}

Evas_Object *tavro_popup_shown(const appdata *ad) {
  for (Evas_Object *const *slot : _slots(const_cast<appdata *>(ad)))
    if (*slot && *slot != ad->crash_popup && *slot != ad->crashpopup_win) return *slot;
  return nullptr;
}
