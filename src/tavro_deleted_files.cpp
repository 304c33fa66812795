#include "tavro_deleted_files.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <cstdlib>
#include <cstring>
#include <iterator>
#include <optional>
#include <set>
#include <utility>

#include "tavro_compose_kept.h"
#include "tavro_dbmgr.h"
#include "tavro_handles.h"
#include "tavro_log.h"
#include "tavro_memory.h"
#include "tavro_note_file.h"
#include "tavro_video_info.h"

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
  if (unlinkat(file.folder.get(), file.name.c_str(), 0) != 0 && errno != ENOENT) {
    TAVRO_LOGE("file of a deleted report: %s", std::strerror(errno));
    return false;
  }
  unlinkat(file.folder.get(), tavro_video_picture_name(file.name).c_str(), 0);  // of a video
  return true;
}

// What a capture is making: its canonical path, though it may not be there yet.
std::string _unfinished;

// Canonical paths of what unfinished writings name, and of what is being made. False when that cannot be
// read.
bool _read_kept(std::set<std::string> *kept) {
  const auto paths = tavro_kept_attached_files();
  if (!paths) return false;
  for (const std::string &path : *paths) kept->insert(_canonical(path));
  if (!_unfinished.empty()) kept->insert(_unfinished);
  return true;
}

// Noted by this process, or read from the note of an earlier one. Kept here too, as the note may not be
// written.
std::set<std::string> _noted;

void _note(std::set<std::string> paths) {
  if (std::includes(_noted.begin(), _noted.end(), paths.begin(), paths.end())) return;
  _noted.merge(_read_note());
  _noted.merge(paths);
  _write_note(_noted);
}

std::string _ending(const std::string &name) {
  const std::size_t dot = name.rfind('.');
  return dot == std::string::npos ? "" : name.substr(dot);
}

bool _is_picture(const std::string &name) {
  return _ending(name) == ".jpg" || _ending(name) == ".png";
}

bool _is_attachment(const std::string &name) {
  return _is_picture(name) || _ending(name) == ".mp4";
}

// The canonical paths of those in the client's own folder whose name is `of_kind`.
std::set<std::string> _own_of(const std::vector<std::string> &paths, bool (*of_kind)(const std::string &)) {
  std::set<std::string> own_paths;
  for (const std::string &path : paths) {
    const own_file own = _find(path, true);
    if (!own.folder_path.empty() && of_kind(own.name)) own_paths.insert(own.path());
  }
  return own_paths;
}

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
  _note(std::move(paths));
  return true;
}

void tavro_deleted_files_note_copies(const std::vector<int> &voc_ids, const std::vector<std::string> &paths) {
  std::vector<tavro_voc_file> named;
  if (!voc_ids.empty() && tavro_dbmgr_get_voc_files(&voc_ids, &named) != 0)
    TAVRO_LOGE("copies of attachments not noted: the store cannot be read");
  std::vector<std::string> attached;
  for (const tavro_voc_file &file : named) attached.push_back(file.path);
  std::set<std::string> copies = _own_of(paths, _is_picture);
  copies.merge(_own_of(attached, _is_attachment));
  _note(std::move(copies));
}

void tavro_deleted_files_set_unfinished(const std::string &path) {
  const own_file own = _find(path, true);
  _unfinished = own.folder_path.empty() ? "" : own.path();
  if (!_unfinished.empty()) _note({_unfinished});
}

void tavro_deleted_files_keep(const std::string &path) {
  _noted.merge(_read_note());
  if (_noted.erase(_find(path, true).path()) != 0) _write_note(_noted);
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
