// Search and filters of "My Reports".
#include <elm_atspi.h>

#include "tavro-common.h"
#include "tavro-main.h"
#include "tavro_history_parts.h"
#include "tavro_memory.h"
#include "tavro_widgets.h"

namespace {

constexpr char kSearchPart[] = "tavro.swallow.search";
constexpr char kFiltersPart[] = "tavro.swallow.filters";
constexpr double kTypingPauseSeconds = 0.15;
constexpr int kMostSoughtCharacters = 200;
constexpr int kMarginUnits = 16;
constexpr int kGapUnits = 6;
constexpr int kNeighbourUnits = 40;

// One chip sets one of the three and takes back what another one set: the row reads as one choice. The first
// shows all again.
struct chip {
  const char *text;
  tavro_voc_stage stage;
  tavro_voc_kind kind;
  bool is_unread;
};
constexpr chip kChips[] = {
    {"IDS_OB_OPT_ALL", TAVRO_VOC_STAGE_ANY, TAVRO_VOC_KIND_ANY, false},
    {"IDS_OB_OPT_NEW_REPLIES", TAVRO_VOC_STAGE_ANY, TAVRO_VOC_KIND_ANY, true},
    {"IDS_OB_OPT_DRAFTS", TAVRO_VOC_STAGE_DRAFT, TAVRO_VOC_KIND_ANY, false},
    {"IDS_OB_OPT_OPEN", TAVRO_VOC_STAGE_OPEN, TAVRO_VOC_KIND_ANY, false},
    {"IDS_OB_OPT_CLOSED", TAVRO_VOC_STAGE_CLOSED, TAVRO_VOC_KIND_ANY, false},
    {"IDS_OB_OPT_SENDING", TAVRO_VOC_STAGE_SENDING, TAVRO_VOC_KIND_ANY, false},
    {"IDS_OB_OPT_FAILED", TAVRO_VOC_STAGE_FAILED, TAVRO_VOC_KIND_ANY, false},
    {"IDS_OB_OPT_PROBLEMS", TAVRO_VOC_STAGE_ANY, TAVRO_VOC_KIND_PROBLEM, false},
    {"IDS_OB_OPT_IDEAS", TAVRO_VOC_STAGE_ANY, TAVRO_VOC_KIND_IDEA, false},
    {"IDS_OB_OPT_CRASHES", TAVRO_VOC_STAGE_ANY, TAVRO_VOC_KIND_CRASH, false},
};

bool _is_on(const chip &one, const tavro_history_choice &choice) {
  if (one.is_unread) return choice.is_unread;
  if (one.stage != TAVRO_VOC_STAGE_ANY) return choice.stage == one.stage;
  if (one.kind != TAVRO_VOC_KIND_ANY) return choice.kind == one.kind;
  return !choice.has_chips();
}

void _show_chips(const tavro_history_view *view) {
  for (size_t i = 0; i < view->chips.size(); ++i) {
    const bool is_on = _is_on(kChips[i], view->choice);
    elm_object_signal_emit(view->chips[i], is_on ? "tavro,on" : "tavro,off", "tavro");
    // Its letters are bold while it is on and take more room.
    edje_object_message_signal_process(elm_layout_edje_get(view->chips[i]));
    elm_layout_sizing_eval(view->chips[i]);
    elm_atspi_accessible_description_set(
        view->chips[i], tavro_text(is_on ? "IDS_OB_BODY_SELECTED" : "IDS_OB_BODY_NOT_SELECTED"));
  }
}

// With a little of its neighbours, so that it is seen that there are more.
void _bring_into_view(const tavro_history_view *view, const Evas_Object *chip) {
  Evas_Object *scroller = elm_object_part_content_get(view->frame, kFiltersPart);
  evas_smart_objects_calculate(evas_object_evas_get(scroller));
  int start = 0, x = 0, width = 0, height = 0;
  evas_object_geometry_get(elm_object_content_get(scroller), &start, nullptr, nullptr, nullptr);
  evas_object_geometry_get(chip, &x, nullptr, &width, &height);
  const int around = static_cast<int>(kNeighbourUnits * elm_config_scale_get());
  elm_scroller_region_bring_in(scroller, x - start - around, 0, width + 2 * around, height);
}

// A second tap on a chip takes it back.
void _toggle(tavro_history_choice &choice, const chip &one) {
  const bool was_on = _is_on(one, choice);
  choice = {choice.text, TAVRO_VOC_STAGE_ANY, TAVRO_VOC_KIND_ANY, false};
  if (!was_on) choice = {choice.text, one.stage, one.kind, one.is_unread};
}

void _chip_clicked_cb(void *data, Evas_Object *clicked, void *) {
  appdata *ad = static_cast<appdata *>(data);
  tavro_history_view *view = ad->history_ad->view;
  for (size_t i = 0; i < view->chips.size(); ++i)
    if (view->chips[i] == clicked) _toggle(view->choice, kChips[i]);
  _show_chips(view);
  tavro_history_reload(ad, true);
  _bring_into_view(view, clicked);
}

void _add_gap(Evas_Object *box, int units) {
  Evas_Object *gap = evas_object_rectangle_add(evas_object_evas_get(box));
  evas_object_color_set(gap, 0, 0, 0, 0);
  evas_object_size_hint_min_set(gap, static_cast<int>(units * elm_config_scale_get()), 1);
  evas_object_show(gap);
  elm_box_pack_end(box, gap);
}

// ---- Search ----

std::string _typed(const tavro_history_view *view) {
  if (!view->search_entry) return "";
  const TavroText text(TAVRO_ADOPT(elm_entry_markup_to_utf8(elm_entry_entry_get(view->search_entry))));
  return text ? g_strstrip(text.get()) : "";
}

void _search_for(appdata *ad, const std::string &text) {
  tavro_history_view *view = ad->history_ad->view;
  if (view->search_timer) ecore_timer_del(view->search_timer);
  view->search_timer = nullptr;
  if (view->choice.text == text) return;
  view->choice.text = text;
  tavro_history_reload(ad, true);
}

Eina_Bool _typing_paused_cb(void *data) {
  appdata *ad = static_cast<appdata *>(data);
  ad->history_ad->view->search_timer = nullptr;
  _search_for(ad, _typed(ad->history_ad->view));
  return ECORE_CALLBACK_CANCEL;
}

// What is set from outside, by a screen reader, passes the entry's own filter.
void _cut_long_text(Evas_Object *entry) {
  const TavroText text(TAVRO_ADOPT(elm_entry_markup_to_utf8(elm_entry_entry_get(entry))));
  if (!text || g_utf8_strlen(text.get(), -1) <= kMostSoughtCharacters) return;
  *g_utf8_offset_to_pointer(text.get(), kMostSoughtCharacters) = '\0';
  elm_entry_entry_set(entry, tavro_markup(text.get()).c_str());
}

void _typed_cb(void *data, Evas_Object *entry, void *) {
  appdata *ad = static_cast<appdata *>(data);
  tavro_history_view *view = ad->history_ad->view;
  _cut_long_text(entry);
  if (view->search_timer)
    ecore_timer_reset(view->search_timer);
  else
    view->search_timer = ecore_timer_add(kTypingPauseSeconds, _typing_paused_cb, ad);
}

void _show_search_button(const tavro_history_view *view) {
  if (!view->search_button) return;
  const bool is_open = view->search_entry != nullptr;
  elm_object_content_set(view->search_button,
                         tavro_icon_add(view->search_button, is_open ? "close/on" : "search/on"));
  elm_atspi_accessible_name_set(view->search_button,
                                tavro_text(is_open ? "IDS_OB_BUTTON_CLOSE_SEARCH" : "IDS_OB_BUTTON_SEARCH"));
}

void _open_search(appdata *ad) {
  tavro_history_view *view = ad->history_ad->view;
  Evas_Object *margins = tavro_layout_add(view->frame, "tavro/picker/search");
  Evas_Object *field = nullptr;
  view->search_entry = tavro_field_add(margins, tavro_text("IDS_OB_BODY_SEARCH_REPORTS"), true, &field);
  Elm_Entry_Filter_Limit_Size limit = {kMostSoughtCharacters, 0};
  elm_entry_markup_filter_append(view->search_entry, elm_entry_filter_limit_size, &limit);
  elm_object_content_set(margins, field);
  evas_object_smart_callback_add(view->search_entry, "changed", _typed_cb, ad);
  elm_object_part_content_set(view->frame, kSearchPart, margins);
  _show_search_button(view);
  elm_object_focus_set(view->search_entry, EINA_TRUE);
}

}  // namespace

bool tavro_history_close_search(appdata *ad) {
  tavro_history_view *view = ad->history_ad->view;
  if (!view->search_entry) return false;
  view->search_entry = nullptr;
  elm_object_part_content_set(view->frame, kSearchPart, nullptr);
  _show_search_button(view);
  if (view->search_button) elm_object_focus_set(view->search_button, EINA_TRUE);
  _search_for(ad, "");
  return true;
}

void tavro_history_toggle_search(appdata *ad) {
  if (!tavro_history_close_search(ad)) _open_search(ad);
}

void tavro_history_clear_choice(appdata *ad) {
  tavro_history_view *view = ad->history_ad->view;
  view->choice = {};
  _show_chips(view);
  tavro_history_close_search(ad);
  tavro_history_reload(ad, true);
  _bring_into_view(view, view->chips.front());
}

void tavro_history_build_filters(appdata *ad) {
  tavro_history_view *view = ad->history_ad->view;
  const double scale = elm_config_scale_get();
  Evas_Object *scroller = elm_scroller_add(view->frame);
  elm_object_style_set(scroller, "tavro");
  elm_scroller_policy_set(scroller, ELM_SCROLLER_POLICY_OFF, ELM_SCROLLER_POLICY_OFF);
  elm_scroller_content_min_limit(scroller, EINA_FALSE, EINA_TRUE);
  elm_object_focus_allow_set(scroller, EINA_FALSE);
  Evas_Object *box = elm_box_add(scroller);
  elm_box_horizontal_set(box, EINA_TRUE);
  elm_box_align_set(box, 0.0, 0.5);
  elm_box_padding_set(box, static_cast<int>(kGapUnits * scale), 0);
  _add_gap(box, kMarginUnits - kGapUnits);
  for (const chip &one : kChips) {
    view->chips.push_back(
        tavro_button_add(box, "tavro_chip", tavro_text(one.text), nullptr, nullptr, _chip_clicked_cb, ad));
    elm_box_pack_end(box, view->chips.back());
  }
  _add_gap(box, kMarginUnits - kGapUnits);
  evas_object_show(box);
  elm_object_content_set(scroller, box);
  evas_object_show(scroller);
  elm_object_part_content_set(view->frame, kFiltersPart, scroller);
  _show_chips(view);
}
