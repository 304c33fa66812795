// Details of one report: its way so far, what the person wrote and what the maker answered.
#include <elm_atspi.h>

#include <algorithm>
#include <cstring>
#include <string>

#include "tavro-common.h"
#include "tavro-main.h"
#include "tavro_dbmgr.h"
#include "tavro_details_text.h"
#include "tavro_history.h"
#include "tavro_log.h"
#include "tavro_memory.h"
#include "tavro_notifications.h"
#include "tavro_preferences.h"
#include "tavro_resend.h"
#include "tavro_screens.h"
#include "tavro_targets.h"
#include "tavro_widgets.h"

namespace {

// The one details page that can be open; `page` null: none.
struct details_page {
  Evas_Object *page;
  Evas_Object *scroller;
  Evas_Object *box;
  Elm_Object_Item *nf_it;
  svc_voc_data *voc;  // owned
} _details;

void _page_deleted_cb(void *, Evas *, Evas_Object *page, void *) {
  if (_details.page != page) return;
  tavro_dbmgr_free_voc_data(_details.voc);
  _details = {};
}

// ---- Sending again ----

void _close(appdata *) {
  if (_details.nf_it) elm_object_item_del(_details.nf_it);
}

void _show_no_file_accessible(appdata *ad) {
  tavro_popup_show(ad, &ad->history_file_popup, tavro_text("IDS_OB_HEADER_NOT_YET"),
                   tavro_text("IDS_OB_BODY_FILES_GONE"), {{tavro_text("IDS_OB_BUTTON_OK"), nullptr}});
}

void _resend_clicked_cb(void *data, Evas_Object *button, void *event_info) {
  appdata *ad = static_cast<appdata *>(data);
  evas_object_data_set(button, "app_data", ad);
  tavro_resend_register_screen({_show_no_file_accessible, _close});
  tavro_send_cb(_details.voc, button, event_info);
}

// ---- Building ----

constexpr int kMarginUnits = 16;
constexpr int kThumbUnits = 72;
constexpr int kPicturesPerRow = 3;

int _text_width(const Evas_Object *scroller) {
  int width = 0;
  evas_object_geometry_get(scroller, nullptr, nullptr, &width, nullptr);
  return std::max(1, width - static_cast<int>(2 * kMarginUnits * elm_config_scale_get()));
}

// The page got another width: the texts wrap anew.
void _resized_cb(void *, Evas *, Evas_Object *scroller, void *) {
  Eina_List *children = elm_box_children_get(_details.box);
  void *child = nullptr;
  EINA_LIST_FREE(children, child) {
    Evas_Object *strut =
        elm_object_part_content_get(static_cast<Evas_Object *>(child), "tavro.swallow.strut");
    if (strut) evas_object_size_hint_min_set(strut, _text_width(scroller), 0);
  }
}

// A layout whose height follows from the width that its texts get.
Evas_Object *_add_flowing(Evas_Object *box, const char *group) {
  Evas_Object *layout = tavro_layout_add(box, group);
  tavro_fill_width(layout);
  Evas_Object *strut = evas_object_rectangle_add(evas_object_evas_get(box));
  evas_object_color_set(strut, 0, 0, 0, 0);
  evas_object_size_hint_min_set(strut, _text_width(_details.scroller), 0);
  elm_object_part_content_set(layout, "tavro.swallow.strut", strut);
  elm_box_pack_end(box, layout);
  return layout;
}

void _build_status(Evas_Object *box, const svc_voc_data *voc) {
  static const char *const kSignals[] = {"open", "done", "now", "stopped"};
  Evas_Object *card = _add_flowing(box, "tavro/details/status");
  const bool has_title = voc->title_description && *voc->title_description;
  tavro_layout_text_set(card, "elm.text", has_title ? voc->title_description : voc->description);
  tavro_layout_text_set(
      card, "elm.text.sub",
      (std::string(tavro_text("IDS_OB_BODY_MADE")) + " " + tavro_details_created(voc)).c_str());
  const tavro_status_line line = tavro_details_status_line(voc->submitted);
  std::string now;
  for (int i = 0; i < 4; ++i) {
    const std::string number = std::to_string(i + 1);
    tavro_layout_text_set(card, ("tavro.text." + number).c_str(), tavro_text(line.labels[i]));
    elm_object_signal_emit(card, ("tavro," + std::string(kSignals[line.steps[i]]) + "," + number).c_str(),
                           "tavro");
    if (i > 0 && line.steps[i] != TAVRO_STEP_OPEN)
      elm_object_signal_emit(card, ("tavro,leg," + std::to_string(i)).c_str(), "tavro");
    if (line.steps[i] == TAVRO_STEP_NOW || line.steps[i] == TAVRO_STEP_STOPPED)
      now = tavro_text(line.labels[i]);
  }
  elm_object_focus_allow_set(card, EINA_FALSE);
  elm_atspi_accessible_name_set(card, (std::string(tavro_text("IDS_OB_BODY_STATUS")) + ": " + now).c_str());
}

Evas_Object *_build_picture(Evas_Object *row, const char *path) {
  const char *slash = std::strrchr(path, '/');
  return tavro_button_add(row, "tavro_thumb_bubble", nullptr, tavro_picture_add(row, path, kThumbUnits),
                          slash ? slash + 1 : path, nullptr, nullptr);
}

// Rows of as many pictures as a bubble is wide.
Evas_Object *_build_pictures(Evas_Object *parent, const svc_voc_data *voc) {
  const int gap = static_cast<int>(8 * elm_config_scale_get());
  Evas_Object *rows = elm_box_add(parent), *row = nullptr;
  elm_box_align_set(rows, 0.0, 0.0);
  elm_box_padding_set(rows, 0, gap);
  int count = 0;
  for (const GSList *link = voc->attachments; link; link = link->next, ++count) {
    if (count % kPicturesPerRow == 0) {
      row = elm_box_add(rows);
      elm_box_horizontal_set(row, EINA_TRUE);
      elm_box_padding_set(row, gap, 0);
      evas_object_size_hint_align_set(row, 0.0, 0.5);
      evas_object_show(row);
      elm_box_pack_end(rows, row);
    }
    elm_box_pack_end(
        row, _build_picture(row, static_cast<const tavro_dbmgr_attachment_info *>(link->data)->file_path));
  }
  evas_object_show(rows);
  return rows;
}

void _build_own_text(Evas_Object *box, const svc_voc_data *voc) {
  const bool has_text = voc->description && *voc->description;
  if (!has_text && !voc->attachments) return;
  Evas_Object *bubble = _add_flowing(box, "tavro/details/mine");
  tavro_layout_text_set(bubble, "elm.text.title", tavro_text("IDS_OB_BODY_YOU"));
  tavro_layout_text_set(bubble, "elm.text", voc->description);
  elm_atspi_accessible_name_set(bubble, voc->description);
  if (voc->attachments) elm_object_content_set(bubble, _build_pictures(bubble, voc));
}

void _build_reply(Evas_Object *box, const tavro_reply &reply) {
  Evas_Object *bubble = _add_flowing(box, "tavro/details/theirs");
  std::string title = tavro_text("IDS_OB_BODY_SUPPORT");
  if (!reply.time.empty()) title += " \xC2\xB7 " + reply.time;
  tavro_layout_text_set(bubble, "elm.text.title", title.c_str());
  // Replies are stored as markup of plain text; what is shown is made anew from the plain text.
  const TavroText plain(TAVRO_ADOPT(elm_entry_markup_to_utf8(reply.markup.c_str())));
  tavro_layout_text_set(bubble, "elm.text", plain.get());
  elm_atspi_accessible_name_set(bubble, plain.get());
}

void _build_resend(appdata *ad) {
  Evas_Object *bottom = tavro_layout_add(_details.page, "tavro/bottom");
  elm_object_content_set(
      bottom, tavro_button_add(bottom, "tavro_primary", tavro_text("IDS_OB_BUTTON_SEND_AGAIN"), nullptr,
                               nullptr, _resend_clicked_cb, ad));
  elm_object_part_content_set(_details.page, "tavro.swallow.bottom", bottom);
  elm_object_signal_emit(_details.page, "tavro,bottom", "tavro");
}

void _show_report(appdata *ad) {
  const svc_voc_data *voc = _details.voc;
  elm_box_clear(_details.box);
  _build_status(_details.box, voc);
  _build_own_text(_details.box, voc);
  for (const tavro_reply &reply : tavro_details_replies(voc)) _build_reply(_details.box, reply);
  elm_object_part_content_set(_details.page, "tavro.swallow.bottom", nullptr);
  if (tavro_details_can_resend(voc->submitted)) _build_resend(ad);
}

void _mark_as_read(appdata *ad, int voc_id) {
  tavro_dbmgr_update_read_push_notifications(voc_id, 1);
  const TavroText user_name = tavro_get_username_from_preference();
  tavro_refresh_unread_count(ad, user_name.get());
  tavro_update_landing_page_history_badge(ad);
}

Evas_Object *_build_box() {
  _details.box = tavro_scrolled_box_add(_details.page, &_details.scroller);
  Evas_Object *scroller = _details.scroller;
  evas_object_event_callback_add(scroller, EVAS_CALLBACK_RESIZE, _resized_cb, nullptr);
  elm_box_padding_set(_details.box, 0, static_cast<int>(10 * elm_config_scale_get()));
  elm_object_content_unset(scroller);
  Evas_Object *margins = tavro_layout_add(scroller, "tavro/margins");
  tavro_fill_width(margins);
  elm_object_content_set(margins, _details.box);
  elm_object_content_set(scroller, margins);
  return scroller;
}

}  // namespace

void tavro_update_history_details_page(appdata *ad, int voc_id) {
  if (!_details.page || _details.voc->id != voc_id) return;
  svc_voc_data *voc = tavro_dbmgr_get_voc_by_id(voc_id);
  if (!voc) return;
  tavro_dbmgr_free_voc_data(_details.voc);
  _details.voc = voc;
  _show_report(ad);
  // The answer is on the screen: it has been read.
  if (voc->push_comments && voc->push_read == 0) _mark_as_read(ad, voc_id);
}

void tavro_create_history_details_page(appdata *ad, int voc_id) {
  if (!ad->nf) return;
  svc_voc_data *voc = tavro_dbmgr_get_voc_by_id(voc_id);
  if (!voc) {
    TAVRO_LOGD("no report with id %d", voc_id);
    tavro_popup_show(ad, &ad->history_file_popup, tavro_text("IDS_OB_HEADER_REPORT_GONE"),
                     tavro_text("IDS_OB_BODY_REPORT_GONE"), {{tavro_text("IDS_OB_BUTTON_OK"), nullptr}});
    return;
  }
  _close(ad);
  const char *title = voc->app_name ? tavro_target_text(voc->app_name) : "";
  _details = {};
  _details.voc = voc;
  _details.page = tavro_page_add(ad, title, "back");
  evas_object_event_callback_add(_details.page, EVAS_CALLBACK_DEL, _page_deleted_cb, nullptr);
  elm_object_content_set(_details.page, _build_box());
  _show_report(ad);
  _details.nf_it = tavro_page_push(ad, _details.page, title);
  _mark_as_read(ad, voc_id);
}
