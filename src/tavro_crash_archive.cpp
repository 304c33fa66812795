#include "tavro_crash_archive.h"

#include <glib.h>
#include <minizip/unzip.h>
#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <cstring>
#include <ctime>
#include <optional>
#include <set>
#include <vector>

#include "tavro_compose_kept.h"
#include "tavro_dbmgr.h"
#include "tavro_handles.h"
#include "tavro_history_text.h"
#include "tavro_log.h"
#include "tavro_type.h"
#include "tavro_widgets.h"

namespace {

using ZipFile = TavroHandle<std::remove_pointer_t<unzFile>, unzClose>;

constexpr char kSummaryMark[] = ".cs";
constexpr int kMostFiles = 50;  // the collector packs three
constexpr size_t kLongestName = 256;
constexpr time_t kKeptSeconds = 7 * 24 * 60 * 60;

bool _is_archive_of_ours(const std::string &path) {
  constexpr size_t folder = sizeof TAVRO_CRASH_ARCHIVE_FOLDER - 1;
  struct stat info = {};
  return path.compare(0, folder, TAVRO_CRASH_ARCHIVE_FOLDER) == 0 && path.size() > folder &&
         path.find('/', folder) == std::string::npos && lstat(path.c_str(), &info) == 0 &&
         S_ISREG(info.st_mode);
}

// A report that has arrived needs its dump no more; drafts, and what is being sent or could not be, do.
bool _is_to_be_sent(int voc_id) {
  const TavroHandle<svc_voc_data, tavro_dbmgr_free_voc_data> voc(tavro_dbmgr_get_voc_by_id(voc_id));
  if (!voc) return true;  // cannot be read just now
  const int status = tavro_current_status(voc->submitted);
  return status == TAVRO_STATUS_SENDING_FAILED || status == TAVRO_STATUS_DRAFT_SAVED ||
         status == TAVRO_STATUS_SENDING || status == TAVRO_STATUS_SENDING_FAILED_NO_NETWORK;
}

// The files that stored reports and unfinished writings need; nothing when that cannot be read.
std::optional<std::set<std::string>> _needed_files(const std::set<std::string> &asked) {
  std::vector<tavro_voc_file> files;
  if (tavro_dbmgr_get_voc_files(nullptr, &files) != 0) return std::nullopt;
  std::optional<std::set<std::string>> paths = tavro_kept_attached_files();
  if (!paths) return std::nullopt;
  for (const tavro_voc_file &file : files)
    if (file.kind == TAVRO_VOC_FILE_DUMP && asked.count(file.path) && _is_to_be_sent(file.voc_id))
      paths->insert(file.path);
  return paths;
}

bool _is_old(const std::string &path) {
  struct stat info = {};
  return stat(path.c_str(), &info) == 0 && std::time(nullptr) - info.st_mtime > kKeptSeconds;
}

void _delete(const std::string &path) {
  if (unlink(path.c_str()) != 0) TAVRO_LOGE("crash dump %s: %s", path.c_str(), std::strerror(errno));
}

// The beginning of the archive's current file.
std::string _read_current(unzFile zip, size_t limit) {
  if (unzOpenCurrentFile(zip) != UNZ_OK) return {};
  std::string content(limit, '\0');
  size_t size = 0;
  int count = 1;
  while (size < limit && count > 0) {
    count = unzReadCurrentFile(zip, content.data() + size, static_cast<unsigned>(limit - size));
    if (count > 0) size += static_cast<size_t>(count);
  }
  content.resize(size);
  unzCloseCurrentFile(zip);
  return content;
}

std::string _as_text(std::string bytes) {
  std::replace(bytes.begin(), bytes.end(), '\0', ' ');
  return TavroGText(g_utf8_make_valid(bytes.data(), static_cast<gssize>(bytes.size()))).get();
}

}  // namespace

void tavro_crash_archive_delete_unneeded(const std::string &path) {
  if (!_is_archive_of_ours(path)) return;
  const auto needed = _needed_files({path});
  if (needed && needed->count(path) == 0) _delete(path);
}

void tavro_crash_archive_prune() {
  std::set<std::string> old;
  const TavroDir folder(opendir(TAVRO_CRASH_ARCHIVE_FOLDER));
  while (const dirent *entry = folder ? readdir(folder.get()) : nullptr) {
    const std::string path = std::string(TAVRO_CRASH_ARCHIVE_FOLDER) + entry->d_name;
    if (_is_archive_of_ours(path) && _is_old(path)) old.insert(path);
  }
  if (old.empty()) return;
  const auto needed = _needed_files(old);
  if (!needed) return;
  for (const std::string &path : old)
    if (needed->count(path) == 0) _delete(path);
}

bool tavro_crash_archive_read(const char *path, size_t limit, std::string *text) {
  const ZipFile zip(unzOpen64(path));
  int error = zip ? unzGoToFirstFile(zip.get()) : UNZ_BADZIPFILE;
  std::string files, summary;
  for (int i = 0; i < kMostFiles && error == UNZ_OK; ++i, error = unzGoToNextFile(zip.get())) {
    unz_file_info64 info = {};
    char name[kLongestName] = {};
    if (unzGetCurrentFileInfo64(zip.get(), &info, name, sizeof name - 1, nullptr, 0, nullptr, 0) != UNZ_OK)
      break;
    files +=
        _as_text(name) + " \u00B7 " + tavro_size_text(static_cast<long long>(info.uncompressed_size)) + "\n";
    if (std::strstr(name, kSummaryMark) && summary.empty())
      summary = _as_text(_read_current(zip.get(), limit));
  }
  if (files.empty()) {
    TAVRO_LOGE("crash dump %s cannot be read", path);
    return false;
  }
  *text = files + (summary.empty() ? "" : "\n" + summary);
  return true;
}
