#include <unistd.h>

#include <cstdio>
#include <cstring>
#include <ctime>
#include <initializer_list>
#include <string>

#include "tavro-common.h"
#include "tavro-main.h"
#include "tavro_dbmgr.h"
#include "tavro_device_status.h"
#include "tavro_drafts.h"
#include "tavro_memory.h"

namespace {

constexpr char kMediaFolder[] = "/opt/usr/media/VantorCommunity/";

// Kept: a kind is recognised anywhere in the path, since the upload service was built on that.
const char *_file_type(const char *path) {
  if (std::strstr(path, "jpg")) return "jpg";
  return std::strstr(path, "png") ? "png" : "mp4";
}

// Names are as fine as a second: the file of a report sent in the same one is kept.
std::string _unused_name(const std::string &name) {
  const std::size_t ending = name.rfind('.');
  std::string unused = name;
  for (int number = 2; !name.empty() && access(unused.c_str(), F_OK) == 0; number++) {
    unused = name.substr(0, ending) + "_" + std::to_string(number) + name.substr(ending);
  }
  return unused;
}

void _free_text(gpointer data) {
  char *text = static_cast<char *>(data);
  TAVRO_FREE(text);
}

void _free_view(compose_view_win *view) {
  for (char **text : {&view->description, &view->title_description, &view->app_name, &view->app_icon,
                      &view->filename, &view->file_type}) {
    TAVRO_FREE(*text);
  }
  g_slist_free_full(view->attachments, _free_text);
  view->attachments = nullptr;
}

}  // namespace

void tavro_generate_filename(char (&filename)[kGeneratedFilenameSize], const char *extension) {
  if (tavro_create_dir(kMediaFolder) != 0) return;
  const time_t now = std::time(nullptr);
  struct tm when = {};
  localtime_r(&now, &when);
  std::snprintf(filename, sizeof filename, "%s%s_%d%02d%02d%02d%02d%02d.%s", kMediaFolder, "VantorCommunity",
                when.tm_year + 1900, when.tm_mon + 1, when.tm_mday, when.tm_hour, when.tm_min, when.tm_sec,
                extension);
}

GSList *tavro_populate_attachment_info(const GSList *paths) {
  GSList *infos = nullptr;
  for (const GSList *node = paths; node; node = node->next) {
    const char *path = static_cast<const char *>(node->data);
    tavro_dbmgr_attachment_info *info = TAVRO_ZALLOC(tavro_dbmgr_attachment_info);
    info->file_path = TAVRO_STRDUP(path);
    info->file_type = TAVRO_STRDUP(_file_type(path));
    infos = g_slist_prepend(infos, info);
  }
  return g_slist_reverse(infos);
}

void tavro_add_extra_data_file(tavro_dbmgr_bug_report_info *report) {
  char filename[kGeneratedFilenameSize] = {};
  tavro_generate_filename(filename, "txt");
  const std::string path = _unused_name(filename);
  if (!path.empty()) tavro_get_extra_device_data(path.c_str());
  TAVRO_FREE(report->device_data_filepath);
  report->device_data_filepath = TAVRO_STRDUP(path.c_str());
}

bool isLogMandatory(const char *appname) {
  if (!appname) return false;
  for (const char *target :
       {"IDS_OB_MBODY_BATTERY", "Hardware", "IDS_OB_MBODY_NETWORK", "IDS_OB_SOFTWARE_UPDATE"}) {
    if (std::strcmp(appname, target) == 0) return true;
  }
  return std::strstr(appname, "Performance") != nullptr;
}

void tavro_free_bug_report(tavro_dbmgr_bug_report_info *report) {
  tavro_dbmgr_free_bug_report_data(report);
}

void tavro_free_suggestion_info(tavro_dbmgr_suggestion_info *suggestion) {
  tavro_dbmgr_free_suggestion_data(suggestion);
}

void tavro_free_problem_view(problem_view_win *view) {
  if (!view) return;
  _free_view(view);
  for (char **text :
       {&view->dump_filename, &view->dump_filepath, &view->syslog_filename, &view->syslog_filepath}) {
    TAVRO_FREE(*text);
  }
}

void tavro_free_idea_view(idea_view_win *view) {
  if (view) _free_view(view);
}

void tavro_free_compose_view(appdata *ad) {
  for (const compose_view_win *view :
       {static_cast<compose_view_win *>(ad->problem_view), static_cast<compose_view_win *>(ad->idea_view)})
    if (view && view->menu_popup) evas_object_del(view->menu_popup);
  tavro_free_problem_view(ad->problem_view);
  TAVRO_FREE(ad->problem_view);
  tavro_free_idea_view(ad->idea_view);
  TAVRO_FREE(ad->idea_view);
}
