#include "tavro_note_file.h"

#include <fcntl.h>
#include <unistd.h>

#include <cerrno>
#include <cstdio>
#include <cstring>
#include <string>

#include "tavro_dbmgr.h"
#include "tavro_handles.h"
#include "tavro_memory.h"

namespace {

constexpr char kAttachmentCount[] = "attachments";

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
    auto *attachment = TAVRO_ZALLOC(tavro_dbmgr_attachment_info);
    attachment->file_path = tavro_note_text(file, own_group.c_str(), "path");
    attachment->file_type = tavro_note_text(file, own_group.c_str(), "type");
    attachment->file_size = g_key_file_get_double(file, own_group.c_str(), "size", nullptr);
    attachments = g_slist_prepend(attachments, attachment);
  }
  return g_slist_reverse(attachments);
}

int tavro_note_write(const char *path, const char *data, gsize size) {
  const std::string unfinished_path = std::string(path) + ".new";
  TavroUnfinishedFile unfinished(unfinished_path);
  const TavroFd fd(open(unfinished_path.c_str(), O_WRONLY | O_CREAT | O_TRUNC | O_CLOEXEC, 0600));
  if (!fd || !_write_all(fd.get(), data, size) || fsync(fd.get()) == -1) return -1;
  if (rename(unfinished_path.c_str(), path) == -1) return -1;
  unfinished.keep();
  const TavroGText folder_path(g_path_get_dirname(path));
  const TavroFd folder(open(folder_path.get(), O_RDONLY | O_DIRECTORY | O_CLOEXEC));
  return folder && fsync(folder.get()) == 0 ? 0 : -1;
}
