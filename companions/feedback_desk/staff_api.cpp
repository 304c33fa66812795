// Reports and answers for staff programs, as JSON.
#include "desk.h"
#include "json_fields.h"

namespace {

constexpr int kReportsPerCall = 100;
constexpr size_t kLongestReply = 20000;  // bytes

nlohmann::json _summary(const DeskReport &report) {
  return {{"id", report.id},         {"kind", report.kind},    {"title", report.title},
          {"app", report.app},       {"user", report.user},    {"created", report.created_ms},
          {"status", report.status}, {"read", report.is_read}, {"received", report.received_ms},
          {"device", report.device}};
}

nlohmann::json _follow_ups(Desk &desk, int64_t report) {
  nlohmann::json follow_ups = nlohmann::json::array();
  for (const auto &follow_up : desk.store.follow_ups(report))
    follow_ups.push_back({{"id", follow_up.id}, {"verdict", follow_up.verdict}});
  return follow_ups;
}

nlohmann::json _files(Desk &desk, int64_t report) {
  nlohmann::json files = nlohmann::json::array();
  for (const auto &file : desk.store.attachments(report))
    files.push_back({{"number", file.number},
                     {"name", file.name},
                     {"kind", file.kind},
                     {"size", file.size},
                     {"sha256", file.sha256},
                     {"complete", file.is_complete}});
  return files;
}

nlohmann::json _answers(Desk &desk, int64_t report) {
  nlohmann::json answers = nlohmann::json::array();
  for (const auto &answer : desk.store.answers(report))
    answers.push_back({{"status", answer.status}, {"reply", answer.reply}, {"time", answer.time_ms}});
  return answers;
}

}  // namespace

const char *give_answer(Desk &desk, int64_t id, int64_t status, const std::string &reply) {
  if (status < DESK_STATUS_SUBMITTED || status > DESK_STATUS_DECLINED) return "status must be 1 to 5";
  if (reply.size() > kLongestReply || !g_utf8_validate_len(reply.data(), reply.size(), nullptr))
    return "a reply is text of at most 20000 bytes";
  const auto report = desk.store.report(id);
  if (!report || !report->is_complete) return "no such report";
  if (!desk.store.add_answer(id, static_cast<int>(status), reply)) return "the desk cannot write its store";
  desk.waiters.wake(report->device);
  return nullptr;
}

void handle_staff_reports(Call &call) {
  nlohmann::json reports = nlohmann::json::array();
  for (const auto &report : call.desk.store.reports(0, 0, kReportsPerCall))
    reports.push_back(_summary(report));
  answer_json(call, 200, {{"reports", std::move(reports)}});
}

void handle_staff_report(Call &call) {
  const auto report = call.desk.store.report(call.numbers[0]);
  if (!report) return refuse(call, 404, "no such report");
  nlohmann::json body = _summary(*report);
  body["text"] = report->text;
  body["severity"] = report->severity;
  body["complete"] = report->is_complete;
  body["model"] = parse_json(report->model_json.data(), report->model_json.size());
  body["missing"] = parse_json(report->missing_json.data(), report->missing_json.size());
  body["attachments"] = _files(call.desk, report->id);
  body["answers"] = _answers(call.desk, report->id);
  body["follow_ups"] = _follow_ups(call.desk, report->id);
  if (report->follow_up_of) {
    body["follow_up_of"] = report->follow_up_of;
    body["verdict"] = report->verdict;
  }
  answer_json(call, 200, body);
}

void handle_staff_answer(Call &call) {
  const auto body = body_object(call);
  if (body.is_discarded()) return;
  const char *fault =
      give_answer(call.desk, call.numbers[0], number_field(body, "status"), text_field(body, "reply"));
  if (fault) return refuse(call, 422, fault);
  answer_json(call, 201, {{"id", call.numbers[0]}, {"status", number_field(body, "status")}});
}
