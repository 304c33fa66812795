// What a device calls: registration, reports, news.
#include <algorithm>
#include <array>

#include "desk.h"
#include "json_fields.h"

namespace {

constexpr size_t kLongestTitle = 10000;  // bytes, as all of these
constexpr size_t kLongestText = 1000000;
constexpr size_t kLongestField = 4096;
constexpr size_t kLongestKey = 200;
constexpr size_t kShortestPhone = 16;
constexpr int64_t kMostReportsPerDevice = 10000;
constexpr size_t kMostMissing = 32;
constexpr int kMostEvents = 20;
constexpr int64_t kNoReport = -1;
constexpr int64_t kLongestWaitSeconds = 60;

// Texts about the device that are kept beside a report; everything else in "model" is dropped.
nlohmann::json _model_of(const nlohmann::json &body) {
  nlohmann::json model = nlohmann::json::object();
  const auto sent = body.find("model");
  if (sent == body.end()) return model;
  for (const char *name : {"name", "manufacturer", "platform", "build", "client"}) {
    std::string text = text_field(*sent, name);
    if (!text.empty() && text.size() <= kLongestField) model[name] = std::move(text);
  }
  return model;
}

// What is wrong with a report, or null.
const char *_report_fault(const DeskReport &report) {
  if (report.kind != "problem" && report.kind != "idea") return "kind must be problem or idea";
  if (report.title.size() > kLongestTitle) return "title is too long";
  if (report.text.size() > kLongestText) return "text is too long";
  if (std::max({report.app.size(), report.severity.size(), report.user.size()}) > kLongestField)
    return "app, severity or user is too long";
  return nullptr;
}

DeskReport _report_of(const Call &call, const nlohmann::json &body) {
  DeskReport report;
  report.device = call.device;
  report.kind = text_field(body, "kind");
  report.title = text_field(body, "title");
  report.text = text_field(body, "text");
  report.app = text_field(body, "app");
  report.severity = text_field(body, "severity");
  report.user = text_field(body, "user");
  report.created_ms = number_field(body, "created");
  report.model_json = json_line(_model_of(body));
  // One that names no number is a follow-up all the same, and never a report of its own.
  if (body.contains("follow_up_of")) report.follow_up_of = number_field(body, "follow_up_of", kNoReport);
  if (report.follow_up_of) report.verdict = text_field(body, "verdict");
  return report;
}

// What is wrong with a follow-up, or null; a report that is none has nothing wrong.
const char *_follow_up_fault(DeskStore &store, const DeskReport &report) {
  if (report.follow_up_of == 0) return nullptr;
  if (report.verdict != DESK_VERDICT_STILL_HAPPENS && report.verdict != DESK_VERDICT_WORKS_NOW)
    return "verdict must be still_happens or works_now";
  const auto first = store.report(report.follow_up_of);
  const bool is_own = first && first->device == report.device;
  return is_own ? nullptr : "follow_up_of names no report of this device";
}

// The report of the call's path, when it is the device's own; refuses otherwise.
std::optional<DeskReport> _own_report(Call &call) {
  auto report = call.desk.store.report(call.numbers[0]);
  if (report && report->device == call.device) return report;
  refuse(call, 404, "no such report of this device");
  return std::nullopt;
}

// Whether every file that the device names by its number is whole.
bool _has_arrived(Desk &desk, int64_t report, const nlohmann::json &body) {
  const auto numbers = body.find("attachments");
  if (numbers == body.end()) return true;
  return numbers->is_array() && std::all_of(numbers->begin(), numbers->end(), [&](const auto &number) {
           const auto file = number.is_number_integer()
                                 ? desk.store.attachment(report, number.template get<int64_t>())
                                 : std::nullopt;
           return file && file->is_complete;
         });
}

nlohmann::json _missing_of(const nlohmann::json &body) {
  nlohmann::json names = nlohmann::json::array();
  const auto sent = body.find("missing");
  if (sent == body.end() || !sent->is_array()) return names;
  for (const auto &name : *sent)
    if (name.is_string() && names.size() < kMostMissing)
      names.push_back(name.get_ref<const std::string &>().substr(0, kLongestField));
  return names;
}

// Answers with what is there after `since`; the cursor stays where it is when there is nothing.
void _answer_updates(const Call &call, int64_t since) {
  nlohmann::json events = nlohmann::json::array();
  int64_t cursor = since;
  for (const auto &answer : call.desk.store.answers_for_device(call.device, since, kMostEvents)) {
    cursor = answer.cursor;
    nlohmann::json event = {{"cursor", cursor},  {"type", "status"},        {"report", answer.report},
                            {"key", answer.key}, {"status", answer.status}, {"time", answer.time_ms}};
    if (!answer.reply.empty()) event["reply"] = answer.reply;
    events.push_back(std::move(event));
  }
  answer_json(call, 200, {{"cursor", cursor}, {"events", std::move(events)}});
}

int64_t _query_number(const Call &call, const char *name) {
  const auto found = call.query.find(name);
  return found == call.query.end() ? 0 : parse_number(found->second).value_or(0);
}

}  // namespace

void handle_register(Call &call) {
  const auto body = body_object(call);
  if (body.is_discarded()) return;
  const std::string phone = text_field(body, "phone");
  if (phone.size() < kShortestPhone || phone.size() > kLongestKey)
    return refuse(call, 400, "phone must be a random text of 16 to 200 bytes");
  const std::string token = random_token();
  const auto device = call.desk.store.register_device(phone, sha256_of(token));
  if (!device) return refuse(call, 503, "the desk cannot write its store");
  answer_json(call, 201, {{"device", *device}, {"token", token}});
}

void handle_add_report(Call &call) {
  const char *key = call.header("Idempotency-Key");
  if (!key || !*key || strlen(key) > kLongestKey || !g_utf8_validate(key, -1, nullptr))
    return refuse(call, 400, "an Idempotency-Key of 1 to 200 bytes is needed");
  const auto body = body_object(call);
  if (body.is_discarded()) return;
  const DeskReport sent = _report_of(call, body);
  if (const char *fault = _report_fault(sent)) return refuse(call, 422, fault);
  DeskStore &store = call.desk.store;
  auto id = store.report_of_key(key, call.device);
  if (!id && store.report_count(call.device) >= kMostReportsPerDevice)
    return refuse(call, 403, "this device has sent its 10000 reports");
  if (const char *fault = id ? nullptr : _follow_up_fault(store, sent)) return refuse(call, 422, fault);
  if (!id) id = store.add_report(key, sent);
  const auto stored = id ? store.report(*id) : std::nullopt;
  if (!stored) return refuse(call, 503, "the desk cannot store the report");
  answer_json(call, 201, {{"id", *id}, {"complete", stored->is_complete}, {"status", stored->status}});
}

void handle_complete(Call &call) {
  const auto report = _own_report(call);
  if (!report) return;
  const auto body = body_object(call);
  if (body.is_discarded()) return;
  if (!report->is_complete && !_has_arrived(call.desk, report->id, body))
    return refuse(call, 409, "not all attachments have arrived");
  if (!call.desk.store.complete_report(report->id, json_line(_missing_of(body))))
    return refuse(call, 503, "the desk cannot write its store");
  answer_json(call, 200, {{"id", report->id}, {"status", report->status}});
}

void handle_updates(Call &call) {
  const int64_t since = _query_number(call, "since");
  const int64_t wait = std::min(_query_number(call, "wait"), kLongestWaitSeconds);
  const bool has_news = !call.desk.store.answers_for_device(call.device, since, 1).empty();
  if (has_news || wait == 0) return _answer_updates(call, since);
  Desk &desk = call.desk;
  desk.waiters.wait(call.device, call.message, static_cast<unsigned>(wait),
                    [&desk, device = call.device, since](SoupServerMessage *message) {
                      Call later{desk, message};
                      later.device = device;
                      _answer_updates(later, since);
                    });
}
