// What went with a report, inside its bubble: tiles of pictures and videos, and rows of the other files.
#include <elm_atspi.h>

#include <cstring>

#include "tavro-common.h"
#include "tavro-main.h"
#include "tavro_compose.h"
#include "tavro_history_details.h"
#include "tavro_memory.h"
#include "tavro_note_file.h"
#include "tavro_screens.h"
#include "tavro_thumbnails.h"
#include "tavro_widgets.h"

namespace {

constexpr int kThumbUnits = 72;
constexpr int kPicturesPerRow = 3;
constexpr gsize kShownStatusBytes = 256 * 1024;

details_page *_page = nullptr;

const char *_name_of(const char *path) {
  const char *slash = std::strrchr(path, '/');
  return slash ? slash + 1 : path;
}

// The place of an attachment is the data of its tile: the record may be another by the time of a click.
const char *_path_at(const void *place) {
  const auto *attachment = static_cast<const tavro_dbmgr_attachment_info *>(
      g_slist_nth_data(_page->voc->attachments, GPOINTER_TO_UINT(place)));
  return attachment ? attachment->file_path : nullptr;
}

void _say_gone(appdata *ad) {
  tavro_popup_show(ad, &ad->history_file_popup, tavro_text("IDS_OB_HEADER_CANNOT_BE_OPENED"),
                   tavro_text("IDS_OB_BODY_FILE_GONE"), {{tavro_text("IDS_OB_BUTTON_OK"), nullptr}});
}

void _tile_clicked_cb(void *data, Evas_Object *, void *) {
  const char *path = _path_at(data);
  if (path && tavro_attachment_size(path) >= 0)
    tavro_create_picture_page(_page->ad, path, true);
  else
    _say_gone(_page->ad);
}

Evas_Object *_build_tile(Evas_Object *row, const char *path, unsigned place) {
  const bool is_gone = tavro_attachment_size(path) < 0;
  const std::string name = tavro_details_text(_name_of(path));
  Evas_Object *tile =
      tavro_button_add(row, "tavro_tile_bubble", nullptr, tavro_thumbnail_add(row, path, kThumbUnits),
                       name.c_str(), _tile_clicked_cb, GUINT_TO_POINTER(place));
  const char *gone = tavro_text("IDS_OB_BODY_GONE");
  if (is_gone) {
    tavro_layout_text_set(tile, nullptr, gone);
    elm_atspi_accessible_description_set(tile, gone);
  }
  elm_atspi_accessible_name_set(tile, name.c_str());
  return tile;
}

Evas_Object *_row_add(Evas_Object *parent) {
  Evas_Object *row = elm_box_add(parent);
  elm_box_horizontal_set(row, EINA_TRUE);
  elm_box_padding_set(row, static_cast<int>(8 * elm_config_scale_get()), 0);
  evas_object_size_hint_align_set(row, 0.0, 0.5);
  evas_object_show(row);
  elm_box_pack_end(parent, row);
  return row;
}

// Rows of as many tiles as a bubble is wide.
void _build_tiles(Evas_Object *column, const GSList *attachments) {
  Evas_Object *row = nullptr;
  unsigned place = 0;
  for (const GSList *link = attachments; link; link = link->next, ++place) {
    const auto *attachment = static_cast<const tavro_dbmgr_attachment_info *>(link->data);
    if (!attachment->file_path) continue;
    if (place % kPicturesPerRow == 0 || !row) row = _row_add(column);
    elm_box_pack_end(row, _build_tile(row, attachment->file_path, place));
  }
}

// ---- Other files ----

enum file_kind { FILE_DEVICE_STATUS, FILE_SYSTEM_LOG, FILE_CRASH_DUMP };

TavroText _path_of(file_kind kind) {
  const svc_voc_data *voc = _page->voc.get();
  if (kind == FILE_DEVICE_STATUS) return TavroText(tavro_dbmgr_get_device_data_file_by_id(voc->id));
  return TavroText(TAVRO_STRDUP(kind == FILE_SYSTEM_LOG ? voc->syslog_file : voc->dump_file));
}

void _open_log_cb(void *, Evas_Object *, void *) {
  const TavroText path = _path_of(FILE_SYSTEM_LOG);
  if (path) tavro_create_log_page(_page->ad, tavro_text("IDS_OB_BODY_SYSTEM_LOG"), path.get());
}

void _open_device_status_cb(void *, Evas_Object *, void *) {
  const TavroText path = _path_of(FILE_DEVICE_STATUS);
  gsize size = 0;
  char *content = nullptr;
  if (!path || tavro_attachment_size(path.get()) > static_cast<gint64>(kShownStatusBytes) ||
      !g_file_get_contents(path.get(), &content, &size, nullptr))
    return _say_gone(_page->ad);
  const TavroGText text(content);
  tavro_create_text_page(_page->ad, tavro_text("IDS_OB_BODY_DEVICE_STATUS"),
                         tavro_details_text(text.get()).c_str());
}

struct listed_file {
  file_kind kind;
  const char *text, *icon;
  Evas_Smart_Cb clicked;  // null: a program's memory is nothing that a person reads
};
constexpr listed_file kListedFiles[] = {
    {FILE_DEVICE_STATUS, "IDS_OB_BODY_DEVICE_STATUS", "file/accent", _open_device_status_cb},
    {FILE_SYSTEM_LOG, "IDS_OB_BODY_SYSTEM_LOG", "log/accent", _open_log_cb},
    {FILE_CRASH_DUMP, "IDS_OB_BODY_CRASH_DUMP", "bug/accent", nullptr},
};

void _build_file(Evas_Object *column, const listed_file &file) {
  const TavroText path = _path_of(file.kind);
  const gint64 size = path && *path ? tavro_attachment_size(path.get()) : -1;
  if (size < 0) return;
  const std::string text = std::string(tavro_text(file.text)) + " \xC2\xB7 " + tavro_size_text(size);
  Evas_Object *link = tavro_details_link_add(column, file.icon, text, file.clicked, 0);
  if (!file.clicked) elm_object_focus_allow_set(link, EINA_FALSE);
  elm_box_pack_end(column, link);
}

}  // namespace

Evas_Object *tavro_details_files_add(details_page *page, Evas_Object *bubble) {
  _page = page;
  Evas_Object *column = tavro_details_column_add(bubble);
  _build_tiles(column, page->voc->attachments);
  for (const listed_file &file : kListedFiles) _build_file(column, file);
  Eina_List *children = elm_box_children_get(column);
  const bool is_empty = !children;
  eina_list_free(children);
  if (is_empty) {
    evas_object_del(column);
    return nullptr;
  }
  return column;
}
