// A compose screen with what it stores, for tests.
#pragma once

#include <app_preference.h>

#include <string>
#include <vector>

#include "files.h"
#include "screens_world.h"
#include "store_access.h"
#include "tavro_compose.h"
#include "tavro_memory.h"
#include "tavro_preferences.h"

using Voc = TavroHandle<svc_voc_data, tavro_dbmgr_free_voc_data>;

constexpr char kComposeMedia[] = "/opt/usr/media/compose-test/";

inline std::string make_file(const std::string &name, const std::string &content, off_t size = 0) {
  const std::string path = write_file(kComposeMedia + name, content);
  if (size > 0) std::filesystem::resize_file(path, static_cast<uintmax_t>(size));
  return path;
}

inline std::string make_picture(const std::string &name, off_t size = 1000) {
  return make_file(name, "\xFF\xD8\xFF\xE0 JFIF", size);
}

class Compose : public Screens {
 protected:
  void SetUp() override {
    start();
    preference_set_boolean(TAVRO_PREF_SENT_PAGE_SEEN, true);
    preference_set_boolean(TAVRO_PREF_ATTACH_LOGS, false);
    preference_remove(TAVRO_PREF_MAX_SIZE_ATTACHMENT);
  }
  void TearDown() override { end(); }

  compose_view_win *view() { return tavro_compose_view(&ad_); }

  // A problem that could be sent.
  void write_problem(const char *target = "Hardware Store") {
    tavro_create_problem_page(&ad_, nullptr);
    view()->app_name = TAVRO_STRDUP(target);
    elm_entry_entry_set(view()->title_entry, "It broke");
    settle();
  }

  void tap_send() { tap(elm_object_part_content_get(view()->bottom, "tavro.swallow.button")); }

  static std::string text(const Evas_Object *widget, const char *part) {
    const char *shown = widget ? elm_object_part_text_get(widget, part) : nullptr;
    return shown ? shown : "";
  }
  std::string size_text() { return text(view()->bottom, "elm.text"); }

  std::vector<std::string> attached() {
    std::vector<std::string> names;
    for (const GSList *link = view()->attachments; link; link = link->next)
      names.push_back(tavro_file_name(static_cast<const char *>(link->data)));
    return names;
  }

  static int reports() { return std::stoi(value("SELECT count(*) FROM TABLE_VOC")); }
  static std::string newest(const std::string &column) {
    return value("SELECT " + column + " FROM TABLE_VOC_EXTENDED ORDER BY VOC_ID DESC LIMIT 1", "", "");
  }

  svc_voc_data *store_draft(const char *log = nullptr) {
    tavro_dbmgr_bug_report_info report{};
    report.submitted = TAVRO_STATUS_DRAFT_SAVED;
    report.title_description = TAVRO_STRDUP("kept");
    report.syslog_file = TAVRO_STRDUP(log);
    const int id = tavro_dbmgr_update_bug_report(&report);
    TAVRO_FREE(report.title_description);
    TAVRO_FREE(report.type);
    TAVRO_FREE(report.syslog_file);
    return tavro_dbmgr_get_voc_by_id(id);
  }
};
