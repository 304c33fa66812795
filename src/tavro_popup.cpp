// Popups and menus over the base window.
#include <efl_extension.h>
#include <elm_atspi.h>

#include <cstring>

#include "tavro-common.h"
#include "tavro-main.h"
#include "tavro_focus.h"
#include "tavro_log.h"
#include "tavro_memory.h"
#include "tavro_widgets.h"

namespace {

struct popup_state {
  Evas_Object **slot;
  tavro_focus_memory focus;  // where the keyboard was
};

struct button_state {
  appdata *ad;
  Evas_Object *popup;
  void (*clicked)(appdata *ad);
};

void _popup_deleted_cb(void *data, Evas *, Evas_Object *popup, void *) {
  popup_state *state = static_cast<popup_state *>(data);
  if (*state->slot == popup) *state->slot = nullptr;
  // A popup that lies above this one keeps the focus.
  if (state->focus.widget && elm_object_focus_get(popup))
    elm_object_focus_set(state->focus.widget, EINA_TRUE);
  tavro_focus_forget(&state->focus);
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
  popup_state *state = TAVRO_ZALLOC(popup_state);
  state->slot = slot;
  tavro_focus_remember(&state->focus, ad->win);
  evas_object_event_callback_add(popup, EVAS_CALLBACK_DEL, _popup_deleted_cb, state);
  eext_object_event_callback_add(popup, EEXT_CALLBACK_BACK, eext_popup_back_cb, nullptr);
  *slot = popup;
  return popup;
}

void _add_buttons(appdata *ad, Evas_Object *popup, Evas_Object *box, const char *style,
                  const std::vector<tavro_popup_button> &buttons) {
  std::vector<Evas_Object *> added;
  const bool has_lines = std::strcmp(style, "tavro_menu") == 0;  // each entry as wide as the menu
  for (const tavro_popup_button &button : buttons) {
    button_state *state = TAVRO_ZALLOC(button_state);
    state->ad = ad;
    state->popup = popup;
    state->clicked = button.clicked;
    Evas_Object *one = tavro_button_add(box, style, button.text, nullptr, nullptr, _button_clicked_cb, state);
    evas_object_event_callback_add(one, EVAS_CALLBACK_DEL, _button_deleted_cb, state);
    evas_object_size_hint_align_set(one, has_lines ? EVAS_HINT_FILL : 0.5, 0.5);
    elm_box_pack_end(box, one);
    added.push_back(one);
  }
  evas_object_show(box);
  tavro_focus_keep_among(added);
  // A menu begins at its top; of a popup the last button is the main one.
  if (!added.empty()) elm_object_focus_set(has_lines ? added.front() : added.back(), EINA_TRUE);
}

// Three buttons beneath each other are too many for a phone that lies on its side.
bool _is_landscape(const Evas_Object *win) {
  int width = 0, height = 0;
  evas_object_geometry_get(win, nullptr, nullptr, &width, &height);
  return width > height;
}

Evas_Object *_entries_show(appdata *ad, Evas_Object **slot, const char *group,
                           const std::vector<tavro_popup_button> &entries) {
  Evas_Object *menu = _overlay_add(ad, slot, group);
  if (!menu) return nullptr;
  elm_layout_signal_callback_add(menu, "tavro,outside", "tavro", _outside_clicked_cb, nullptr);
  Evas_Object *box = elm_box_add(menu);
  _add_buttons(ad, menu, box, "tavro_menu", entries);
  elm_object_content_set(menu, box);
  return menu;
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
  elm_box_horizontal_set(box, buttons.size() < 3 || _is_landscape(ad->win));
  elm_box_align_set(box, 1.0, 0.5);
  _add_buttons(ad, popup, box, "tavro_flat", buttons);
  elm_object_part_content_set(popup, "tavro.swallow.buttons", box);
  return popup;
}

Evas_Object *tavro_menu_show(appdata *ad, Evas_Object **slot,
                             std::initializer_list<tavro_popup_button> entries) {
  return _entries_show(ad, slot, "tavro/menu", entries);
}

Evas_Object *tavro_sheet_show(appdata *ad, Evas_Object **slot, const char *title,
                              const std::vector<tavro_popup_button> &entries) {
  Evas_Object *sheet = _entries_show(ad, slot, "tavro/sheet", entries);
  if (!sheet) return nullptr;
  tavro_layout_text_set(sheet, "elm.text", title);
  elm_atspi_accessible_name_set(sheet, title);
  return sheet;
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
