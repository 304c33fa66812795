// A page with one plain text, in parts when it is long.
#include <elm_atspi.h>
#include <notification.h>

#include <algorithm>
#include <cstring>
#include <string>
#include <vector>

#include "tavro-common.h"
#include "tavro-main.h"
#include "tavro_handles.h"
#include "tavro_log_archive.h"
#include "tavro_memory.h"
#include "tavro_screens.h"
#include "tavro_text_parts.h"
#include "tavro_widgets.h"

namespace {

constexpr size_t kPartBytes = 8 * 1024;
constexpr size_t kLogShownBytes = 256 * 1024;

// Belongs to its page.
struct text_page {
  Evas_Object *page;
  Evas_Object *scroller;
  Evas_Object *entry;
  Evas_Object *bottom;  // null when the text has one part
  Evas_Object *previous, *next;
  char *text;
  int shown;  // part, from 0
};

void _page_deleted_cb(void *data, Evas *, Evas_Object *, void *) {
  text_page *state = static_cast<text_page *>(data);
  TAVRO_FREE(state->text);
  TAVRO_FREE(state);
}

void _show_part(text_page *state, int number) {
  const std::vector<std::string> parts = tavro_text_parts(state->text, kPartBytes);
  const int count = static_cast<int>(parts.size());
  state->shown = number;
  elm_entry_entry_set(state->entry, tavro_markup(parts[static_cast<size_t>(number)].c_str()).c_str());
  elm_scroller_region_show(state->scroller, 0, 0, 1, 1);
  if (!state->bottom) return;
  const TavroGText place(g_strdup_printf(tavro_text("IDS_OB_BODY_PART_PD1_OF_PD2"), number + 1, count));
  tavro_layout_text_set(state->bottom, "elm.text", place.get());
  elm_object_disabled_set(state->previous, number == 0);
  elm_object_disabled_set(state->next, number == count - 1);
}

void _previous_clicked_cb(void *data, Evas_Object *, void *) {
  text_page *state = static_cast<text_page *>(data);
  _show_part(state, state->shown - 1);
}

void _next_clicked_cb(void *data, Evas_Object *, void *) {
  text_page *state = static_cast<text_page *>(data);
  _show_part(state, state->shown + 1);
}

void _copy_clicked_cb(void *data, Evas_Object *button, void *) {
  const std::string text = static_cast<text_page *>(data)->text;
  elm_cnp_selection_set(button, ELM_SEL_TYPE_CLIPBOARD, ELM_SEL_FORMAT_TEXT, text.data(), text.size());
  notification_status_message_post(tavro_text("IDS_OB_BODY_COPIED"));
}

// Scrolls by the keys that do so everywhere, wherever on the page the focus is.
Eina_Bool _key_cb(void *data, Evas_Object *, Evas_Object *, Evas_Callback_Type type, void *event_info) {
  if (type != EVAS_CALLBACK_KEY_DOWN) return EINA_FALSE;
  const text_page *state = static_cast<text_page *>(data);
  const char *key = static_cast<Evas_Event_Key_Down *>(event_info)->key;
  int y = 0, width = 0, height = 0, content = 0;
  elm_scroller_region_get(state->scroller, nullptr, &y, &width, &height);
  elm_scroller_child_size_get(state->scroller, nullptr, &content);
  const struct {
    const char *key;
    int y;
  } kPlaces[] = {{"Next", y + height}, {"Prior", y - height}, {"Home", 0}, {"End", content - height}};
  for (const auto &place : kPlaces) {
    if (std::strcmp(key, place.key) != 0) continue;
    elm_scroller_region_show(state->scroller, 0, std::clamp(place.y, 0, std::max(0, content - height)), width,
                             height);
    return EINA_TRUE;
  }
  return EINA_FALSE;
}

Evas_Object *_build_turner(text_page *state, const char *part, const char *label, Evas_Smart_Cb clicked) {
  Evas_Object *button =
      tavro_button_add(state->bottom, "tavro_turn", tavro_text(label), nullptr, nullptr, clicked, state);
  elm_object_part_content_set(state->bottom, part, button);
  return button;
}

void _build_bottom(text_page *state) {
  state->bottom = tavro_layout_add(state->page, "tavro/text/bottom");
  state->previous =
      _build_turner(state, "tavro.swallow.previous", "IDS_OB_BUTTON_PREVIOUS", _previous_clicked_cb);
  state->next = _build_turner(state, "tavro.swallow.next", "IDS_OB_BUTTON_NEXT", _next_clicked_cb);
  elm_object_part_content_set(state->page, "tavro.swallow.bottom", state->bottom);
  elm_object_signal_emit(state->page, "tavro,bottom", "tavro");
}

void _build_text(text_page *state, const char *title, bool is_log) {
  Evas_Object *box = tavro_scrolled_box_add(state->page, &state->scroller);
  Evas_Object *margins = tavro_layout_add(box, "tavro/margins");
  tavro_fill_width(margins);
  elm_box_pack_end(box, margins);
  state->entry = elm_entry_add(margins);
  elm_entry_editable_set(state->entry, EINA_FALSE);
  elm_object_style_set(state->entry, is_log ? "tavro_log" : "tavro");
  elm_entry_cnp_mode_set(state->entry, ELM_CNP_MODE_PLAINTEXT);
  elm_atspi_accessible_name_set(state->entry, title);
  evas_object_show(state->entry);
  elm_object_content_set(margins, state->entry);
  elm_object_content_set(state->page, state->scroller);
}

}  // namespace

void tavro_create_text_page(appdata *ad, const char *title, const char *text, bool is_log) {
  if (!ad->nf) return;
  text_page *state = TAVRO_ZALLOC(text_page);
  state->text = TAVRO_STRDUP(text);
  state->page = tavro_page_add(ad, title, "back");
  evas_object_event_callback_add(state->page, EVAS_CALLBACK_FREE, _page_deleted_cb, state);
  tavro_page_action_add(state->page, "copy", tavro_text("IDS_OB_BUTTON_COPY"), _copy_clicked_cb, state);
  elm_object_event_callback_add(state->page, _key_cb, state);
  _build_text(state, title, is_log);
  if (tavro_text_parts(state->text, kPartBytes).size() > 1) _build_bottom(state);
  _show_part(state, 0);
  tavro_page_push(ad, state->page, title);
}

void tavro_create_log_page(appdata *ad, const char *title, const char *path) {
  tavro_log_tail tail;
  if (!tavro_log_archive_read(path, kLogShownBytes, &tail)) {
    tavro_popup_show(ad, &ad->history_file_popup, tavro_text("IDS_OB_HEADER_CANNOT_BE_OPENED"),
                     tavro_text("IDS_OB_BODY_LOG_NOT_READABLE"), {{tavro_text("IDS_OB_BUTTON_OK"), nullptr}});
    return;
  }
  if (tail.is_cut) {
    const TavroGText note(
        g_strdup_printf(tavro_text("IDS_OB_BODY_LOG_LAST_PS"), tavro_size_text(kLogShownBytes).c_str()));
    tail.text.insert(0, std::string(note.get()) + "\n\n");
  }
  tavro_create_text_page(ad, title, tail.text.c_str(), true);
}
