#include "svc_report.h"

#include <system_info.h>

#include <cstring>

#include "handles.h"
#include "tavro_memory.h"
#include "tavro_type.h"

namespace {

std::string _text(const char *text) {
  return text ? text : "";
}

// The client stores fixed categories as string ids, which it shows in the phone's language. Support staff
// read them in the desk's.
std::string _target_name(const char *stored) {
  static const char *const kCategories[][2] = {{"IDS_OB_MBODY_BATTERY", "Battery"},
                                               {"IDS_OB_MBODY_NETWORK", "Network"},
                                               {"IDS_OB_SOFTWARE_UPDATE", "Software update"},
                                               {"IDS_OB_BODY_SOMETHING_ELSE", "Something else"}};
  const std::string name = _text(stored);
  for (const auto &category : kCategories)
    if (name == category[0]) return category[1];
  return name;
}

std::string _fact(const char *key) {
  char *value = nullptr;
  if (system_info_get_platform_string(key, &value) != SYSTEM_INFO_ERROR_NONE || !value) return {};
  std::string fact = value;
  free(value);
  return fact;
}

nlohmann::json _model() {
  return {{"name", _fact(SYSTEM_INFO_KEY_MODEL_NAME)},
          {"platform", _fact(SYSTEM_INFO_KEY_PLATFORM_NAME) + " " + _fact(SYSTEM_INFO_KEY_PLATFORM_VERSION)},
          {"build", _fact(SYSTEM_INFO_KEY_BUILD_STRING)}};
}

std::string _key_of(const svc_voc_data &voc, const std::string &phone) {
  return phone + ":" + std::to_string(voc.id) + ":" + _text(voc.date_of_creation);
}

// Every place of the report counts, also one whose file is gone, so that numbers never shift. What support
// needs most comes first: when there are more files than the desk takes, the last attachments stay behind.
std::vector<SvcFile> _files_of(const svc_voc_data &voc) {
  std::vector<SvcFile> files;
  auto add = [&files](const char *path, const char *kind) {
    if (path && *path) files.push_back({static_cast<int>(files.size()) + 1, path, kind});
  };
  const TavroText device_status(tavro_dbmgr_get_device_data_file_by_id(voc.id));
  add(device_status.get(), "device_status");
  add(voc.syslog_file, "system_log");
  add(voc.dump_file, "crash_dump");
  for (GSList *item = voc.attachments; item; item = item->next)
    add(static_cast<tavro_dbmgr_attachment_info *>(item->data)->file_path, "attachment");
  return files;
}

// The desk judges whether the first report is one of this phone's, and what the verdict says. False: the
// store does not tell now.
bool _add_follow_up(nlohmann::json &body, int voc_id) {
  char *stored = nullptr;
  const int first = tavro_dbmgr_get_follow_up(voc_id, &stored);
  const TavroText verdict(stored);
  if (first < 1) return first == 0;
  body["follow_up_of"] = first;
  body["verdict"] = _text(verdict.get());
  return true;
}

}  // namespace

bool svc_is_complete(int voc_id) {
  return TavroText(tavro_dbmgr_get_voc_title_description_by_id(voc_id)) != nullptr;
}

std::optional<SvcReport> svc_read_report(int voc_id, const std::string &phone) {
  const SvcVoc voc(tavro_dbmgr_get_voc_by_id(voc_id));
  if (!voc) return std::nullopt;
  SvcReport report;
  report.voc_id = voc_id;
  report.key = _key_of(*voc, phone);
  report.files = _files_of(*voc);
  const bool is_idea = _text(voc->type) == TAVRO_DBMGR_SUGGESTION;
  report.body = {{"kind", is_idea ? "idea" : "problem"},
                 {"title", _text(voc->title_description)},
                 {"text", _text(voc->description)},
                 {"app", _target_name(voc->app_name)},
                 {"severity", _text(voc->severity)},
                 {"user", _text(voc->user_name)},
                 {"created", g_ascii_strtoll(_text(voc->date_of_creation).c_str(), nullptr, 10)},
                 {"model", _model()}};
  report.is_whole = _add_follow_up(report.body, voc_id);
  return report;
}

int svc_voc_id_of_key(const std::string &key, const std::string &phone) {
  if (key.compare(0, phone.size() + 1, phone + ":") != 0) return 0;
  const size_t end = key.find(':', phone.size() + 1);
  if (end == std::string::npos) return 0;
  const int voc_id = svc_parse_voc_id(key.substr(phone.size() + 1, end - phone.size() - 1).c_str());
  const SvcVoc voc(voc_id ? tavro_dbmgr_get_voc_by_id(voc_id) : nullptr);
  return voc && _key_of(*voc, phone) == key ? voc_id : 0;
}

int svc_last_status(const svc_voc_data &voc) {
  const std::string statuses = _text(voc.submitted);
  const size_t start = statuses.rfind('#') == std::string::npos ? 0 : statuses.rfind('#') + 1;
  return start < statuses.size() ? static_cast<int>(strtol(statuses.c_str() + start, nullptr, 10)) : -1;
}

int svc_status_count(const svc_voc_data &voc) {
  if (!voc.submitted || !*voc.submitted) return 0;
  int count = 1;
  for (const char *at = voc.submitted; *at; ++at) count += *at == '#';
  return count;
}

int svc_parse_voc_id(const char *text) {
  const size_t length = text ? strlen(text) : 0;
  if (length == 0 || length > 10 || strspn(text, "0123456789") != length) return 0;
  const gint64 id = g_ascii_strtoll(text, nullptr, 10);
  return id <= G_MAXINT ? static_cast<int>(id) : 0;
}

std::string svc_base_name(const std::string &path) {
  return GCharPtr(g_path_get_basename(path.c_str())).get();
}
