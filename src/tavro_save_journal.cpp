#include "tavro_save_journal.h"

#include <fcntl.h>
#include <unistd.h>

#include <cerrno>
#include <cstring>
#include <string>

#include "dbmgr/tavro_dbmgr_internal.h"
#include "tavro_log.h"

namespace {

constexpr char kPath[] = TAVRO_DBMGR_FOLDER "/.tavro.save";
constexpr char kUnfinishedPath[] = TAVRO_DBMGR_FOLDER "/.tavro.save.new";
constexpr char kDamagedPath[] = TAVRO_DBMGR_FOLDER "/.tavro.save.damaged";

// Group and keys of the file. A missing key is a null text.
constexpr char kReport[] = "report";
constexpr char kType[] = "type";
constexpr char kSubmitted[] = "submitted";
constexpr char kLastVocId[] = "last_voc_id";
constexpr char kAttachmentCount[] = "attachments";

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
    {"user_name", &problem::user_name},
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
const char *_description(const problem *report) {
  return report->description;
}
const char *_description(const idea *report) {
  return report->suggestion;
}
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

struct report_deleter {
  void operator()(problem *report) const { tavro_dbmgr_free_bug_report_data(report); }
  void operator()(idea *report) const { tavro_dbmgr_free_suggestion_data(report); }
};

// Values are put in quotes and escaped here: GKeyFile's own texts must be UTF-8, which paths need not be.
void _set_text(GKeyFile *file, const char *group, const char *key, const char *text) {
  static const std::string bytes_above_ascii = [] {
    std::string bytes;
    for (int byte = 0x80; byte <= 0xff; byte++) bytes += static_cast<char>(byte);
    return bytes;
  }();
  if (!text) return;
  const TavroGText escaped(g_strescape(text, bytes_above_ascii.c_str()));
  g_key_file_set_value(file, group, key, (std::string("\"") + escaped.get() + "\"").c_str());
}

char *_get_text(GKeyFile *file, const char *group, const char *key) {
  const TavroGText value(g_key_file_get_value(file, group, key, nullptr));
  const std::size_t length = value ? std::strlen(value.get()) : 0;
  if (length < 2) return nullptr;
  value.get()[length - 1] = '\0';
  return TAVRO_ADOPT(g_strcompress(value.get() + 1));
}

std::string _attachment_group(int index) {
  return "attachment " + std::to_string(index);
}

void _note_attachments(GKeyFile *file, const GSList *attachments) {
  int count = 0;
  for (; attachments; attachments = attachments->next) {
    const auto *attachment = static_cast<const tavro_dbmgr_attachment_info *>(attachments->data);
    if (!attachment) continue;
    const std::string group = _attachment_group(count++);
    _set_text(file, group.c_str(), "path", attachment->file_path);
    _set_text(file, group.c_str(), "type", attachment->file_type);
    g_key_file_set_double(file, group.c_str(), "size", attachment->file_size);
  }
  g_key_file_set_integer(file, kReport, kAttachmentCount, count);
}

GSList *_noted_attachments(GKeyFile *file) {
  const int count = g_key_file_get_integer(file, kReport, kAttachmentCount, nullptr);
  GSList *attachments = nullptr;
  for (int i = 0; i < count; i++) {
    const std::string group = _attachment_group(i);
    if (!g_key_file_has_group(file, group.c_str())) break;
    auto *attachment = TAVRO_ZALLOC(tavro_dbmgr_attachment_info);
    attachment->file_path = _get_text(file, group.c_str(), "path");
    attachment->file_type = _get_text(file, group.c_str(), "type");
    attachment->file_size = g_key_file_get_double(file, group.c_str(), "size", nullptr);
    attachments = g_slist_prepend(attachments, attachment);
  }
  return g_slist_reverse(attachments);
}

bool _write_all(int fd, const char *data, gsize size) {
  while (size > 0) {
    const ssize_t written = write(fd, data, size);
    if (written == -1 && errno == EINTR) continue;
    if (written <= 0) return false;
    data += written;
    size -= static_cast<gsize>(written);
  }
  return true;
}

bool _write_file(const char *data, gsize size) {
  TavroUnfinishedFile unfinished(kUnfinishedPath);
  const TavroFd fd(open(kUnfinishedPath, O_WRONLY | O_CREAT | O_TRUNC | O_CLOEXEC, 0600));
  if (!fd || !_write_all(fd.get(), data, size) || fsync(fd.get()) == -1) return false;
  if (rename(kUnfinishedPath, kPath) == -1) return false;
  unfinished.keep();
  const TavroFd folder(open(TAVRO_DBMGR_FOLDER, O_RDONLY | O_DIRECTORY | O_CLOEXEC));
  return folder && fsync(folder.get()) == 0;
}

template <typename Report>
int _write(const Report *report) {
  if (!report) return -1;
  const int last_voc_id = store_last_voc_id();
  const TavroKeyFile file(g_key_file_new());
  g_key_file_set_string(file.get(), kReport, kType, _type(report));
  g_key_file_set_integer(file.get(), kReport, kSubmitted, report->submitted);
  g_key_file_set_integer(file.get(), kReport, kLastVocId, last_voc_id);
  for (const auto &text : _texts(report)) _set_text(file.get(), kReport, text.key, report->*text.member);
  _note_attachments(file.get(), report->attachments);
  gsize size = 0;
  const TavroGText data(g_key_file_to_data(file.get(), &size, nullptr));
  if (last_voc_id >= 0 && _write_file(data.get(), size)) return 0;
  TAVRO_LOGE("save is not protected: %s", last_voc_id < 0 ? "no store" : std::strerror(errno));
  return -1;
}

template <typename Report>
std::unique_ptr<Report, report_deleter> _noted_report(GKeyFile *file) {
  std::unique_ptr<Report, report_deleter> report(TAVRO_ZALLOC(Report));
  report->submitted = g_key_file_get_integer(file, kReport, kSubmitted, nullptr);
  for (const auto &text : _texts(report.get()))
    report.get()->*text.member = _get_text(file, kReport, text.key);
  report->attachments = _noted_attachments(file);
  return report;
}

// The id of the noted report, in whatever state its save is: stored now if it was not. Below 1 on failure.
template <typename Report>
int _complete(GKeyFile *file) {
  const auto report = _noted_report<Report>(file);
  int noted_id = g_key_file_get_integer(file, kReport, kLastVocId, nullptr);
  // Ids only grow, so a lower one means that the store was replaced since.
  const int last_id = store_last_voc_id();
  if (last_id < noted_id) noted_id = 0;
  const int id =
      store_find_voc_above(noted_id, _type(report.get()), report->user_name, _description(report.get()));
  if (last_id < 0 || id < 0) return -1;
  if (id == 0) return _save(report.get());
  if (store_is_voc_complete(id)) return id;
  store_replace_attachments(report->attachments, id);
  _save_extension(report.get(), id);
  return id;
}

void _set_damaged_aside(const char *reason) {
  TAVRO_LOGE("save journal is damaged, kept as %s: %s", kDamagedPath, reason);
  rename(kPath, kDamagedPath);
}

}  // namespace

int tavro_journal_write(const tavro_dbmgr_bug_report_info *report) {
  return _write(report);
}

int tavro_journal_write(const tavro_dbmgr_suggestion_info *suggestion) {
  return _write(suggestion);
}

void tavro_journal_clear() {
  if (unlink(kPath) == -1 && errno != ENOENT) TAVRO_LOGE("save journal stays: %s", std::strerror(errno));
}

void tavro_journal_clear(int voc_id) {
  if (store_is_voc_complete(voc_id)) tavro_journal_clear();
}

int tavro_journal_recover() {
  const TavroKeyFile file(g_key_file_new());
  TavroError error;
  if (!g_key_file_load_from_file(file.get(), kPath, G_KEY_FILE_NONE, tavro_out(error))) {
    if (!g_error_matches(error.get(), G_FILE_ERROR, G_FILE_ERROR_NOENT)) _set_damaged_aside(error->message);
    return 0;
  }
  const TavroGText type(g_key_file_get_string(file.get(), kReport, kType, nullptr));
  int id = 0;
  if (g_strcmp0(type.get(), TAVRO_DBMGR_BUG_REPORT) == 0) {
    id = _complete<tavro_dbmgr_bug_report_info>(file.get());
  } else if (g_strcmp0(type.get(), TAVRO_DBMGR_SUGGESTION) == 0) {
    id = _complete<tavro_dbmgr_suggestion_info>(file.get());
  } else {
    _set_damaged_aside("unknown type");
    return 0;
  }
  if (!store_is_voc_complete(id)) return 0;
  tavro_journal_clear();
  TAVRO_LOGD("interrupted save completed: %d", id);
  return id;
}
