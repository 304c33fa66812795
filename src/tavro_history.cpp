// "My Reports": the list of the user's reports.
#include "tavro_history.h"

#include <elm_atspi.h>

#include <cstring>
#include <string>

#include "tavro-common.h"
#include "tavro-main.h"
#include "tavro_appdata.h"
#include "tavro_dbmgr.h"
#include "tavro_focus.h"
#include "tavro_handles.h"
#include "tavro_history_parts.h"
#include "tavro_log.h"
#include "tavro_memory.h"
#include "tavro_preferences.h"
#include "tavro_report_delete.h"
#include "tavro_screens.h"
#include "tavro_widgets.h"

namespace {

// The page's title is also what resuming looks at.
constexpr char kTitle[] = "IDS_OB_HEADER_MY_REPORTS";
constexpr guint kMostListed = 100;  // The store reads no more of them at a time.

// ---- Loading ----

void _leave_out_deleted(GSList **vocs) {
  for (GSList *link = *vocs; link;) {
    GSList *next = link->next;
    svc_voc_data *voc = static_cast<svc_voc_data *>(link->data);
    if (tavro_delete_is_waiting(voc->id)) {
      tavro_dbmgr_free_voc_data(voc);
      *vocs = g_slist_delete_link(*vocs, link);
    }
    link = next;
  }
}

// What the person chose to see of the user's reports. False when the store cannot be read just now.
bool _load(tavro_history_view *view, const char *user_name, GSList **vocs) {
  const tavro_history_choice &choice = view->choice;
  int count = 0;
  if (choice.is_all())
    get_voc_list_from_db(&count, vocs, user_name);
  else
    *vocs = tavro_dbmgr_search_vocs(user_name, {choice.text.empty() ? nullptr : choice.text.c_str(),
                                                choice.stage, choice.kind, choice.is_unread});
  if (!*vocs) {
    const int stored = tavro_dbmgr_get_voc_count(user_name);
    if (stored < 0 || (stored > 0 && choice.is_all())) return false;
  }
  view->has_older = g_slist_length(*vocs) >= kMostListed &&
                    tavro_dbmgr_get_voc_count(user_name) > static_cast<int>(kMostListed);
  _leave_out_deleted(vocs);
  return true;
}

void _show_reports(appdata *ad, GSList *vocs, bool is_new_list) {
  history_app_data_s *history = ad->history_ad;
  GSList *shown = history->history_genlist_items;
  const std::vector<int> ticked = tavro_history_ticked_ids(history);
  if (!vocs) tavro_history_leave_selection(ad);
  history->history_genlist_items = vocs;
  if (history->delete_status) tavro_history_restore_ticks(ad, ticked);
  tavro_history_refresh_rows(ad);
  tavro_free_voc_list(&shown);  // Only now: the rows that were shown pointed into it.
  if (vocs)
    tavro_history_show_list(history);
  else
    tavro_history_show_no_rows(ad);
  history->view->had_reports |= vocs != nullptr;
  tavro_history_dress_page(ad);
  if (history->delete_status) tavro_history_redraw_all(ad);
  if (is_new_list) elm_scroller_region_show(history->history_genlist, 0, 0, 1, 1);
}

void _deletion_changed(appdata *ad) {
  if (ad->history_ad) tavro_history_reload(ad, false);
}

// ---- Title bar ----

void _search_clicked_cb(void *data, Evas_Object *, void *) {
  tavro_history_toggle_search(static_cast<appdata *>(data));
}

void _select_chosen(appdata *ad) {
  if (ad->history_ad) tavro_history_enter_selection(ad, -1);
}

void _more_clicked_cb(void *data, Evas_Object *, void *) {
  appdata *ad = static_cast<appdata *>(data);
  tavro_menu_show(ad, &ad->history_edit_popup, {{tavro_text("IDS_OB_BUTTON_SELECT"), _select_chosen}});
}

void _back_clicked_cb(void *data, Evas_Object *, void *) {
  elm_naviframe_item_pop(static_cast<appdata *>(data)->nf);
}

void _delete_confirmed(appdata *ad) {
  if (ad->history_ad) tavro_history_leave_selection(ad);
}

void _delete_clicked_cb(void *data, Evas_Object *, void *) {
  appdata *ad = static_cast<appdata *>(data);
  tavro_delete_reports(ad, tavro_history_ticked_ids(ad->history_ad), _delete_confirmed);
}

// Another mode has other buttons. One that the focus was on takes it along: the caller says where to.
void _change_buttons(appdata *ad, bool is_selecting, bool has_rows) {
  history_app_data_s *history = ad->history_ad;
  tavro_history_view *view = history->view;
  const bool has_actions = has_rows || !view->choice.is_all();
  const bool are_shown = elm_object_part_content_get(history->page, "tavro.swallow.start") &&
                         (view->delete_button != nullptr) == is_selecting &&
                         (view->search_button != nullptr) == (!is_selecting && has_actions);
  if (are_shown) return;
  Evas_Object *start = tavro_button_add(
      history->page, "tavro_icon", nullptr,
      tavro_icon_add(history->page, is_selecting ? "close/on" : "back/on"),
      tavro_text(is_selecting ? "IDS_OB_BUTTON_CANCEL" : "IDS_OB_BUTTON_BACK"), _back_clicked_cb, ad);
  elm_object_part_content_set(history->page, "tavro.swallow.start", start);
  elm_object_part_content_set(history->page, "tavro.swallow.actions", nullptr);
  view->delete_button = view->search_button = nullptr;
  if (is_selecting) {
    view->delete_button = tavro_page_action_add(
        history->page, "trash", tavro_text("IDS_OB_BUTTON_DELETE_ABB5"), _delete_clicked_cb, ad);
  } else if (has_actions) {
    view->search_button = tavro_page_action_add(history->page, "search", tavro_text("IDS_OB_BUTTON_SEARCH"),
                                                _search_clicked_cb, ad);
    tavro_page_action_add(history->page, "more", tavro_text("IDS_OB_BUTTON_MORE"), _more_clicked_cb, ad);
  }
}

std::string _title(const history_app_data_s *history) {
  if (!history->delete_status) return tavro_text(kTitle);
  const std::string title = tavro_text("IDS_OB_HEADER_SELECT_ITEMS");
  const int count = history->checked_item_count;
  return count > 0 ? title + " (" + std::to_string(count) + ")" : title;
}

// "Back" ends the selection mode or the search first.
Eina_Bool _pop_cb(void *data, Elm_Object_Item *) {
  appdata *ad = static_cast<appdata *>(data);
  if (ad->history_ad->delete_status) {
    tavro_history_leave_selection(ad);
    return EINA_FALSE;
  }
  return tavro_history_close_search(ad) ? EINA_FALSE : EINA_TRUE;
}

// ---- Page ----

void _long_pressed_cb(void *data, Evas_Object *, void *event_info) {
  const genlist_item *row = tavro_history_row_of(static_cast<Elm_Object_Item *>(event_info));
  if (row->voc) tavro_history_enter_selection(static_cast<appdata *>(data), row->index);
}

Evas_Object *_build_list(appdata *ad) {
  Evas_Object *list = elm_genlist_add(ad->history_ad->view->frame);
  elm_genlist_homogeneous_set(list, EINA_TRUE);
  elm_genlist_select_mode_set(list, ELM_OBJECT_SELECT_MODE_ALWAYS);
  elm_scroller_policy_set(list, ELM_SCROLLER_POLICY_OFF, ELM_SCROLLER_POLICY_OFF);
  evas_object_data_set(list, "app_data", ad);
  elm_atspi_accessible_name_set(list, tavro_text(kTitle));
  tavro_focus_walk_list(list);
  evas_object_smart_callback_add(list, "longpressed", _long_pressed_cb, ad);
  evas_object_show(list);
  return list;
}

void _page_deleted_cb(void *data, Evas *, Evas_Object *page, void *) {
  appdata *ad = static_cast<appdata *>(data);
  history_app_data_s *history = ad->history_ad;
  if (!history || history->page != page) return;
  elm_genlist_clear(history->history_genlist);
  tavro_free_voc_list(&history->history_genlist_items);
  elm_genlist_item_class_free(history->_itc);
  if (history->view->search_timer) ecore_timer_del(history->view->search_timer);
  delete history->view;
  TAVRO_FREE(history->history_item_status_array);
  TAVRO_FREE(ad->history_ad);
  tavro_voc_list_lock_destroy(ad);
}

void _build_page(appdata *ad) {
  history_app_data_s *history = ad->history_ad;
  history->page = tavro_page_add(ad, tavro_text(kTitle), "back");
  evas_object_event_callback_add(history->page, EVAS_CALLBACK_DEL, _page_deleted_cb, ad);
  history->view->frame = tavro_layout_add(history->page, "tavro/history");
  tavro_history_build_filters(ad);
  history->history_genlist = _build_list(ad);
  elm_object_content_set(history->view->frame, history->history_genlist);
  elm_object_content_set(history->page, history->view->frame);
}

// The naviframe gives the focus of a page that comes up to its first control, which may be a part of the list
// that is not shown.
void _focus_start_cb(void *data, Evas_Object *nf, void *) {
  appdata *ad = static_cast<appdata *>(data);
  evas_object_smart_callback_del(nf, "transition,finished", _focus_start_cb);
  const history_app_data_s *history = ad->history_ad;
  if (!history || elm_naviframe_top_item_get(nf) != history->history_nf_it) return;
  elm_object_focus_set(history->history_genlist_items
                           ? history->history_genlist
                           : elm_object_part_content_get(history->page, "tavro.swallow.start"),
                       EINA_TRUE);
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
  if (draft->type && std::strcmp(draft->type, TAVRO_DBMGR_SUGGESTION) == 0)
    tavro_create_idea_page(ad, draft);
  else
    tavro_create_problem_page(ad, draft);
}

void tavro_history_dress_page(appdata *ad) {
  const history_app_data_s *history = ad->history_ad;
  tavro_history_view *view = history->view;
  const bool has_rows = history->history_genlist_items != nullptr;
  _change_buttons(ad, history->delete_status, has_rows);
  const std::string title = _title(history);
  tavro_layout_text_set(history->page, "elm.text.title", title.c_str());
  elm_atspi_accessible_name_set(history->page, title.c_str());
  const bool is_filtered = !history->delete_status && (has_rows || !view->choice.is_all());
  elm_object_signal_emit(view->frame, is_filtered ? "tavro,filters" : "tavro,bare", "tavro");
  if (view->delete_button)
    elm_object_disabled_set(view->delete_button, history->checked_item_count == 0 ? EINA_TRUE : EINA_FALSE);
}

void tavro_history_reload(appdata *ad, bool is_new_list) {
  const TavroText user_name = tavro_get_username_from_preference();
  GSList *vocs = nullptr;
  if (_load(ad->history_ad->view, user_name ? user_name.get() : "", &vocs))
    _show_reports(ad, vocs, is_new_list);
  else if (!ad->history_ad->history_genlist_items)
    tavro_history_show_unreadable(ad);  // else what is shown is better than nothing
}

void tavro_update_history_page(app_control_h, appdata *ad) {
  TAVRO_LOGD("Called for status update from svc");
  if (ad->history_ad && tavro_get_username_from_preference()) tavro_history_reload(ad, false);
}

void tavro_create_history_page(appdata *ad) {
  if (!ad->nf || ad->history_ad) return;
  history_app_data_s *history = ad->history_ad = TAVRO_ZALLOC(history_app_data_s);
  tavro_voc_list_lock_create(ad);
  history->view = new tavro_history_view;
  history->_itc = tavro_history_row_class_new();
  _build_page(ad);
  tavro_history_reload(ad, true);
  tavro_delete_register_screen(_deletion_changed);
  evas_object_smart_callback_add(ad->nf, "transition,finished", _focus_start_cb, ad);
  history->history_nf_it = tavro_page_push(ad, history->page, tavro_text(kTitle));
  elm_naviframe_item_pop_cb_set(history->history_nf_it, _pop_cb, ad);
}
