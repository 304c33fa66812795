#include "tavro_follow_up.h"

#include <algorithm>

#include "tavro-common.h"
#include "tavro_details_text.h"
#include "tavro_drafts.h"
#include "tavro_memory.h"
#include "tavro_report_delete.h"

namespace {

constexpr size_t kTitleBytes = 200;  // of the first report's, in the follow-up's own

std::string _title_of(const svc_voc_data *first, const char *verdict) {
  const bool is_idea = g_strcmp0(first->type, TAVRO_DBMGR_SUGGESTION) == 0;
  const std::string text = tavro_details_verdict(verdict, is_idea);
  std::string name = tavro_details_title(first, kTitleBytes);
  std::replace(name.begin(), name.end(), '\n', ' ');
  return name.empty() ? text : text + ": " + name;
}

}  // namespace

std::vector<tavro_follow_up> tavro_follow_ups_of(const svc_voc_data *first) {
  std::vector<tavro_follow_up> follow_ups;
  const TavroHandle<GSList, g_slist_free> ids(tavro_dbmgr_get_follow_ups(first->server_voc_id));
  for (const GSList *id = ids.get(); id; id = id->next) {
    const int voc_id = GPOINTER_TO_INT(id->data);
    if (voc_id == first->id || tavro_delete_is_waiting(voc_id)) continue;
    char *stored = nullptr;
    if (tavro_dbmgr_get_follow_up(voc_id, &stored) < 1) continue;
    const TavroText verdict(stored);
    TavroVoc voc(tavro_dbmgr_get_voc_by_id(voc_id));
    if (voc) follow_ups.push_back({std::move(voc), verdict ? verdict.get() : ""});
  }
  return follow_ups;
}

TavroVoc tavro_follow_up_first(int voc_id) {
  const int server_id = tavro_dbmgr_get_follow_up(voc_id, nullptr);
  TavroVoc first(server_id > 0 ? tavro_dbmgr_get_voc_by_server_id(server_id) : nullptr);
  if (first && tavro_delete_is_waiting(first->id)) first.reset();
  return first;
}

bool tavro_is_follow_up(int voc_id) {
  return tavro_dbmgr_get_follow_up(voc_id, nullptr) > 0;
}

int tavro_follow_up_send(appdata *ad, const svc_voc_data *first, const char *verdict,
                         const std::string &text) {
  const TavroHandle<tavro_dbmgr_bug_report_info, tavro_dbmgr_free_bug_report_data> report(
      TAVRO_ZALLOC(tavro_dbmgr_bug_report_info));
  report->description = TAVRO_STRDUP(text.c_str());
  report->title_description = TAVRO_STRDUP(_title_of(first, verdict).c_str());
  report->app_name = TAVRO_STRDUP(first->app_name);
  report->app_icon = TAVRO_STRDUP(first->app_icon);
  report->severity = TAVRO_STRDUP(first->severity);
  report->user_name = TAVRO_STRDUP(first->user_name);
  report->follow_up_of = first->server_voc_id;
  report->follow_up_verdict = TAVRO_STRDUP(verdict);
  return tavro_send_report(ad, report.get());
}
