#include <sys/stat.h>
#include <system_info.h>

#include <cerrno>
#include <cstring>
#include <string>

#include "tavro_crash_service.h"
#include "tavro_dc_private.h"
#include "tavro_handles.h"
#include "tavro_log.h"

namespace {

using FolderList = TavroHandle<tavro_dc_folder, _tavro_dc_free_folder_list>;

struct platform_fact {
  const char *key;
  TavroText tavro_dc_texts::*owner;
  char *tavro_dc_report_info::*field;
};

constexpr platform_fact kFacts[] = {
    {SYSTEM_INFO_KEY_MODEL_NAME, &tavro_dc_texts::model, &tavro_dc_report_info::model},
    {SYSTEM_INFO_KEY_BUILD_STRING, &tavro_dc_texts::build_number, &tavro_dc_report_info::build_number},
    {SYSTEM_INFO_KEY_PLATFORM_VERSION, &tavro_dc_texts::tizen_version, &tavro_dc_report_info::tizen_version},
    {SYSTEM_INFO_KEY_PLATFORM_NAME, &tavro_dc_texts::platform, &tavro_dc_report_info::platform},
};

TavroText _platform_text(const char *key) {
  char *text = nullptr;
  const int error = system_info_get_platform_string(key, &text);
  if (error != SYSTEM_INFO_ERROR_NONE) {
    TAVRO_LOGE("system_info_get_platform_string failed: %d", error);
    return nullptr;
  }
  return TavroText(TAVRO_ADOPT(text));
}

// The field shows the new text, and the one before it, if it was the collector's, is freed.
void _put(TavroText text, TavroText *owner, char **field) {
  *field = text.get();
  *owner = std::move(text);
}

void _read_platform(tavro_dc_context *context) {
  for (const platform_fact &fact : kFacts) {
    TavroText text = _platform_text(fact.key);
    if (text) _put(std::move(text), &(context->texts.*fact.owner), &(context->report_info.*fact.field));
  }
  const TavroText date = _platform_text(SYSTEM_INFO_KEY_BUILD_DATE);
  const TavroText time = _platform_text(SYSTEM_INFO_KEY_BUILD_TIME);
  if (!date || !time) return;
  TavroText both(TAVRO_ADOPT(g_strdup_printf("%s %s", date.get(), time.get())));
  _put(std::move(both), &context->texts.build_date, &context->report_info.build_date);
  TAVRO_LOGD("build_time: %s", context->report_info.build_date);
}

TavroText _archive_path(const char *folder) {
  const TavroGText token(_tavro_dc_split_folder_name(folder));
  return TavroText(TAVRO_ADOPT(g_strdup_printf("%s%s%s.zip", kTavroDcArchiveFolder, "tavro_", token.get())));
}

FolderList _read_crash_folders(DIR *dump_folder) {
  FolderList list;
  while (const dirent *entry = readdir(dump_folder)) {
    if (std::strcmp(entry->d_name, ".") == 0 || std::strcmp(entry->d_name, "..") == 0) continue;
    const std::string path = std::string(TAVRO_CRASH_DUMP_FOLDER) + entry->d_name + "/";
    struct stat64 info;
    if (stat64(path.c_str(), &info) != 0) {
      TAVRO_LOGE("Could stat fail %s %s", path.c_str(), std::strerror(errno));
      continue;
    }
    list.reset(_tavro_dc_insert_crash_folder_list(list.release(), info.st_mtime, entry->d_name));
  }
  return list;
}

// Sorted anew, the list has another head.
FolderList _sorted(FolderList list) {
  tavro_dc_folder *head = list.release();
  _tavro_dc_sort_crash_folder_list(&head);
  return FolderList(head);
}

}  // namespace

int _tavro_dc_get_crash_dump_and_zip(char **folder) {
  *folder = nullptr;
  const TavroDir dump_folder(opendir(TAVRO_CRASH_DUMP_FOLDER));
  if (!dump_folder) {
    TAVRO_LOGE("Could not open directory");
    return -1;
  }
  const FolderList list = _sorted(_read_crash_folders(dump_folder.get()));
  if (!list) return 1;
  for (const tavro_dc_folder *node = list.get(); node && !tavro_dc_is_cancelled(); node = node->next) {
    TavroGText core, summary, log;
    _tavro_dc_get_dump_files(node->folder_path, tavro_out(core), tavro_out(summary), tavro_out(log));
    if (!core && !summary && !log) continue;
    TAVRO_LOGD("log_file: %s, cs_file: %s gz_file = %s", log.get(), summary.get(), core.get());
    *folder = g_strdup(node->folder_path);
    return _tavro_dc_zip_files(core.get(), summary.get(), log.get(), node->folder_path);
  }
  if (!tavro_dc_is_cancelled()) TAVRO_LOGE("no crash folder holds a crash file");
  return -1;
}

char *_tavro_dc_get_log_dump_file(const char *name) {
  if (std::strcmp(name, ".") == 0) return nullptr;
  return g_strdup_printf("%s%s", TAVRO_LOG_DUMP_FOLDER, name);
}

void _tavro_dc_start(tavro_dc_context *context) {
  _read_platform(context);
  TavroGText folder;
  const int result = _tavro_dc_get_crash_dump_and_zip(tavro_out(folder));
  if (result != 0 && tavro_dc_is_cancelled()) return;
  const tavro_dc_callbacks &listener = context->report_info.listener;
  const tavro_dc_cb callback = result == -1 ? listener.dc_error_cb : listener.dc_done_cb;
  _put(result == 0 ? _archive_path(folder.get()) : nullptr, &context->texts.file_path,
       &context->report_info.file_path);
  if (callback) callback(context, &context->report_info, context->userdata);
}
