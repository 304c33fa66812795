#include "tavro_start.h"

#include "tavro-common.h"
#include "tavro-main.h"
#include "tavro_appdata.h"
#include "tavro_preferences.h"
#include "tavro_screens.h"

namespace {

// A popup may have built the window without a page in it.
bool _has_page(const appdata *ad) {
  return ad->win && ad->nf && elm_naviframe_top_item_get(ad->nf);
}

}  // namespace

void tavro_handle_null_window(appdata *ad) {
  if (tavro_is_ending() || _has_page(ad) || !tavro_create_base_window(ad)) return;
  if (tavro_get_username_from_preference()) {
    tavro_create_landing_page(ad);
  } else {
    tavro_create_account_page(ad);
  }
}

void tavro_handle_welcome_page(appdata *ad) {
  if (tavro_is_ending()) return;
  if (!_has_page(ad)) {
    tavro_handle_null_window(ad);
    return;
  }
  elm_win_iconified_set(ad->win, EINA_FALSE);
  elm_win_raise(ad->win);
  elm_win_activate(ad->win);
}
