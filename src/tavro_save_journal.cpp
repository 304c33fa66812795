#include "tavro_save_journal.h"

#include <fcntl.h>
#include <sys/file.h>
#include <time.h>
#include <unistd.h>

#include <cerrno>
#include <cstring>
#include <string>
#include <utility>

#include "dbmgr/tavro_dbmgr_internal.h"
#include "tavro_log.h"
#include "tavro_note_file.h"

namespace {

constexpr char kPath[] = TAVRO_DBMGR_FOLDER "/.tavro.save";
constexpr char kDamagedPath[] = TAVRO_DBMGR_FOLDER "/.tavro.save.damaged";
constexpr char kAbandonedPath[] = TAVRO_DBMGR_FOLDER "/.tavro.save.abandoned";
constexpr char kLockPath[] = TAVRO_DBMGR_FOLDER "/.tavro.save.lock";

constexpr long kLockPollNanoseconds = 10 * 1000 * 1000;
constexpr int kLockPolls = 200;

// Group and keys of the file. A missing key is a null text.
constexpr char kReport[] = "report";
constexpr char kType[] = "type";
constexpr char kSubmitted[] = "submitted";
constexpr char kLastVocId[] = "last_voc_id";
constexpr char kFollowUpOf[] = "follow_up_of";

template <typename Report>
struct journal_text {
  const char *key;
  char *Report::*member;
};

using problem = tavro_dbmgr_bug_report_info;
constexpr journal_text<problem> kProblemTexts[] = {
    {"description", &problem::description}, {"title", &problem::title_description},
    {"app_name", &problem::app_name},       {"app_icon", &problem::app_icon},
    {"severity", &problem::severity},       {"dump_file", &problem::dump_file},
    {"dump_name", &problem::dump_name},     {"syslog_file", &problem::syslog_file},
    {"syslog_name", &problem::syslog_name}, {"device_data_filepath", &problem::device_data_filepath},
    {"user_name", &problem::user_name},     {"follow_up_verdict", &problem::follow_up_verdict},
};

using idea = tavro_dbmgr_suggestion_info;
constexpr journal_text<idea> kIdeaTexts[] = {
    {"description", &idea::suggestion},  {"title", &idea::title_description},
    {"app_name", &idea::app_name},       {"app_icon", &idea::app_icon},
    {"severity", &idea::severity},       {"syslog_file", &idea::syslog_file},
    {"syslog_name", &idea::syslog_name}, {"user_name", &idea::user_name},
};

// What differs between the two kinds of report.
const auto &_texts(const problem *) {
  return kProblemTexts;
}
const auto &_texts(const idea *) {
  return kIdeaTexts;
}
const char *_type(const problem *) {
  return TAVRO_DBMGR_BUG_REPORT;
}
const char *_type(const idea *) {
  return TAVRO_DBMGR_SUGGESTION;
}
// Only a problem report can be a follow-up.
int _follow_up_of(const problem *report) {
  return report->follow_up_of;
}
int _follow_up_of(const idea *) {
  return 0;
}
void _set_follow_up_of(problem *report, int server_id) {
  report->follow_up_of = server_id;
}
void _set_follow_up_of(idea *, int) {}
int _save(problem *report) {
  return tavro_dbmgr_update_bug_report(report);
}
int _save(idea *report) {
  return tavro_dbmgr_update_suggestion(report);
}
void _save_extension(const problem *report, int id) {
  tavro_dbmgr_update_bug_report_extended(report, id);
}
void _save_extension(const idea *report, int id) {
  tavro_dbmgr_update_suggestion_extended(report, id);
}

// From the note to the end of the save, so that a client which starts while an earlier one is still ending
// does not complete a save that is under way.
TavroFd save_lock;
unsigned int attachments_being_saved = 0;

bool _lock() {
  if (save_lock) return true;
  TavroFd lock(open(kLockPath, O_RDWR | O_CREAT | O_NOFOLLOW | O_CLOEXEC, 0600));
  if (!lock) return false;
  const timespec pause = {0, kLockPollNanoseconds};
  for (int i = 0; i < kLockPolls; i++) {
    if (flock(lock.get(), LOCK_EX | LOCK_NB) == 0) {
      save_lock = std::move(lock);
      return true;
    }
    nanosleep(&pause, nullptr);
  }
  return false;
}

void _unlock() {
  save_lock = TavroFd();
}

struct report_deleter {
  void operator()(problem *report) const { tavro_dbmgr_free_bug_report_data(report); }
  void operator()(idea *report) const { tavro_dbmgr_free_suggestion_data(report); }
};

void _remove(const char *path) {
  if (unlink(path) == -1 && errno != ENOENT) TAVRO_LOGE("save journal stays: %s", std::strerror(errno));
}

int _refuse(const char *reason) {
  TAVRO_LOGE("save cannot be protected: %s", reason);
  _unlock();
  return -1;
}

template <typename Report>
int _write(const Report *report) {
  if (!report) return -1;
  if (!_lock()) return _refuse(std::strerror(errno));
  if (access(kPath, F_OK) == 0 || access(kAbandonedPath, F_OK) == 0)
    return _refuse("an earlier save is not finished");
  const int last_voc_id = store_last_voc_id();
  if (last_voc_id < 0) return _refuse("no store");
  const TavroKeyFile file(g_key_file_new());
  g_key_file_set_string(file.get(), kReport, kType, _type(report));
  g_key_file_set_integer(file.get(), kReport, kSubmitted, report->submitted);
  g_key_file_set_integer(file.get(), kReport, kLastVocId, last_voc_id);
  if (const int first = _follow_up_of(report))
    g_key_file_set_integer(file.get(), kReport, kFollowUpOf, first);
  for (const auto &text : _texts(report))
    tavro_note_set_text(file.get(), kReport, text.key, report->*text.member);
  tavro_note_set_attachments(file.get(), kReport, report->attachments);
  gsize size = 0;
  const TavroGText data(g_key_file_to_data(file.get(), &size, nullptr));
  if (tavro_note_write(kPath, data.get(), size) != 0) {
    const int reason = errno;
    _remove(kPath);
    return _refuse(std::strerror(reason));
  }
  attachments_being_saved = g_slist_length(report->attachments);
  return 0;
}

template <typename Report>
std::unique_ptr<Report, report_deleter> _noted_report(GKeyFile *file) {
  std::unique_ptr<Report, report_deleter> report(TAVRO_ZALLOC(Report));
  report->submitted = g_key_file_get_integer(file, kReport, kSubmitted, nullptr);
  _set_follow_up_of(report.get(), g_key_file_get_integer(file, kReport, kFollowUpOf, nullptr));
  for (const auto &text : _texts(report.get()))
    report.get()->*text.member = tavro_note_text(file, kReport, text.key);
  report->attachments = tavro_note_attachments(file, kReport);
  return report;
}

// The row of the noted report, however much of it was stored; 0 for none, -1 on failure.
int _noted_row(GKeyFile *file) {
  int noted_id = g_key_file_get_integer(file, kReport, kLastVocId, nullptr);
  // Ids only grow, so a lower one means that the store was replaced since.
  const int last_id = store_last_voc_id();
  if (last_id < 0) return -1;
  if (last_id < noted_id) noted_id = 0;
  const TavroGText type(g_key_file_get_string(file, kReport, kType, nullptr));
  const TavroText user_name(tavro_note_text(file, kReport, "user_name"));
  const TavroText description(tavro_note_text(file, kReport, "description"));
  return store_find_voc_above(noted_id, type.get(), user_name.get(), description.get());
}

// A save whose row was refused leaves its attachments and its extension row behind, under no report.
int _without_remains(int voc_id) {
  if (voc_id == 0) store_remove_remains();
  return voc_id;
}

// The id of the noted report, stored now as far as it was not. Below 1 when it still is not complete.
template <typename Report>
int _complete(GKeyFile *file) {
  const auto report = _noted_report<Report>(file);
  const unsigned int attachment_count = g_slist_length(report->attachments);
  int id = _noted_row(file);
  if (id < 0) return -1;
  if (id == 0) {
    _without_remains(0);  // of the noted save itself: the disk that refused it may have refused this too
    id = _without_remains(_save(report.get()));
  } else {
    if (!store_has_attachments(id, attachment_count)) store_replace_attachments(report->attachments, id);
    if (!store_is_voc_complete(id)) _save_extension(report.get(), id);
  }
  return store_is_voc_complete(id) && store_has_attachments(id, attachment_count) ? id : 0;
}

// The noted report, complete now; 0 when there is none, or it cannot be completed yet.
int _recover() {
  const TavroKeyFile file = tavro_note_load(kPath, kDamagedPath);
  if (!file) return 0;
  const TavroGText type(g_key_file_get_string(file.get(), kReport, kType, nullptr));
  int id = 0;
  if (g_strcmp0(type.get(), TAVRO_DBMGR_BUG_REPORT) == 0) {
    id = _complete<tavro_dbmgr_bug_report_info>(file.get());
  } else if (g_strcmp0(type.get(), TAVRO_DBMGR_SUGGESTION) == 0) {
    id = _complete<tavro_dbmgr_suggestion_info>(file.get());
  } else {
    tavro_note_set_aside(kPath, kDamagedPath, "unknown type");
  }
  if (id < 1) return 0;
  _remove(kPath);
  TAVRO_LOGD("interrupted save completed: %d", id);
  return id;
}

// Take what was stored of an abandoned report out of the store. A full disk may refuse that too: then the
// note stays, and it is tried again before the next save.
void _drop_abandoned() {
  const TavroKeyFile file = tavro_note_load(kAbandonedPath, kDamagedPath);
  const int last_id = file ? store_last_voc_id() : -1;
  if (last_id < 0) return;
  _without_remains(0);
  // In a store that was replaced since, a row with these texts is another report.
  const bool is_same_store = last_id >= g_key_file_get_integer(file.get(), kReport, kLastVocId, nullptr);
  const int id = is_same_store ? _noted_row(file.get()) : 0;
  if (id < 0) return;
  if (id >= 1) tavro_dbmgr_destroy_vocs_by_id(id);
  const int left = id >= 1 ? _noted_row(file.get()) : 0;
  if (id == 0 || (left >= 0 && left != id)) _remove(kAbandonedPath);
}

}  // namespace

int tavro_journal_write(const tavro_dbmgr_bug_report_info *report) {
  return _write(report);
}

int tavro_journal_write(const tavro_dbmgr_suggestion_info *suggestion) {
  return _write(suggestion);
}

void tavro_journal_clear() {
  _remove(kPath);
  _unlock();
}

int tavro_journal_clear(int voc_id) {
  _without_remains(voc_id);
  if (store_is_voc_complete(voc_id) && store_has_attachments(voc_id, attachments_being_saved)) {
    tavro_journal_clear();
    return voc_id;
  }
  _unlock();
  return voc_id < 0 ? voc_id : 0;
}

void tavro_journal_abandon() {
  if (!_lock()) return;
  if (rename(kPath, kAbandonedPath) == -1 && errno != ENOENT)
    TAVRO_LOGE("save journal stays: %s", std::strerror(errno));
  _drop_abandoned();
  _unlock();
}

int tavro_journal_recover() {
  if (!_lock()) {
    if (errno != ENOENT) TAVRO_LOGE("another client is saving, or no lock: %s", std::strerror(errno));
    return 0;
  }
  _drop_abandoned();
  const int id = _recover();
  _unlock();
  return id;
}
