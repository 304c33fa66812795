// "My Reports" brought into step with the store while it is being looked at.
#include <cstring>
#include <ctime>
#include <map>
#include <optional>

#include "tavro-main.h"
#include "tavro_history_parts.h"

namespace {

// Where the person is in the list.
struct place {
  int y = 0, row_height = 0, first_index = 0;
  int focused_id = 0;  // 0: the focus is elsewhere
};

Elm_Object_Item *_first_report_item(const history_app_data_s *history) {
  return history->select_item ? elm_genlist_item_next_get(history->select_item)
                              : elm_genlist_first_item_get(history->history_genlist);
}

template <typename Visit>
void _for_each_row(const history_app_data_s *history, Visit visit) {
  for (Elm_Object_Item *item = _first_report_item(history); item && item != history->view->older_item;
       item = elm_genlist_item_next_get(item))
    visit(tavro_history_row_of(item));
}

bool _is_same_text(const char *one, const char *other) {
  return one == other || (one && other && std::strcmp(one, other) == 0);
}

bool _looks_same(const svc_voc_data *one, const svc_voc_data *other) {
  for (const auto field :
       {&svc_voc_data::submitted, &svc_voc_data::date_of_updation, &svc_voc_data::title_description,
        &svc_voc_data::app_name, &svc_voc_data::app_icon, &svc_voc_data::type, &svc_voc_data::dump_file,
        &svc_voc_data::push_comments, &svc_voc_data::description})
    if (!_is_same_text(one->*field, other->*field)) return false;
  return one->push_read == other->push_read;
}

// By how many rows what stays in its order has moved down: the first such report of those on the screen
// tells. A report that was changed has come up to the top, by the time of its change.
int _rows_added_above(const history_app_data_s *history, int first_index) {
  struct position {
    int index;
    const svc_voc_data *voc;
  };
  std::map<int, position> positions;
  int index = 0;
  for (const GSList *link = history->history_genlist_items; link; link = link->next, ++index) {
    const svc_voc_data *voc = static_cast<svc_voc_data *>(link->data);
    positions[voc->id] = {index, voc};
  }
  const int above = history->select_item ? 1 : 0;
  std::optional<int> moved;
  _for_each_row(history, [&](const genlist_item *row) {
    if (moved || row->index + above < first_index) return;
    const auto found = positions.find(row->voc->id);
    if (found != positions.end() &&
        _is_same_text(found->second.voc->date_of_updation, row->voc->date_of_updation))
      moved = found->second.index - row->index;
  });
  return moved.value_or(0);
}

int _today() {
  const time_t now = std::time(nullptr);
  struct tm day {};
  localtime_r(&now, &day);
  return day.tm_yday;
}

// The items stay and show other reports: putting one in or taking one away makes the toolkit build all rows
// on the screen anew, twice.
void _fill_rows(appdata *ad, bool is_other_day) {
  history_app_data_s *history = ad->history_ad;
  Elm_Object_Item *older = history->view->older_item;
  Elm_Object_Item *at = _first_report_item(history);
  int index = 0;
  for (const GSList *link = history->history_genlist_items; link; link = link->next, ++index) {
    svc_voc_data *voc = static_cast<svc_voc_data *>(link->data);
    if (!at || at == older) {
      tavro_history_row_add(ad, voc, index, older);
      continue;
    }
    genlist_item *row = tavro_history_row_of(at);
    const bool is_changed = is_other_day || !_looks_same(row->voc, voc);
    row->voc = voc;
    if (is_changed) tavro_history_row_redraw(row);
    at = elm_genlist_item_next_get(at);
  }
  while (at && at != older) {
    Elm_Object_Item *next = elm_genlist_item_next_get(at);
    elm_object_item_del(at);
    at = next;
  }
}

// 0 as well for a row that was scrolled out of view: the list follows the focus, wherever that goes.
int _focused_id(const history_app_data_s *history, const place &now) {
  const Evas_Object *list = history->history_genlist;
  const Elm_Object_Item *item = elm_object_focus_get(list) ? elm_object_focused_item_get(list) : nullptr;
  const genlist_item *row = item ? tavro_history_row_of(item) : nullptr;
  if (!row || !row->voc) return 0;
  int height = 0;
  evas_object_geometry_get(list, nullptr, nullptr, nullptr, &height);
  const int y = (row->index + (history->select_item ? 1 : 0)) * now.row_height - now.y;
  return y + now.row_height > 0 && y < height ? row->voc->id : 0;
}

void _give_focus_back(const history_app_data_s *history, int voc_id) {
  _for_each_row(history, [voc_id](const genlist_item *row) {
    if (row->voc->id == voc_id && !elm_object_item_focus_get(row->item))
      elm_object_item_focus_set(row->item, EINA_TRUE);
  });
}

place _place_now(const history_app_data_s *history) {
  place now;
  int content = 0;
  elm_scroller_region_get(history->history_genlist, nullptr, &now.y, nullptr, nullptr);
  elm_scroller_child_size_get(history->history_genlist, nullptr, &content);
  const int count = static_cast<int>(elm_genlist_items_count(history->history_genlist));
  if (count > 0) now.row_height = content / count;
  if (now.row_height > 0) now.first_index = now.y / now.row_height;
  now.focused_id = _focused_id(history, now);
  return now;
}

// Show the same rows as before, above which `rows_added` have come; negative: gone. At its top the list stays
// there, for what is new comes in where the person looks.
void _keep_place(const history_app_data_s *history, const place &before, int rows_added) {
  if (before.y <= 0) return;
  int width = 0, height = 0;
  evas_object_geometry_get(history->history_genlist, nullptr, nullptr, &width, &height);
  const int y = before.y + rows_added * before.row_height;
  // As large as what is seen: a smaller region that is in view already would stay where it is.
  elm_scroller_region_show(history->history_genlist, 0, y, width, height);
  // The toolkit shows the last region again when a size changes: so the rows that are yet to be added are
  // there in the end. A list that becomes shorter in another way remembers a point in the middle.
  if (rows_added < 0) elm_scroller_region_show(history->history_genlist, 0, y + height / 2, 1, 1);
}

}  // namespace

void tavro_history_drop_select_all(history_app_data_s *history) {
  const place before = _place_now(history);
  elm_object_item_del(history->select_item);
  history->select_item = nullptr;
  history->select_check = nullptr;
  // The toolkit may move the list itself when it counts the rows again; where it stands is settled after
  // that.
  evas_smart_objects_calculate(evas_object_evas_get(history->history_genlist));
  _keep_place(history, before, -1);
}

void tavro_history_refresh_rows(appdata *ad) {
  history_app_data_s *history = ad->history_ad;
  const place before = _place_now(history);
  const int today = _today();
  const int rows_added = _rows_added_above(history, before.first_index);
  _fill_rows(ad, history->view->day != today);
  history->view->day = today;
  tavro_history_dress_end(ad);
  if (before.focused_id != 0) _give_focus_back(history, before.focused_id);
  _keep_place(history, before, rows_added);
}
