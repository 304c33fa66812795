// What becomes of the file that the editor saved.
#include "tavro-main.h"
#include "tavro_appdata.h"
#include "tavro_compose.h"
#include "tavro_compose_keeper.h"
#include "tavro_compose_strip.h"
#include "tavro_image_editor_parts.h"
#include "tavro_memory.h"

namespace {

GSList *_find_captured(const appdata *ad, const std::string &path) {
  GSList *link = ad->image_list;
  while (link && path != static_cast<const char *>(link->data)) link = link->next;
  return link;
}

// The captured file goes; what was made of it takes its place.
void _keep_captured(appdata *ad, const std::string &captured, const std::string &path) {
  GSList *link = _find_captured(ad, captured);
  char *made = TAVRO_STRDUP(path.c_str());
  if (!link) {
    ad->image_list = g_slist_append(ad->image_list, made);
    return;
  }
  char *listed = static_cast<char *>(link->data);
  TAVRO_FREE(listed);
  link->data = made;
}

// Whether it is attached.
bool _take_over(appdata *ad, const tavro_edit_picture &picture, const tavro_edit &edit,
                const std::string &path) {
  if (!tavro_compose_replace(ad, picture.path, path)) return false;
  if (!picture.is_screenshot) return true;
  _keep_captured(ad, picture.path, path);
  const ie::CRect box = tavro_edit_saved_box(picture, edit);
  tavro_select_box_add(ad, box.Left(), box.Top(), box.Width(), box.Height());
  return true;
}

}  // namespace

bool editor_attach_saved(appdata *ad, const tavro_edit_picture &picture, const tavro_edit &edit,
                         const std::string &path) {
  const bool is_attached = tavro_compose_view(ad) && _take_over(ad, picture, edit, path);
  if (!is_attached) tavro_edit_remove_file(path);
  tavro_compose_keeper_flush();  // the captured file goes, what replaces it must be known
  return is_attached;
}

void editor_drop_screenshot(appdata *ad, const std::string &path) {
  tavro_edit_remove_file(path);
  if (GSList *link = _find_captured(ad, path)) {
    char *listed = static_cast<char *>(link->data);
    ad->image_list = g_slist_delete_link(ad->image_list, link);
    TAVRO_FREE(listed);
  }
}
