#include "conversation_page.h"

#include <fcntl.h>

#include "page_text.h"

namespace {

// Pictures and recordings, as the user attached them.
std::string _pictures(const Desk &desk, const DeskReport &report, const std::vector<DeskAttachment> &files) {
  std::string body;
  for (const auto &file : files) {
    if (file.kind != "attachment" || !file.is_complete) continue;
    const std::string path = file_path(report, file), type = file_type(desk, report.id, file.number);
    if (type.compare(0, 6, "image/") == 0)
      body += "<a href=\"" + path + "\"><img src=\"" + path + "\" alt=\"" + html(file.name) +
              "\" loading=\"lazy\"></a>";
    else if (type == "video/mp4")
      body += "<video controls preload=\"metadata\" src=\"" + path + "\" title=\"" + html(file.name) +
              "\"></video>";
  }
  return body.empty() ? body : "<div class=\"pictures\">" + body + "</div>";
}

std::string _bubble(const char *side, const std::string &from, const std::string &body) {
  return std::string("<div class=\"bubble ") + side + "\"><span class=\"from\">" + from + "</span>" + body +
         "</div>";
}

std::string _user(const DeskReport &report) {
  return html(report.user.empty() ? "User" : report.user);
}

std::string _answer(const DeskAnswer &answer) {
  return _bubble("ours", "Support · " + html_time(answer.time_ms) + " · " + html(status_text(answer.status)),
                 answer.reply.empty() ? "Status changed without a reply." : html(answer.reply));
}

std::string _link(int64_t report, const std::string &text) {
  return "<a href=\"" + report_path(report) + "\">" + text + "</a>";
}

std::string _follow_up(const DeskReport &report, const DeskReport &first) {
  std::string body = "<strong>" + verdict_text(report.verdict, first) + "</strong>";
  if (!report.text.empty()) body += "\n" + html(report.text);
  return _bubble("theirs", _user(report) + " · " + html_time(report.received_ms),
                 body + "\n" + _link(report.id, "Open the follow-up"));
}

}  // namespace

std::string verdict_text(const std::string &verdict, const DeskReport &first) {
  if (verdict == DESK_VERDICT_WORKS_NOW) return "Works now";
  return first.kind == "idea" ? "Still missing" : "Still happens";
}

std::string report_path(int64_t report) {
  return "/staff/reports/" + std::to_string(report);
}

std::string file_path(const DeskReport &report, const DeskAttachment &file) {
  return report_path(report.id) + "/files/" + std::to_string(file.number);
}

std::string file_start(const Desk &desk, int64_t report, int64_t number, int64_t most_bytes) {
  UniqueFd file(open(desk.files.path(report, number).c_str(), O_RDONLY | O_CLOEXEC));
  std::string start(static_cast<size_t>(most_bytes), '\0');
  const ssize_t got = file ? read(file.get(), start.data(), start.size()) : 0;
  start.resize(got > 0 ? static_cast<size_t>(got) : 0);
  return start;
}

const char *file_type(const Desk &desk, int64_t report, int64_t number) {
  const std::string start = file_start(desk, report, number, 16);
  return content_type_of(start.data(), start.size());
}

std::string first_report_html(Desk &desk, const DeskReport &report) {
  const auto first = report.follow_up_of ? desk.store.report(report.follow_up_of) : std::nullopt;
  if (!first) return {};
  const std::string title = first->title.empty() ? "report " + std::to_string(first->id) : html(first->title);
  return "<p>" + verdict_text(report.verdict, *first) + ": follow-up to " + _link(first->id, title) + "</p>";
}

std::string conversation_html(Desk &desk, const DeskReport &report,
                              const std::vector<DeskAttachment> &files) {
  std::string body = "<section aria-label=\"Conversation\">" +
                     _bubble("theirs", _user(report) + " · " + html_time(report.created_ms),
                             html(report.text) + _pictures(desk, report, files));
  const auto answers = desk.store.answers(report.id);
  auto answer = answers.begin();
  for (const auto &follow_up : desk.store.follow_ups(report.id)) {
    for (; answer != answers.end() && answer->time_ms <= follow_up.received_ms; ++answer)
      body += _answer(*answer);
    body += _follow_up(follow_up, report);
  }
  for (; answer != answers.end(); ++answer) body += _answer(*answer);
  return body + "</section>";
}
