#include "page_text.h"

#include "desk_store.h"
#include "handles.h"

namespace {

struct GDateTimeDeleter {
  void operator()(GDateTime *time) const { g_date_time_unref(time); }
};

}  // namespace

std::string html(const std::string &text) {
  GCharPtr valid(g_utf8_make_valid(text.data(), static_cast<gssize>(text.size())));
  std::string escaped;
  for (const char *at = valid.get(); *at; ++at) switch (*at) {
      case '&':
        escaped += "&amp;";
        break;
      case '<':
        escaped += "&lt;";
        break;
      case '>':
        escaped += "&gt;";
        break;
      case '"':
        escaped += "&quot;";
        break;
      case '\'':
        escaped += "&#39;";
        break;
      default:
        escaped += *at;
    }
  return escaped;
}

std::string html_time(int64_t ms) {
  std::unique_ptr<GDateTime, GDateTimeDeleter> time(g_date_time_new_from_unix_local(ms / 1000));
  if (!time) return "unknown time";
  GCharPtr machine(g_date_time_format_iso8601(time.get()));
  GCharPtr person(g_date_time_format(time.get(), "%-d %b %Y, %H:%M"));
  return std::string("<time datetime=\"") + machine.get() + "\">" + html(person.get()) + "</time>";
}

std::string size_text(int64_t bytes) {
  return GCharPtr(g_format_size(static_cast<guint64>(bytes))).get();
}

std::string status_text(int status) {
  switch (status) {
    case DESK_STATUS_SUBMITTED:
      return "Submitted";
    case DESK_STATUS_IN_PROCESS:
      return "In process";
    case DESK_STATUS_SOLVED:
      return "Solved";
    case DESK_STATUS_COMPLETED:
      return "Completed";
    case DESK_STATUS_DECLINED:
      return "Declined";
    default:
      return "Status " + std::to_string(status);
  }
}

std::string secret_field(const std::string &form_secret) {
  return "<input type=\"hidden\" name=\"secret\" value=\"" + html(form_secret) + "\">";
}

std::string html_page(const std::string &title, const std::string &form_secret, const std::string &body) {
  std::string page =
      "<!doctype html><html lang=\"en\"><head><meta charset=\"utf-8\">"
      "<meta name=\"viewport\" content=\"width=device-width, initial-scale=1\"><title>";
  page += html(title) + " · Feedback desk</title><link rel=\"stylesheet\" href=\"/staff/style.css\"></head>";
  page += "<body><header class=\"bar\"><div><a class=\"name\" href=\"/staff\">Feedback desk</a>";
  if (!form_secret.empty())
    page += "<form method=\"post\" action=\"/staff/logout\">" + secret_field(form_secret) +
            "<button>Sign out</button></form>";
  return page + "</div></header><main>" + body + "</main></body></html>\n";
}
