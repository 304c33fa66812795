// How a compose screen ends: sent, saved as a draft, discarded or left, and the question before that.
#include <string>
#include <vector>

#include "tavro-common.h"
#include "tavro-main.h"
#include "tavro_autosave.h"
#include "tavro_compose.h"
#include "tavro_compose_keeper.h"
#include "tavro_compose_parts.h"
#include "tavro_compose_strip.h"
#include "tavro_crash_archive.h"
#include "tavro_dbmgr.h"
#include "tavro_deleted_files.h"
#include "tavro_handles.h"
#include "tavro_image_editor.h"
#include "tavro_report_files.h"
#include "tavro_screens.h"
#include "tavro_system_log.h"

namespace {

// What the screen held when it opened, to tell whether leaving would lose anything.
struct opened_content {
  std::string title, description, attachments, target;
  bool has_dump;
} _opened;

opened_content _content_of(appdata *ad) {
  const compose_view_win *view = tavro_compose_view(ad);
  std::string attachments;
  for (const GSList *link = view->attachments; link; link = link->next)
    attachments += static_cast<const char *>(link->data) + std::string("\n");
  return {elm_entry_entry_get(view->title_entry), elm_entry_entry_get(view->entry), attachments,
          view->app_name ? view->app_name : "", ad->problem_view && ad->problem_view->dump_filepath};
}

// A log that came by itself can come again; one that the person asked for counts.
bool _would_lose_something(appdata *ad) {
  if (tavro_image_editor_kept_page()) return true;
  const bool has_own_log =
      ad->problem_view && ad->problem_view->syslog_filepath && tavro_compose_log_was_switched();
  if (!tavro_compose_has_content(ad)) return has_own_log;
  const opened_content now = _content_of(ad);
  return now.title != _opened.title || now.description != _opened.description ||
         now.attachments != _opened.attachments || now.target != _opened.target ||
         now.has_dump != _opened.has_dump || (ad->problem_view && tavro_compose_log_was_switched());
}

void _end_parts(appdata *ad) {
  tavro_compose_send_end();
  tavro_compose_log_end();
  tavro_free_compose_view(ad);
}

// The screen ends without a new record: its automatic copy goes with it, and so does, when the person says
// "discard", the draft that it was opened from with its log, and the copies made for its attachments.
void _end_without_record(appdata *ad, bool with_draft) {
  std::vector<int> gone = {ad->auto_saved_id};
  if (with_draft) gone.push_back(ad->id_to_delete);
  tavro_deleted_files_note_copies(gone, tavro_compose_attached(ad));
  const bool has_dump = ad->problem_view && ad->problem_view->dump_filepath;
  const std::string dump = has_dump ? ad->problem_view->dump_filepath : "";
  tavro_compose_log_end();
  tavro_system_log_drop(ad);  // while the draft is known: its log stays its own
  tavro_system_log_end(ad);
  if (ad->auto_saved_id >= 1) tavro_dbmgr_destroy_vocs_by_id(ad->auto_saved_id);
  if (with_draft && ad->id_to_delete >= 1) {
    tavro_delete_syslog_file(ad->id_to_delete);
    tavro_dbmgr_destroy_vocs_by_id(ad->id_to_delete);
  }
  ad->auto_saved_id = 0;
  ad->id_to_delete = 0;
  tavro_autosave_stop();
  tavro_compose_keeper_forget();
  if (has_dump) tavro_crash_archive_delete_unneeded(dump);
  _end_parts(ad);
  tavro_deleted_files_remove();
}

void _discard(appdata *ad) {
  _end_without_record(ad, true);
  tavro_pop_naviframe_middle_items(ad);
}

std::string _keep_draft_body(const appdata *ad) {
  const std::string body =
      tavro_text(ad->id_to_delete >= 1 ? "IDS_OB_BODY_KEEP_CHANGES" : "IDS_OB_BODY_KEEP_DRAFT");
  if (tavro_autosave_screenshot().empty()) return body;
  return tavro_text("IDS_OB_BODY_KEEP_SCREENSHOT") + ("\n" + body);
}

void _ask_before_leaving(appdata *ad) {
  tavro_popup_show(ad, &ad->cancel_popup, tavro_text("IDS_OB_HEADER_KEEP_DRAFT"),
                   _keep_draft_body(ad).c_str(),
                   {{tavro_text("IDS_OB_BUTTON_STAY"), nullptr},
                    {tavro_text("IDS_OB_BUTTON_DISCARD"), _discard},
                    {tavro_text("IDS_OB_BUTTON_SAVE_DRAFT"), tavro_compose_save_draft}});
}

void _say_refused(appdata *ad, std::string path) {
  const TavroHandle<GSList, g_slist_free> paths(g_slist_append(nullptr, path.data()));
  tavro_compose_attach_files(ad, paths.get());
}

Eina_Bool _pop_cb(void *data, Elm_Object_Item *) {
  appdata *ad = static_cast<appdata *>(data);
  if (tavro_compose_end_unchanged(ad)) return EINA_TRUE;
  _ask_before_leaving(ad);
  return EINA_FALSE;
}

bool _may_close(appdata *ad) {
  if (!_would_lose_something(ad)) return true;
  _ask_before_leaving(ad);
  return false;
}

// With the window, or after the record: what is kept for the next start stays.
void _page_deleted_cb(void *data, Evas *, Evas_Object *page, void *) {
  appdata *ad = static_cast<appdata *>(data);
  const compose_view_win *view = tavro_compose_view(ad);
  if (!view || view->layout == page) _end_parts(ad);
}

}  // namespace

Elm_Object_Item *tavro_compose_front_page(appdata *ad) {
  const compose_view_win *view = tavro_compose_view(ad);
  Elm_Object_Item *editor = view ? tavro_image_editor_kept_page() : nullptr;
  return editor || !view ? editor : view->nf_it;
}

void tavro_compose_remember_opened(appdata *ad) {
  _opened = _content_of(ad);
}

void tavro_compose_forget_opened() {
  _opened = {};
}

bool tavro_compose_end_unchanged(appdata *ad) {
  if (_would_lose_something(ad)) return false;
  _end_without_record(ad, false);
  return true;
}

void tavro_compose_guard(appdata *ad) {
  const compose_view_win *view = tavro_compose_view(ad);
  evas_object_event_callback_add(view->layout, EVAS_CALLBACK_DEL, _page_deleted_cb, ad);
  elm_naviframe_item_pop_cb_set(view->nf_it, _pop_cb, ad);
  tavro_set_page_guard({_may_close, tavro_compose_front_page});
}

// A save that fails leaves the screen as it is; one that was refused for its size has said so itself.
void tavro_compose_finish(appdata *ad, int (*save)(appdata *ad)) {
  if (save(ad) >= 1) {
    tavro_compose_send_end();
    tavro_compose_log_end();
    return;
  }
  if (ad->problem_view && ad->problem_view->server_size_error) return;
  tavro_popup_show(ad, &ad->cancel_popup, tavro_text("IDS_OB_HEADER_NOT_STORED"),
                   tavro_text("IDS_OB_BODY_NOT_STORED"), {{tavro_text("IDS_OB_BUTTON_OK"), nullptr}});
}

void tavro_compose_save_draft(appdata *ad) {
  if (!tavro_compose_view(ad)) return;
  const std::string edited = tavro_autosave_screenshot(), screenshot = tavro_autosave_attach_screenshot(ad);
  if (!edited.empty() && screenshot.empty()) return _say_refused(ad, edited);
  tavro_compose_finish(ad, tavro_save_compose_draft);
  if (tavro_compose_view(ad)) tavro_autosave_detach_screenshot(ad, screenshot);
}

void tavro_compose_discard(appdata *ad) {
  if (_would_lose_something(ad) || ad->id_to_delete >= 1)
    _ask_before_leaving(ad);
  else
    _discard(ad);
}

bool tavro_leave_compose_page(appdata *ad) {
  const compose_view_win *view = tavro_compose_view(ad);
  if (!view) return true;
  if (_would_lose_something(ad)) {
    elm_naviframe_item_pop_to(tavro_compose_front_page(ad));
    _ask_before_leaving(ad);
    return false;
  }
  tavro_image_editor_close();
  Elm_Object_Item *page = view->nf_it;
  _end_without_record(ad, false);
  elm_object_item_del(page);
  return true;
}
