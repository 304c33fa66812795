// Picker of pictures and videos to attach: a grid of what the gallery has, any number can be chosen. The
// folders are walked on a worker; what it finds comes into the grid a few at a time, so that the main loop
// stays free.
#include <elm_atspi.h>

#include <algorithm>
#include <cmath>
#include <cstring>
#include <deque>
#include <memory>
#include <string>
#include <vector>

#include "tavro-common.h"
#include "tavro-main.h"
#include "tavro_gallery.h"
#include "tavro_screens.h"
#include "tavro_thumbnails.h"
#include "tavro_widgets.h"

namespace {

bool _is_open = false;  // a second tap opens no second picker

constexpr int kColumnUnits = 90;
constexpr size_t kItemsPerTurn = 32;         // of the main loop; a first page or more
constexpr double kQuietSearchSeconds = 0.3;  // a search that takes longer says so

struct gallery_picker;

// A walk on its worker; `picker` is the main loop's, null once the page is gone.
struct gallery_search {
  gallery_picker *picker;
  std::vector<std::string> folders;
  int unreadable_folders;
};

struct gallery_picker {
  appdata *ad = nullptr;
  tavro_pictures_chosen chosen = nullptr;
  Evas_Object *page = nullptr;
  Evas_Object *grid = nullptr;        // null until something is found
  Evas_Object *add_button = nullptr;  // with the grid
  Elm_Gengrid_Item_Class *item_class = nullptr;
  std::vector<const tavro_gallery_file *> chosen_files;  // in the order of choosing; the grid's
  std::deque<tavro_gallery_file> found;                  // not in the grid yet
  gallery_search *search = nullptr;                      // null once it has ended
  Ecore_Thread *worker = nullptr;
  Ecore_Idler *filling = nullptr;
  Ecore_Timer *quiet = nullptr;  // until the page says that it searches
};

// ---- Choosing ----

void _show_count(gallery_picker *picker) {
  const size_t count = picker->chosen_files.size();
  elm_object_disabled_set(picker->add_button, count == 0);
  std::string text = tavro_text("IDS_OB_BUTTON_ATTACH");
  if (count > 0) text += " (" + std::to_string(count) + ")";
  elm_object_text_set(picker->add_button, text.c_str());
  elm_atspi_accessible_name_set(picker->add_button, text.c_str());
}

const tavro_gallery_file *_file_of(const void *item) {
  return static_cast<const tavro_gallery_file *>(
      elm_object_item_data_get(static_cast<const Elm_Object_Item *>(item)));
}

void _item_selected_cb(void *data, Evas_Object *, void *item) {
  auto *picker = static_cast<gallery_picker *>(data);
  picker->chosen_files.push_back(_file_of(item));
  _show_count(picker);
}

void _item_unselected_cb(void *data, Evas_Object *, void *item) {
  auto *picker = static_cast<gallery_picker *>(data);
  auto &files = picker->chosen_files;
  files.erase(std::remove(files.begin(), files.end(), _file_of(item)), files.end());
  _show_count(picker);
}

void _add_clicked_cb(void *data, Evas_Object *, void *) {
  auto *picker = static_cast<gallery_picker *>(data);
  appdata *ad = picker->ad;
  GSList *paths = nullptr;
  for (const tavro_gallery_file *file : picker->chosen_files)
    paths = g_slist_append(paths, const_cast<char *>(file->path.c_str()));
  picker->chosen(ad, paths);
  g_slist_free(paths);
  elm_naviframe_item_pop(ad->nf);
}

// ---- Grid ----

char *_item_text(void *data, Evas_Object *, const char *) {
  const std::string &path = static_cast<tavro_gallery_file *>(data)->path;
  return strdup(tavro_markup(path.c_str() + path.rfind('/') + 1).c_str());  // The toolkit frees it.
}

Evas_Object *_item_content(void *data, Evas_Object *grid, const char *) {
  return tavro_thumbnail_add(grid, static_cast<tavro_gallery_file *>(data)->path.c_str(), kColumnUnits);
}

void _item_deleted(void *data, Evas_Object *) {
  delete static_cast<tavro_gallery_file *>(data);
}

Elm_Gengrid_Item_Class *_item_class_new() {
  Elm_Gengrid_Item_Class *item_class = elm_gengrid_item_class_new();
  item_class->item_style = "tavro_picture";
  item_class->func.text_get = _item_text;
  item_class->func.content_get = _item_content;
  item_class->func.del = _item_deleted;
  return item_class;
}

// As many columns as fit, which together fill the width.
void _fit_columns_cb(void *, Evas *, Evas_Object *grid, void *) {
  int width = 0;
  evas_object_geometry_get(grid, nullptr, nullptr, &width, nullptr);
  const int least_side = std::max(1, static_cast<int>(std::lround(kColumnUnits * elm_config_scale_get())));
  const int side = std::max(least_side, width / std::max(1, width / least_side));
  elm_gengrid_item_size_set(grid, side, side);
}

void _build_grid(gallery_picker *picker) {
  picker->grid = elm_gengrid_add(picker->page);
  evas_object_event_callback_add(picker->grid, EVAS_CALLBACK_RESIZE, _fit_columns_cb, nullptr);
  _fit_columns_cb(nullptr, nullptr, picker->grid, nullptr);
  elm_atspi_accessible_name_set(picker->grid, tavro_text("IDS_OB_HEADER_CHOOSE_PICTURES"));
  elm_gengrid_multi_select_set(picker->grid, EINA_TRUE);
  elm_gengrid_align_set(picker->grid, 0.0, 0.0);
  elm_scroller_policy_set(picker->grid, ELM_SCROLLER_POLICY_OFF, ELM_SCROLLER_POLICY_OFF);
  evas_object_smart_callback_add(picker->grid, "selected", _item_selected_cb, picker);
  evas_object_smart_callback_add(picker->grid, "unselected", _item_unselected_cb, picker);
  evas_object_show(picker->grid);
  elm_object_content_set(picker->page, picker->grid);
}

void _build_bottom(gallery_picker *picker) {
  Evas_Object *bottom = tavro_layout_add(picker->page, "tavro/bottom");
  picker->add_button = tavro_button_add(bottom, "tavro_primary", "", nullptr,
                                        tavro_text("IDS_OB_BUTTON_ATTACH"), _add_clicked_cb, picker);
  elm_object_content_set(bottom, picker->add_button);
  elm_object_part_content_set(picker->page, "tavro.swallow.bottom", bottom);
  elm_object_signal_emit(picker->page, "tavro,bottom", "tavro");
  _show_count(picker);
  // Of itself the toolkit puts a button that was enabled later before the grid.
  Evas_Object *back = elm_object_part_content_get(picker->page, "tavro.swallow.start");
  for (Evas_Object *next : {back, picker->grid, bottom})
    elm_object_focus_custom_chain_append(picker->page, next, nullptr);
}

int _compare_items(const void *left, const void *right) {
  return tavro_gallery_is_before(*_file_of(left), *_file_of(right)) ? -1 : 1;
}

// Files come in the order of showing within a report, but a later report may hold earlier ones.
void _insert(gallery_picker *picker, tavro_gallery_file file) {
  Elm_Object_Item *last = elm_gengrid_last_item_get(picker->grid);
  auto *own = new tavro_gallery_file(std::move(file));
  if (!last || tavro_gallery_is_before(*_file_of(last), *own))
    elm_gengrid_item_append(picker->grid, picker->item_class, own, nullptr, nullptr);
  else
    elm_gengrid_item_sorted_insert(picker->grid, picker->item_class, own, _compare_items, nullptr, nullptr);
  if (elm_gengrid_items_count(picker->grid) <= kGalleryMostFiles) return;
  last = elm_gengrid_last_item_get(picker->grid);
  if (!elm_gengrid_item_selected_get(last)) elm_object_item_del(last);
}

Eina_Bool _fill_some_cb(void *data) {
  auto *picker = static_cast<gallery_picker *>(data);
  for (size_t i = 0; i < kItemsPerTurn && !picker->found.empty(); ++i) {
    _insert(picker, std::move(picker->found.front()));
    picker->found.pop_front();
  }
  if (!picker->found.empty()) return ECORE_CALLBACK_RENEW;
  picker->filling = nullptr;
  return ECORE_CALLBACK_CANCEL;
}

// ---- Search ----

void _show_state(gallery_picker *picker, const char *tile, const char *title, const char *hint) {
  Evas_Object *empty = tavro_layout_add(picker->page, "tavro/empty");
  elm_object_part_content_set(empty, "icon_area", tavro_tile_add(empty, tile));
  elm_object_text_set(empty, tavro_text(title));
  elm_object_signal_emit(empty, "tavro,headed", "tavro");
  if (hint) elm_object_part_text_set(empty, "elm.text.sub", tavro_text(hint));
  elm_object_content_set(picker->page, empty);
}

Eina_Bool _say_searching_cb(void *data) {
  auto *picker = static_cast<gallery_picker *>(data);
  picker->quiet = nullptr;
  _show_state(picker, "image", "IDS_OB_BODY_LOOKING_FOR_PICTURES", nullptr);
  return ECORE_CALLBACK_CANCEL;
}

void _stop_being_quiet(gallery_picker *picker) {
  if (picker->quiet) ecore_timer_del(picker->quiet);
  picker->quiet = nullptr;
}

void _search_work(void *data, Ecore_Thread *thread) {
  auto *search = static_cast<gallery_search *>(data);
  search->unreadable_folders =
      tavro_gallery_walk(search->folders, [thread](std::vector<tavro_gallery_file> files) {
        auto *message = new std::vector<tavro_gallery_file>(std::move(files));
        if (!ecore_thread_feedback(thread, message)) delete message;
        return !ecore_thread_check(thread);
      });
}

void _search_found_cb(void *data, Ecore_Thread *, void *message) {
  const std::unique_ptr<std::vector<tavro_gallery_file>> files(
      static_cast<std::vector<tavro_gallery_file> *>(message));
  gallery_picker *picker = static_cast<gallery_search *>(data)->picker;
  if (!picker || files->empty()) return;
  _stop_being_quiet(picker);
  std::move(files->begin(), files->end(), std::back_inserter(picker->found));
  if (!picker->grid) {
    _build_grid(picker);
    _build_bottom(picker);
  }
  if (!picker->filling && _fill_some_cb(picker)) picker->filling = ecore_idler_add(_fill_some_cb, picker);
}

void _search_ended_cb(void *data, Ecore_Thread *) {
  const std::unique_ptr<gallery_search> search(static_cast<gallery_search *>(data));
  gallery_picker *picker = search->picker;
  if (!picker) return;
  picker->search = nullptr;
  _stop_being_quiet(picker);
  if (picker->grid) return;
  if (search->unreadable_folders > 0)
    _show_state(picker, "image", "IDS_OB_BODY_PICTURES_UNREADABLE", "IDS_OB_BODY_PICTURES_UNREADABLE_HINT");
  else
    _show_state(picker, "image", "IDS_OB_BODY_NO_PICTURES", "IDS_OB_BODY_NO_PICTURES_HINT");
}

void _start_search(gallery_picker *picker) {
  picker->quiet = ecore_timer_add(kQuietSearchSeconds, _say_searching_cb, picker);
  picker->search = new gallery_search{picker, tavro_gallery_folders(), 0};
  picker->worker = ecore_thread_feedback_run(_search_work, _search_found_cb, _search_ended_cb,
                                             _search_ended_cb, picker->search, EINA_FALSE);
}

void _page_deleted_cb(void *data, Evas *, Evas_Object *, void *) {
  const std::unique_ptr<gallery_picker> picker(static_cast<gallery_picker *>(data));
  _is_open = false;
  _stop_being_quiet(picker.get());
  if (picker->filling) ecore_idler_del(picker->filling);
  if (picker->search) {
    picker->search->picker = nullptr;
    ecore_thread_cancel(picker->worker);  // may end it at once, and then frees the search
  }
  elm_gengrid_item_class_free(picker->item_class);
}

}  // namespace

void tavro_create_gallery_picker(appdata *ad, tavro_pictures_chosen chosen) {
  if (_is_open) return;
  _is_open = true;
  const char *title = tavro_text("IDS_OB_HEADER_CHOOSE_PICTURES");
  auto *picker = new gallery_picker;
  picker->ad = ad;
  picker->chosen = chosen;
  picker->item_class = _item_class_new();
  picker->page = tavro_page_add(ad, title, "back");
  evas_object_event_callback_add(picker->page, EVAS_CALLBACK_FREE, _page_deleted_cb, picker);
  tavro_page_push(ad, picker->page, title);
  _start_search(picker);
}
