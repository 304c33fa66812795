// Selection mode of "My Reports": ticking reports to delete them.
#include <algorithm>

#include "tavro-main.h"
#include "tavro_history_parts.h"
#include "tavro_history_text.h"
#include "tavro_memory.h"
#include "tavro_type.h"

namespace {

int _row_count(const history_app_data_s *history) {
  return static_cast<int>(g_slist_length(history->history_genlist_items));
}

const svc_voc_data *_report_at(const history_app_data_s *history, int index) {
  return static_cast<svc_voc_data *>(
      g_slist_nth_data(history->history_genlist_items, static_cast<guint>(index)));
}

void _forget_ticks(history_app_data_s *history) {
  TAVRO_FREE(history->history_item_status_array);
  history->checked_item_count = 0;
}

void _new_ticks(history_app_data_s *history) {
  _forget_ticks(history);
  history->history_item_status_array =
      TAVRO_ADOPT(g_new0(int, static_cast<gsize>(std::max(1, _row_count(history)))));
}

void _set_tick(history_app_data_s *history, int index, bool is_ticked) {
  int &tick = history->history_item_status_array[index];
  history->checked_item_count += (is_ticked ? 1 : 0) - tick;
  tick = is_ticked ? 1 : 0;
}

}  // namespace

bool tavro_history_can_tick(const svc_voc_data *voc) {
  return tavro_current_status(voc->submitted) != TAVRO_STATUS_SENDING;
}

bool tavro_history_is_ticked(const history_app_data_s *history, int index) {
  return history->history_item_status_array && history->history_item_status_array[index] != 0;
}

void tavro_history_checkbox_selected(appdata *ad, int index) {
  history_app_data_s *history = ad->history_ad;
  if (!history->delete_status || index < 0 || index >= _row_count(history)) return;
  if (!tavro_history_can_tick(_report_at(history, index))) return;
  _set_tick(history, index, !tavro_history_is_ticked(history, index));
  tavro_history_dress_page(ad);
  tavro_history_redraw_all(ad);
}

void tavro_history_select_all(appdata *ad) {
  history_app_data_s *history = ad->history_ad;
  int index = 0;
  bool is_any_open = false;
  for (const GSList *link = history->history_genlist_items; link; link = link->next, ++index)
    is_any_open |= tavro_history_can_tick(static_cast<svc_voc_data *>(link->data)) &&
                   !tavro_history_is_ticked(history, index);
  index = 0;
  for (const GSList *link = history->history_genlist_items; link; link = link->next, ++index)
    _set_tick(history, index, is_any_open && tavro_history_can_tick(static_cast<svc_voc_data *>(link->data)));
  tavro_history_dress_page(ad);
  tavro_history_redraw_all(ad);
}

std::vector<int> tavro_history_ticked_ids(const history_app_data_s *history) {
  std::vector<int> ids;
  int index = 0;
  for (const GSList *link = history->history_genlist_items; link; link = link->next, ++index)
    if (tavro_history_is_ticked(history, index)) ids.push_back(static_cast<svc_voc_data *>(link->data)->id);
  return ids;
}

void tavro_history_restore_ticks(appdata *ad, const std::vector<int> &ids) {
  history_app_data_s *history = ad->history_ad;
  _new_ticks(history);
  int index = 0;
  for (const GSList *link = history->history_genlist_items; link; link = link->next, ++index) {
    const svc_voc_data *voc = static_cast<svc_voc_data *>(link->data);
    // One that went out again meanwhile cannot be deleted now.
    if (tavro_history_can_tick(voc) && std::find(ids.begin(), ids.end(), voc->id) != ids.end())
      _set_tick(history, index, true);
  }
}

void tavro_history_enter_selection(appdata *ad, int index) {
  history_app_data_s *history = ad->history_ad;
  if (history->delete_status || !history->history_genlist_items) return;
  history->delete_status = true;
  _new_ticks(history);
  tavro_history_row_add(ad, nullptr, -1, elm_genlist_first_item_get(history->history_genlist));
  if (index >= 0 && tavro_history_can_tick(_report_at(history, index))) _set_tick(history, index, true);
  tavro_history_dress_page(ad);
  tavro_history_redraw_all(ad);
  elm_object_focus_set(history->history_genlist, EINA_TRUE);
}

void tavro_history_leave_selection(appdata *ad) {
  history_app_data_s *history = ad->history_ad;
  if (!history->delete_status) return;
  history->delete_status = false;
  _forget_ticks(history);
  tavro_history_drop_select_all(history);
  tavro_history_dress_page(ad);
  tavro_history_redraw_all(ad);
  elm_object_focus_set(history->history_genlist, EINA_TRUE);
}
