// The compose screens: report a problem, share an idea.
#include <elm_atspi.h>

#include <cstring>
#include <string>

#include "tavro-common.h"
#include "tavro-main.h"
#include "tavro_autosave.h"
#include "tavro_compose.h"
#include "tavro_compose_convert.h"
#include "tavro_compose_keeper.h"
#include "tavro_compose_parts.h"
#include "tavro_compose_strip.h"
#include "tavro_dbmgr.h"
#include "tavro_memory.h"
#include "tavro_screens.h"
#include "tavro_targets.h"
#include "tavro_widgets.h"

namespace {

void _show_target(compose_view_win *view, bool is_idea) {
  const bool is_chosen = view->app_name != nullptr;
  elm_object_part_text_set(view->target_button, "elm.text.sub", tavro_text("IDS_OB_BODY_ABOUT"));
  const char *name = is_chosen ? tavro_target_text(view->app_name) : tavro_text("IDS_OB_BODY_CHOOSE_TARGET");
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

// Writing comes next; a crash report has its title already. The naviframe gives the focus of a page that
// comes up to its first button, where a blank would close the page.
void _focus_title_cb(void *data, Evas_Object *nf, void *) {
  appdata *ad = static_cast<appdata *>(data);
  const compose_view_win *view = tavro_compose_view(ad);
  evas_object_smart_callback_del(nf, "transition,finished", _focus_title_cb);
  if (!view || elm_naviframe_top_item_get(nf) != view->nf_it) return;
  Evas_Object *entry = ad->type == CRASH ? view->entry : view->title_entry;
  elm_object_focus_set(entry, EINA_TRUE);
  elm_entry_cursor_end_set(entry);  // A draft's text is gone on with.
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
  tavro_compose_log_update(ad);
  tavro_compose_keeper_note();
  evas_object_smart_callback_add(ad->nf, "transition,finished", _focus_title_cb, ad);
}

// ---- What the person touches ----

void _send_clicked_cb(void *data, Evas_Object *, void *) {
  tavro_compose_send(static_cast<appdata *>(data));
}

void _menu_clicked_cb(void *data, Evas_Object *, void *) {
  appdata *ad = static_cast<appdata *>(data);
  compose_view_win *view = tavro_compose_view(ad);
  if (!view) return;
  tavro_menu_show(ad, &view->menu_popup,
                  {{tavro_text("IDS_OB_BUTTON_SAVE_DRAFT"), tavro_compose_save_draft},
                   {tavro_text("IDS_OB_HEADER_WHAT_IS_SENT"), tavro_compose_review},
                   {tavro_text("IDS_OB_BUTTON_DISCARD"), tavro_compose_discard}});
}

void _typed_cb(void *, Evas_Object *, void *) {
  tavro_compose_keeper_note();
}

void _target_clicked_cb(void *data, Evas_Object *, void *) {
  tavro_create_target_picker(static_cast<appdata *>(data), _target_chosen);
}

// A page above has closed, or this one has just come up.
void _page_shown_cb(void *data, Evas_Object *nf, void *) {
  appdata *ad = static_cast<appdata *>(data);
  const compose_view_win *view = tavro_compose_view(ad);
  if (view && elm_naviframe_top_item_get(nf) == view->nf_it) tavro_compose_rest(ad);
}

void _page_gone_cb(void *data, Evas *, Evas_Object *, void *) {
  appdata *ad = static_cast<appdata *>(data);
  if (ad->nf) evas_object_smart_callback_del_full(ad->nf, "transition,finished", _page_shown_cb, ad);
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
  elm_entry_cursor_end_set(view->entry);
  for (const GSList *link = draft->attachments; link; link = link->next) {
    const char *path = static_cast<const tavro_dbmgr_attachment_info *>(link->data)->file_path;
    if (!path) continue;  // of a damaged record
    // One that cannot be read just now stays attached: support is told its name if it is gone for good.
    if (!tavro_compose_attach(view, path))
      view->attachments = g_slist_append(view->attachments, TAVRO_STRDUP(path));
  }
  tavro_compose_count(view);  // with those that are there but cannot be attached anew
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
  tavro_compose_dump_build(ad, box);
  if (ad->problem_view) tavro_compose_log_build(ad, ad->problem_view, box);
  return scroller;
}

void _build_bottom(appdata *ad, compose_view_win *view) {
  view->bottom = tavro_layout_add(view->layout, "tavro/compose/bottom");
  Evas_Object *send = tavro_button_add(view->bottom, "tavro_primary", tavro_text("IDS_OB_BUTTON_SEND"),
                                       nullptr, nullptr, _send_clicked_cb, ad);
  elm_object_part_content_set(view->bottom, "tavro.swallow.button", send);
  elm_object_part_content_set(view->layout, "tavro.swallow.bottom", view->bottom);
  elm_object_signal_emit(view->layout, "tavro,bottom", "tavro");
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
  tavro_page_action_add(view->layout, "more", tavro_text("IDS_OB_BUTTON_MORE"), _menu_clicked_cb, ad);
  tavro_page_action_add(view->layout, "send", tavro_text("IDS_OB_BUTTON_SEND"), _send_clicked_cb, ad);
  elm_object_content_set(view->layout, _build_content(ad, view, hint));
  _build_bottom(ad, view);
  if (draft) _fill_from_draft(view, draft);
  tavro_compose_remember_opened(ad);
  tavro_compose_strip_refresh(ad);
  view->nf_it = tavro_page_push(ad, view->layout, title);
  tavro_compose_guard(ad);
  evas_object_smart_callback_add(ad->nf, "transition,finished", _focus_title_cb, ad);
  evas_object_smart_callback_add(ad->nf, "transition,finished", _page_shown_cb, ad);
  evas_object_event_callback_add(view->layout, EVAS_CALLBACK_DEL, _page_gone_cb, ad);
  for (Evas_Object *entry : {view->title_entry, view->entry})
    evas_object_smart_callback_add(entry, "changed", _typed_cb, nullptr);
  tavro_autosave_start(ad, tavro_compose_end_unchanged);
  tavro_compose_keeper_start(ad);
  tavro_compose_convert(ad);  // of a draft that was stored meanwhile
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

void tavro_compose_rest(appdata *ad) {
  const compose_view_win *view = tavro_compose_view(ad);
  if (!view || !view->layout) return;
  Evas_Object *page = elm_layout_edje_get(view->layout);
  edje_object_signal_emit(page, "tavro,rest", "tavro");
  edje_object_message_signal_process(page);  // before the next touch
  edje_object_calc_force(page);
}

void tavro_create_problem_page(appdata *ad, const svc_voc_data *draft) {
  if (!tavro_leave_compose_page(ad)) return;
  ad->type = draft && ad->type == CRASH ? CRASH : PROBLEM;
  ad->problem_view = TAVRO_ZALLOC(problem_view_win);
  if (draft) _take_files(ad->problem_view, draft);
  const bool is_crash = ad->type == CRASH;
  _build_page(ad, ad->problem_view, draft,
              tavro_text(is_crash ? "IDS_OB_HEADER_REPORT_A_CRASH" : "IDS_OB_HEADER_REPORT_A_PROBLEM"),
              tavro_text(is_crash ? "IDS_OB_BODY_CRASH_HINT" : "IDS_OB_BODY_PROBLEM_HINT"));
}

void tavro_create_idea_page(appdata *ad, const svc_voc_data *draft) {
  if (!tavro_leave_compose_page(ad)) return;
  ad->type = IDEA;
  ad->idea_view = TAVRO_ZALLOC(idea_view_win);
  _build_page(ad, ad->idea_view, draft, tavro_text("IDS_OB_HEADER_SHARE_AN_IDEA"),
              tavro_text("IDS_OB_BODY_IDEA_HINT"));
}
