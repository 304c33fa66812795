// Popups and menus over the base window.
#include <efl_extension.h>
#include <elm_atspi.h>

#include <algorithm>
#include <cstring>
#include <string>

#include "tavro-common.h"
#include "tavro-main.h"
#include "tavro_focus.h"
#include "tavro_handles.h"
#include "tavro_log.h"
#include "tavro_memory.h"
#include "tavro_widgets.h"

namespace {

constexpr char kStateKey[] = "tavro,popup";
constexpr int kSideUnits = 32;    // beside the column of a popup
constexpr int kAroundUnits = 60;  // above and below it: the card's edge and what is left of the window
constexpr int kButtonsGapUnits = 14;
constexpr int kTileUnits = 44;

struct popup_state {
  Evas_Object **slot;
  tavro_focus_memory focus;  // where the keyboard was
  // Of a popup with texts; `strut` gives these their width, `room` is as tall as what is seen of them.
  Evas_Object *text, *strut, *room, *buttons;
  Evas_Object *main;  // button as wide as the card; null: none
};

struct button_state {
  appdata *ad;
  Evas_Object *popup;
  void (*clicked)(appdata *ad);
};

void _popup_deleted_cb(void *data, Evas *, Evas_Object *popup, void *) {
  popup_state *state = static_cast<popup_state *>(data);
  evas_object_data_del(popup, kStateKey);
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
  evas_object_data_set(popup, kStateKey, state);
  tavro_focus_remember(&state->focus, ad->win);
  evas_object_event_callback_add(popup, EVAS_CALLBACK_DEL, _popup_deleted_cb, state);
  eext_object_event_callback_add(popup, EEXT_CALLBACK_BACK, eext_popup_back_cb, nullptr);
  *slot = popup;
  return popup;
}

Evas_Object *_add_button(appdata *ad, Evas_Object *popup, Evas_Object *box, const char *style,
                         const tavro_popup_button &button) {
  button_state *state = TAVRO_ZALLOC(button_state);
  state->ad = ad;
  state->popup = popup;
  state->clicked = button.clicked;
  Evas_Object *added = tavro_button_add(box, style, button.text, nullptr, nullptr, _button_clicked_cb, state);
  evas_object_event_callback_add(added, EVAS_CALLBACK_DEL, _button_deleted_cb, state);
  return added;
}

// `main` (may be null) is a button above them that has the focus first.
void _add_buttons(appdata *ad, Evas_Object *popup, Evas_Object *box, const char *style,
                  const std::vector<tavro_popup_button> &buttons, Evas_Object *main = nullptr) {
  std::vector<Evas_Object *> added;
  if (main) added.push_back(main);
  const bool has_lines = std::strcmp(style, "tavro_menu") == 0;  // each entry as wide as the menu
  for (const tavro_popup_button &button : buttons) {
    Evas_Object *one = _add_button(ad, popup, box, style, button);
    evas_object_size_hint_align_set(one, has_lines ? EVAS_HINT_FILL : 1.0, 0.5);
    elm_box_pack_end(box, one);
    added.push_back(one);
  }
  evas_object_show(box);
  if (added.empty()) return;
  tavro_focus_keep_among(added);
  // A menu begins at its top; of a popup without a main button the last one is that.
  elm_object_focus_set(has_lines || main ? added.front() : added.back(), EINA_TRUE);
}

int _units(int units) {
  return static_cast<int>(units * elm_config_scale_get());
}

Evas_Object *_clear_rectangle_add(const Evas_Object *parent) {
  Evas_Object *rectangle = evas_object_rectangle_add(evas_object_evas_get(parent));
  evas_object_color_set(rectangle, 0, 0, 0, 0);
  return rectangle;
}

// Buttons beside each other where their texts leave them the room, else beneath; returns their height.
int _arrange_buttons(Evas_Object *box, int width) {
  int beside = 0, beneath = 0, tallest = 0;
  Eina_List *buttons = elm_box_children_get(box);
  void *button = nullptr;
  EINA_LIST_FREE(buttons, button) {
    int least = 0, height = 0;
    evas_object_size_hint_min_get(static_cast<Evas_Object *>(button), &least, &height);
    beside += least;
    beneath += height;
    tallest = std::max(tallest, height);
  }
  elm_box_horizontal_set(box, beside <= width);
  return beside <= width ? tallest : beneath;
}

// The window, a text or a button got another size: the texts wrap anew and scroll in what the buttons leave.
void _fit_cb(void *popup, Evas *, Evas_Object *, void *) {
  const popup_state *state =
      static_cast<popup_state *>(evas_object_data_get(static_cast<Evas_Object *>(popup), kStateKey));
  if (!state) return;  // the popup is going
  int width = 0, height = 0, text_height = 0;
  evas_object_geometry_get(static_cast<Evas_Object *>(popup), nullptr, nullptr, &width, &height);
  width = std::max(1, width - _units(2 * kSideUnits));
  const int buttons_height = _arrange_buttons(state->buttons, width);
  evas_object_size_hint_min_set(state->strut, width, 0);
  edje_object_size_min_restricted_calc(elm_layout_edje_get(state->text), nullptr, &text_height, width, 0);
  int main_height = 0;
  if (state->main) evas_object_size_hint_min_get(state->main, nullptr, &main_height);
  const int gaps = state->main ? 2 * kButtonsGapUnits : kButtonsGapUnits;
  const int left = std::max(1, height - _units(kAroundUnits + gaps) - buttons_height - main_height);
  evas_object_size_hint_min_set(state->room, 0, std::min(text_height, left));
}

// Texts that scroll, in a place that is as tall as _fit_cb() says.
Evas_Object *_add_texts(popup_state *state, Evas_Object *column, const char *group, const char *title,
                        const char *body) {
  Evas_Object *place = elm_table_add(column), *scroller = nullptr;
  tavro_fill_width(place);
  state->room = _clear_rectangle_add(place);
  evas_object_size_hint_weight_set(state->room, EVAS_HINT_EXPAND, EVAS_HINT_EXPAND);
  elm_table_pack(place, state->room, 0, 0, 1, 1);
  Evas_Object *box = tavro_scrolled_box_add(place, &scroller);
  evas_object_size_hint_align_set(scroller, EVAS_HINT_FILL, EVAS_HINT_FILL);
  elm_object_focus_allow_set(scroller, EINA_FALSE);
  elm_table_pack(place, scroller, 0, 0, 1, 1);
  state->text = tavro_layout_add(box, group);
  tavro_fill_width(state->text);
  state->strut = _clear_rectangle_add(box);
  elm_object_part_content_set(state->text, "tavro.swallow.strut", state->strut);
  tavro_layout_text_set(state->text, "elm.text", title);
  tavro_layout_text_set(state->text, "elm.text.body", body);
  elm_box_pack_end(box, state->text);
  evas_object_show(place);
  return place;
}

popup_state *_state_of(const Evas_Object *popup) {
  return static_cast<popup_state *>(evas_object_data_get(popup, kStateKey));
}

// The column of a popup, which begins with its texts.
Evas_Object *_add_column(Evas_Object *popup, const char *group, const char *title, const char *body) {
  elm_atspi_accessible_name_set(popup, title);
  elm_atspi_accessible_description_set(popup, body);
  Evas_Object *column = elm_box_add(popup);
  elm_box_padding_set(column, 0, _units(kButtonsGapUnits));
  elm_box_pack_end(column, _add_texts(_state_of(popup), column, group, title, body));
  elm_object_content_set(popup, column);
  return column;
}

Evas_Object *_add_button_box(popup_state *state, Evas_Object *column) {
  state->buttons = elm_box_add(column);
  tavro_fill_width(state->buttons);
  elm_box_align_set(state->buttons, 1.0, 0.5);
  elm_box_pack_end(column, state->buttons);
  return state->buttons;
}

// From the start to the end of the main button above them.
void _spread(Evas_Object *box) {
  const TavroHandle<Eina_List, eina_list_free> buttons(elm_box_children_get(box));
  if (auto *first = static_cast<Evas_Object *>(eina_list_data_get(buttons.get()))) {
    evas_object_size_hint_weight_set(first, EVAS_HINT_EXPAND, 0.0);
    evas_object_size_hint_align_set(first, 0.0, 0.5);
  }
}

void _fit_always(Evas_Object *popup) {
  const popup_state *state = _state_of(popup);
  evas_object_event_callback_add(popup, EVAS_CALLBACK_RESIZE, _fit_cb, popup);
  for (Evas_Object *part : {state->text, state->buttons})
    evas_object_event_callback_add(part, EVAS_CALLBACK_CHANGED_SIZE_HINTS, _fit_cb, popup);
  _fit_cb(popup, nullptr, nullptr, nullptr);
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
  popup_state *state = _state_of(popup);
  Evas_Object *column = _add_column(popup, "tavro/popup_text", title, body);
  _add_buttons(ad, popup, _add_button_box(state, column), "tavro_flat", buttons);
  _fit_always(popup);
  return popup;
}

Evas_Object *tavro_card_show(appdata *ad, Evas_Object **slot, const tavro_card &card,
                             const std::vector<tavro_popup_button> &others) {
  Evas_Object *popup = _overlay_add(ad, slot, "tavro/popup");
  if (!popup) {
    TAVRO_LOGE("popup cannot be shown: %s", card.title);
    return nullptr;
  }
  popup_state *state = _state_of(popup);
  Evas_Object *column = _add_column(popup, "tavro/card_text", card.title, card.body);
  tavro_card_subtitle_set(popup, card.subtitle);
  Evas_Object *tile = card.picture ? tavro_picture_add(state->text, card.picture, kTileUnits)
                                   : tavro_tile_add(state->text, card.tile);
  elm_object_part_content_set(state->text, "elm.swallow.icon", tile);
  if (card.main.text) {
    Evas_Object *frame = tavro_layout_add(column, "tavro/card_main");
    tavro_fill_width(frame);
    state->main = _add_button(ad, popup, frame, "tavro_primary", card.main);
    elm_object_content_set(frame, state->main);
    elm_box_pack_end(column, frame);
  }
  _add_buttons(ad, popup, _add_button_box(state, column), "tavro_flat", others, state->main);
  if (state->main) _spread(state->buttons);
  _fit_always(popup);
  return popup;
}

void tavro_card_subtitle_set(Evas_Object *popup, const char *subtitle) {
  const popup_state *state = _state_of(popup);
  if (!state) return;
  tavro_layout_text_set(state->text, "elm.text.sub", subtitle);
  const char *body = elm_object_part_text_get(state->text, "elm.text.body");
  const TavroText plain(TAVRO_ADOPT(elm_entry_markup_to_utf8(body)));
  elm_atspi_accessible_description_set(popup, (std::string(subtitle) + "\n" + plain.get()).c_str());
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
