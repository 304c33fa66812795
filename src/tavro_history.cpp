// "My Reports": the list of the user's reports.
#include "tavro_history.h"

#include <cstdlib>
#include <cstring>
#include <memory>
#include <string>

#include "tavro-common.h"
#include "tavro-main.h"
#include "tavro_appdata.h"
#include "tavro_dbmgr.h"
#include "tavro_history_text.h"
#include "tavro_log.h"
#include "tavro_memory.h"
#include "tavro_preferences.h"
#include "tavro_screens.h"
#include "tavro_targets.h"
#include "tavro_theme.h"
#include "tavro_widgets.h"

namespace {

// The page's title is also what resuming looks at.
constexpr char kTitle[] = "IDS_OB_HEADER_MY_REPORTS";

bool _is_idea(const svc_voc_data *voc) {
  return voc->type && std::strcmp(voc->type, TAVRO_DBMGR_SUGGESTION) == 0;
}

bool _has_unread_reply(const svc_voc_data *voc) {
  return voc->push_comments && voc->push_read == 0;
}

char *genlist_get_text_part(void *data, Evas_Object *, const char *part) {
  const genlist_item *row = static_cast<genlist_item *>(data);
  return tavro_history_row_text(row->index, row->voc, part);
}

void _replace(std::string &text, const char *what, const std::string &with) {
  // Only the tags at the start are ours; what the person wrote is escaped and follows them.
  const size_t at = text.find(what);
  if (at != std::string::npos) text.replace(at, std::strlen(what), with);
}

// The row's text with sizes that follow the scale factor and a red that the palette has: the texts themselves
// carry the pixels and the red of one phone.
char *_row_text(void *data, Evas_Object *list, const char *part) {
  const std::unique_ptr<char, decltype(&std::free)> text(genlist_get_text_part(data, list, part), &std::free);
  if (!text) return nullptr;
  std::string shown = text.get();
  _replace(shown, "<font_size=32>", "<font_size=17>");
  _replace(shown, "<font_size=29>", "<font_size=14>");
  _replace(shown, "<color=#ff0000>", std::string("<color=") + tavro_theme_danger_colour() + ">");
  return strdup(shown.c_str());  // The toolkit frees it.
}

Evas_Object *_row_content(void *data, Evas_Object *list, const char *part) {
  const svc_voc_data *voc = static_cast<genlist_item *>(data)->voc;
  if (!voc) return nullptr;
  if (std::strcmp(part, "elm.icon.1") == 0) {
    if (voc->dump_file) return tavro_tile_add(list, "bug");
    const bool has_icon = voc->app_icon && *voc->app_icon && !_is_idea(voc);
    return has_icon ? tavro_picture_add(list, voc->app_icon, 44)
                    : tavro_tile_add(list, tavro_target_tile(voc->app_name, _is_idea(voc)));
  }
  if (std::strcmp(part, "elm.icon.right.bottom") == 0 && _has_unread_reply(voc))
    return tavro_layout_add(list, "tavro/dot/unread");
  return nullptr;
}

void _row_deleted(void *data, Evas_Object *) {
  genlist_item *row = static_cast<genlist_item *>(data);
  TAVRO_FREE(row);
}

void _open_report(appdata *ad, genlist_item *row) {
  ad->history_ad->history_details_index = row->index;
  svc_voc_data *voc = row->voc;
  tavro_create_history_details_page(ad, voc->id);
  voc->push_read = 1;
  elm_genlist_item_fields_update(row->item, "elm.icon.right.bottom", ELM_GENLIST_ITEM_FIELD_CONTENT);
}

void _reopen_draft(appdata *ad, const svc_voc_data *voc) {
  TAVRO_LOGD("type:%s", voc->type);
  if (!tavro_leave_compose_page(ad)) return;
  const bool is_crash = !_is_idea(voc) && voc->dump_file;
  if (is_crash) ad->hType = ERROR;
  ad->type = is_crash ? CRASH : PROBLEM;
  tavro_edit_cb(ad, voc);
}

void _tavro_history_select_cb(void *data, Evas_Object *list, void *event_info) {
  TAVRO_LOGD("selected");
  appdata *ad = static_cast<appdata *>(evas_object_data_get(list, "app_data"));
  Elm_Object_Item *item = static_cast<Elm_Object_Item *>(event_info);
  const guint index = GPOINTER_TO_UINT(data);
  genlist_item *row = static_cast<genlist_item *>(elm_object_item_data_get(item));
  elm_genlist_item_selected_set(item, EINA_FALSE);
  const svc_voc_data *voc =
      static_cast<svc_voc_data *>(g_slist_nth_data(ad->history_ad->history_genlist_items, index));
  if (!voc) return;
  if (tavro_current_status(voc->submitted) != TAVRO_STATUS_DRAFT_SAVED)
    _open_report(ad, row);
  else
    _reopen_draft(ad, voc);
}

Elm_Genlist_Item_Class *_row_class_new() {
  Elm_Genlist_Item_Class *row_class = elm_genlist_item_class_new();
  row_class->item_style = "2line.top.4";
  row_class->func.text_get = _row_text;
  row_class->func.content_get = _row_content;
  row_class->func.del = _row_deleted;
  return row_class;
}

void _append_rows(history_app_data_s *history) {
  int index = 0;
  for (GSList *link = history->history_genlist_items; link; link = link->next, ++index) {
    genlist_item *row = TAVRO_ZALLOC(genlist_item);
    row->index = index;
    row->voc = static_cast<svc_voc_data *>(link->data);
    row->item =
        elm_genlist_item_append(history->history_genlist, history->_itc, row, nullptr, ELM_GENLIST_ITEM_NONE,
                                _tavro_history_select_cb, GINT_TO_POINTER(index));
  }
}

Evas_Object *_build_empty(Evas_Object *page) {
  Evas_Object *empty = tavro_layout_add(page, "tavro/empty");
  elm_object_part_content_set(empty, "icon_area", tavro_tile_add(empty, "list"));
  elm_object_part_text_set(
      empty, "elm.text.sub",
      tavro_text("IDS_OB_BODY_AFTER_YOU_COMPOSE_FEEDBACK_MESSAGES_THEY_WILL_BE_SHOWN_HERE"));
  return empty;
}

Evas_Object *_build_list(appdata *ad) {
  Evas_Object *list = elm_genlist_add(ad->history_ad->page);
  elm_genlist_homogeneous_set(list, EINA_TRUE);
  elm_genlist_select_mode_set(list, ELM_OBJECT_SELECT_MODE_ALWAYS);
  elm_scroller_policy_set(list, ELM_SCROLLER_POLICY_OFF, ELM_SCROLLER_POLICY_OFF);
  evas_object_data_set(list, "app_data", ad);
  evas_object_show(list);
  return list;
}

// Show what is stored now: the list with its rows, or the empty page. A list that is shown stays, and with it
// the place it was scrolled to.
void _show_reports(appdata *ad, const char *user_name) {
  history_app_data_s *history = ad->history_ad;
  GSList *shown = history->history_genlist_items;
  int count = 0;
  history->history_genlist_items = nullptr;
  get_voc_list_from_db(&count, &history->history_genlist_items, user_name);
  if (!history->history_genlist_items && shown && tavro_dbmgr_get_voc_count(user_name) != 0) {
    // The store could not be read just now: what is shown is better than nothing.
    history->history_genlist_items = shown;
    return;
  }
  if (!history->history_genlist_items) {
    history->history_genlist = nullptr;
    elm_object_content_set(history->page, _build_empty(history->page));
  } else if (!history->history_genlist) {
    history->history_genlist = _build_list(ad);
    _append_rows(history);
    elm_object_content_set(history->page, history->history_genlist);
  } else {
    int x = 0, y = 0, width = 0, height = 0;
    elm_scroller_region_get(history->history_genlist, &x, &y, &width, &height);
    elm_genlist_clear(history->history_genlist);
    _append_rows(history);
    elm_scroller_region_show(history->history_genlist, x, y, width, height);
  }
  tavro_free_voc_list(&shown);  // Only now: the rows that were shown pointed into it.
}

void _page_deleted_cb(void *data, Evas *, Evas_Object *page, void *) {
  appdata *ad = static_cast<appdata *>(data);
  history_app_data_s *history = ad->history_ad;
  if (!history || history->page != page) return;
  if (history->history_genlist) elm_genlist_clear(history->history_genlist);
  tavro_free_voc_list(&history->history_genlist_items);
  elm_genlist_item_class_free(history->_itc);
  TAVRO_FREE(ad->history_ad);
  tavro_voc_list_lock_destroy(ad);
}

}  // namespace

void get_voc_list_from_db(int *count, GSList **vocs, const char *user_name) {
  *vocs = tavro_dbmgr_get_vocs_for_history(user_name);
  if (*vocs) *count = static_cast<int>(g_slist_length(*vocs));
}

void tavro_free_voc_list(GSList **vocs) {
  for (GSList *link = *vocs; link; link = link->next)
    tavro_dbmgr_free_voc_data(static_cast<svc_voc_data *>(link->data));
  g_slist_free(*vocs);
  *vocs = nullptr;
}

void tavro_edit_cb(appdata *ad, const svc_voc_data *draft) {
  if (_is_idea(draft))
    tavro_create_idea_page(ad, draft);
  else
    tavro_create_problem_page(ad, draft);
}

void tavro_update_history_page(app_control_h, appdata *ad) {
  TAVRO_LOGD("Called for status update from svc");
  if (!ad->history_ad) return;
  const TavroText user_name = tavro_get_username_from_preference();
  if (user_name) _show_reports(ad, user_name.get());
}

void tavro_create_history_page(appdata *ad) {
  if (!ad->nf || ad->history_ad) return;
  history_app_data_s *history = ad->history_ad = TAVRO_ZALLOC(history_app_data_s);
  tavro_voc_list_lock_create(ad);
  history->_itc = _row_class_new();
  history->page = tavro_page_add(ad, tavro_text(kTitle), "back");
  evas_object_event_callback_add(history->page, EVAS_CALLBACK_DEL, _page_deleted_cb, ad);
  const TavroText user_name = tavro_get_username_from_preference();
  _show_reports(ad, user_name ? user_name.get() : "");
  history->history_nf_it = tavro_page_push(ad, history->page, tavro_text(kTitle));
}
