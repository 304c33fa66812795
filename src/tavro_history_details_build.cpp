// The content of the details page: the card with status and timeline, and the conversation.
#include <elm_atspi.h>

#include <algorithm>

#include "tavro-common.h"
#include "tavro-main.h"
#include "tavro_handles.h"
#include "tavro_history_details.h"
#include "tavro_history_text.h"
#include "tavro_screens.h"
#include "tavro_targets.h"
#include "tavro_widgets.h"

namespace {

constexpr size_t kBubbleBytes = 2000;  // a longer text opens on a page of its own
constexpr size_t kTitleBytes = 600;
constexpr char kBetween[] = " \xC2\xB7 ";

// The page that is being built or shown, for the callbacks of its widgets.
details_page *_page = nullptr;

bool _is_idea(const svc_voc_data *voc) {
  return g_strcmp0(voc->type, TAVRO_DBMGR_SUGGESTION) == 0;
}

std::string _with_number(const char *id, size_t number) {
  const TavroGText text(g_strdup_printf(tavro_text(id), static_cast<int>(number)));
  return text.get();
}

// ---- Status ----

Evas_Object *_build_icon(Evas_Object *card, const svc_voc_data *voc) {
  const bool has_icon = voc->app_icon && *voc->app_icon && !_is_idea(voc);
  return has_icon
             ? tavro_picture_add(card, voc->app_icon, 44)
             : tavro_tile_add(card, voc->app_name ? tavro_target_tile(voc->app_name, _is_idea(voc)) : "app");
}

// Returns what the report's state reads as.
std::string _build_steps(Evas_Object *card, const svc_voc_data *voc) {
  static const char *const kSignals[] = {"open", "done", "now", "stopped"};
  const tavro_status_line line = tavro_details_status_line(voc->submitted);
  bool is_passed = false;
  for (int i = 0; i < 4; ++i) {
    const std::string number = std::to_string(i + 1);
    tavro_layout_text_set(card, ("tavro.text." + number).c_str(), tavro_text(line.labels[i]));
    elm_object_signal_emit(card, ("tavro," + std::string(kSignals[line.steps[i]]) + "," + number).c_str(),
                           "tavro");
    if (i > 0 && !is_passed)
      elm_object_signal_emit(card, ("tavro,leg," + std::to_string(i)).c_str(), "tavro");
    is_passed = is_passed || line.steps[i] == TAVRO_STEP_NOW || line.steps[i] == TAVRO_STEP_STOPPED;
  }
  const char *now = "";
  _tavro_get_status(tavro_dbmgr_current_state(voc->submitted), &now);
  return now;
}

void _show_states_cb(void *, Evas_Object *, void *) {
  _page->shown_states = _page->shown_states == kStatesAtFirst ? kMostStates : kStatesAtFirst;
  tavro_details_refresh_later();
}

void _build_state(Evas_Object *rows, const tavro_timeline_state &state, bool is_now) {
  Evas_Object *row = tavro_layout_add(rows, "tavro/details/state");
  tavro_fill_width(row);
  tavro_layout_text_set(row, "elm.text", state.text.c_str());
  tavro_layout_text_set(row, "elm.text.sub", state.time.c_str());
  const bool is_stopped = state.status == TAVRO_STATUS_DECLINED ||
                          state.status == TAVRO_STATUS_SENDING_FAILED ||
                          state.status == TAVRO_STATUS_SENDING_FAILED_NO_NETWORK;
  if (is_now) elm_object_signal_emit(row, "tavro,now", "tavro");
  if (is_stopped) elm_object_signal_emit(row, "tavro,stopped", "tavro");
  elm_object_focus_allow_set(row, EINA_FALSE);
  elm_atspi_accessible_name_set(row, state.text.c_str());
  elm_atspi_accessible_description_set(row, state.time.c_str());
  elm_box_pack_end(rows, row);
}

// How many of so many states are shown: a line instead of a single one would save nothing.
size_t _shown_states(size_t count, size_t most) {
  return count <= most + 1 ? count : most;
}

// Under the newest states: how to see the others, or how many are never shown.
void _build_more_states(Evas_Object *rows, size_t count) {
  if (count == _shown_states(count, kStatesAtFirst)) return;
  const bool is_collapsed = _page->shown_states == kStatesAtFirst;
  const size_t most = _shown_states(count, kMostStates);
  const std::string text = is_collapsed ? _with_number("IDS_OB_BUTTON_SHOW_ALL_PD", most)
                                        : std::string(tavro_text("IDS_OB_BUTTON_SHOW_LESS"));
  if (!is_collapsed && count > most)
    _build_state(rows,
                 {TAVRO_STATUS_UNDER_REVIEW, _with_number("IDS_OB_BODY_PD_EARLIER_STATES", count - most), {}},
                 false);
  Evas_Object *button = tavro_details_link_add(rows, nullptr, text, _show_states_cb, 0);
  elm_box_pack_end(rows, button);
}

Evas_Object *_build_timeline(Evas_Object *card, const svc_voc_data *voc) {
  tavro_timeline timeline = tavro_details_timeline(voc, _page->shown_states + 1);
  if (timeline.states.empty()) return nullptr;
  timeline.states.resize(_shown_states(timeline.count, _page->shown_states));
  Evas_Object *rows = elm_box_add(card);
  for (const tavro_timeline_state &state : timeline.states)
    _build_state(rows, state, &state == &timeline.states.front());
  _build_more_states(rows, timeline.count);
  evas_object_show(rows);
  return rows;
}

void _build_status(details_page *page) {
  const svc_voc_data *voc = page->voc.get();
  Evas_Object *card = tavro_details_add_flowing(page, "tavro/details/status");
  const std::string title = tavro_details_title(voc, kTitleBytes);
  const std::string target = tavro_details_text(tavro_target_text(voc->app_name));
  const std::string made = std::string(tavro_text("IDS_OB_BODY_MADE")) + " " + tavro_details_created(voc);
  tavro_layout_text_set(card, "elm.text", title.c_str());
  elm_object_part_content_set(card, "tavro.swallow.icon", _build_icon(card, voc));
  tavro_layout_text_set(card, "elm.text.target", target.c_str());
  tavro_layout_text_set(card, "elm.text.sub", made.c_str());
  const std::string now = _build_steps(card, voc);
  if (Evas_Object *timeline = _build_timeline(card, voc)) {
    elm_object_content_set(card, timeline);
    elm_object_signal_emit(card, "tavro,timeline", "tavro");
  }
  elm_object_focus_allow_set(card, EINA_TRUE);
  elm_atspi_accessible_name_set(card, (std::string(tavro_text("IDS_OB_BODY_STATUS")) + ": " + now).c_str());
  elm_atspi_accessible_description_set(card, (title + kBetween + target + kBetween + made).c_str());
}

// ---- Conversation ----

// The message of a button; null when the button belongs to a page that is about to go.
const tavro_message *_message_at(const void *place) {
  const auto at = reinterpret_cast<size_t>(place);
  return at < _page->messages.size() ? &_page->messages[at] : nullptr;
}

void _open_text_cb(void *data, Evas_Object *, void *) {
  const tavro_message *message = _message_at(data);
  if (!message) return;
  const bool is_theirs = message->kind == TAVRO_MESSAGE_REPLY;
  tavro_create_text_page(_page->ad, tavro_text(is_theirs ? "IDS_OB_BODY_SUPPORT" : "IDS_OB_BODY_YOUR_TEXT"),
                         message->text.c_str());
}

void _open_follow_up_cb(void *data, Evas_Object *, void *) {
  if (const tavro_message *message = _message_at(data)) tavro_details_open_later(message->voc_id);
}

void _open_first_cb(void *data, Evas_Object *, void *) {
  tavro_details_open_later(GPOINTER_TO_INT(data));
}

void _earlier_messages_cb(void *, Evas_Object *, void *) {
  _page->shown_messages += kMessagesAtFirst;
  tavro_details_refresh_later();
}

std::string _who_and_when(const tavro_message &message) {
  const bool is_theirs = message.kind == TAVRO_MESSAGE_REPLY;
  std::string text = tavro_text(is_theirs ? "IDS_OB_BODY_SUPPORT" : "IDS_OB_BODY_YOU");
  if (!message.time.empty()) text += kBetween + message.time;
  // A follow-up that has arrived needs no word for that.
  const bool is_under_way =
      message.kind == TAVRO_MESSAGE_FOLLOW_UP &&
      (message.status < TAVRO_STATUS_UNDER_REVIEW || message.status >= TAVRO_STATUS_SENDING);
  if (!is_under_way) return text;
  const char *state = "";
  _tavro_get_status(std::to_string(message.status).c_str(), &state);
  return text + kBetween + state;
}

// What belongs to a message below its text.
void _build_extras(details_page *page, Evas_Object *bubble, const tavro_message &message, size_t place) {
  Evas_Object *column = tavro_details_column_add(bubble);
  bool is_empty = true;
  const auto add = [&](Evas_Object *widget) {
    if (!widget) return;
    elm_box_pack_end(column, widget);
    is_empty = false;
  };
  if (message.text.size() > kBubbleBytes)
    add(tavro_details_link_add(column, "file/accent", tavro_text("IDS_OB_BUTTON_WHOLE_TEXT"), _open_text_cb,
                               place));
  if (message.kind == TAVRO_MESSAGE_REPORT) add(tavro_details_files_add(page, column));
  if (message.kind == TAVRO_MESSAGE_FOLLOW_UP)
    add(tavro_details_link_add(column, "chat/accent", tavro_text("IDS_OB_BUTTON_OPEN"), _open_follow_up_cb,
                               place));
  if (is_empty)
    evas_object_del(column);
  else
    elm_object_content_set(bubble, column);
}

void _build_bubble(details_page *page, size_t place) {
  const tavro_message &message = page->messages[place];
  std::string shown = tavro_details_beginning(message.text, kBubbleBytes);
  if (shown.size() < message.text.size()) shown += " …";
  const std::string when = _who_and_when(message);
  Evas_Object *bubble = tavro_details_add_flowing(
      page, message.kind == TAVRO_MESSAGE_REPLY ? "tavro/details/theirs" : "tavro/details/mine");
  tavro_layout_text_set(bubble, "elm.text.title", when.c_str());
  std::string markup = tavro_markup(shown.c_str());
  if (!message.verdict.empty()) {
    markup =
        "<b>" + tavro_markup(message.verdict.c_str()) + "</b>" + (markup.empty() ? "" : "<br/>" + markup);
    shown = shown.empty() ? message.verdict : message.verdict + ": " + shown;
  }
  elm_object_part_text_set(bubble, "elm.text", markup.c_str());
  if (markup.empty()) elm_object_signal_emit(bubble, "tavro,textless", "tavro");
  elm_object_focus_allow_set(bubble, EINA_TRUE);
  elm_atspi_accessible_name_set(bubble, shown.empty() ? when.c_str() : shown.c_str());
  elm_atspi_accessible_description_set(bubble, when.c_str());
  _build_extras(page, bubble, message, place);
}

bool _says_nothing(const details_page *page, const tavro_message &message) {
  return message.kind == TAVRO_MESSAGE_REPORT && message.text.empty() && !page->voc->attachments;
}

void _build_conversation(details_page *page) {
  const size_t count = page->messages.size();
  const size_t from = count > page->shown_messages ? count - page->shown_messages : 0;
  if (!_says_nothing(page, page->messages[0])) _build_bubble(page, 0);
  if (from > 1) {
    Evas_Object *earlier =
        tavro_details_link_add(page->box, "chat/accent", _with_number("IDS_OB_BUTTON_EARLIER_PD", from - 1),
                               _earlier_messages_cb, 0);
    elm_box_pack_end(page->box, earlier);
  }
  for (size_t place = std::max<size_t>(from, 1); place < count; ++place) _build_bubble(page, place);
}

// The way from a follow-up to the report that it follows up.
void _build_first(details_page *page) {
  if (!page->first) return;
  const std::string title = tavro_details_title(page->first.get(), kTitleBytes);
  const std::string caption = tavro_text("IDS_OB_BODY_FOLLOW_UP_TO");
  Evas_Object *row =
      tavro_button_add(page->box, "tavro_target", title.c_str(), _build_icon(page->box, page->first.get()),
                       (caption + ": " + title).c_str(), _open_first_cb, GINT_TO_POINTER(page->first->id));
  tavro_layout_text_set(row, "elm.text.sub", caption.c_str());
  elm_object_part_content_set(row, "elm.swallow.end", tavro_icon_add(row, "chevron"));
  tavro_fill_width(row);
  elm_box_pack_end(page->box, row);
}

}  // namespace

int tavro_details_text_width(const Evas_Object *scroller) {
  constexpr int kMarginUnits = 16;
  int width = 0;
  evas_object_geometry_get(scroller, nullptr, nullptr, &width, nullptr);
  return std::max(1, width - static_cast<int>(2 * kMarginUnits * elm_config_scale_get()));
}

Evas_Object *tavro_details_column_add(Evas_Object *parent) {
  Evas_Object *column = elm_box_add(parent);
  elm_box_align_set(column, 0.0, 0.0);
  elm_box_padding_set(column, 0, static_cast<int>(8 * elm_config_scale_get()));
  evas_object_size_hint_align_set(column, 0.0, 0.5);
  evas_object_show(column);
  return column;
}

Evas_Object *tavro_details_add_flowing(details_page *page, const char *group) {
  Evas_Object *layout = tavro_layout_add(page->box, group);
  tavro_fill_width(layout);
  Evas_Object *strut = evas_object_rectangle_add(evas_object_evas_get(page->box));
  evas_object_color_set(strut, 0, 0, 0, 0);
  evas_object_size_hint_min_set(strut, tavro_details_text_width(page->scroller), 0);
  elm_object_part_content_set(layout, "tavro.swallow.strut", strut);
  elm_box_pack_end(page->box, layout);
  return layout;
}

Evas_Object *tavro_details_link_add(Evas_Object *parent, const char *icon, const std::string &text,
                                    Evas_Smart_Cb clicked, size_t place) {
  Evas_Object *button =
      tavro_button_add(parent, "tavro_file", text.c_str(), icon ? tavro_icon_add(parent, icon) : nullptr,
                       nullptr, clicked, reinterpret_cast<void *>(place));
  evas_object_size_hint_align_set(button, 0.0, 0.5);
  return button;
}

void tavro_details_build(details_page *page) {
  _page = page;
  std::vector<tavro_follow_up_record> follow_ups;
  for (const tavro_follow_up &follow_up : page->follow_ups)
    follow_ups.push_back({follow_up.voc.get(), follow_up.verdict});
  page->messages = tavro_details_messages(page->voc.get(), follow_ups);
  _build_status(page);
  _build_first(page);
  _build_conversation(page);
}
