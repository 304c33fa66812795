#include "tavro_share.h"

#include <Elementary.h>
#include <notification.h>
#include <notification_status.h>

#include <cstring>
#include <string>
#include <utility>
#include <vector>

#include "tavro-common.h"
#include "tavro-main.h"
#include "tavro_appdata.h"
#include "tavro_compose.h"
#include "tavro_compose_keeper.h"
#include "tavro_compose_strip.h"
#include "tavro_handles.h"
#include "tavro_image_editor.h"
#include "tavro_preferences.h"
#include "tavro_request.h"
#include "tavro_screens.h"
#include "tavro_widgets.h"

namespace {

// A report's size limit is reached long before these.
constexpr size_t kMostFiles = 100;
constexpr size_t kLongestTextBytes = 1024 * 1024;

struct shared_content {
  std::vector<std::string> files;
  std::string text;
  unsigned int left_out = 0;  // files beyond the limit
  bool is_text_cut = false;
};
shared_content _waiting;  // for an account

// The path that a file URI names. Anything else stays as it is, to be named as what cannot be read.
std::string _path_of(const std::string &name) {
  char *host = nullptr;
  const TavroGText path(g_filename_from_uri(name.c_str(), &host, nullptr));
  const TavroGText owned_host(host);
  const bool is_local = !host || !*host || std::strcmp(host, "localhost") == 0;
  return path && is_local ? path.get() : name;
}

void _add_file(const std::string &name) {
  if (name.empty()) return;
  if (_waiting.files.size() < kMostFiles)
    _waiting.files.push_back(_path_of(name));
  else
    _waiting.left_out++;
}

// Between two characters.
void _cut(std::string *text) {
  size_t end = kLongestTextBytes;
  while (end > 0 && (static_cast<unsigned char>((*text)[end]) & 0xC0) == 0x80) end--;
  text->resize(end);
}

void _add_text(const std::string &text) {
  if (text.empty()) return;
  if (!_waiting.text.empty()) _waiting.text += "\n";
  _waiting.text += text;
  if (_waiting.text.size() <= kLongestTextBytes) return;
  _cut(&_waiting.text);
  _waiting.is_text_cut = true;
}

void _take(app_control_h request) {
  for (const char *key : {APP_CONTROL_DATA_PATH, APP_CONTROL_DATA_SELECTED})
    for (const std::string &name : tavro_request_texts(request, key)) _add_file(name);
  char *uri = nullptr;
  app_control_get_uri(request, &uri);
  if (const TavroText owned_uri{TAVRO_ADOPT(uri)}) _add_file(uri);
  for (const std::string &text : tavro_request_texts(request, APP_CONTROL_DATA_TEXT)) _add_text(text);
}

// The open compose screen, brought to the front as far as nothing is lost, or a new one; null when neither
// can be had.
compose_view_win *_compose_screen(appdata *ad) {
  Elm_Object_Item *front = tavro_compose_front_page(ad);
  if (front && front != elm_naviframe_top_item_get(ad->nf)) elm_naviframe_item_pop_to(front);
  if (!front) tavro_create_problem_page(ad, nullptr);
  return tavro_compose_view(ad);
}

// What did not get as far as the screen, a line each.
std::string _left_out(const shared_content &content) {
  std::string lines;
  if (content.left_out > 0) {
    const TavroGText files(g_strdup_printf(tavro_text("IDS_OB_BODY_PD_FILES_LEFT_OUT"), content.left_out));
    lines = files.get();
  }
  if (content.is_text_cut)
    lines += (lines.empty() ? "" : "\n") + std::string(tavro_text("IDS_OB_BODY_TEXT_CUT"));
  return lines;
}

void _attach(appdata *ad, const std::vector<std::string> &files, const std::string &left_out) {
  GSList *paths = nullptr;
  for (const std::string &file : files) paths = g_slist_append(paths, const_cast<char *>(file.c_str()));
  const TavroHandle<GSList, g_slist_free> owned(paths);
  tavro_compose_attach_files(ad, paths, left_out);
}

void _append_text(const compose_view_win *view, const std::string &text) {
  if (text.empty()) return;
  const char *gap = elm_entry_is_empty(view->entry) ? "" : "<br/>";
  elm_entry_entry_append(view->entry, (gap + tavro_markup(text.c_str())).c_str());
}

}  // namespace

void tavro_attach_shared_files(app_control_h request, appdata *ad) {
  _take(request);
  tavro_attach_waiting_files(ad);
}

void tavro_attach_waiting_files(appdata *ad) {
  const bool is_anything = !_waiting.files.empty() || !_waiting.text.empty();
  if (!is_anything || tavro_is_ending() || !ad->landing_nf_it || !tavro_get_username_from_preference())
    return;
  const compose_view_win *view = _compose_screen(ad);
  if (!view) return;
  const shared_content content = std::exchange(_waiting, {});
  _append_text(view, content.text);
  _attach(ad, content.files, _left_out(content));
  tavro_compose_keeper_note();
  // It covers what has changed.
  if (tavro_image_editor_kept_page() && !ad->cancel_popup)
    notification_status_message_post(tavro_text("IDS_OB_TPOP_ADDED_TO_REPORT"));
}
