// Popups and menus over the base window.
#include <efl_extension.h>
#include <elm_atspi.h>

#include "tavro-common.h"
#include "tavro-main.h"
#include "tavro_log.h"
#include "tavro_memory.h"
#include "tavro_widgets.h"

namespace {

// While any is shown, nothing below can take the focus.
int _shown_overlays = 0;

struct popup_state {
  appdata *ad;
  Evas_Object **slot;
};

struct button_state {
  appdata *ad;
  Evas_Object *popup;
  void (*clicked)(appdata *ad);
};

void _popup_deleted_cb(void *data, Evas *, Evas_Object *popup, void *) {
  popup_state *state = static_cast<popup_state *>(data);
  if (*state->slot == popup) *state->slot = nullptr;
  --_shown_overlays;
  // The window may be going down with its popup.
  if (state->ad->nf && _shown_overlays == 0) elm_object_tree_focus_allow_set(state->ad->nf, EINA_TRUE);
  TAVRO_FREE(state);
}

void _button_deleted_cb(void *data, Evas *, Evas_Object *, void *) {
  button_state *state = static_cast<button_state *>(data);
  TAVRO_FREE(state);
}

void _button_clicked_cb(void *data, Evas_Object *, void *) {
  const button_state chosen = *static_cast<button_state *>(data);
  evas_object_del(chosen.popup);
  if (chosen.clicked) chosen.clicked(chosen.ad);
}

void _outside_clicked_cb(void *, Evas_Object *popup, const char *, const char *) {
  evas_object_del(popup);
}

Evas_Object *_overlay_add(appdata *ad, Evas_Object **slot, const char *group) {
  if (!tavro_create_base_window(ad)) return nullptr;
  if (*slot) evas_object_del(*slot);
  Evas_Object *popup = tavro_layout_add(ad->win, group);
  elm_win_resize_object_add(ad->win, popup);
  ++_shown_overlays;
  popup_state *state = TAVRO_ZALLOC(popup_state);
  state->ad = ad;
  state->slot = slot;
  evas_object_event_callback_add(popup, EVAS_CALLBACK_DEL, _popup_deleted_cb, state);
  eext_object_event_callback_add(popup, EEXT_CALLBACK_BACK, eext_popup_back_cb, nullptr);
  elm_object_tree_focus_allow_set(ad->nf, EINA_FALSE);
  *slot = popup;
  return popup;
}

void _add_buttons(appdata *ad, Evas_Object *popup, Evas_Object *box, const char *style,
                  std::initializer_list<tavro_popup_button> buttons) {
  Evas_Object *last = nullptr;
  for (const tavro_popup_button &button : buttons) {
    button_state *state = TAVRO_ZALLOC(button_state);
    state->ad = ad;
    state->popup = popup;
    state->clicked = button.clicked;
    last = tavro_button_add(box, style, button.text, nullptr, nullptr, _button_clicked_cb, state);
    evas_object_event_callback_add(last, EVAS_CALLBACK_DEL, _button_deleted_cb, state);
    elm_box_pack_end(box, last);
  }
  evas_object_show(box);
  if (last) elm_object_focus_set(last, EINA_TRUE);
}

}  // namespace

Evas_Object *tavro_popup_show(appdata *ad, Evas_Object **slot, const char *title, const char *body,
                              std::initializer_list<tavro_popup_button> buttons) {
  Evas_Object *popup = _overlay_add(ad, slot, "tavro/popup");
  if (!popup) {
    TAVRO_LOGE("popup cannot be shown: %s", title);
    return nullptr;
  }
  tavro_layout_text_set(popup, "elm.text", title);
  tavro_layout_text_set(popup, "elm.text.body", body);
  elm_atspi_accessible_name_set(popup, title);
  elm_atspi_accessible_description_set(popup, body);
  Evas_Object *box = elm_box_add(popup);
  elm_box_horizontal_set(box, buttons.size() < 3);
  elm_box_align_set(box, 1.0, 0.5);
  _add_buttons(ad, popup, box, "tavro_flat", buttons);
  elm_object_part_content_set(popup, "tavro.swallow.buttons", box);
  return popup;
}

Evas_Object *tavro_menu_show(appdata *ad, Evas_Object **slot,
                             std::initializer_list<tavro_popup_button> entries) {
  Evas_Object *menu = _overlay_add(ad, slot, "tavro/menu");
  if (!menu) return nullptr;
  elm_layout_signal_callback_add(
      menu, "tavro,outside", "tavro",
      [](void *, Evas_Object *popup, const char *emission, const char *source) {
        _outside_clicked_cb(nullptr, popup, emission, source);
      },
      nullptr);
  Evas_Object *box = elm_box_add(menu);
  _add_buttons(ad, menu, box, "tavro_menu", entries);
  elm_object_content_set(menu, box);
  return menu;
}

void tavro_delete_all_popup(appdata *ad) {
  Evas_Object **const slots[] = {
      &ad->version_popup,      &ad->delete_fd_popup, &ad->delete_popup,     &ad->history_edit_popup,
      &ad->history_file_popup, &ad->settings_popup,  &ad->imgedit_popup,    &ad->cancel_popup,
      &ad->connection_popup,   &ad->crash_popup,     &ad->signout_popup,    &ad->crashpopup_win,
      &ad->cpmgr_popup,        &ad->quit_beta_popup, &ad->next_steps_popup, &ad->corvane_account_optin_popup,
      &ad->opt_out_popup,
  };
  for (Evas_Object **slot : slots)
    if (*slot) {
      evas_object_del(*slot);
      *slot = nullptr;
    }
}
