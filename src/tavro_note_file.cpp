#include "tavro_note_file.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <cstdio>
#include <cstring>
#include <string>

#include "tavro_dbmgr.h"
#include "tavro_handles.h"
#include "tavro_log.h"
#include "tavro_memory.h"

namespace {

constexpr char kAttachmentCount[] = "attachments";
constexpr int kMostDamagedFiles = 100;

std::string _attachment_group(int index) {
  return "attachment " + std::to_string(index);
}

bool _write_all(int fd, const char *data, gsize size) {
  while (size > 0) {
    const ssize_t written = write(fd, data, size);
    if (written == -1 && errno == EINTR) continue;
    if (written == 0) errno = EIO;
    if (written <= 0) return false;
    data += written;
    size -= static_cast<gsize>(written);
  }
  return true;
}

// A name that nothing has; empty when there are too many.
std::string _unused_path(const std::string &path) {
  struct stat info = {};
  for (int place = 1; place <= kMostDamagedFiles; place++) {
    const std::string numbered = place == 1 ? path : path + "." + std::to_string(place);
    if (lstat(numbered.c_str(), &info) == -1) return numbered;
  }
  return "";
}

}  // namespace

// Values are put in quotes and escaped here: GKeyFile's own texts must be UTF-8, which paths need not be.
void tavro_note_set_text(GKeyFile *file, const char *group, const char *key, const char *text) {
  static const std::string bytes_above_ascii = [] {
    std::string bytes;
    for (int byte = 0x80; byte <= 0xff; byte++) bytes += static_cast<char>(byte);
    return bytes;
  }();
  if (!text) return;
  const TavroGText escaped(g_strescape(text, bytes_above_ascii.c_str()));
  g_key_file_set_value(file, group, key, (std::string("\"") + escaped.get() + "\"").c_str());
}

char *tavro_note_text(GKeyFile *file, const char *group, const char *key) {
  const TavroGText value(g_key_file_get_value(file, group, key, nullptr));
  const std::size_t length = value ? std::strlen(value.get()) : 0;
  if (length < 2) return nullptr;
  value.get()[length - 1] = '\0';
  return TAVRO_ADOPT(g_strcompress(value.get() + 1));
}

void tavro_note_set_attachments(GKeyFile *file, const char *group, const GSList *attachments) {
  int count = 0;
  for (; attachments; attachments = attachments->next) {
    const auto *attachment = static_cast<const tavro_dbmgr_attachment_info *>(attachments->data);
    if (!attachment) continue;
    const std::string own_group = _attachment_group(count++);
    tavro_note_set_text(file, own_group.c_str(), "path", attachment->file_path);
    tavro_note_set_text(file, own_group.c_str(), "type", attachment->file_type);
    g_key_file_set_double(file, own_group.c_str(), "size", attachment->file_size);
  }
  g_key_file_set_integer(file, group, kAttachmentCount, count);
}

GSList *tavro_note_attachments(GKeyFile *file, const char *group) {
  const int count = g_key_file_get_integer(file, group, kAttachmentCount, nullptr);
  GSList *attachments = nullptr;
  for (int i = 0; i < count; i++) {
    const std::string own_group = _attachment_group(i);
    if (!g_key_file_has_group(file, own_group.c_str())) break;
    char *path = tavro_note_text(file, own_group.c_str(), "path");
    if (!path) continue;
    auto *attachment = TAVRO_ZALLOC(tavro_dbmgr_attachment_info);
    attachment->file_path = path;
    attachment->file_type = tavro_note_text(file, own_group.c_str(), "type");
    attachment->file_size = g_key_file_get_double(file, own_group.c_str(), "size", nullptr);
    attachments = g_slist_prepend(attachments, attachment);
  }
  return g_slist_reverse(attachments);
}

void tavro_note_set_aside(const char *path, const char *damaged_path, const char *reason) {
  const std::string aside = _unused_path(damaged_path);
  if (!aside.empty() && rename(path, aside.c_str()) == 0)
    TAVRO_LOGE("%s is damaged, set aside as %s: %s", path, aside.c_str(), reason);
  else
    TAVRO_LOGE("%s is damaged and stays: %s", path, reason);
}

TavroKeyFile tavro_note_load(const char *path, const char *damaged_path) {
  TavroKeyFile file(g_key_file_new());
  TavroError error;
  if (g_key_file_load_from_file(file.get(), path, G_KEY_FILE_NONE, tavro_out(error))) return file;
  if (error->domain == G_KEY_FILE_ERROR)
    tavro_note_set_aside(path, damaged_path, error->message);
  else if (!g_error_matches(error.get(), G_FILE_ERROR, G_FILE_ERROR_NOENT))
    TAVRO_LOGE("%s cannot be read now: %s", path, error->message);
  return nullptr;
}

int tavro_note_replace(const char *path, const char *data, gsize size) {
  const std::string unfinished_path = std::string(path) + ".new";
  TavroUnfinishedFile unfinished(unfinished_path);
  // What lies there may be a link, or readable by others: never written through.
  unlink(unfinished_path.c_str());
  const TavroFd fd(open(unfinished_path.c_str(), O_WRONLY | O_CREAT | O_EXCL | O_CLOEXEC, 0600));
  if (!fd || !_write_all(fd.get(), data, size) || fsync(fd.get()) == -1) return -1;
  if (rename(unfinished_path.c_str(), path) == -1) return -1;
  unfinished.keep();
  return 0;
}

int tavro_note_sync_folder(const char *path) {
  const TavroGText folder_path(g_path_get_dirname(path));
  const TavroFd folder(open(folder_path.get(), O_RDONLY | O_DIRECTORY | O_CLOEXEC));
  return folder && fsync(folder.get()) == 0 ? 0 : -1;
}

int tavro_note_write(const char *path, const char *data, gsize size) {
  return tavro_note_replace(path, data, size) == 0 ? tavro_note_sync_folder(path) : -1;
}
