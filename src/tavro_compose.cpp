// The compose screens: report a problem, share an idea.
#include <elm_atspi.h>

#include <cstring>
#include <string>

#include "tavro-common.h"
#include "tavro-main.h"
#include "tavro_autosave.h"
#include "tavro_compose.h"
#include "tavro_compose_strip.h"
#include "tavro_dbmgr.h"
#include "tavro_log.h"
#include "tavro_memory.h"
#include "tavro_screens.h"
#include "tavro_targets.h"
#include "tavro_widgets.h"

namespace {

// What the screen held when it opened, to tell whether leaving would lose anything. There is one screen at
// most.
struct opened_content {
  std::string title, description;
  guint attachments;
  std::string target;
} _opened;

opened_content _content_of(const compose_view_win *view) {
  return {elm_entry_entry_get(view->title_entry), elm_entry_entry_get(view->entry),
          g_slist_length(view->attachments), view->app_name ? view->app_name : ""};
}

bool _would_lose_something(const compose_view_win *view) {
  if (!view || !tavro_compose_has_content(view)) return false;
  const opened_content now = _content_of(view);
  return now.title != _opened.title || now.description != _opened.description ||
         now.attachments != _opened.attachments || now.target != _opened.target;
}

void _show_target(compose_view_win *view, bool is_idea) {
  const bool is_chosen = view->app_name != nullptr;
  elm_object_part_text_set(view->target_button, "elm.text.sub", tavro_text("IDS_OB_BODY_ABOUT"));
  const char *name = tavro_text(is_chosen ? view->app_name : "IDS_OB_BODY_CHOOSE_TARGET");
  tavro_layout_text_set(view->target_button, nullptr, name);
  elm_atspi_accessible_name_set(view->target_button,
                                (std::string(tavro_text("IDS_OB_BODY_ABOUT")) + ": " + name).c_str());
  Evas_Object *icon = view->app_icon ? tavro_picture_add(view->target_button, view->app_icon, 44)
                                     : tavro_tile_add(view->target_button,
                                                      is_chosen ? tavro_target_tile(view->app_name, false)
                                                      : is_idea ? "bulb"
                                                                : "bug");
  elm_object_part_content_set(view->target_button, "elm.swallow.content", icon);
}

// Writing comes next. The naviframe gives the focus of a page that comes up to its first button, where a
// blank would close the page.
void _focus_title_cb(void *data, Evas_Object *nf, void *) {
  const compose_view_win *view = tavro_compose_view(static_cast<appdata *>(data));
  evas_object_smart_callback_del(nf, "transition,finished", _focus_title_cb);
  if (view && elm_naviframe_top_item_get(nf) == view->nf_it)
    elm_object_focus_set(view->title_entry, EINA_TRUE);
}

void _target_chosen(appdata *ad, const char *name, const char *icon) {
  compose_view_win *view = tavro_compose_view(ad);
  if (!view) return;
  TAVRO_FREE(view->app_name);
  TAVRO_FREE(view->app_icon);
  view->app_name = TAVRO_STRDUP(name);
  view->app_icon = TAVRO_STRDUP(icon);
  ad->isPerformanceApp = std::strstr(name, "Performance") != nullptr;
  _show_target(view, ad->type == IDEA);
  evas_object_smart_callback_add(ad->nf, "transition,finished", _focus_title_cb, ad);
}

// ---- Ending the screen ----

void _forget_view(appdata *ad) {
  compose_view_win *view = tavro_compose_view(ad);
  if (view && view->menu_popup) evas_object_del(view->menu_popup);
  if (ad->problem_view) {
    tavro_free_problem_view(ad->problem_view);
    TAVRO_FREE(ad->problem_view);
  }
  if (ad->idea_view) {
    tavro_free_idea_view(ad->idea_view);
    TAVRO_FREE(ad->idea_view);
  }
}

// The screen ends without a new record: its automatic copy goes with it, and so does, when the person says
// "discard", the draft that it was opened from.
void _end_without_record(appdata *ad, bool with_draft) {
  if (ad->auto_saved_id >= 1) tavro_dbmgr_destroy_vocs_by_id(ad->auto_saved_id);
  if (with_draft && ad->id_to_delete >= 1) tavro_dbmgr_destroy_vocs_by_id(ad->id_to_delete);
  ad->auto_saved_id = 0;
  ad->id_to_delete = 0;
  tavro_autosave_stop();
  _forget_view(ad);
}

// A save that fails leaves the screen as it is; one that was refused for its size has said so itself.
void _finish(appdata *ad, int (*save)(appdata *ad)) {
  if (save(ad) >= 1) return;
  if (ad->problem_view && ad->problem_view->server_size_error) return;
  tavro_popup_show(ad, &ad->cancel_popup, tavro_text("IDS_OB_HEADER_NOT_STORED"),
                   tavro_text("IDS_OB_BODY_NOT_STORED"), {{tavro_text("IDS_OB_BUTTON_OK"), nullptr}});
}

void _save_draft(appdata *ad) {
  if (tavro_compose_view(ad)) _finish(ad, tavro_save_compose_draft);
}

void _discard(appdata *ad) {
  _end_without_record(ad, true);
  tavro_pop_naviframe_middle_items(ad);
}

void _ask_before_leaving(appdata *ad) {
  tavro_popup_show(ad, &ad->cancel_popup, tavro_text("IDS_OB_HEADER_KEEP_DRAFT"),
                   tavro_text(ad->id_to_delete >= 1 ? "IDS_OB_BODY_KEEP_CHANGES" : "IDS_OB_BODY_KEEP_DRAFT"),
                   {{tavro_text("IDS_OB_BUTTON_STAY"), nullptr},
                    {tavro_text("IDS_OB_BUTTON_DISCARD"), _discard},
                    {tavro_text("IDS_OB_BUTTON_SAVE_DRAFT"), _save_draft}});
}

Eina_Bool _pop_cb(void *data, Elm_Object_Item *) {
  appdata *ad = static_cast<appdata *>(data);
  if (!_would_lose_something(tavro_compose_view(ad))) {
    _end_without_record(ad, false);
    return EINA_TRUE;
  }
  _ask_before_leaving(ad);
  return EINA_FALSE;
}

bool _may_close(appdata *ad) {
  if (!_would_lose_something(tavro_compose_view(ad))) return true;
  _ask_before_leaving(ad);
  return false;
}

Elm_Object_Item *_kept_page(appdata *ad) {
  const compose_view_win *view = tavro_compose_view(ad);
  return view ? view->nf_it : nullptr;
}

void _discard_from_menu(appdata *ad) {
  if (_would_lose_something(tavro_compose_view(ad)))
    _ask_before_leaving(ad);
  else
    _discard(ad);
}

void _page_deleted_cb(void *data, Evas *, Evas_Object *page, void *) {
  appdata *ad = static_cast<appdata *>(data);
  const compose_view_win *view = tavro_compose_view(ad);
  if (view && view->layout == page) _forget_view(ad);
}

// ---- What the person touches ----

void _show_gap(appdata *ad, tavro_compose_gap gap) {
  const char *body = gap == TAVRO_COMPOSE_NO_TARGET    ? "IDS_OB_BODY_GAP_TARGET"
                     : gap == TAVRO_COMPOSE_NO_CONTENT ? "IDS_OB_BODY_GAP_CONTENT"
                                                       : "IDS_OB_BODY_GAP_SIZE";
  tavro_popup_show(ad, &ad->cancel_popup, tavro_text("IDS_OB_HEADER_NOT_YET"), tavro_text(body),
                   {{tavro_text("IDS_OB_BUTTON_OK"), nullptr}});
}

void _send_clicked_cb(void *data, Evas_Object *, void *) {
  appdata *ad = static_cast<appdata *>(data);
  compose_view_win *view = tavro_compose_view(ad);
  if (!view) return;
  const tavro_compose_gap gap = tavro_compose_check(view, tavro_attachment_size_limit());
  if (gap == TAVRO_COMPOSE_NO_TARGET || gap == TAVRO_COMPOSE_NO_CONTENT || (gap && ad->type == IDEA))
    _show_gap(ad, gap);
  else
    _finish(ad, tavro_send_compose_data);
}

void _menu_clicked_cb(void *data, Evas_Object *, void *) {
  appdata *ad = static_cast<appdata *>(data);
  compose_view_win *view = tavro_compose_view(ad);
  if (!view) return;
  tavro_menu_show(ad, &view->menu_popup,
                  {{tavro_text("IDS_OB_BUTTON_SAVE_DRAFT"), _save_draft},
                   {tavro_text("IDS_OB_BUTTON_DISCARD"), _discard_from_menu}});
}

void _target_clicked_cb(void *data, Evas_Object *, void *) {
  tavro_create_target_picker(static_cast<appdata *>(data), _target_chosen);
}

// ---- Building ----

Evas_Object *_build_field(Evas_Object *box, const char *hint, bool is_single_line, int min_height_units) {
  Evas_Object *field = nullptr;
  Evas_Object *entry = tavro_field_add(box, hint, is_single_line, &field);
  evas_object_size_hint_min_set(field, 0, static_cast<int>(min_height_units * elm_config_scale_get()));
  elm_box_pack_end(box, field);
  return entry;
}

void _build_target(appdata *ad, compose_view_win *view, Evas_Object *box) {
  view->target_button =
      tavro_button_add(box, "tavro_target", nullptr, nullptr, nullptr, _target_clicked_cb, ad);
  tavro_fill_width(view->target_button);
  elm_object_part_content_set(view->target_button, "elm.swallow.end", tavro_icon_add(box, "chevron"));
  elm_box_pack_end(box, view->target_button);
  _show_target(view, ad->type == IDEA);
}

void _fill_from_draft(compose_view_win *view, const svc_voc_data *draft) {
  elm_entry_entry_set(view->entry, tavro_markup(draft->description).c_str());
  elm_entry_entry_set(view->title_entry, tavro_markup(draft->title_description).c_str());
  for (const GSList *link = draft->attachments; link; link = link->next) {
    const char *path = static_cast<const tavro_dbmgr_attachment_info *>(link->data)->file_path;
    // One that cannot be read just now stays attached: support is told its name if it is gone for good.
    if (!tavro_compose_attach(view, path))
      view->attachments = g_slist_append(view->attachments, TAVRO_STRDUP(path));
  }
}

Evas_Object *_build_content(appdata *ad, compose_view_win *view, const char *hint) {
  Evas_Object *scroller = nullptr;
  Evas_Object *box = tavro_scrolled_box_add(view->layout, &scroller);
  const int gap = static_cast<int>(10 * elm_config_scale_get());
  elm_box_padding_set(box, 0, gap);
  Evas_Object *frame = tavro_layout_add(scroller, "tavro/margins");
  elm_object_content_unset(scroller);
  elm_object_content_set(frame, box);
  evas_object_size_hint_weight_set(frame, EVAS_HINT_EXPAND, 0.0);
  evas_object_size_hint_align_set(frame, EVAS_HINT_FILL, 0.0);
  elm_object_content_set(scroller, frame);
  _build_target(ad, view, box);
  view->title_entry = _build_field(box, tavro_text("IDS_OB_BODY_TITLE"), true, 50);
  view->entry = _build_field(box, hint, false, 128);
  tavro_compose_strip_build(ad, view, box);
  return scroller;
}

void _build_page(appdata *ad, compose_view_win *view, const svc_voc_data *draft, const char *title,
                 const char *hint) {
  ad->auto_saved_id = 0;
  ad->id_to_delete = draft ? draft->id : 0;
  if (draft) {
    view->app_name = draft->app_name && *draft->app_name ? TAVRO_STRDUP(draft->app_name) : nullptr;
    view->app_icon = draft->app_icon && *draft->app_icon ? TAVRO_STRDUP(draft->app_icon) : nullptr;
  }
  view->layout = tavro_page_add(ad, title, "close");
  evas_object_event_callback_add(view->layout, EVAS_CALLBACK_DEL, _page_deleted_cb, ad);
  tavro_page_action_add(view->layout, "more", tavro_text("IDS_OB_BUTTON_MORE"), _menu_clicked_cb, ad);
  elm_object_content_set(view->layout, _build_content(ad, view, hint));
  view->bottom = tavro_layout_add(view->layout, "tavro/compose/bottom");
  Evas_Object *send = tavro_button_add(view->bottom, "tavro_primary", tavro_text("IDS_OB_BUTTON_SEND"),
                                       nullptr, nullptr, _send_clicked_cb, ad);
  elm_object_part_content_set(view->bottom, "tavro.swallow.button", send);
  elm_object_part_content_set(view->layout, "tavro.swallow.bottom", view->bottom);
  elm_object_signal_emit(view->layout, "tavro,bottom", "tavro");
  if (draft) _fill_from_draft(view, draft);
  _opened = _content_of(view);
  tavro_compose_strip_refresh(ad);
  view->nf_it = tavro_page_push(ad, view->layout, title);
  elm_naviframe_item_pop_cb_set(view->nf_it, _pop_cb, ad);
  evas_object_smart_callback_add(ad->nf, "transition,finished", _focus_title_cb, ad);
  tavro_set_page_guard({_may_close, _kept_page});
  tavro_autosave_start(ad);
}

// The dump and the system log that a draft of a problem holds.
void _take_files(problem_view_win *view, const svc_voc_data *draft) {
  if (draft->dump_file) {
    view->dump_filepath = TAVRO_STRDUP(draft->dump_file);
    view->dump_filename = TAVRO_STRDUP(draft->dump_name);
  }
  if (draft->syslog_file && *draft->syslog_file) {
    const char *slash = std::strrchr(draft->syslog_file, '/');
    view->syslog_filepath = TAVRO_STRDUP(draft->syslog_file);
    view->syslog_filename = TAVRO_STRDUP(slash ? slash + 1 : draft->syslog_file);
  }
}

}  // namespace

bool tavro_leave_compose_page(appdata *ad) {
  compose_view_win *view = tavro_compose_view(ad);
  if (!view) return true;
  if (_would_lose_something(view)) {
    elm_naviframe_item_pop_to(view->nf_it);
    _ask_before_leaving(ad);
    return false;
  }
  Elm_Object_Item *page = view->nf_it;
  _end_without_record(ad, false);
  elm_object_item_del(page);
  return true;
}

void tavro_create_problem_page(appdata *ad, const svc_voc_data *draft) {
  if (!tavro_leave_compose_page(ad)) return;
  ad->type = ad->type == CRASH ? CRASH : PROBLEM;
  ad->problem_view = TAVRO_ZALLOC(problem_view_win);
  if (draft) _take_files(ad->problem_view, draft);
  _build_page(ad, ad->problem_view, draft, tavro_text("IDS_OB_HEADER_REPORT_A_PROBLEM"),
              tavro_text("IDS_OB_BODY_PROBLEM_HINT"));
}

void tavro_create_idea_page(appdata *ad, const svc_voc_data *draft) {
  if (!tavro_leave_compose_page(ad)) return;
  ad->type = IDEA;
  ad->idea_view = TAVRO_ZALLOC(idea_view_win);
  _build_page(ad, ad->idea_view, draft, tavro_text("IDS_OB_HEADER_SHARE_AN_IDEA"),
              tavro_text("IDS_OB_BODY_IDEA_HINT"));
}
