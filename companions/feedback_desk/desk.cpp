#include "desk.h"

#include <exception>

#include "json_fields.h"
#include "secret.h"

namespace {

constexpr char kCallKey[] = "tavro-call";
constexpr size_t kJsonLimit = 8 * 1024 * 1024;  // a text of 1,000,000 bytes, every one of them escaped
constexpr size_t kSmallLimit = 64 * 1024;
constexpr size_t kFormLimit = 256 * 1024;
constexpr size_t kFileLimit = 64 * 1024 * 1024;

const Route kRoutes[] = {
    {"POST", "/api/v1/devices", Access::kEnrolment, kSmallLimit, handle_register},
    {"POST", "/api/v1/reports", Access::kDevice, kJsonLimit, handle_add_report},
    {"GET", "/api/v1/reports/*/attachments/*", Access::kDevice, 0, handle_attachment_state},
    {"PUT", "/api/v1/reports/*/attachments/*", Access::kDevice, kFileLimit, handle_attachment,
     begin_attachment},
    {"POST", "/api/v1/reports/*/complete", Access::kDevice, kSmallLimit, handle_complete},
    {"GET", "/api/v1/updates", Access::kDevice, 0, handle_updates},
    {"GET", "/api/v1/staff/reports", Access::kStaff, 0, handle_staff_reports},
    {"GET", "/api/v1/staff/reports/*", Access::kStaff, 0, handle_staff_report},
    {"POST", "/api/v1/staff/reports/*/answers", Access::kStaff, kFormLimit, handle_staff_answer},
    {"GET", "/", Access::kOpen, 0, handle_home},
    {"GET", "/staff/style.css", Access::kOpen, 0, handle_style},
    {"GET", "/staff/login", Access::kOpen, 0, handle_login_page},
    {"POST", "/staff/login", Access::kOpen, kSmallLimit, handle_login},
    {"POST", "/staff/logout", Access::kSession, kSmallLimit, handle_logout},
    {"GET", "/staff", Access::kSession, 0, handle_list_page},
    {"GET", "/staff/reports/*", Access::kSession, 0, handle_report_page},
    {"POST", "/staff/reports/*/answers", Access::kSession, kFormLimit, handle_answer_form},
    {"GET", "/staff/reports/*/files/*", Access::kSession, 0, handle_file},
};

// Compares part by part; a "*" takes one number.
bool _path_matches(const char *pattern, const char *path, std::vector<int64_t> &numbers) {
  numbers.clear();
  while (*pattern) {
    if (*pattern != '*') {
      if (*pattern++ != *path++) return false;
      continue;
    }
    const size_t digits = strspn(path, "0123456789");
    const auto number = parse_number(std::string(path, digits));
    if (!number) return false;
    numbers.push_back(*number);
    path += digits;
    ++pattern;
  }
  return !*path;
}

// Finds the call's route, or refuses.
bool _find_route(Call &call, const char *path) {
  const char *method = soup_server_message_get_method(call.message);
  bool is_path_known = false;
  for (const Route &route : kRoutes) {
    if (!_path_matches(route.pattern, path, call.numbers)) continue;
    is_path_known = true;
    if (strcmp(route.method, method) != 0) continue;
    call.route = &route;
    return true;
  }
  refuse(call, is_path_known ? 405 : 404, is_path_known ? "this method is not known here" : "no such page");
  return false;
}

// The secret behind "Authorization: <scheme> ", or nothing.
std::string _authorization(const Call &call, const char *scheme) {
  const char *header = call.header("Authorization");
  const size_t length = strlen(scheme);
  if (!header || g_ascii_strncasecmp(header, scheme, length) != 0 || header[length] != ' ') return {};
  return header + length + 1;
}

// Only wrong secrets count, and the right one always gets in: nobody can lock others out by guessing. A
// secret has 256 random bits, so what the limit does not stop is hopeless.
bool _has_secret(const Call &call, const char *scheme, const std::string &secret, int status,
                 const char *reason) {
  if (same_secret(_authorization(call, scheme), secret)) return true;
  const bool may_be_wrong = call.desk.wrong_secret_rate.take(call.peer());
  refuse(call, may_be_wrong ? status : 429,
         may_be_wrong ? reason : "too many wrong secrets, try again later");
  return false;
}

bool _is_enrolled(Call &call) {
  if (!_has_secret(call, "Enrolment", call.desk.enrolment_secret, 403, "the enrolment secret is wrong"))
    return false;
  if (call.desk.enrolment_rate.take("")) return true;
  refuse(call, 429, "too many registrations, try again later");
  return false;
}

bool _is_device(Call &call) {
  const std::string token = _authorization(call, "Bearer");
  const auto device = token.empty() ? std::nullopt : call.desk.store.device_of_token(sha256_of(token));
  if (!device) {
    refuse(call, 401, "the device token is not known");
    return false;
  }
  call.device = *device;
  if (call.desk.device_rate.take(call.device)) return true;
  refuse(call, 429, "too many calls, try again later");
  return false;
}

bool _is_staff(Call &call) {
  return _has_secret(call, "Bearer", call.desk.staff_token, 401, "the staff token is wrong");
}

std::string _session_cookie(const Call &call) {
  const char *header = call.header("Cookie");
  const std::string cookies = header ? header : "";
  const std::string name = "desk_session=";
  for (size_t at = 0; at < cookies.size();) {
    const size_t end = std::min(cookies.find(';', at), cookies.size());
    const size_t begin = cookies.find_first_not_of(' ', at);
    if (begin < end && cookies.compare(begin, name.size(), name) == 0)
      return cookies.substr(begin + name.size(), end - begin - name.size());
    at = end + 1;
  }
  return {};
}

bool _is_signed_in(Call &call) {
  call.session = call.desk.sessions.find(_session_cookie(call));
  if (call.session) return true;
  answer_redirect(call, "/staff/login");
  return false;
}

bool _may_call(Call &call) {
  switch (call.route->access) {
    case Access::kEnrolment:
      return _is_enrolled(call);
    case Access::kDevice:
      return _is_device(call);
    case Access::kStaff:
      return _is_staff(call);
    case Access::kSession:
      return _is_signed_in(call);
    case Access::kOpen:
      break;
  }
  return true;
}

// A body must say how long it is before it comes.
bool _body_fits(const Call &call) {
  SoupMessageHeaders *headers = soup_server_message_get_request_headers(call.message);
  const auto encoding = soup_message_headers_get_encoding(headers);
  const bool is_sized = encoding == SOUP_ENCODING_CONTENT_LENGTH || encoding == SOUP_ENCODING_NONE;
  if (!is_sized || (call.route->body_limit > 0 && encoding == SOUP_ENCODING_NONE))
    refuse(call, 411, "a Content-Length is needed");
  else if (soup_message_headers_get_content_length(headers) > static_cast<goffset>(call.route->body_limit))
    refuse(call, 413, "the body is too large");
  else
    return true;
  return false;
}

void _read_query(Call &call, GHashTable *query) {
  GHashTableIter iter;
  gpointer name = nullptr, value = nullptr;
  if (!query) return;
  g_hash_table_iter_init(&iter, query);
  while (g_hash_table_iter_next(&iter, &name, &value))
    call.query[static_cast<char *>(name)] = value ? static_cast<char *>(value) : "";
}

// Every answer forbids what no page of the desk needs.
void _set_safety_headers(const Call &call) {
  call.set_header("Content-Security-Policy",
                  "default-src 'none'; style-src 'self'; img-src 'self'; media-src 'self'; "
                  "form-action 'self'; base-uri 'none'; frame-ancestors 'none'");
  call.set_header("X-Content-Type-Options", "nosniff");
  call.set_header("Referrer-Policy", "same-origin");
  call.set_header("Cache-Control", "no-store");
}

void _begin(Call &call, const char *path, GHashTable *query) {
  auto *body = soup_server_message_get_request_body(call.message);
  soup_message_body_set_accumulate(body, FALSE);
  _set_safety_headers(call);
  _read_query(call, query);
  if (!_find_route(call, path) || !_may_call(call) || !_body_fits(call)) return;
  if (call.route->begin)
    call.route->begin(call);
  else
    soup_message_body_set_accumulate(body, TRUE);
}

// Runs a step of a call; what it throws (no memory) becomes an answer and goes no further.
template <class Step>
void _run(Call &call, Step step) {
  try {
    step();
  } catch (const std::exception &fault) {
    g_warning("a call failed: %s", fault.what());
    soup_server_message_set_status(call.message, 500, nullptr);
  }
}

void _headers_cb(SoupServer *, SoupServerMessage *message, const char *path, GHashTable *query,
                 gpointer data) {
  auto *call = new Call{*static_cast<Desk *>(data), message};
  g_object_set_data_full(G_OBJECT(message), kCallKey, call,
                         [](gpointer memory) { delete static_cast<Call *>(memory); });
  _run(*call, [&] { _begin(*call, path, query); });
}

void _body_cb(SoupServer *, SoupServerMessage *message, const char *, GHashTable *, gpointer) {
  auto *call = static_cast<Call *>(g_object_get_data(G_OBJECT(message), kCallKey));
  if (!call || !call->route || soup_server_message_get_status(message) != 0) return;
  if (call->route->access == Access::kSession && !_is_signed_in(*call)) return;  // ended meanwhile
  _run(*call, [&] { call->route->handle(*call); });
}

}  // namespace

void desk_serve(SoupServer *server, Desk &desk) {
  soup_server_add_early_handler(server, nullptr, _headers_cb, &desk, nullptr);
  soup_server_add_handler(server, nullptr, _body_cb, &desk, nullptr);
}

void answer_json(const Call &call, int status, const nlohmann::json &body) {
  const std::string line = json_line(body) + "\n";
  soup_server_message_set_status(call.message, static_cast<guint>(status), nullptr);
  soup_server_message_set_response(call.message, "application/json", SOUP_MEMORY_COPY, line.data(),
                                   line.size());
}

void answer_html(const Call &call, int status, const std::string &page) {
  soup_server_message_set_status(call.message, static_cast<guint>(status), nullptr);
  soup_server_message_set_response(call.message, "text/html; charset=utf-8", SOUP_MEMORY_COPY, page.data(),
                                   page.size());
}

void answer_redirect(const Call &call, const char *path) {
  soup_server_message_set_status(call.message, 303, nullptr);
  call.set_header("Location", path);
}

void refuse(const Call &call, int status, const char *reason) {
  answer_json(call, status, {{"error", reason}});
}

nlohmann::json body_object(const Call &call) {
  SoupMessageBody *body = soup_server_message_get_request_body(call.message);
  GBytesPtr flat(soup_message_body_flatten(body));
  gsize size = 0;
  auto *data = static_cast<const char *>(g_bytes_get_data(flat.get(), &size));
  nlohmann::json parsed = data ? parse_json(data, size) : nlohmann::json(nlohmann::json::value_t::discarded);
  if (parsed.is_object()) return parsed;
  refuse(call, 400, "the body is not a JSON object");
  return nlohmann::json(nlohmann::json::value_t::discarded);
}

std::map<std::string, std::string> body_form(const Call &call) {
  GBytesPtr flat(soup_message_body_flatten(soup_server_message_get_request_body(call.message)));
  gsize size = 0;
  auto *data = static_cast<const char *>(g_bytes_get_data(flat.get(), &size));
  GHashTablePtr decoded(soup_form_decode(std::string(data ? data : "", size).c_str()));
  std::map<std::string, std::string> form;
  GHashTableIter iter;
  gpointer name = nullptr, value = nullptr;
  g_hash_table_iter_init(&iter, decoded.get());
  while (g_hash_table_iter_next(&iter, &name, &value))
    form[static_cast<char *>(name)] = value ? static_cast<char *>(value) : "";
  return form;
}

std::optional<int64_t> parse_number(const std::string &text) {
  if (text.empty() || text.size() > 18 || text.find_first_not_of("0123456789") != std::string::npos)
    return std::nullopt;
  return g_ascii_strtoll(text.c_str(), nullptr, 10);
}
