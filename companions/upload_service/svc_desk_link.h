// Calls to the feedback desk: registration, tokens and one HTTP exchange at a time each, all asynchronous.
//
// A call is answered exactly once, on the main loop. The phone is registered before its first call, and again
// once when the desk does not know its token any more; calls that come meanwhile wait for that.
#pragma once

#include <libsoup/soup.h>

#include <functional>
#include <nlohmann/json.hpp>
#include <string>
#include <utility>
#include <vector>

#include "handles.h"
#include "svc_state.h"

struct DeskCall {
  std::string method;
  std::string path;  // behind "/api/v1"
  std::vector<std::pair<std::string, std::string>> headers;
  std::string content_type;
  std::string body;
};

struct DeskReply {
  int status = 0;       // 0: no whole answer came
  nlohmann::json body;  // an object, or empty

  bool is_ok() const { return status >= 200 && status < 300; }
  // The desk has judged this call: asking again would change nothing.
  bool is_refusal() const {
    return status >= 400 && status < 500 && status != 401 && status != 408 && status != 425 && status != 429;
  }
};

class DeskLink {
 public:
  using Then = std::function<void(const DeskReply &)>;

  explicit DeskLink(SvcState &state);
  DeskLink(const DeskLink &) = delete;
  DeskLink &operator=(const DeskLink &) = delete;

  void call(DeskCall call, Then then);

 private:
  void call_registered(const DeskCall &call, bool may_register, Then then);
  void register_phone(std::function<void(bool)> then);
  void on_registered(const DeskReply &reply);
  void exchange(const DeskCall &call, const std::string &authorization, Then then);

  SvcState &state_;
  std::string url_;  // without a slash at the end
  GObjectPtr<SoupSession> session_;
  std::vector<std::function<void(bool)>> waiting_for_registration_;
};

// A call with a JSON body.
DeskCall desk_post(std::string path, const nlohmann::json &body);
