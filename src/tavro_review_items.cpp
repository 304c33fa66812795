#include <algorithm>
#include <cstring>

#include "tavro-common.h"
#include "tavro-main.h"
#include "tavro_compose.h"
#include "tavro_gallery.h"
#include "tavro_handles.h"
#include "tavro_memory.h"
#include "tavro_preferences.h"
#include "tavro_review.h"
#include "tavro_targets.h"
#include "tavro_widgets.h"

namespace {

constexpr char kBetween[] = " \xC2\xB7 ";

template <typename... Values>
std::string _text_with(const char *id, Values... values) {
  const TavroGText text(g_strdup_printf(tavro_text(id), values...));
  return text.get();
}

std::string _plain_text(const Evas_Object *entry) {
  if (!entry) return {};
  const TavroText text(TAVRO_ADOPT(elm_entry_markup_to_utf8(elm_entry_entry_get(entry))));
  return text ? text.get() : "";
}

std::string _or_empty(const char *text) {
  return text ? text : "";
}

void _take_problem_facts(tavro_review_facts *facts, const appdata *ad) {
  const problem_view_win *view = ad->problem_view;
  facts->is_problem = true;
  facts->dump_path = _or_empty(view->dump_filepath);
  facts->log_path = _or_empty(view->syslog_filepath);
  facts->log_state = tavro_system_log_current(ad);
  facts->is_log_mandatory = view->app_name && isLogMandatory(view->app_name);
  facts->is_device_status_removed = view->is_device_status_removed;
}

std::string _text_detail(const tavro_review_facts &facts) {
  const glong length = g_utf8_strlen(facts.description.c_str(), -1);
  std::string content = length == 1 ? tavro_text("IDS_OB_BODY_1_CHARACTER")
                                    : _text_with("IDS_OB_BODY_PD_CHARACTERS", static_cast<int>(length));
  if (length == 0) {
    content = tavro_text(facts.title.empty() ? "IDS_OB_BODY_NO_TEXT" : "IDS_OB_BODY_ONLY_A_TITLE");
  } else if (!facts.title.empty()) {
    content = _text_with("IDS_OB_BODY_TITLE_AND_PS", content.c_str());
  }
  if (facts.target.empty()) return content;
  return _text_with("IDS_OB_BODY_ABOUT_PS", facts.target.c_str()) + kBetween + content;
}

tavro_review_item _text_item(const tavro_review_facts &facts) {
  const auto size = static_cast<gint64>(facts.title.size() + facts.description.size());
  return {TAVRO_REVIEW_TEXT, tavro_text("IDS_OB_BODY_YOUR_TEXT"), _text_detail(facts), {}, size, true, true,
          TAVRO_REVIEW_KEEP};
}

// A file that cannot be read travels by its name alone.
tavro_review_item _file_item(tavro_review_kind kind, std::string title, const std::string &path) {
  const gint64 size = tavro_attachment_size(path.c_str());
  const std::string detail = size < 0 ? tavro_text("IDS_OB_BODY_CANNOT_BE_READ") : tavro_size_text(size);
  return {kind, std::move(title), detail, path, std::max<gint64>(size, 0), true, true, TAVRO_REVIEW_REMOVE};
}

std::string _name_of(const std::string &path) {
  return path.substr(path.rfind('/') + 1) + kBetween;
}

tavro_review_item _attachment_item(const std::string &path, int number) {
  const bool is_video = tavro_gallery_is_video(path.c_str());
  tavro_review_item item =
      _file_item(is_video ? TAVRO_REVIEW_VIDEO : TAVRO_REVIEW_PICTURE,
                 _text_with(is_video ? "IDS_OB_BODY_VIDEO_PD" : "IDS_OB_BODY_PICTURE_PD", number), path);
  item.detail.insert(0, _name_of(path));
  return item;
}

tavro_review_item _dump_item(const std::string &path) {
  tavro_review_item item = _file_item(TAVRO_REVIEW_DUMP, tavro_text("IDS_OB_BODY_CRASH_DUMP"), path);
  item.detail.insert(0, _name_of(path));
  return item;
}

tavro_review_item _log_item(const tavro_review_facts &facts) {
  const char *title = tavro_text("IDS_OB_BODY_SYSTEM_LOG");
  tavro_review_item item;
  if (facts.log_path.empty()) {
    const bool is_coming = facts.log_state == TAVRO_SYSTEM_LOG_COLLECTING;
    const char *detail = tavro_text(is_coming ? "IDS_OB_BODY_LOG_COLLECTING" : "IDS_OB_BODY_LOG_FAILED");
    item = {TAVRO_REVIEW_LOG, title, detail, {}, 0, is_coming, false, TAVRO_REVIEW_REMOVE};
  } else {
    item = _file_item(TAVRO_REVIEW_LOG, title, facts.log_path);
  }
  if (facts.is_log_mandatory) {
    item.action = TAVRO_REVIEW_KEEP;
    item.detail += kBetween + std::string(tavro_text("IDS_OB_BODY_LOG_NEEDED"));
  }
  return item;
}

std::string _device_status_detail(const tavro_review_facts &facts) {
  if (facts.is_device_status_removed) return tavro_text("IDS_OB_BODY_NOT_SENT");
  if (facts.device_status.empty()) return tavro_text("IDS_OB_BODY_DEVICE_STATUS_READING");
  const bool has_network = facts.device_status.find("\nRSSI : ") != std::string::npos;
  return tavro_text(has_network ? "IDS_OB_BODY_DEVICE_STATUS_NETWORK" : "IDS_OB_BODY_DEVICE_STATUS_PARTS") +
         (kBetween + tavro_size_text(static_cast<gint64>(facts.device_status.size())));
}

tavro_review_item _device_status_item(const tavro_review_facts &facts) {
  const bool is_sent = !facts.is_device_status_removed;
  return {TAVRO_REVIEW_DEVICE_STATUS,
          tavro_text("IDS_OB_BODY_DEVICE_STATUS"),
          _device_status_detail(facts),
          {},
          is_sent ? static_cast<gint64>(facts.device_status.size()) : 0,
          is_sent,
          true,
          is_sent ? TAVRO_REVIEW_REMOVE : TAVRO_REVIEW_PUT_BACK};
}

tavro_review_item _account_item(const tavro_review_facts &facts) {
  const bool has_account = !facts.account.empty();
  return {TAVRO_REVIEW_ACCOUNT,
          tavro_text("IDS_OB_BODY_ACCOUNT"),
          has_account ? facts.account : tavro_text("IDS_OB_BODY_NO_ACCOUNT"),
          {},
          static_cast<gint64>(facts.account.size()),
          has_account,
          false,
          TAVRO_REVIEW_KEEP};
}

}  // namespace

tavro_review_facts tavro_review_facts_of(appdata *ad) {
  tavro_review_facts facts;
  const compose_view_win *view = tavro_compose_view(ad);
  if (!view) return facts;
  if (view->app_name) facts.target = tavro_target_text(view->app_name);
  facts.title = _plain_text(view->title_entry);
  facts.description = _plain_text(view->entry);
  for (const GSList *link = view->attachments; link; link = link->next)
    facts.attachments.emplace_back(static_cast<const char *>(link->data));
  if (ad->problem_view == view) _take_problem_facts(&facts, ad);
  facts.account = _or_empty(tavro_get_username_from_preference().get());
  return facts;
}

std::vector<tavro_review_item> tavro_review_items(const tavro_review_facts &facts) {
  std::vector<tavro_review_item> items = {_text_item(facts)};
  int number = 0;
  for (const std::string &path : facts.attachments) items.push_back(_attachment_item(path, ++number));
  if (facts.is_problem) {
    if (!facts.dump_path.empty()) items.push_back(_dump_item(facts.dump_path));
    if (!facts.log_path.empty() || facts.log_state != TAVRO_SYSTEM_LOG_OFF) items.push_back(_log_item(facts));
    items.push_back(_device_status_item(facts));
  }
  items.push_back(_account_item(facts));
  return items;
}

std::string tavro_review_total(const std::vector<tavro_review_item> &items) {
  gint64 size = 0;
  int count = 0;
  for (const tavro_review_item &item : items) {
    size += item.size;
    count += item.is_sent;
  }
  const std::string size_text = tavro_size_text(size);
  return count == 1 ? _text_with("IDS_OB_BODY_1_ITEM_PS", size_text.c_str())
                    : _text_with("IDS_OB_BODY_PD_ITEMS_PS", count, size_text.c_str());
}

std::string tavro_review_text(const tavro_review_facts &facts) {
  std::string text;
  if (!facts.target.empty()) text = _text_with("IDS_OB_BODY_ABOUT_PS", facts.target.c_str());
  for (const std::string *part : {&facts.title, &facts.description})
    if (!part->empty()) text += (text.empty() ? "" : "\n\n") + *part;
  return text;
}
