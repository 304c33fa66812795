#include "tavro_deleted_files.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <cstdlib>
#include <cstring>
#include <iterator>
#include <set>
#include <utility>

#include "tavro_compose_kept.h"
#include "tavro_dbmgr.h"
#include "tavro_handles.h"
#include "tavro_log.h"
#include "tavro_memory.h"
#include "tavro_note_file.h"

namespace {

constexpr char kNotePath[] = TAVRO_DBMGR_FOLDER "/.tavro.delete";
constexpr char kDamagedPath[] = TAVRO_DBMGR_FOLDER "/.tavro.delete.damaged";
constexpr char kGroup[] = "files";
constexpr char kCount[] = "count";

constexpr char kMediaFolder[] = "/opt/usr/media";
// Folders in it whose files may go: all others are the gallery's.
struct own_folder {
  const char *name;
  bool has_attachments;  // that the client made; else logs and dumps alone
};
constexpr own_folder kOwnFolders[] = {{"VantorCommunity", true}, {"QRT_debug", false}, {"Orbel", false}};

// The path without links and detours; empty when there is nothing.
std::string _canonical(const std::string &path) {
  const TavroHandle<char, std::free> canonical(realpath(path.c_str(), nullptr));
  return canonical ? canonical.get() : "";
}

// A plain file in a folder of ours: the folder, held open so that nobody exchanges it, and the name there.
struct own_file {
  TavroFd folder;  // none: there is no such file
  std::string folder_path;
  std::string name;
  std::string path() const { return folder_path + "/" + name; }
};

// A folder of ours counts only when nobody put a link in its place.
bool _is_own_folder(const std::string &path, bool is_attachment) {
  const std::string media = _canonical(kMediaFolder) + "/";
  return std::any_of(std::begin(kOwnFolders), std::end(kOwnFolders), [&](const own_folder &folder) {
    return (folder.has_attachments || !is_attachment) && path == media + folder.name;
  });
}

own_file _find(const std::string &path, bool is_attachment) {
  const std::size_t slash = path.rfind('/');
  if (slash == std::string::npos) return own_file{TavroFd(), {}, {}};
  own_file file{TavroFd(), _canonical(path.substr(0, slash + 1)), path.substr(slash + 1)};
  if (!_is_own_folder(file.folder_path, is_attachment)) return own_file{TavroFd(), {}, {}};
  TavroFd folder(open(file.folder_path.c_str(), O_RDONLY | O_DIRECTORY | O_NOFOLLOW | O_CLOEXEC));
  struct stat info = {};
  if (folder && fstatat(folder.get(), file.name.c_str(), &info, AT_SYMLINK_NOFOLLOW) == 0 &&
      S_ISREG(info.st_mode))
    file.folder = std::move(folder);
  return file;
}

// ---- The note ----

std::string _key(int index) {
  return "path " + std::to_string(index);
}

std::set<std::string> _read_note() {
  std::set<std::string> paths;
  const TavroKeyFile note = tavro_note_load(kNotePath, kDamagedPath);
  const int count = note ? g_key_file_get_integer(note.get(), kGroup, kCount, nullptr) : 0;
  for (int i = 0; i < count; i++) {
    const TavroText path(tavro_note_text(note.get(), kGroup, _key(i).c_str()));
    if (!path) break;
    paths.insert(path.get());
  }
  return paths;
}

void _write_note(const std::set<std::string> &paths) {
  const TavroKeyFile note(g_key_file_new());
  int count = 0;
  for (const std::string &path : paths)
    tavro_note_set_text(note.get(), kGroup, _key(count++).c_str(), path.c_str());
  g_key_file_set_integer(note.get(), kGroup, kCount, count);
  gsize size = 0;
  const TavroGText data(g_key_file_to_data(note.get(), &size, nullptr));
  if (tavro_note_write(kNotePath, data.get(), size) != 0)
    TAVRO_LOGE("files of deleted reports not noted: %s", std::strerror(errno));
}

// ---- Removing ----

// Canonical paths of those of the files that stored reports still name. False when the store cannot be read.
bool _read_needed(const std::set<std::string> &paths, std::set<std::string> *needed) {
  std::vector<tavro_voc_file> named;
  if (tavro_dbmgr_get_voc_files(nullptr, &named) != 0) return false;
  std::set<std::string> names;
  for (const std::string &path : paths) names.insert(path.substr(path.rfind('/') + 1));
  // Only what ends with one of the names can be one of the files, and is looked for on the disk.
  for (const tavro_voc_file &file : named)
    if (names.count(file.path.substr(file.path.rfind('/') + 1))) needed->insert(_canonical(file.path));
  return true;
}

// False when it is there still and is to be tried again.
bool _remove(const std::string &path, const std::set<std::string> &needed) {
  const own_file file = _find(path, false);
  if (!file.folder || needed.count(file.path())) return true;
  if (unlinkat(file.folder.get(), file.name.c_str(), 0) == 0 || errno == ENOENT) return true;
  TAVRO_LOGE("file of a deleted report: %s", std::strerror(errno));
  return false;
}

// Canonical paths of what unfinished writings name. False when that cannot be read.
bool _read_kept(std::set<std::string> *kept) {
  const auto paths = tavro_kept_attached_files();
  if (!paths) return false;
  for (const std::string &path : *paths) kept->insert(_canonical(path));
  return true;
}

// Noted by this process, or read from the note of an earlier one. Kept here too, as the note may not be
// written.
std::set<std::string> _noted;

}  // namespace

bool tavro_deleted_files_note(const std::vector<int> &voc_ids) {
  std::vector<tavro_voc_file> named;
  if (tavro_dbmgr_get_voc_files(&voc_ids, &named) != 0) return false;
  std::set<std::string> paths;
  for (const tavro_voc_file &file : named) {
    const bool is_log = file.kind == TAVRO_VOC_FILE_SYSLOG || file.kind == TAVRO_VOC_FILE_DUMP;
    const own_file own = _find(file.path, !is_log);
    if (own.folder) paths.insert(own.path());
  }
  if (paths.empty()) return true;
  _noted.merge(_read_note());
  _noted.merge(paths);
  _write_note(_noted);
  return true;
}

void tavro_deleted_files_remove() {
  _noted.merge(_read_note());
  std::set<std::string> needed, kept, left;
  if (_noted.empty() || !_read_needed(_noted, &needed) || !_read_kept(&kept)) return;
  for (const std::string &path : _noted)
    if (kept.count(path) || !_remove(path, needed)) left.insert(path);
  _noted = left;
  if (!left.empty())
    _write_note(left);
  else if (unlink(kNotePath) != 0 && errno != ENOENT)
    TAVRO_LOGE("note of deleted files stays: %s", std::strerror(errno));
}
