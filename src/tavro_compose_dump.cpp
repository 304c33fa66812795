// The crash dump on the problem screen: its row, what it holds, and the screen of a new crash report.
#include <elm_atspi.h>

#include <algorithm>
#include <string>

#include "tavro-common.h"
#include "tavro-main.h"
#include "tavro_compose.h"
#include "tavro_compose_keeper.h"
#include "tavro_compose_parts.h"
#include "tavro_compose_strip.h"
#include "tavro_crash_archive.h"
#include "tavro_dbmgr.h"
#include "tavro_handles.h"
#include "tavro_memory.h"
#include "tavro_screens.h"
#include "tavro_widgets.h"

namespace {

constexpr size_t kSummaryShownBytes = 256 * 1024;

// What goes on once a dump that is too large was left out.
void (*_go_on)(appdata *ad) = nullptr;

void _open_clicked_cb(void *data, Evas_Object *, void *) {
  tavro_compose_dump_open(static_cast<appdata *>(data));
}

void _remove_clicked_cb(void *data, Evas_Object *, void *) {
  // Not from inside the button's own callback.
  ecore_job_add(
      [](void *ad_data) {
        appdata *ad = static_cast<appdata *>(ad_data);
        tavro_compose_dump_remove(ad);
        if (ad->problem_view) elm_object_focus_set(ad->problem_view->log_row, EINA_TRUE);
      },
      data);
}

// A row with two lines, which opens something or, without a callback, only tells.
Evas_Object *_build_row(appdata *ad, problem_view_win *view, Evas_Object *box, const std::string &detail,
                        bool can_open) {
  Evas_Object *row = view->dump_row = tavro_layout_add(box, "tavro/compose/dump");
  tavro_fill_width(row);
  const char *title = tavro_text("IDS_OB_BODY_CRASH_DUMP");
  Evas_Object *opener = tavro_button_add(row, "tavro_dump", title, tavro_icon_add(row, "bug"), nullptr,
                                         can_open ? _open_clicked_cb : nullptr, ad);
  tavro_layout_text_set(opener, "elm.text.sub", detail.c_str());
  elm_atspi_accessible_description_set(opener, detail.c_str());
  elm_object_focus_allow_set(opener, can_open);
  elm_object_content_set(row, opener);
  return opener;
}

// The name comes last: it is what a narrow row can do without.
std::string _detail(const char *path, gint64 size) {
  const std::string state = size < 0 ? tavro_text("IDS_OB_BODY_FILE_UNREADABLE") : tavro_size_text(size);
  return state + " \u00B7 " + tavro_file_name(path);
}

// Says why there is no dump, above the log's row.
void _build_note(appdata *ad, const char *text) {
  problem_view_win *view = ad->problem_view;
  Evas_Object *box = elm_object_parent_widget_get(view->log_row);
  _build_row(ad, view, box, text, false);
  elm_box_pack_before(box, view->dump_row, view->log_row);
}

void _leave_out(appdata *ad) {
  tavro_compose_dump_remove(ad);
  _go_on(ad);
}

}  // namespace

void tavro_compose_dump_build(appdata *ad, Evas_Object *box) {
  problem_view_win *view = ad->problem_view;
  if (!view || !view->dump_filepath) return;
  const gint64 size = tavro_attachment_size(view->dump_filepath);
  Evas_Object *opener = _build_row(ad, view, box, _detail(view->dump_filepath, size), true);
  if (size < 0) elm_object_signal_emit(opener, "tavro,failed", "tavro");
  const std::string name =
      std::string(tavro_text("IDS_OB_BUTTON_REMOVE")) + " " + tavro_text("IDS_OB_BODY_CRASH_DUMP");
  Evas_Object *remove =
      tavro_button_add(view->dump_row, "tavro_icon", nullptr, tavro_icon_add(view->dump_row, "close"),
                       name.c_str(), _remove_clicked_cb, ad);
  elm_object_part_content_set(view->dump_row, "elm.swallow.end", remove);
  elm_box_pack_end(box, view->dump_row);
}

void tavro_compose_dump_remove(appdata *ad) {
  problem_view_win *view = ad->problem_view;
  if (!view || !view->dump_filepath) return;
  const std::string path = view->dump_filepath;
  TAVRO_FREE(view->dump_filename);
  TAVRO_FREE(view->dump_filepath);
  if (view->dump_row) evas_object_del(view->dump_row);
  view->dump_row = nullptr;
  tavro_compose_strip_refresh(ad);
  tavro_compose_keeper_flush();  // what is kept of the screen names it no more
  tavro_crash_archive_delete_unneeded(path);
}

void tavro_compose_dump_open(appdata *ad) {
  const problem_view_win *view = ad->problem_view;
  if (!view || !view->dump_filepath) return;
  std::string text;
  if (tavro_crash_archive_read(view->dump_filepath, kSummaryShownBytes, &text))
    return tavro_create_text_page(ad, tavro_text("IDS_OB_BODY_CRASH_DUMP"), text.c_str(), true);
  tavro_popup_show(ad, &ad->history_file_popup, tavro_text("IDS_OB_HEADER_CANNOT_BE_OPENED"),
                   tavro_text("IDS_OB_BODY_FILE_NOT_READABLE"), {{tavro_text("IDS_OB_BUTTON_OK"), nullptr}});
}

bool tavro_compose_dump_is_too_large(appdata *ad, void (*go_on)(appdata *ad)) {
  const problem_view_win *view = ad->problem_view;
  if (!view || !view->dump_filepath) return false;
  const gint64 limit = tavro_attachment_size_limit(), total = tavro_compose_total(ad);
  const gint64 size = std::max<gint64>(tavro_attachment_size(view->dump_filepath), 0);
  if (total <= limit || total - size > limit) return false;
  _go_on = go_on;
  const TavroGText body(g_strdup_printf(tavro_text("IDS_OB_BODY_DUMP_PS1_OVER_PS2_MB"),
                                        tavro_size_text(size).c_str(), tavro_megabytes(limit).c_str()));
  tavro_popup_show(ad, &ad->cancel_popup, tavro_text("IDS_OB_HEADER_DUMP_TOO_LARGE"), body.get(),
                   {{tavro_text("IDS_OB_BUTTON_LEAVE_DUMP_OUT"), _leave_out},
                    {tavro_text("IDS_OB_BUTTON_STAY"), nullptr}});
  return true;
}

void tavro_create_crash_page(appdata *ad, const tavro_crash_report &report) {
  if (!tavro_leave_compose_page(ad)) return;
  const TavroHandle<svc_voc_data, tavro_dbmgr_free_voc_data> draft(TAVRO_ZALLOC(svc_voc_data));
  const TavroGText title(g_strdup_printf(tavro_text("IDS_OB_HEADER_PS_STOPPED"), report.app_name));
  draft->title_description = TAVRO_STRDUP(title.get());
  draft->app_name = TAVRO_STRDUP(report.app_name);
  draft->app_icon = TAVRO_STRDUP(report.app_icon);
  draft->dump_file = TAVRO_STRDUP(report.archive);
  if (report.archive) draft->dump_name = TAVRO_STRDUP(tavro_file_name(report.archive).c_str());
  ad->hType = ERROR;
  ad->type = CRASH;
  tavro_create_problem_page(ad, draft.get());
  tavro_compose_log_want(ad);
  if (report.archive) {
    // The dump alone is worth a question before it is thrown away, and worth being kept.
    tavro_compose_forget_opened();
    tavro_compose_keeper_keep_all();
  } else {
    _build_note(
        ad, tavro_text(report.has_failed ? "IDS_OB_BODY_CRASH_DUMP_FAILED" : "IDS_OB_BODY_NO_CRASH_DUMP"));
  }
}
