// Offering back what an earlier run left on a compose screen.
#include <glib.h>

#include <optional>
#include <string>

#include "tavro-common.h"
#include "tavro-main.h"
#include "tavro_appdata.h"
#include "tavro_compose.h"
#include "tavro_compose_kept.h"
#include "tavro_compose_parts.h"
#include "tavro_deleted_files.h"
#include "tavro_log.h"
#include "tavro_preferences.h"
#include "tavro_screens.h"

namespace {

constexpr glong kShownCharacters = 60;

// Once for each landing page: at the start, and after another person signed in.
const Elm_Object_Item *_offered_on = nullptr;
std::string _offered_path;  // the file that the popup is about

void _offer_next(appdata *ad);

// Nothing where it was stored or removed since.
std::optional<kept_writing> _load(const std::string &path) {
  std::optional<kept_writing> kept = tavro_kept_load(path);
  if (!kept) return std::nullopt;
  tavro_kept_check_drafts(&*kept);
  if (!tavro_kept_is_stored(*kept)) return kept;
  // The process ended between storing the report and removing what the report replaces.
  TAVRO_LOGD("%s is stored already", path.c_str());
  tavro_deleted_files_note_copies({kept->content->id, kept->auto_saved_id}, {});
  for (const int id : {kept->content->id, kept->auto_saved_id})
    if (id >= 1) tavro_dbmgr_destroy_vocs_by_id(id);
  tavro_kept_remove(path);
  tavro_deleted_files_remove();
  return std::nullopt;
}

bool _is_of_user(const kept_writing &kept) {
  const TavroText user_name = tavro_get_username_from_preference();
  return g_strcmp0(user_name.get(), kept.content->user_name) == 0;
}

std::string _first_line(const char *text) {
  std::string line = text ? text : "";
  line.erase(0, line.find_first_not_of(" \t\r\n"));
  return line.substr(0, line.find('\n'));
}

// Its first words; the name of a file, or of what crashed, where there are none.
std::string _first_words(const kept_writing &kept) {
  const svc_voc_data &content = *kept.content;
  std::string words = _first_line(content.title_description);
  if (words.empty()) words = _first_line(content.description);
  if (words.empty() && content.attachments)
    words = tavro_file_name(
        static_cast<const tavro_dbmgr_attachment_info *>(content.attachments->data)->file_path);
  if (words.empty() && content.app_name) words = content.app_name;
  if (g_utf8_strlen(words.c_str(), -1) <= kShownCharacters) return words;
  return words.substr(0, static_cast<size_t>(g_utf8_offset_to_pointer(words.c_str(), kShownCharacters) -
                                             words.c_str())) +
         "\u2026";
}

// ---- What the person decides ----

// The screen as it was, with everything on it still to be stored. False, with nothing changed, while another
// screen holds something to lose.
bool _reopen(appdata *ad) {
  if (!tavro_leave_compose_page(ad)) return false;
  const std::optional<kept_writing> kept = _load(_offered_path);
  if (!kept) return false;
  ad->type = kept->type;
  if (kept->type == IDEA)
    tavro_create_idea_page(ad, kept->content.get());
  else
    tavro_create_problem_page(ad, kept->content.get());
  if (!tavro_compose_view(ad)) return false;
  ad->auto_saved_id = kept->auto_saved_id;
  if (ad->problem_view) ad->problem_view->is_device_status_removed = kept->is_device_status_removed;
  tavro_compose_keeper_take_over(_offered_path);
  return true;
}

void _go_on(appdata *ad) {
  if (!_reopen(ad)) return;
  tavro_compose_forget_opened();
  tavro_compose_tell_lost_files(ad, {{tavro_text("IDS_OB_BUTTON_OK"), nullptr}});
}

// When the store refuses the draft, its screen is there and says so.
void _keep_as_draft(appdata *ad) {
  if (_reopen(ad)) {
    tavro_compose_forget_opened();
    Elm_Object_Item *page = tavro_compose_view(ad)->nf_it;
    tavro_compose_save_draft(ad);
    // A page that was pushed just now does not take being popped.
    if (!tavro_compose_view(ad) && elm_naviframe_top_item_get(ad->nf) == page) elm_object_item_del(page);
  }
  _offer_next(ad);
}

// As from its screen, except that a draft it was opened from stays as it was last stored.
void _discard(appdata *ad) {
  if (_reopen(ad)) tavro_leave_compose_page(ad);
  _offer_next(ad);
}

// Without an answer because a compose screen came up: there will be another occasion.
void _offer_closed_cb(void *data, Evas *, Evas_Object *, void *) {
  if (tavro_compose_view(static_cast<appdata *>(data))) _offered_on = nullptr;
}

void _offer(appdata *ad, const std::string &path, const kept_writing &kept) {
  _offered_path = path;
  const std::string body = std::string(tavro_text("IDS_OB_BODY_GO_ON_WRITING")) + "\n\n" + _first_words(kept);
  Evas_Object *popup =
      tavro_popup_show(ad, &ad->cancel_popup, tavro_text("IDS_OB_HEADER_GO_ON_WRITING"), body.c_str(),
                       {{tavro_text("IDS_OB_BUTTON_DISCARD"), _discard},
                        {tavro_text("IDS_OB_BUTTON_KEEP_AS_DRAFT"), _keep_as_draft},
                        {tavro_text("IDS_OB_BUTTON_GO_ON"), _go_on}});
  if (popup) evas_object_event_callback_add(popup, EVAS_CALLBACK_DEL, _offer_closed_cb, ad);
}

// Nothing while a screen is open: one of the files is its own.
void _offer_next(appdata *ad) {
  if (tavro_compose_view(ad)) return;
  for (const std::string &path : tavro_kept_paths()) {
    const std::optional<kept_writing> kept = _load(path);
    if (kept && _is_of_user(*kept)) return _offer(ad, path, *kept);
  }
}

bool _may_offer(const appdata *ad) {
  return !tavro_is_ending() && ad->nf && ad->landing_nf_it && !ad->version_popup && !ad->cancel_popup &&
         elm_naviframe_top_item_get(ad->nf) == ad->landing_nf_it && tavro_get_username_from_preference();
}

}  // namespace

void tavro_compose_keeper_offer(appdata *ad) {
  if (!_may_offer(ad) || _offered_on == ad->landing_nf_it) return;
  _offered_on = ad->landing_nf_it;
  _offer_next(ad);
}
