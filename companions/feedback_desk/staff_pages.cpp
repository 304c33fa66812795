// Pages for support staff: signing in, the list of reports, one report, and its files.
#include <fcntl.h>
#include <sys/stat.h>

#include "conversation_page.h"
#include "desk.h"
#include "json_fields.h"
#include "page_text.h"
#include "style.h"

namespace {

constexpr int kReportsPerPage = 50;
constexpr int64_t kShownStatusFileBytes = 64 * 1024;
constexpr char kSessionCookie[] = "desk_session=";
constexpr char kCookieScope[] = "; Path=/; HttpOnly; SameSite=Strict";

// Whether a form was sent by a page of this session: it carries the session's secret, and a browser that says
// where the form was names this desk.
bool _is_own_form(const Call &call, const std::map<std::string, std::string> &form) {
  const auto secret = form.find("secret");
  const char *origin = call.header("Origin"), *host = call.header("Host");
  const bool is_own_site = !origin || (host && origin == std::string("http://") + host);
  return is_own_site && secret != form.end() && same_secret(secret->second, call.session->form_secret);
}

void _answer_fault(const Call &call, int status, const char *title, const char *text) {
  answer_html(
      call, status,
      html_page(title, call.session ? call.session->form_secret : "",
                std::string("<section class=\"card empty\"><h1>") + title + "</h1><p class=\"quiet\">" +
                    text + "</p><p><a href=\"/staff\">All reports</a></p></section>"));
}

void _answer_login(const Call &call, int status, const char *error) {
  std::string body = "<form class=\"card login\" method=\"post\" action=\"/staff/login\"><h1>Sign in</h1>";
  if (*error) body += std::string("<p class=\"error\" role=\"alert\">") + error + "</p>";
  body +=
      "<label for=\"token\">Staff token</label>"
      "<input id=\"token\" name=\"token\" type=\"password\" autocomplete=\"current-password\" required "
      "autofocus>"
      "<button class=\"main\">Sign in</button>"
      "<p class=\"quiet\">The desk prints its staff token when it starts.</p></form>";
  answer_html(call, status, html_page("Sign in", "", body));
}

std::string _status_chip(int status) {
  return "<span class=\"status status-" + std::to_string(status) + "\">" + html(status_text(status)) +
         "</span>";
}

// What staff should see first: a report that support closed and its user did not.
std::string _attention_chip(const DeskReport &report) {
  if (report.last_verdict != DESK_VERDICT_STILL_HAPPENS) return _status_chip(report.status);
  return "<span class=\"status status-5\">" + verdict_text(report.last_verdict, report) + "</span>";
}

std::string _kind_text(const DeskReport &report) {
  if (report.follow_up_of) return "Follow-up";
  return report.kind == "idea" ? "Idea" : "Problem";
}

std::string _title_of(const DeskReport &report) {
  return report.title.empty() ? "(no title)" : report.title;
}

std::string _filters(int chosen) {
  std::string body = "<ul class=\"filters\">";
  for (int status = 0; status <= DESK_STATUS_DECLINED; ++status) {
    body += "<li><a href=\"/staff";
    if (status) body += "?status=" + std::to_string(status);
    body += status == chosen ? "\" aria-current=\"page\">" : "\">";
    body += (status ? status_text(status) : "All") + "</a></li>";
  }
  return body + "</ul>";
}

std::string _list_row(const DeskReport &report) {
  return "<li" + std::string(report.is_read ? "" : " class=\"unread\"") + "><a href=\"/staff/reports/" +
         std::to_string(report.id) + "\"><span class=\"dot\"" +
         (report.is_read ? "" : " role=\"img\" aria-label=\"Unread\"") + "></span><span class=\"title\">" +
         html(_title_of(report)) + "</span><span class=\"quiet\">" + _kind_text(report) + " · " +
         html(report.app) + " · " + html_time(report.received_ms) + "</span>" + _attention_chip(report) +
         "</a></li>";
}

std::string _empty_list(int status) {
  if (status)
    return "<section class=\"card empty\"><h2>No report has this status</h2>"
           "<p><a href=\"/staff\">Show all reports</a></p></section>";
  return "<section class=\"card empty\"><h2>No reports yet</h2><p class=\"quiet\">When somebody sends a "
         "problem "
         "or an idea from a phone, it appears here.</p></section>";
}

std::string _answer_form(const DeskReport &report, const std::string &secret) {
  std::string body = "<form class=\"card\" method=\"post\" action=\"/staff/reports/" +
                     std::to_string(report.id) + "/answers\">" + secret_field(secret) +
                     "<label for=\"status\">Status</label><select id=\"status\" name=\"status\">";
  for (int status = DESK_STATUS_SUBMITTED; status <= DESK_STATUS_DECLINED; ++status)
    body += "<option value=\"" + std::to_string(status) + "\"" +
            (status == report.status ? " selected" : "") + ">" + status_text(status) + "</option>";
  return body +
         "</select><label for=\"reply\">Reply</label><textarea id=\"reply\" name=\"reply\" "
         "maxlength=\"5000\" "
         "placeholder=\"What the user should know. May be left empty.\"></textarea>"
         "<button class=\"main\">Send answer</button></form>";
}

void _append_fact(std::string &body, const char *name, const std::string &value) {
  if (!value.empty()) body += std::string("<dt>") + name + "</dt><dd>" + html(value) + "</dd>";
}

std::string _facts(const DeskReport &report) {
  const auto model = parse_json(report.model_json.data(), report.model_json.size());
  std::string body = "<section class=\"card\"><h2>About this report</h2><dl>";
  _append_fact(body, "Application", report.app);
  _append_fact(body, "Severity", report.severity);
  _append_fact(body, "Model", text_field(model, "manufacturer") + " " + text_field(model, "name"));
  _append_fact(body, "Platform", text_field(model, "platform"));
  _append_fact(body, "Build", text_field(model, "build"));
  body += "<dt>Received</dt><dd>" + html_time(report.received_ms) + "</dd>";
  _append_fact(body, "Number", std::to_string(report.id));
  return body + "</dl></section>";
}

std::string _other_files(const Desk &desk, const DeskReport &report,
                         const std::vector<DeskAttachment> &files) {
  std::string list;
  for (const auto &file : files) {
    const std::string type = file_type(desk, report.id, file.number);
    const bool is_in_conversation = file.kind == "attachment" && type != "application/octet-stream";
    if (file.is_complete && !is_in_conversation)
      list += "<li><a href=\"" + file_path(report, file) + "\">" + html(file.name) +
              "</a> <span class=\"quiet\">" + html(size_text(file.size)) + "</span></li>";
  }
  const auto missing = parse_json(report.missing_json.data(), report.missing_json.size());
  for (const auto &name : missing)
    if (name.is_string())
      list += "<li>" + html(name.get<std::string>()) + " <span class=\"quiet\">could not be sent</span></li>";
  if (list.empty()) return list;
  return "<section class=\"card\"><h2>Files</h2><ul class=\"files\">" + list + "</ul></section>";
}

std::string _device_status(const Desk &desk, const DeskReport &report,
                           const std::vector<DeskAttachment> &files) {
  std::string body;
  for (const auto &file : files)
    if (file.kind == "device_status" && file.is_complete)
      body += "<section class=\"card\"><h2>Device status</h2><pre tabindex=\"0\">" +
              html(file_start(desk, report.id, file.number, kShownStatusFileBytes)) + "</pre></section>";
  return body;
}

// A name for "Content-Disposition" in which no byte can end the header or leave a folder.
std::string _download_name(const std::string &name) {
  const size_t slash = name.find_last_of("/\\");
  const std::string base = slash == std::string::npos ? name : name.substr(slash + 1);
  return GCharPtr(g_uri_escape_string(base.c_str(), nullptr, FALSE)).get();
}

}  // namespace

void handle_home(Call &call) {
  answer_redirect(call, "/staff");
}

void handle_style(Call &call) {
  soup_server_message_set_status(call.message, 200, nullptr);
  soup_server_message_set_response(call.message, "text/css; charset=utf-8", SOUP_MEMORY_STATIC, kStyleSheet,
                                   sizeof kStyleSheet - 1);
}

void handle_login_page(Call &call) {
  _answer_login(call, 200, "");
}

void handle_login(Call &call) {
  const auto form = body_form(call);
  const auto token = form.find("token");
  if (token == form.end() || !same_secret(token->second, call.desk.staff_token)) {
    if (!call.desk.wrong_secret_rate.take(call.peer()))
      return _answer_login(call, 429, "Too many wrong tokens. Try again in a minute.");
    return _answer_login(call, 403, "This is not the staff token.");
  }
  call.set_header("Set-Cookie", (kSessionCookie + call.desk.sessions.begin() + kCookieScope).c_str());
  answer_redirect(call, "/staff");
}

void handle_logout(Call &call) {
  if (!_is_own_form(call, body_form(call)))
    return _answer_fault(call, 403, "Not signed out", "The form did not come from this desk.");
  call.desk.sessions.end(*call.session);
  call.set_header("Set-Cookie", (std::string(kSessionCookie) + kCookieScope + "; Max-Age=0").c_str());
  answer_redirect(call, "/staff/login");
}

void handle_list_page(Call &call) {
  const auto status = static_cast<int>(std::min<int64_t>(parse_number(call.query["status"]).value_or(0), 99));
  const int64_t before = parse_number(call.query["before"]).value_or(0);
  const auto reports = call.desk.store.reports(before, status, kReportsPerPage);
  std::string body = "<h1>Reports</h1>" + _filters(status);
  if (reports.empty())
    body += _empty_list(status);
  else {
    body += "<ul class=\"list\">";
    for (const auto &report : reports) body += _list_row(report);
    body += "</ul>";
  }
  if (reports.size() == kReportsPerPage)
    body += "<p><a class=\"back\" href=\"/staff?status=" + std::to_string(status) +
            "&amp;before=" + std::to_string(reports.back().id) + "\">Older reports</a></p>";
  answer_html(call, 200, html_page("Reports", call.session->form_secret, body));
}

void handle_report_page(Call &call) {
  Desk &desk = call.desk;
  const auto report = desk.store.report(call.numbers[0]);
  if (!report || !report->is_complete)
    return _answer_fault(call, 404, "No such report", "It may have another number.");
  desk.store.mark_read(report->id);
  const auto files = desk.store.attachments(report->id);
  const std::string body =
      "<a class=\"back\" href=\"/staff\">‹ All reports</a><div class=\"card heading\"><div><h1>" +
      html(_title_of(*report)) + "</h1><p class=\"quiet\">" + _kind_text(*report) + " · " +
      html(report->app) + "</p>" + first_report_html(desk, *report) + "</div>" +
      _status_chip(report->status) + "</div><div class=\"columns\"><div>" +
      conversation_html(desk, *report, files) + _answer_form(*report, call.session->form_secret) +
      "</div><aside>" + _facts(*report) + _device_status(desk, *report, files) +
      _other_files(desk, *report, files) + "</aside></div>";
  answer_html(call, 200, html_page(_title_of(*report), call.session->form_secret, body));
}

void handle_answer_form(Call &call) {
  auto form = body_form(call);
  if (!_is_own_form(call, form))
    return _answer_fault(call, 403, "Nothing was sent",
                         "The form did not come from this desk. Sign in again.");
  const char *fault =
      give_answer(call.desk, call.numbers[0], parse_number(form["status"]).value_or(0), form["reply"]);
  if (fault) return _answer_fault(call, 422, "Nothing was sent", fault);
  answer_redirect(call, ("/staff/reports/" + std::to_string(call.numbers[0])).c_str());
}

void handle_file(Call &call) {
  const int64_t report = call.numbers[0], number = call.numbers[1];
  const auto file = call.desk.store.attachment(report, number);
  if (!file || !file->is_complete)
    return _answer_fault(call, 404, "No such file", "The report has no such file.");
  // Mapped, not read: a recording may be large.
  GMappedFile *mapped = g_mapped_file_new(call.desk.files.path(report, number).c_str(), FALSE, nullptr);
  if (!mapped) return _answer_fault(call, 404, "No such file", "The file is no longer there.");
  GBytesPtr bytes(g_mapped_file_get_bytes(mapped));
  g_mapped_file_unref(mapped);
  const std::string type =
      content_type_of(g_bytes_get_data(bytes.get(), nullptr), g_bytes_get_size(bytes.get()));
  const bool is_shown = type != "application/octet-stream";
  call.set_header("Content-Type", type.c_str());
  call.set_header("Content-Disposition", ((is_shown ? "inline" : "attachment") +
                                          std::string("; filename*=UTF-8''") + _download_name(file->name))
                                             .c_str());
  soup_server_message_set_status(call.message, 200, nullptr);
  soup_message_body_append_bytes(soup_server_message_get_response_body(call.message), bytes.get());
}
