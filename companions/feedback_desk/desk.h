// The running desk: its store, files, sessions and limits, and one HTTP call on its way through them.
//
// A call is matched against the table of routes when its headers are there: rights, rates and sizes are
// checked before a byte of the body is read. Its handler runs when the body is whole. Everything happens on
// the main loop; no exception leaves a handler.
#pragma once

#include <libsoup/soup.h>

#include <map>
#include <memory>
#include <nlohmann/json.hpp>
#include <string>
#include <vector>

#include "desk_files.h"
#include "desk_limits.h"
#include "desk_store.h"
#include "staff_sessions.h"
#include "update_waiters.h"

struct Desk {
  DeskStore store;
  DeskFiles files;
  StaffSessions sessions;
  UpdateWaiters waiters;
  RateLimit device_rate{20.0, 400.0};      // calls per second, burst; per device
  RateLimit enrolment_rate{5.0, 50.0};     // registrations with the right secret, together
  RateLimit wrong_secret_rate{0.2, 10.0};  // wrong staff tokens and enrolment secrets; per peer
  std::map<std::string, std::shared_ptr<bool>> arriving;  // files being received; false when taken over
  std::string staff_token;
  std::string enrolment_secret;
};

struct Call;

// Who may make a call. Session pages send the browser to the sign-in page instead of refusing.
enum class Access { kOpen, kEnrolment, kDevice, kStaff, kSession };

struct Route {
  const char *method;
  const char *pattern;  // "*" stands for one number
  Access access;
  size_t body_limit;  // bytes
  void (*handle)(Call &call);
  void (*begin)(Call &call) = nullptr;  // for bodies that are taken as they arrive
};

struct Call {
  Desk &desk;
  SoupServerMessage *message;
  const Route *route = nullptr;
  std::vector<int64_t> numbers{};  // what the "*" of the pattern stood for
  std::map<std::string, std::string> query{};
  std::string device{};             // Access::kDevice: who calls
  StaffSession *session = nullptr;  // Access::kSession

  const char *header(const char *name) const {
    return soup_message_headers_get_one(soup_server_message_get_request_headers(message), name);
  }
  // The address that the call came from.
  std::string peer() const {
    const char *host = soup_server_message_get_remote_host(message);
    return host ? host : "";
  }
  void set_header(const char *name, const char *value) const {
    soup_message_headers_replace(soup_server_message_get_response_headers(message), name, value);
  }
};

// Takes every call of the server. The desk must outlive it.
void desk_serve(SoupServer *server, Desk &desk);

// Answers. A refusal is one line of JSON: {"error": reason}.
void answer_json(const Call &call, int status, const nlohmann::json &body);
void answer_html(const Call &call, int status, const std::string &page);
void answer_redirect(const Call &call, const char *path);
void refuse(const Call &call, int status, const char *reason);

// The call's body as JSON; refuses (and returns a discarded value) when it is not an object.
nlohmann::json body_object(const Call &call);
// The call's body as the fields of a form.
std::map<std::string, std::string> body_form(const Call &call);

// A decimal number of 1 to 18 digits.
std::optional<int64_t> parse_number(const std::string &text);

// Handlers, by the file that has them.
void handle_register(Call &call);  // device_api.cpp
void handle_add_report(Call &call);
void handle_complete(Call &call);
void handle_updates(Call &call);
void handle_attachment_state(Call &call);  // attachment_api.cpp
void begin_attachment(Call &call);
void handle_attachment(Call &call);
void handle_staff_reports(Call &call);  // staff_api.cpp
void handle_staff_report(Call &call);
void handle_staff_answer(Call &call);
void handle_home(Call &call);  // staff_pages.cpp
void handle_style(Call &call);
void handle_login_page(Call &call);
void handle_login(Call &call);
void handle_logout(Call &call);
void handle_list_page(Call &call);
void handle_report_page(Call &call);
void handle_answer_form(Call &call);
void handle_file(Call &call);

// One answer of a staff member, from the page or the interface; wakes the device's waiting call. The reason
// when it is refused, else null.
const char *give_answer(Desk &desk, int64_t report, int64_t status, const std::string &reply);
