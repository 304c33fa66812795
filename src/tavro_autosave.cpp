#include "tavro_autosave.h"

#include <cstdint>
#include <string>

#include "tavro-main.h"
#include "tavro_compose.h"
#include "tavro_compose_keeper.h"
#include "tavro_dbmgr.h"
#include "tavro_deleted_files.h"
#include "tavro_drafts.h"
#include "tavro_log.h"

namespace {

constexpr int kFirstSavePercent = 15;
constexpr int kSaveAlwaysBelowPercent = 6;
constexpr int kAutoSaveUnderWay = -1;

// Of the open screen; null: it does not tell.
tavro_end_unchanged _end_unchanged = nullptr;
std::string _screenshot;

bool _entry_is_empty(const Evas_Object *entry) {
  return !entry || elm_entry_is_empty(entry);
}

bool _has_something_to_save(const appdata *ad, const compose_view_win *view) {
  const bool has_log = ad->problem_view && ad->problem_view->syslog_filepath;
  return has_log || view->attachments || !_entry_is_empty(view->entry) || !_entry_is_empty(view->title_entry);
}

// An earlier copy stays the current one when its successor cannot be stored.
void _save_draft(appdata *ad) {
  const int earlier_id = ad->auto_saved_id;
  const int id = ad->idea_view ? tavro_save_idea_compose_data(ad, TAVRO_STATUS_DRAFT_SAVED)
                               : tavro_save_problem_compose_data(ad, TAVRO_STATUS_DRAFT_SAVED);
  if (id >= 1 || earlier_id < 1) ad->auto_saved_id = id;
  TAVRO_LOGD("ad->auto_saved_id: %d", ad->auto_saved_id);
  tavro_compose_keeper_note();
  tavro_compose_keeper_flush();
}

void _save_at(appdata *ad, int capacity) {
  if (!_has_something_to_save(ad, tavro_compose_view(ad))) {
    TAVRO_LOGD("nothing to save");
    return;
  }
  const int earlier_id = ad->auto_saved_id;
  if (earlier_id == 0) ad->auto_saved_id = kAutoSaveUnderWay;
  if (capacity < kSaveAlwaysBelowPercent) {
    _save_draft(ad);
    if (earlier_id < 1 || ad->auto_saved_id == earlier_id) return;
    tavro_deleted_files_note_copies({earlier_id}, {});
    tavro_dbmgr_destroy_vocs_by_id(earlier_id);
    tavro_deleted_files_remove();
  } else if (capacity == kFirstSavePercent) {
    _save_draft(ad);
  }
}

}  // namespace

void tavro_autosave_start(appdata *ad, tavro_end_unchanged end_unchanged) {
  _end_unchanged = end_unchanged;
  const int ret =
      device_add_callback(DEVICE_CALLBACK_BATTERY_CAPACITY, __tavro_app_battery_capacity_changed_cb, ad);
  if (ret != DEVICE_ERROR_NONE && ret != DEVICE_ERROR_ALREADY_IN_PROGRESS) {
    TAVRO_LOGD("device_add_callback failed: %d, %s", ret, get_error_message(ret));
  }
}

void tavro_autosave_stop() {
  _end_unchanged = nullptr;
  device_remove_callback(DEVICE_CALLBACK_BATTERY_CAPACITY, __tavro_app_battery_capacity_changed_cb);
}

void tavro_autosave_set_screenshot(const std::string &path) {
  _screenshot = path;
}

std::string tavro_autosave_screenshot() {
  return _screenshot;
}

std::string tavro_autosave_attach_screenshot(appdata *ad) {
  const std::string path = _screenshot;
  if (path.empty() || !tavro_compose_attach(tavro_compose_view(ad), path.c_str())) return "";
  tavro_compose_keeper_note();
  return path;
}

void tavro_autosave_detach_screenshot(appdata *ad, const std::string &path) {
  if (path.empty()) return;
  tavro_compose_detach(tavro_compose_view(ad), path.c_str());
  tavro_compose_keeper_note();
}

bool tavro_autosave_at_end(appdata *ad) {
  const compose_view_win *view = tavro_compose_view(ad);
  if (!view) return false;
  tavro_autosave_attach_screenshot(ad);  // stays: should the store refuse the draft, it is kept elsewhere
  const bool has_nothing = _end_unchanged ? _end_unchanged(ad) : !_has_something_to_save(ad, view);
  return !has_nothing && tavro_save_compose_draft(ad) >= 1;
}

void __tavro_app_battery_capacity_changed_cb(device_callback_e type, void *value, void *user_data) {
  auto *ad = static_cast<appdata *>(user_data);
  const int capacity = static_cast<int>(reinterpret_cast<intptr_t>(value));
  const compose_view_win *view = tavro_compose_view(ad);
  if (!view) return;
  TAVRO_LOGD("battery_capacity is [%d] [%d]", type, capacity);
  if (capacity > kFirstSavePercent) return;
  const std::string edited = tavro_autosave_attach_screenshot(ad);
  _save_at(ad, capacity);
  tavro_autosave_detach_screenshot(ad, edited);
}
