// The page "What is sent": every item of the open report, to be opened or taken off.
#include <elm_atspi.h>

#include <algorithm>
#include <string>
#include <vector>

#include "tavro-common.h"
#include "tavro-main.h"
#include "tavro_compose.h"
#include "tavro_compose_strip.h"
#include "tavro_device_status.h"
#include "tavro_review.h"
#include "tavro_screens.h"
#include "tavro_widgets.h"

namespace {

constexpr double kLogLookSeconds = 0.5;

// The one page that can be open; `page` null: none. It goes with the compose screen that it belongs to.
struct review_page {
  appdata *ad;
  Evas_Object *page, *box, *bottom;
  Evas_Object *compose;  // layout of the compose screen
  Elm_Object_Item *nf_it;
  Ecore_Timer *log_timer;  // while the log is being collected
  Ecore_Job *rebuild;
  tavro_review_send send;
  std::string device_status;             // empty: not read yet
  std::vector<tavro_review_item> items;  // as shown
} _review;

tavro_review_facts _facts() {
  tavro_review_facts facts = tavro_review_facts_of(_review.ad);
  facts.device_status = _review.device_status;
  return facts;
}

// ---- Opening ----

const std::string &_read_device_status() {
  if (_review.device_status.empty()) _review.device_status = tavro_device_status_text();
  return _review.device_status;
}

void _open(const tavro_review_item &item) {
  switch (item.kind) {
    case TAVRO_REVIEW_TEXT:
      return tavro_create_text_page(_review.ad, item.title.c_str(), tavro_review_text(_facts()).c_str());
    case TAVRO_REVIEW_PICTURE:
    case TAVRO_REVIEW_VIDEO:
      return tavro_create_picture_page(_review.ad, item.path.c_str());
    case TAVRO_REVIEW_LOG:
      return tavro_create_log_page(_review.ad, item.title.c_str(), item.path.c_str());
    case TAVRO_REVIEW_DEVICE_STATUS:
      return tavro_create_text_page(_review.ad, item.title.c_str(), _read_device_status().c_str());
    case TAVRO_REVIEW_DUMP:
      return tavro_compose_dump_open(_review.ad);
    case TAVRO_REVIEW_ACCOUNT:
      return;
  }
}

// ---- Taking off, putting back ----

void _schedule_rebuild();

void _change(const tavro_review_item &item) {
  compose_view_win *view = tavro_compose_view(_review.ad);
  problem_view_win *problem = _review.ad->problem_view;
  if (!view) return;
  if (item.kind == TAVRO_REVIEW_PICTURE || item.kind == TAVRO_REVIEW_VIDEO) {
    tavro_compose_detach(view, item.path.c_str());
  } else if (!problem) {
    return;
  } else if (item.kind == TAVRO_REVIEW_DUMP) {
    tavro_compose_dump_remove(_review.ad);
  } else if (item.kind == TAVRO_REVIEW_LOG) {
    tavro_system_log_drop(_review.ad);
  } else if (item.kind == TAVRO_REVIEW_DEVICE_STATUS) {
    problem->is_device_status_removed = item.action == TAVRO_REVIEW_REMOVE;
  }
  tavro_compose_strip_refresh(_review.ad);
  tavro_compose_strip_dropped(item.path);  // nothing for what is no attachment
  _schedule_rebuild();
}

// The rows carry their place in the list, which is made anew together with them.
const tavro_review_item &_item_of(const void *data) {
  return _review.items[reinterpret_cast<size_t>(data)];
}

void _row_clicked_cb(void *data, Evas_Object *, void *) {
  _open(_item_of(data));
}

void _end_clicked_cb(void *data, Evas_Object *, void *) {
  _change(_item_of(data));
}

void _send_clicked_cb(void *, Evas_Object *, void *) {
  if (tavro_compose_view(_review.ad)) _review.send(_review.ad);
}

// ---- Building ----

// In the order of tavro_review_kind.
constexpr const char *kIcons[] = {"chat/accent", "image/accent", "video/accent", "bug/accent",
                                  "log/accent",  "file/accent",  "person/accent"};

void _build_end(Evas_Object *row, const tavro_review_item &item, const void *place) {
  const bool is_removal = item.action == TAVRO_REVIEW_REMOVE;
  const std::string name =
      std::string(tavro_text(is_removal ? "IDS_OB_BUTTON_REMOVE" : "IDS_OB_BUTTON_PUT_BACK")) + " " +
      item.title;
  Evas_Object *end = tavro_button_add(row, "tavro_item_end", nullptr,
                                      tavro_icon_add(row, is_removal ? "close" : "plus/accent"), name.c_str(),
                                      _end_clicked_cb, place);
  elm_object_part_content_set(row, "tavro.swallow.end", end);
}

// Returns the control that opens the item.
Evas_Object *_build_row(const tavro_review_item &item, const void *place) {
  Evas_Object *row = tavro_layout_add(_review.box, "tavro/review/row");
  tavro_fill_width(row);
  Evas_Object *opener =
      tavro_button_add(row, "tavro_item", item.title.c_str(), tavro_icon_add(row, kIcons[item.kind]), nullptr,
                       item.can_open ? _row_clicked_cb : nullptr, place);
  tavro_layout_text_set(opener, "elm.text.sub", item.detail.c_str());
  elm_atspi_accessible_description_set(opener, item.detail.c_str());
  if (!item.is_sent) elm_object_signal_emit(opener, "tavro,off", "tavro");
  if (!item.can_open) elm_object_focus_allow_set(opener, EINA_FALSE);
  elm_object_content_set(row, opener);
  if (item.action != TAVRO_REVIEW_KEEP) {
    elm_object_signal_emit(opener, "tavro,short", "tavro");
    _build_end(row, item, place);
  }
  elm_box_pack_end(_review.box, row);
  return opener;
}

void _build_note() {
  Evas_Object *note = elm_label_add(_review.box);
  elm_object_style_set(note, "tavro_note");
  elm_label_line_wrap_set(note, ELM_WRAP_MIXED);
  tavro_layout_text_set(note, nullptr, tavro_text("IDS_OB_BODY_REVIEW_NOTE"));
  elm_atspi_accessible_name_set(note, tavro_text("IDS_OB_BODY_REVIEW_NOTE"));
  tavro_fill_width(note);
  evas_object_show(note);
  elm_box_pack_end(_review.box, note);
}

// Which row has the keyboard's focus, also with the button at its end; -1: none.
int _focused_row() {
  int row = -1, place = -1;  // the note is the first child
  Eina_List *children = elm_box_children_get(_review.box);
  void *child = nullptr;
  EINA_LIST_FREE(children, child) {
    if (elm_object_focus_get(static_cast<Evas_Object *>(child))) row = place;
    ++place;
  }
  return row;
}

Eina_Bool _log_timer_cb(void *);

void _watch_log() {
  const bool is_coming = tavro_system_log_current(_review.ad) == TAVRO_SYSTEM_LOG_COLLECTING;
  if (is_coming && !_review.log_timer)
    _review.log_timer = ecore_timer_add(kLogLookSeconds, _log_timer_cb, nullptr);
}

void _rebuild() {
  const int focused = _focused_row();
  elm_box_clear(_review.box);
  _build_note();
  _review.items = tavro_review_items(_facts());
  const size_t to_focus = std::min(static_cast<size_t>(std::max(focused, 0)), _review.items.size() - 1);
  for (size_t i = 0; i < _review.items.size(); ++i) {
    Evas_Object *opener = _build_row(_review.items[i], reinterpret_cast<const void *>(i));
    if (focused >= 0 && i == to_focus) elm_object_focus_set(opener, EINA_TRUE);
  }
  tavro_layout_text_set(_review.bottom, "elm.text", tavro_review_total(_review.items).c_str());
  _watch_log();
}

Eina_Bool _log_timer_cb(void *) {
  if (tavro_system_log_current(_review.ad) == TAVRO_SYSTEM_LOG_COLLECTING) return ECORE_CALLBACK_RENEW;
  _review.log_timer = nullptr;
  if (tavro_compose_view(_review.ad)) _rebuild();
  return ECORE_CALLBACK_CANCEL;
}

void _rebuild_cb(void *) {
  _review.rebuild = nullptr;
  if (tavro_compose_view(_review.ad)) _rebuild();
}

// The clicked button goes with the rebuilt rows, but not from inside its own callback.
void _schedule_rebuild() {
  if (!_review.rebuild) _review.rebuild = ecore_job_add(_rebuild_cb, nullptr);
}

// The page is on the screen: now there is time to ask the services of the phone.
void _painted_cb(void *, Evas *canvas, void *) {
  evas_event_callback_del(canvas, EVAS_CALLBACK_RENDER_POST, _painted_cb);
  ecore_job_add(
      [](void *) {
        if (!_review.page || !_review.ad->problem_view) return;
        _read_device_status();
        _schedule_rebuild();
      },
      nullptr);
}

void _compose_deleted_cb(void *, Evas *, Evas_Object *, void *) {
  _review.compose = nullptr;
  ecore_job_add(
      [](void *) {
        if (_review.page && !_review.compose) elm_object_item_del(_review.nf_it);
      },
      nullptr);
}

void _page_deleted_cb(void *, Evas *canvas, Evas_Object *page, void *) {
  if (_review.page != page) return;
  evas_event_callback_del(canvas, EVAS_CALLBACK_RENDER_POST, _painted_cb);
  if (_review.compose)
    evas_object_event_callback_del(_review.compose, EVAS_CALLBACK_DEL, _compose_deleted_cb);
  if (_review.log_timer) ecore_timer_del(_review.log_timer);
  if (_review.rebuild) ecore_job_del(_review.rebuild);
  _review = {};
}

void _build_bottom() {
  _review.bottom = tavro_layout_add(_review.page, "tavro/review/bottom");
  if (_review.send) {
    Evas_Object *send = tavro_button_add(_review.bottom, "tavro_primary", tavro_text("IDS_OB_BUTTON_SEND"),
                                         nullptr, nullptr, _send_clicked_cb, nullptr);
    elm_object_part_content_set(_review.bottom, "tavro.swallow.button", send);
    elm_object_signal_emit(_review.bottom, "tavro,send", "tavro");
  }
  elm_object_part_content_set(_review.page, "tavro.swallow.bottom", _review.bottom);
  elm_object_signal_emit(_review.page, "tavro,bottom", "tavro");
}

}  // namespace

void tavro_create_review_page(appdata *ad, tavro_review_send send) {
  const compose_view_win *view = tavro_compose_view(ad);
  if (!ad->nf || !view || _review.page) return;
  const char *title = tavro_text("IDS_OB_HEADER_WHAT_IS_SENT");
  _review.ad = ad;
  _review.send = send;
  _review.compose = view->layout;
  _review.page = tavro_page_add(ad, title, "back");
  evas_object_event_callback_add(_review.page, EVAS_CALLBACK_DEL, _page_deleted_cb, nullptr);
  evas_object_event_callback_add(_review.compose, EVAS_CALLBACK_DEL, _compose_deleted_cb, nullptr);
  Evas_Object *scroller = nullptr;
  _review.box = tavro_scrolled_box_add(_review.page, &scroller);
  elm_object_content_set(_review.page, scroller);
  _build_bottom();
  _rebuild();
  _review.nf_it = tavro_page_push(ad, _review.page, title);
  evas_event_callback_add(evas_object_evas_get(_review.page), EVAS_CALLBACK_RENDER_POST, _painted_cb,
                          nullptr);
}
