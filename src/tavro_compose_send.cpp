// The road of "Send": pictures that are being converted, what is missing, files that are gone, a system log
// that is not there yet, the first look at what is sent, and then the report itself. Each question leaves the
// screen as it is.
#include <app_preference.h>

#include <string>

#include "tavro-common.h"
#include "tavro-main.h"
#include "tavro_compose.h"
#include "tavro_compose_convert.h"
#include "tavro_compose_keeper.h"
#include "tavro_compose_parts.h"
#include "tavro_compose_strip.h"
#include "tavro_log.h"
#include "tavro_preferences.h"
#include "tavro_screens.h"
#include "tavro_widgets.h"

namespace {

// The popup under which a report waits for its log; null while none does.
Evas_Object *_waiting = nullptr;
// The same for pictures, and what goes on when they are there.
Evas_Object *_waiting_for_files = nullptr;
void (*_go_on)(appdata *ad) = nullptr;
// The person has seen what is sent, should that not have been stored.
bool _has_reviewed = false;
// The person chose to send without the log this time: until "Send" or "What is sent" is chosen anew.
bool _goes_without_log = false;

void _begin(appdata *ad);
void _check_log(appdata *ad);

void _show_gap(appdata *ad, tavro_compose_gap gap) {
  const char *body = gap == TAVRO_COMPOSE_NO_TARGET    ? "IDS_OB_BODY_GAP_TARGET"
                     : gap == TAVRO_COMPOSE_NO_CONTENT ? "IDS_OB_BODY_GAP_CONTENT"
                                                       : "IDS_OB_BODY_GAP_SIZE";
  tavro_popup_show(ad, &ad->cancel_popup, tavro_text("IDS_OB_HEADER_NOT_YET"), tavro_text(body),
                   {{tavro_text("IDS_OB_BUTTON_OK"), nullptr}});
}

// Too large a problem report is refused by its saver, in its own words.
bool _is_complete(appdata *ad) {
  const tavro_compose_gap gap = tavro_compose_check(ad, tavro_attachment_size_limit());
  if (gap == TAVRO_COMPOSE_COMPLETE || (gap == TAVRO_COMPOSE_TOO_LARGE && ad->problem_view)) return true;
  _show_gap(ad, gap);
  return false;
}

// `data` is the variable that holds the popup.
void _waiting_deleted_cb(void *data, Evas *, Evas_Object *popup, void *) {
  Evas_Object **waiting = static_cast<Evas_Object **>(data);
  if (*waiting == popup) *waiting = nullptr;
}

// ---- Pictures that are being converted ----

// A picture that turns out to be no good is told in a popup, which ends the wait.
bool _waits_for_files(appdata *ad, void (*go_on)(appdata *ad)) {
  if (!tavro_compose_convert(ad)) return false;
  _go_on = go_on;
  _waiting_for_files = tavro_popup_show(ad, &ad->cancel_popup, tavro_text("IDS_OB_HEADER_PICTURES_AWAITED"),
                                        tavro_text("IDS_OB_BODY_PICTURES_AWAITED"),
                                        {{tavro_text("IDS_OB_BUTTON_STAY"), nullptr}});
  if (_waiting_for_files)
    evas_object_event_callback_add(_waiting_for_files, EVAS_CALLBACK_DEL, _waiting_deleted_cb,
                                   &_waiting_for_files);
  return true;
}

// ---- The last step, by way of "What is sent" the first time and for drafts ----

// A draft does not remember that the device status was taken off, so it never goes unseen.
bool _may_go_unseen(const appdata *ad) {
  const bool is_draft_of_problem = ad->problem_view && ad->id_to_delete >= 1;
  return !is_draft_of_problem && tavro_preference_flag(TAVRO_PREF_SENT_PAGE_SEEN, false);
}

void _send(appdata *ad) {
  if (_waits_for_files(ad, _begin)) return;  // another application has shared one meanwhile
  if (_has_reviewed || _may_go_unseen(ad))
    tavro_compose_finish(ad, tavro_send_compose_data);
  else
    tavro_create_review_page(ad, tavro_compose_send_from_review);
}

// ---- The system log ----

void _send_without_log(appdata *ad) {
  if (!ad->problem_view) return;
  _goes_without_log = true;
  tavro_compose_log_give_up(ad);
  _send(ad);
}

void _wait_for_log(appdata *ad) {
  const char *title = tavro_text("IDS_OB_HEADER_LOG_AWAITED");
  const char *body = tavro_text("IDS_OB_BODY_LOG_AWAITED");
  const tavro_popup_button stay{tavro_text("IDS_OB_BUTTON_STAY"), nullptr};
  const tavro_popup_button without{tavro_text("IDS_OB_BUTTON_SEND_WITHOUT_LOG"), _send_without_log};
  _waiting = isLogMandatory(ad->problem_view->app_name)
                 ? tavro_popup_show(ad, &ad->cancel_popup, title, body, {stay})
                 : tavro_popup_show(ad, &ad->cancel_popup, title, body, {without, stay});
  if (_waiting) evas_object_event_callback_add(_waiting, EVAS_CALLBACK_DEL, _waiting_deleted_cb, &_waiting);
}

void _try_log_again(appdata *ad) {
  if (!ad->problem_view) return;
  tavro_compose_log_update(ad);
  _check_log(ad);
}

// A phone that cannot make a log must not keep a report back, even one that should carry a log.
void _tell_log_failed(appdata *ad) {
  tavro_popup_show(ad, &ad->cancel_popup, tavro_text("IDS_OB_HEADER_LOG_FAILED"),
                   tavro_text(isLogMandatory(ad->problem_view->app_name) ? "IDS_OB_BODY_LOG_FAILED_MANDATORY"
                                                                         : "IDS_OB_BODY_LOG_FAILED_OPTIONAL"),
                   {{tavro_text("IDS_OB_BUTTON_STAY"), nullptr},
                    {tavro_text("IDS_OB_BUTTON_SEND_WITHOUT_LOG"), _send_without_log},
                    {tavro_text("IDS_OB_BUTTON_TRY_AGAIN"), _try_log_again}});
}

void _check_log(appdata *ad) {
  if (_goes_without_log) return _send(ad);
  switch (tavro_compose_log_stand(ad)) {
    case log_stand::settled:
      return _send(ad);
    case log_stand::awaited:
      return _wait_for_log(ad);
    case log_stand::failed:
      return _tell_log_failed(ad);
  }
}

// ---- Files that were there when they were chosen ----

void _send_without_lost(appdata *ad) {
  compose_view_win *view = tavro_compose_view(ad);
  if (!view) return;
  for (const std::string &path : tavro_compose_lost_attachments(view))
    tavro_compose_detach(view, path.c_str());
  tavro_compose_strip_refresh(ad);
  _begin(ad);
}

bool _has_all_files(appdata *ad) {
  return !tavro_compose_tell_lost_files(ad,
                                        {{tavro_text("IDS_OB_BUTTON_SEND_WITHOUT_FILES"), _send_without_lost},
                                         {tavro_text("IDS_OB_BUTTON_STAY"), nullptr}});
}

void _begin(appdata *ad) {
  compose_view_win *view = tavro_compose_view(ad);
  if (!view || _waits_for_files(ad, _begin)) return;
  tavro_compose_count(view);
  if (tavro_compose_dump_is_too_large(ad, _begin) || !_is_complete(ad) || !_has_all_files(ad)) return;
  tavro_compose_log_hurry(ad);
  _check_log(ad);
}

}  // namespace

void tavro_compose_send(appdata *ad) {
  const compose_view_win *view = tavro_compose_view(ad);
  if (!view || view->nf_it != elm_naviframe_top_item_get(ad->nf)) return;
  _goes_without_log = false;
  // What follows may wait for a log or an answer.
  tavro_compose_keeper_flush();
  _begin(ad);
}

bool tavro_compose_tell_lost_files(appdata *ad, std::initializer_list<tavro_popup_button> buttons) {
  std::string names;
  for (const std::string &path : tavro_compose_lost_attachments(tavro_compose_view(ad)))
    names += "\n\u2022 " + tavro_file_name(path.c_str());
  if (names.empty()) return false;
  tavro_popup_show(ad, &ad->cancel_popup, tavro_text("IDS_OB_HEADER_FILES_LOST"),
                   (tavro_text("IDS_OB_BODY_FILES_LOST") + names).c_str(), buttons);
  return true;
}

void tavro_compose_review(appdata *ad) {
  if (!tavro_compose_view(ad) || _waits_for_files(ad, tavro_compose_review)) return;
  _goes_without_log = false;
  tavro_create_review_page(ad, tavro_compose_send_from_review);
}

void tavro_compose_send_from_review(appdata *ad) {
  _has_reviewed = true;
  if (preference_set_boolean(TAVRO_PREF_SENT_PAGE_SEEN, true) != PREFERENCE_ERROR_NONE)
    TAVRO_LOGE("that the page of what is sent was seen could not be stored");
  _begin(ad);
}

void tavro_compose_send_log_changed(appdata *ad) {
  if (!_waiting || tavro_compose_log_stand(ad) == log_stand::awaited) return;
  evas_object_del(_waiting);
  _check_log(ad);
}

void tavro_compose_send_files_changed(appdata *ad) {
  if (!_waiting_for_files || tavro_compose_convert(ad)) return;
  evas_object_del(_waiting_for_files);
  _go_on(ad);
}

void tavro_compose_send_end() {
  _has_reviewed = _goes_without_log = false;
  for (Evas_Object *popup : {_waiting, _waiting_for_files})
    if (popup) evas_object_del(popup);
}
