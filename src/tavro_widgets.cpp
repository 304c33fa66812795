#include "tavro_widgets.h"

#include <elm_atspi.h>

#include <cstdio>
#include <cstring>

#include "tavro-common.h"
#include "tavro-main.h"
#include "tavro_focus.h"
#include "tavro_handles.h"
#include "tavro_memory.h"
#include "tavro_theme.h"

namespace {

constexpr char kActionsPart[] = "tavro.swallow.actions";

void _back_clicked_cb(void *data, Evas_Object *, void *) {
  elm_naviframe_item_pop(static_cast<Evas_Object *>(data));
}

Evas_Object *_actions_box(Evas_Object *page) {
  Evas_Object *box = elm_object_part_content_get(page, kActionsPart);
  if (box) return box;
  box = elm_box_add(page);
  elm_box_horizontal_set(box, EINA_TRUE);
  evas_object_show(box);
  elm_object_part_content_set(page, kActionsPart, box);
  return box;
}

// Filter of an entry; `markup` is malloc'ed and may be changed in place, since it only gets shorter.
void _line_breaks_to_blanks(void *, Evas_Object *, char **markup) {
  constexpr char kLineBreak[] = "<br/>";
  for (char *at = *markup ? std::strstr(*markup, kLineBreak) : nullptr; at;
       at = std::strstr(at, kLineBreak)) {
    *at = ' ';
    std::memmove(at + 1, at + sizeof kLineBreak - 1, std::strlen(at + sizeof kLineBreak - 1) + 1);
  }
}

void _field_focused_cb(void *data, Evas_Object *, void *) {
  elm_object_signal_emit(static_cast<Evas_Object *>(data), "tavro,focused", "tavro");
}

void _field_unfocused_cb(void *data, Evas_Object *, void *) {
  elm_object_signal_emit(static_cast<Evas_Object *>(data), "tavro,unfocused", "tavro");
}

// Filter of an entry: the Tab that leads on from a field is not text.
void _drop_tab(void *, Evas_Object *, char **markup) {
  if (*markup && (std::strcmp(*markup, "\t") == 0 || std::strcmp(*markup, "<tab/>") == 0)) **markup = '\0';
}

// Fields are steps of a form: Tab leads on from them, as it does everywhere else.
void _field_key_cb(void *entry, Evas *, Evas_Object *, void *event_info) {
  auto *key = static_cast<Evas_Event_Key_Down *>(event_info);
  if (std::strcmp(key->keyname, "Tab") != 0) return;
  const bool is_back = evas_key_modifier_is_set(key->modifiers, "Shift");
  tavro_focus_show(static_cast<Evas_Object *>(entry));
  key->event_flags = static_cast<Evas_Event_Flags>(key->event_flags | EVAS_EVENT_FLAG_ON_HOLD);
  elm_object_focus_next(static_cast<Evas_Object *>(entry), is_back ? ELM_FOCUS_PREVIOUS : ELM_FOCUS_NEXT);
}

void _field_touched_cb(void *data, Evas_Object *, const char *, const char *) {
  elm_object_focus_set(static_cast<Evas_Object *>(data), EINA_TRUE);
}

}  // namespace

std::string tavro_markup(const char *text) {
  if (!text) return {};
  const TavroText markup(TAVRO_ADOPT(elm_entry_utf8_to_markup(text)));
  return markup ? markup.get() : "";
}

Evas_Object *tavro_layout_add(Evas_Object *parent, const char *group) {
  Evas_Object *layout = elm_layout_add(parent);
  elm_layout_file_set(layout, tavro_theme_file(), group);
  evas_object_size_hint_weight_set(layout, EVAS_HINT_EXPAND, EVAS_HINT_EXPAND);
  evas_object_size_hint_align_set(layout, EVAS_HINT_FILL, EVAS_HINT_FILL);
  evas_object_show(layout);
  return layout;
}

void tavro_layout_text_set(Evas_Object *layout, const char *part, const char *text) {
  const Evas_Object *shown =
      edje_object_part_object_get(elm_layout_edje_get(layout), part ? part : "elm.text");
  const char *type = shown ? evas_object_type_get(shown) : nullptr;
  const bool is_markup = type && std::strcmp(type, "textblock") == 0;
  elm_object_part_text_set(layout, part, is_markup ? tavro_markup(text).c_str() : text);
}

Evas_Object *tavro_icon_add(Evas_Object *parent, const char *name) {
  return tavro_layout_add(parent, (std::string("tavro/icon/") + name).c_str());
}

Evas_Object *tavro_tile_add(Evas_Object *parent, const char *name) {
  return tavro_layout_add(parent, (std::string("tavro/tile/") + name).c_str());
}

Evas_Object *tavro_picture_add(Evas_Object *parent, const char *path, int units) {
  Evas_Object *image = elm_image_add(parent);
  elm_image_prescale_set(image, static_cast<int>(units * elm_config_scale_get()));
  elm_image_async_open_set(image, EINA_TRUE);
  elm_image_preload_disabled_set(image, EINA_FALSE);
  elm_image_aspect_fixed_set(image, EINA_TRUE);
  elm_image_fill_outside_set(image, EINA_TRUE);
  elm_image_file_set(image, path, nullptr);
  evas_object_show(image);
  return image;
}

Evas_Object *tavro_button_add(Evas_Object *parent, const char *style, const char *text, Evas_Object *content,
                              const char *accessible_name, Evas_Smart_Cb clicked, const void *data) {
  Evas_Object *button = elm_button_add(parent);
  elm_object_style_set(button, style);
  if (text) tavro_layout_text_set(button, nullptr, text);
  if (content) elm_object_part_content_set(button, "elm.swallow.content", content);
  elm_atspi_accessible_name_set(button, accessible_name ? accessible_name : text);
  if (clicked) evas_object_smart_callback_add(button, "clicked", clicked, data);
  evas_object_show(button);
  return button;
}

Evas_Object *tavro_field_add(Evas_Object *parent, const char *hint, bool is_single_line,
                             Evas_Object **field) {
  *field = tavro_layout_add(parent, "tavro/field");
  tavro_fill_width(*field);
  Evas_Object *entry = elm_entry_add(*field);
  // One line of text may still take several on a narrow screen: the box grows with it.
  if (is_single_line) elm_entry_markup_filter_append(entry, _line_breaks_to_blanks, nullptr);
  elm_entry_markup_filter_append(entry, _drop_tab, nullptr);
  elm_object_style_set(entry, "tavro");
  elm_entry_cnp_mode_set(entry, ELM_CNP_MODE_PLAINTEXT);
  elm_object_part_text_set(entry, "elm.guide", hint);
  elm_atspi_accessible_name_set(entry, hint);
  evas_object_smart_callback_add(entry, "focused", _field_focused_cb, *field);
  evas_object_smart_callback_add(entry, "unfocused", _field_unfocused_cb, *field);
  evas_object_event_callback_priority_add(elm_layout_edje_get(entry), EVAS_CALLBACK_KEY_DOWN,
                                          EVAS_CALLBACK_PRIORITY_BEFORE, _field_key_cb, entry);
  elm_layout_signal_callback_add(*field, "tavro,touched", "tavro", _field_touched_cb, entry);
  evas_object_show(entry);
  elm_object_content_set(*field, entry);
  return entry;
}

Evas_Object *tavro_row_add(Evas_Object *parent, const char *tile, const char *title, const char *subtitle,
                           Evas_Object *end, Evas_Smart_Cb clicked, const void *data) {
  Evas_Object *row =
      tavro_button_add(parent, "tavro_row", title, tavro_tile_add(parent, tile), nullptr, clicked, data);
  tavro_fill_width(row);
  tavro_row_subtitle_set(row, subtitle);
  if (end) elm_object_part_content_set(row, "elm.swallow.end", end);
  return row;
}

void tavro_row_subtitle_set(Evas_Object *row, const char *subtitle) {
  tavro_layout_text_set(row, "elm.text.sub", subtitle);
  elm_object_signal_emit(row, subtitle ? "tavro,two_lines" : "tavro,one_line", "tavro");
  elm_atspi_accessible_description_set(row, subtitle);
}

void tavro_fill_width(Evas_Object *widget) {
  evas_object_size_hint_weight_set(widget, EVAS_HINT_EXPAND, 0.0);
  evas_object_size_hint_align_set(widget, EVAS_HINT_FILL, 0.0);
}

Evas_Object *tavro_scrolled_box_add(Evas_Object *parent, Evas_Object **scroller) {
  *scroller = elm_scroller_add(parent);
  elm_object_style_set(*scroller, "tavro");
  elm_scroller_policy_set(*scroller, ELM_SCROLLER_POLICY_OFF, ELM_SCROLLER_POLICY_OFF);
  elm_scroller_content_min_limit(*scroller, EINA_FALSE, EINA_FALSE);
  evas_object_size_hint_weight_set(*scroller, EVAS_HINT_EXPAND, EVAS_HINT_EXPAND);
  evas_object_show(*scroller);
  Evas_Object *box = elm_box_add(*scroller);
  evas_object_size_hint_weight_set(box, EVAS_HINT_EXPAND, 0.0);
  evas_object_size_hint_align_set(box, EVAS_HINT_FILL, 0.0);
  elm_box_align_set(box, 0.0, 0.0);
  evas_object_show(box);
  elm_object_content_set(*scroller, box);
  return box;
}

Evas_Object *tavro_page_add(appdata *ad, const char *title, const char *start_icon) {
  Evas_Object *page = tavro_layout_add(ad->nf, "tavro/page");
  elm_object_part_text_set(page, "elm.text.title", title);
  if (!start_icon) {
    elm_object_signal_emit(page, "tavro,first", "tavro");
    return page;
  }
  Evas_Object *icon = tavro_icon_add(page, (std::string(start_icon) + "/on").c_str());
  Evas_Object *button = tavro_button_add(page, "tavro_icon", nullptr, icon, tavro_text("IDS_OB_BUTTON_BACK"),
                                         _back_clicked_cb, ad->nf);
  elm_object_part_content_set(page, "tavro.swallow.start", button);
  return page;
}

Evas_Object *tavro_page_action_add(Evas_Object *page, const char *icon, const char *name,
                                   Evas_Smart_Cb clicked, const void *data) {
  Evas_Object *box = _actions_box(page);
  Evas_Object *content = tavro_icon_add(box, (std::string(icon) + "/on").c_str());
  Evas_Object *button = tavro_button_add(box, "tavro_icon", nullptr, content, name, clicked, data);
  elm_box_pack_end(box, button);
  return button;
}

Elm_Object_Item *tavro_page_push(appdata *ad, Evas_Object *page, const char *title) {
  tavro_focus_leave_page(ad->nf);
  Elm_Object_Item *item = elm_naviframe_item_push(ad->nf, title, nullptr, nullptr, page, nullptr);
  elm_naviframe_item_title_enabled_set(item, EINA_FALSE, EINA_FALSE);
  return item;
}

std::string tavro_megabytes(long long bytes) {
  char text[32];
  std::snprintf(text, sizeof text, "%.1f", static_cast<double>(bytes) / (1024.0 * 1024.0));
  return text;
}

std::string tavro_size_text(long long bytes) {
  constexpr long long kKilobyte = 1024, kFirstMegabytes = 1000 * kKilobyte;
  const bool is_large = bytes > kFirstMegabytes;
  const std::string number =
      is_large ? tavro_megabytes(bytes) : std::to_string((bytes + kKilobyte - 1) / kKilobyte);
  const TavroGText text(
      g_strdup_printf(tavro_text(is_large ? "IDS_OB_BODY_PS_MB" : "IDS_OB_BODY_PS_KB"), number.c_str()));
  return text.get();
}
