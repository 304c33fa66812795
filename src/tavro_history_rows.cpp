// The rows of "My Reports".
#include <elm_atspi.h>

#include <cstdlib>
#include <cstring>
#include <string>

#include "tavro-common.h"
#include "tavro-main.h"
#include "tavro_handles.h"
#include "tavro_history_parts.h"
#include "tavro_history_text.h"
#include "tavro_log.h"
#include "tavro_memory.h"
#include "tavro_screens.h"
#include "tavro_target_rows.h"
#include "tavro_targets.h"
#include "tavro_theme.h"
#include "tavro_widgets.h"

namespace {

constexpr int kSelectAllIndex = -1;
constexpr char kFirstPart[] = "elm.text.main.left";  // what the list asks a row for first when it draws it
// A row shows some fifty letters; laying out a whole long text would stop the list.
constexpr size_t kMostShownBytes = 600;

using CText = TavroHandle<char, std::free>;

appdata *_appdata_of(const Evas_Object *list) {
  return static_cast<appdata *>(evas_object_data_get(list, "app_data"));
}

bool _is_idea(const svc_voc_data *voc) {
  return voc->type && std::strcmp(voc->type, TAVRO_DBMGR_SUGGESTION) == 0;
}

bool _has_unread_reply(const svc_voc_data *voc) {
  return voc->push_comments && voc->push_read == 0;
}

// ---- Texts ----

char *genlist_get_text_part(void *data, Evas_Object *, const char *part) {
  const genlist_item *row = static_cast<genlist_item *>(data);
  return tavro_history_row_text(row->index, row->voc, part);
}

void _replace(std::string &text, const char *what, const std::string &with) {
  // Only the tags at the start are ours; what the person wrote is escaped and follows them.
  const size_t at = text.find(what);
  if (at != std::string::npos) text.replace(at, std::strlen(what), with);
}

// Markup without what comes behind the first bytes, cut neither in a tag, an entity nor a character.
void _shorten(std::string &markup) {
  if (markup.size() <= kMostShownBytes) return;
  size_t end = kMostShownBytes;
  while (end > 0 && (static_cast<unsigned char>(markup[end]) & 0xC0) == 0x80) --end;
  markup.resize(end);
  for (const auto &[open, close] : {std::pair('<', '>'), std::pair('&', ';')}) {
    const size_t begun = markup.rfind(open);
    if (begun != std::string::npos && markup.find(close, begun) == std::string::npos) markup.resize(begun);
  }
}

std::string _plain(const genlist_item *row, const char *part) {
  const CText text(tavro_history_row_text(row->index, row->voc, part));
  if (!text) return "";
  std::string markup = text.get();
  _shorten(markup);
  const TavroText plain(TAVRO_ADOPT(elm_entry_markup_to_utf8(markup.c_str())));
  return plain ? plain.get() : "";
}

// "Battery: Drains overnight. In process, 9:41 AM. New reply."
std::string _name(const genlist_item *row) {
  if (!row->voc) return _plain(row, "elm.text.main.left");
  const TavroGText name(g_strdup_printf(
      tavro_text("IDS_OB_BODY_REPORT_PS_PS_PS_PS"), _plain(row, "elm.text.main.left.top").c_str(),
      _plain(row, "elm.text.sub.left.bottom").c_str(), _plain(row, "elm.text.sub.right.bottom").c_str(),
      _plain(row, "elm.text.sub.right.top").c_str()));
  return std::string(name.get()) +
         (_has_unread_reply(row->voc) ? std::string(" ") + tavro_text("IDS_OB_BODY_NEW_REPLY") : "");
}

// ---- Ticks ----

bool _is_all_ticked(const history_app_data_s *history) {
  int tickable = 0;
  for (const GSList *link = history->history_genlist_items; link; link = link->next)
    tickable += tavro_history_can_tick(static_cast<svc_voc_data *>(link->data));
  return tickable > 0 && history->checked_item_count == tickable;
}

bool _is_ticked(const history_app_data_s *history, const genlist_item *row) {
  return row->index == kSelectAllIndex ? _is_all_ticked(history)
                                       : tavro_history_is_ticked(history, row->index);
}

bool _can_tick(const genlist_item *row) {
  return !row->voc || tavro_history_can_tick(row->voc);
}

const char *_tick_text(const history_app_data_s *history, const genlist_item *row) {
  if (!history->delete_status) return "";
  if (!_can_tick(row)) return tavro_text("IDS_OB_BODY_STILL_BEING_SENT");
  return tavro_text(_is_ticked(history, row) ? "IDS_OB_BODY_SELECTED" : "IDS_OB_BODY_NOT_SELECTED");
}

// What a screen reader says of the row, whatever its parts are.
void _name_row(const history_app_data_s *history, const genlist_item *row) {
  if (!row->item) return;
  elm_atspi_accessible_name_set(row->item, _name(row).c_str());
  elm_atspi_accessible_description_set(row->item, _tick_text(history, row));
}

// A row gets its name when it is drawn. A screen reader asks about those that are not on the screen, too.
void _name_early(const Evas_Object *list, const genlist_item *row) {
  if (row->index >= kSelectAllIndex && elm_config_atspi_mode_get())
    _name_row(_appdata_of(list)->history_ad, row);
}

// The row's text with sizes that follow the scale factor and a red that the palette has: the texts themselves
// carry the pixels and the red of one phone.
char *_row_text(void *data, Evas_Object *list, const char *part) {
  if (std::strcmp(part, kFirstPart) == 0)
    _name_row(_appdata_of(list)->history_ad, static_cast<genlist_item *>(data));
  const CText text(genlist_get_text_part(data, list, part));
  if (!text) return nullptr;
  std::string shown = text.get();
  _shorten(shown);
  _replace(shown, "<font_size=32>", "<font_size=17>");
  _replace(shown, "<font_size=29>", "<font_size=14>");
  _replace(shown, "<color=#ff0000>",
           std::string("<font_weight=Normal color=") + tavro_theme_danger_colour() + ">");
  return strdup(shown.c_str());  // The toolkit frees it.
}

// ---- Contents ----

Evas_Object *_check_box(const genlist_item *row, Evas_Object *list) {
  history_app_data_s *history = _appdata_of(list)->history_ad;
  if (!history->delete_status) return nullptr;
  const char *look = !_can_tick(row) ? "off" : _is_ticked(history, row) ? "ticked" : "empty";
  Evas_Object *check = tavro_layout_add(list, (std::string("tavro/history/check/") + look).c_str());
  if (row->index == kSelectAllIndex) history->select_check = check;
  return check;
}

Evas_Object *_veil(const genlist_item *row, Evas_Object *list) {
  const bool is_veiled = _appdata_of(list)->history_ad->delete_status && !_can_tick(row);
  return is_veiled ? tavro_layout_add(list, "tavro/history/veil") : nullptr;
}

Evas_Object *_target_tile(const svc_voc_data *voc, Evas_Object *list) {
  if (voc->dump_file) return tavro_tile_add(list, "bug");
  const bool has_icon = voc->app_icon && *voc->app_icon && !_is_idea(voc);
  return has_icon ? tavro_application_icon_add(list, voc->app_icon)
                  : tavro_tile_add(list, tavro_target_tile(voc->app_name, _is_idea(voc)));
}

Evas_Object *_row_content(void *data, Evas_Object *list, const char *part) {
  genlist_item *row = static_cast<genlist_item *>(data);
  if (std::strcmp(part, "elm.icon.check") == 0) return _check_box(row, list);
  if (!row->voc) return nullptr;
  if (std::strcmp(part, "tavro.veil") == 0) return _veil(row, list);
  if (std::strcmp(part, "elm.icon.1") == 0) return row->content = _target_tile(row->voc, list);
  if (std::strcmp(part, "elm.icon.right.bottom") == 0 && _has_unread_reply(row->voc))
    return tavro_layout_add(list, "tavro/dot/unread");
  return nullptr;
}

void _row_deleted(void *data, Evas_Object *) {
  genlist_item *row = static_cast<genlist_item *>(data);
  TAVRO_FREE(row);
}

// ---- Selecting a row ----

void _open_report(appdata *ad, const genlist_item *row) {
  history_app_data_s *history = ad->history_ad;
  const int voc_id = row->voc->id;
  history->history_details_index = row->index;
  tavro_create_history_details_page(ad, voc_id);  // stores that the replies were read, too
  for (Elm_Object_Item *item = elm_genlist_first_item_get(history->history_genlist); item;
       item = elm_genlist_item_next_get(item)) {
    genlist_item *shown = tavro_history_row_of(item);
    if (!shown->voc || shown->voc->id != voc_id) continue;
    shown->voc->push_read = 1;
    tavro_history_row_redraw(shown);
    return;
  }
}

void _reopen_draft(appdata *ad, const svc_voc_data *voc) {
  TAVRO_LOGD("type:%s", voc->type);
  if (!tavro_leave_compose_page(ad)) return;
  const bool is_crash = !_is_idea(voc) && voc->dump_file;
  if (is_crash) ad->hType = ERROR;
  ad->type = is_crash ? CRASH : PROBLEM;
  tavro_edit_cb(ad, voc);
}

// `data` is the row: its index changes when rows above it come and go.
void _tavro_history_select_cb(void *data, Evas_Object *list, void *event_info) {
  TAVRO_LOGD("selected");
  appdata *ad = _appdata_of(list);
  const genlist_item *row = static_cast<genlist_item *>(data);
  elm_genlist_item_selected_set(static_cast<Elm_Object_Item *>(event_info), EINA_FALSE);
  if (row->index == kSelectAllIndex)
    tavro_history_select_all(ad);
  else if (ad->history_ad->delete_status)
    tavro_history_checkbox_selected(ad, row->index);
  else if (tavro_current_status(row->voc->submitted) != TAVRO_STATUS_DRAFT_SAVED)
    _open_report(ad, row);
  else
    _reopen_draft(ad, row->voc);
}

}  // namespace

Elm_Genlist_Item_Class *tavro_history_row_class_new() {
  Elm_Genlist_Item_Class *row_class = elm_genlist_item_class_new();
  row_class->item_style = "2line.top.4";
  row_class->func.text_get = _row_text;
  row_class->func.content_get = _row_content;
  row_class->func.del = _row_deleted;
  return row_class;
}

void tavro_history_row_add(appdata *ad, svc_voc_data *voc, int index, Elm_Object_Item *before) {
  history_app_data_s *history = ad->history_ad;
  genlist_item *row = TAVRO_ZALLOC(genlist_item);
  row->index = index;
  row->voc = voc;
  row->item =
      before ? elm_genlist_item_insert_before(history->history_genlist, history->_itc, row, nullptr, before,
                                              ELM_GENLIST_ITEM_NONE, _tavro_history_select_cb, row)
             : elm_genlist_item_append(history->history_genlist, history->_itc, row, nullptr,
                                       ELM_GENLIST_ITEM_NONE, _tavro_history_select_cb, row);
  if (index == kSelectAllIndex) history->select_item = row->item;
  _name_early(history->history_genlist, row);
}

genlist_item *tavro_history_row_of(const Elm_Object_Item *item) {
  return static_cast<genlist_item *>(elm_object_item_data_get(item));
}

void tavro_history_row_redraw(const genlist_item *row) {
  _name_early(elm_object_item_widget_get(row->item), row);
  elm_genlist_item_fields_update(row->item, nullptr, ELM_GENLIST_ITEM_FIELD_ALL);
}

void tavro_history_redraw_all(const appdata *ad) {
  Elm_Object_Item *item = elm_genlist_first_item_get(ad->history_ad->history_genlist);
  for (; item; item = elm_genlist_item_next_get(item)) tavro_history_row_redraw(tavro_history_row_of(item));
}
