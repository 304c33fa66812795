// Getting files onto a compose screen: where they can come from, why one is refused, and what can be done
// with one that is attached.
#include <cstring>
#include <string>
#include <vector>

#include "tavro-common.h"
#include "tavro-main.h"
#include "tavro_compose.h"
#include "tavro_compose_convert.h"
#include "tavro_compose_strip.h"
#include "tavro_handles.h"
#include "tavro_hoverui.h"
#include "tavro_image_editor.h"
#include "tavro_picture_info.h"
#include "tavro_screens.h"
#include "tavro_widgets.h"

namespace {

// The attachment that the menu is open for. Its file may have gone from the screen by the time an entry is
// chosen; nothing happens then.
std::string _chosen;

std::string _refusal(const char *path, tavro_attachment_fault fault) {
  if (fault == TAVRO_ATTACHMENT_TOO_MANY) {
    const TavroGText text(g_strdup_printf(tavro_text("IDS_OB_BODY_FILES_PD_AT_MOST"), kMostAttachments));
    return tavro_file_name(path) + ": " + text.get();
  }
  const char *reason = fault == TAVRO_ATTACHMENT_UNREADABLE  ? "IDS_OB_BODY_FILE_UNREADABLE"
                       : fault == TAVRO_ATTACHMENT_EMPTY     ? "IDS_OB_BODY_FILE_EMPTY"
                       : fault == TAVRO_ATTACHMENT_TOO_LARGE ? "IDS_OB_BODY_FILE_PS_MB_LIMIT"
                                                             : "IDS_OB_BODY_FILE_OTHER_KIND";
  const std::string limit = tavro_megabytes(tavro_attachment_size_limit());
  // A text without %s takes no notice of the limit.
  const TavroGText text(g_strdup_printf(tavro_text(reason), limit.c_str()));
  return tavro_file_name(path) + ": " + text.get();
}

void _attach_file(appdata *ad, const char *path) {
  const TavroHandle<GSList, g_slist_free> paths(g_slist_append(nullptr, const_cast<char *>(path)));
  tavro_compose_attach_files(ad, paths.get());
}

void _pictures_chosen(appdata *ad, const GSList *paths) {
  tavro_compose_attach_files(ad, paths);
}

void _choose_from_gallery(appdata *ad) {
  tavro_create_gallery_picker(ad, _pictures_chosen);
}

void _capture(appdata *ad, captureType type) {
  if (tavro_capture_start(ad, type)) return;
  tavro_popup_show(ad, &ad->cancel_popup, tavro_text("IDS_OB_HEADER_NO_CAPTURE"),
                   tavro_text("IDS_OB_BODY_NO_CAPTURE"), {{tavro_text("IDS_OB_BUTTON_OK"), nullptr}});
}

void _take_screenshot(appdata *ad) {
  _capture(ad, IMAGE);
}

void _record_video(appdata *ad) {
  _capture(ad, VIDEO);
}

void _open(appdata *ad) {
  tavro_create_picture_page(ad, _chosen.c_str());
}

void _edit(appdata *ad) {
  tavro_edit_attachment(_chosen.c_str(), ad);
}

void _move(appdata *ad, int steps) {
  compose_view_win *view = tavro_compose_view(ad);
  if (!view) return;
  tavro_compose_move(view, _chosen.c_str(), steps);
  tavro_compose_strip_refresh(ad);
  tavro_compose_strip_focus(ad, _chosen.c_str());
}

void _move_left(appdata *ad) {
  _move(ad, -1);
}

void _move_right(appdata *ad) {
  _move(ad, 1);
}

void _remove(appdata *ad) {
  tavro_compose_strip_remove(ad, _chosen.c_str());
}

int _place_of(const compose_view_win *view, const char *path) {
  int place = 0;
  for (const GSList *link = view->attachments; link; link = link->next, ++place)
    if (std::strcmp(static_cast<const char *>(link->data), path) == 0) return place;
  return -1;
}

}  // namespace

void tavro_compose_attach_files(appdata *ad, const GSList *paths, const std::string &left_out) {
  compose_view_win *view = tavro_compose_view(ad);
  if (!view) return;
  std::string refused = left_out;
  for (const GSList *link = paths; link; link = link->next) {
    const char *path = static_cast<const char *>(link->data);
    if (tavro_compose_attach(view, path)) continue;
    refused += (refused.empty() ? "" : "\n") + _refusal(path, tavro_attachment_check(view, path));
  }
  tavro_compose_convert(ad);
  tavro_compose_strip_refresh(ad);
  if (!refused.empty())
    tavro_popup_show(ad, &ad->cancel_popup, tavro_text("IDS_OB_HEADER_NOT_ATTACHED"), refused.c_str(),
                     {{tavro_text("IDS_OB_BUTTON_OK"), nullptr}});
}

bool tavro_compose_replace(appdata *ad, const std::string &old_path, const std::string &path) {
  compose_view_win *view = tavro_compose_view(ad);
  const int place = _place_of(view, old_path.c_str());
  tavro_compose_detach(view, old_path.c_str());
  _attach_file(ad, path.c_str());
  const bool is_attached = _place_of(view, path.c_str()) >= 0;
  if (place < 0) return is_attached;
  const std::string &there = is_attached ? path : old_path;
  if (!is_attached) tavro_compose_attach(view, old_path.c_str());
  tavro_compose_move(view, there.c_str(), place + 1 - static_cast<int>(g_slist_length(view->attachments)));
  tavro_compose_strip_refresh(ad);
  if (is_attached && _chosen == old_path) _chosen = path;
  if (is_attached) tavro_compose_strip_dropped(old_path);
  return is_attached;
}

void tavro_show_problem_capture_data(appdata *ad, const char *path) {
  if (ad->problem_view) _attach_file(ad, path);
}

void tavro_show_idea_capture_data(appdata *ad, const char *path) {
  if (ad->idea_view) _attach_file(ad, path);
}

void tavro_compose_show_sources(appdata *ad) {
  compose_view_win *view = tavro_compose_view(ad);
  if (!view) return;
  std::vector<tavro_popup_button> entries;
  if (tavro_capture_btns_enabled())
    entries = {{tavro_text("IDS_OB_BUTTON_TAKE_SCREENSHOT"), _take_screenshot},
               {tavro_text("IDS_OB_BUTTON_RECORD_VIDEO"), _record_video}};
  entries.push_back({tavro_text("IDS_OB_BUTTON_FROM_GALLERY"), _choose_from_gallery});
  entries.push_back({tavro_text("IDS_OB_BUTTON_CANCEL"), nullptr});
  tavro_sheet_show(ad, &view->menu_popup, tavro_text("IDS_OB_HEADER_ATTACH"), entries);
}

void tavro_compose_show_attachment_menu(appdata *ad, const char *path) {
  compose_view_win *view = tavro_compose_view(ad);
  if (!view || !view->attachments) return;
  _chosen = path;
  std::vector<tavro_popup_button> entries{{tavro_text("IDS_OB_BUTTON_OPEN"), _open}};
  tavro_picture_info picture{};
  // One that is being converted is about to be replaced by its copy.
  if (tavro_picture_info_read(path, &picture) && picture.format != TAVRO_PICTURE_WEBP)
    entries.push_back({tavro_text("IDS_OB_BUTTON_EDIT"), _edit});
  if (_chosen != static_cast<const char *>(view->attachments->data))
    entries.push_back({tavro_text("IDS_OB_BUTTON_MOVE_LEFT"), _move_left});
  if (_chosen != static_cast<const char *>(g_slist_last(view->attachments)->data))
    entries.push_back({tavro_text("IDS_OB_BUTTON_MOVE_RIGHT"), _move_right});
  entries.push_back({tavro_text("IDS_OB_BUTTON_REMOVE"), _remove});
  entries.push_back({tavro_text("IDS_OB_BUTTON_CANCEL"), nullptr});
  tavro_sheet_show(ad, &view->menu_popup, tavro_file_name(path).c_str(), entries);
}
