#include <fcntl.h>
#include <sys/stat.h>

#include <cerrno>
#include <cstring>
#include <string>

#include "tavro_crash_service.h"
#include "tavro_dc_private.h"
#include "tavro_handles.h"
#include "tavro_log.h"

namespace {

// Later kinds do not count for a name that an earlier one claims.
struct file_kind {
  const char *mark;
  char **path;
};

// `path` ends with a slash. The folder is not entered through a link, which that slash would follow.
TavroDir _open_folder(const std::string &path) {
  const std::string name = path.substr(0, path.size() - 1);
  TavroFd folder(open(name.c_str(), O_RDONLY | O_DIRECTORY | O_NOFOLLOW | O_CLOEXEC));
  TavroDir entries(folder ? fdopendir(folder.get()) : nullptr);
  if (entries) folder.release();
  return entries;
}

bool _is_regular_file(DIR *folder, const char *name) {
  struct stat info;
  return fstatat(dirfd(folder), name, &info, AT_SYMLINK_NOFOLLOW) == 0 && S_ISREG(info.st_mode);
}

}  // namespace

tavro_dc_folder *_tavro_dc_insert_crash_folder_list(tavro_dc_folder *list, long time, const char *name) {
  auto *node = g_new0(tavro_dc_folder, 1);
  node->time = time;
  node->folder_path = g_strdup(name);
  node->next = list;
  return node;
}

void _tavro_dc_sorted_insert(tavro_dc_folder **head, tavro_dc_folder *node) {
  tavro_dc_folder **place = head;
  if (*head && (*head)->time > node->time) {
    place = &(*head)->next;
    while (*place && (*place)->time >= node->time) place = &(*place)->next;
  }
  node->next = *place;
  *place = node;
}

void _tavro_dc_sort_crash_folder_list(tavro_dc_folder **list) {
  tavro_dc_folder *sorted = nullptr;
  while (*list) {
    tavro_dc_folder *node = *list;
    *list = node->next;
    _tavro_dc_sorted_insert(&sorted, node);
  }
  *list = sorted;
}

void _tavro_dc_free_folder_list(tavro_dc_folder *list) {
  while (list) {
    tavro_dc_folder *node = list;
    list = node->next;
    g_free(node->folder_path);
    g_free(node);
  }
}

void _tavro_dc_display_crash_folder_list(const tavro_dc_folder *list) {
  if (!list) TAVRO_LOGD("LIst null");
  for (; list; list = list->next) TAVRO_LOGD("%ld %s", list->time, list->folder_path);
}

char *_tavro_dc_split_folder_name(const char *name) {
  if (!name) return nullptr;
  const char *last = std::strrchr(name, '_');
  return g_strdup(last ? last + 1 : name);
}

void _tavro_dc_get_dump_files(const char *folder, char **core, char **summary, char **log) {
  *core = *summary = *log = nullptr;
  const std::string path = std::string(TAVRO_CRASH_DUMP_FOLDER) + folder + "/";
  const TavroDir entries = _open_folder(path);
  if (!entries) {
    TAVRO_LOGE("open dir fail = %s %s %x", path.c_str(), std::strerror(errno), static_cast<unsigned>(errno));
    return;
  }
  const file_kind kinds[] = {{".coredump.gz", core}, {".log.gz", log}, {".cs", summary}};
  while (const dirent *entry = readdir(entries.get())) {
    for (const file_kind &kind : kinds) {
      if (!std::strstr(entry->d_name, kind.mark)) continue;
      if (!_is_regular_file(entries.get(), entry->d_name)) {
        TAVRO_LOGE("%s%s is no regular file", path.c_str(), entry->d_name);
        break;
      }
      g_free(*kind.path);
      *kind.path = g_strconcat(path.c_str(), entry->d_name, nullptr);
      break;
    }
  }
}
