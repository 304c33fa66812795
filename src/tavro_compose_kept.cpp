#include "tavro_compose_kept.h"

#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <cstdlib>
#include <cstring>

#include "tavro_compose_keeper.h"
#include "tavro_history_text.h"
#include "tavro_log.h"
#include "tavro_memory.h"
#include "tavro_note_file.h"

namespace {

// More than a person leaves behind; without a limit a fault elsewhere could fill the disk.
constexpr int kMostFiles = 100;
constexpr off_t kLargestFileBytes = 64 * 1024 * 1024;
constexpr char kDamagedPath[] = TAVRO_COMPOSE_KEEPER_FILE ".damaged";
constexpr gint64 kMillisecondsPerSecond = 1000;

constexpr char kGroup[] = "writing";
constexpr char kKind[] = "kind";
constexpr char kOpenedFrom[] = "opened_from";
constexpr char kAutoSaved[] = "auto_saved";
constexpr char kBegun[] = "begun";
constexpr char kNoDeviceStatus[] = "without_device_status";

constexpr struct {
  reportType type;
  const char *name;
  const char *stored_type;
} kKinds[] = {
    {PROBLEM, "problem", TAVRO_DBMGR_BUG_REPORT},
    {CRASH, "crash", TAVRO_DBMGR_BUG_REPORT},
    {IDEA, "idea", TAVRO_DBMGR_SUGGESTION},
};

constexpr struct {
  const char *key;
  char *svc_voc_data::*member;
} kTexts[] = {
    {"title", &svc_voc_data::title_description}, {"description", &svc_voc_data::description},
    {"app_name", &svc_voc_data::app_name},       {"app_icon", &svc_voc_data::app_icon},
    {"dump_file", &svc_voc_data::dump_file},     {"dump_name", &svc_voc_data::dump_name},
    {"syslog_file", &svc_voc_data::syslog_file}, {"user_name", &svc_voc_data::user_name},
};

const char *_stored_type(reportType type) {
  for (const auto &kind : kKinds)
    if (kind.type == type) return kind.stored_type;
  return "";
}

bool _is_text(const char *text) {
  return !text || g_utf8_validate(text, -1, nullptr);
}

// The reason why it cannot be read, null when it was.
const char *_read(GKeyFile *file, kept_writing *kept) {
  const TavroGText name(g_key_file_get_string(file, kGroup, kKind, nullptr));
  kept->type = NONE;
  for (const auto &kind : kKinds)
    if (g_strcmp0(kind.name, name.get()) == 0) kept->type = kind.type;
  if (kept->type == NONE) return "unknown kind";
  svc_voc_data *content = TAVRO_ZALLOC(svc_voc_data);
  kept->content.reset(content);
  for (const auto &text : kTexts) content->*text.member = tavro_note_text(file, kGroup, text.key);
  if (!_is_text(content->title_description) || !_is_text(content->description)) return "no text";
  content->attachments = tavro_note_attachments(file, kGroup);
  content->id = g_key_file_get_integer(file, kGroup, kOpenedFrom, nullptr);
  kept->auto_saved_id = g_key_file_get_integer(file, kGroup, kAutoSaved, nullptr);
  kept->begun = g_key_file_get_int64(file, kGroup, kBegun, nullptr);
  kept->is_device_status_removed = g_key_file_get_boolean(file, kGroup, kNoDeviceStatus, nullptr);
  return tavro_kept_says_something(*kept) ? nullptr : "no content";
}

std::nullopt_t _set_aside(const std::string &path, const char *reason) {
  tavro_note_set_aside(path.c_str(), kDamagedPath, reason);
  return std::nullopt;
}

std::string _path(int place) {
  return place == 1 ? TAVRO_COMPOSE_KEEPER_FILE : TAVRO_COMPOSE_KEEPER_FILE "." + std::to_string(place);
}

bool _are_equal(const char *one, const char *other) {
  return std::strcmp(one ? one : "", other ? other : "") == 0;
}

bool _have_same_files(const GSList *some, const GSList *others) {
  for (; some && others; some = some->next, others = others->next)
    if (!_are_equal(static_cast<const tavro_dbmgr_attachment_info *>(some->data)->file_path,
                    static_cast<const tavro_dbmgr_attachment_info *>(others->data)->file_path))
      return false;
  return !some && !others;
}

bool _is_same_report(const kept_writing &kept, const svc_voc_data &stored) {
  const svc_voc_data &content = *kept.content;
  const gint64 created = stored.date_of_creation ? std::atoll(stored.date_of_creation) : 0;
  return stored.id != kept.auto_saved_id && stored.id != content.id &&
         created >= kept.begun * kMillisecondsPerSecond && _are_equal(stored.type, _stored_type(kept.type)) &&
         _are_equal(stored.description, content.description) &&
         _are_equal(stored.title_description, content.title_description) &&
         _are_equal(stored.dump_file, content.dump_file) &&
         _have_same_files(stored.attachments, content.attachments);
}

int _draft_or_none(const kept_writing &kept, int id) {
  if (id < 1) return 0;
  const TavroHandle<svc_voc_data, tavro_dbmgr_free_voc_data> stored(tavro_dbmgr_get_voc_by_id(id));
  return stored && _are_equal(stored->type, _stored_type(kept.type)) &&
                 _are_equal(stored->user_name, kept.content->user_name) &&
                 tavro_current_status(stored->submitted) == TAVRO_STATUS_DRAFT_SAVED
             ? id
             : 0;
}

}  // namespace

std::string tavro_kept_data(const kept_writing &kept) {
  const TavroKeyFile file(g_key_file_new());
  for (const auto &kind : kKinds)
    if (kind.type == kept.type) g_key_file_set_string(file.get(), kGroup, kKind, kind.name);
  for (const auto &text : kTexts)
    tavro_note_set_text(file.get(), kGroup, text.key, kept.content.get()->*text.member);
  tavro_note_set_attachments(file.get(), kGroup, kept.content->attachments);
  g_key_file_set_integer(file.get(), kGroup, kOpenedFrom, kept.content->id);
  g_key_file_set_integer(file.get(), kGroup, kAutoSaved, kept.auto_saved_id);
  g_key_file_set_int64(file.get(), kGroup, kBegun, kept.begun);
  g_key_file_set_boolean(file.get(), kGroup, kNoDeviceStatus, kept.is_device_status_removed);
  return TavroGText(g_key_file_to_data(file.get(), nullptr, nullptr)).get();
}

std::optional<kept_writing> tavro_kept_load(const std::string &path) {
  struct stat info = {};
  if (lstat(path.c_str(), &info) == -1) return std::nullopt;
  if (!S_ISREG(info.st_mode) || info.st_size > kLargestFileBytes) return _set_aside(path, "not of ours");
  const TavroKeyFile file = tavro_note_load(path.c_str(), kDamagedPath);
  if (!file) return std::nullopt;
  kept_writing kept;
  const char *reason = _read(file.get(), &kept);
  if (reason) return _set_aside(path, reason);
  return kept;
}

void tavro_kept_remove(const std::string &path) {
  if (unlink(path.c_str()) == -1 && errno != ENOENT)
    TAVRO_LOGE("%s stays: %s", path.c_str(), std::strerror(errno));
}

std::vector<std::string> tavro_kept_paths() {
  std::vector<std::string> paths;
  struct stat info = {};
  for (int place = 1; place <= kMostFiles; place++)
    if (lstat(_path(place).c_str(), &info) == 0) paths.push_back(_path(place));
  return paths;
}

std::string tavro_kept_unused_path() {
  struct stat info = {};
  for (int place = 1; place <= kMostFiles; place++)
    if (lstat(_path(place).c_str(), &info) == -1) return _path(place);
  return "";
}

bool tavro_kept_says_something(const kept_writing &kept) {
  const svc_voc_data &content = *kept.content;
  for (const char *text : {content.title_description, content.description, content.dump_file})
    if (text && *text) return true;
  return content.attachments != nullptr;
}

bool tavro_kept_is_stored(const kept_writing &kept) {
  GSList *reports = tavro_dbmgr_get_vocs_for_history(kept.content->user_name);
  bool is_stored = false;
  for (const GSList *link = reports; link; link = link->next)
    is_stored = is_stored || _is_same_report(kept, *static_cast<const svc_voc_data *>(link->data));
  g_slist_free_full(reports,
                    [](gpointer voc) { tavro_dbmgr_free_voc_data(static_cast<svc_voc_data *>(voc)); });
  return is_stored;
}

void tavro_kept_check_drafts(kept_writing *kept) {
  kept->content->id = _draft_or_none(*kept, kept->content->id);
  kept->auto_saved_id = _draft_or_none(*kept, kept->auto_saved_id);
}
