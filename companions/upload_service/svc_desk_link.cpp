#include "svc_desk_link.h"

#include "json_fields.h"
#include "secret.h"
#include "svc_log.h"

namespace {

constexpr size_t kLongestAnswer = 4 * 1024 * 1024;  // bytes
constexpr guint kTimeoutSeconds = 40;               // longer than a call for news is held back

// One exchange under way; owns everything that its steps need.
struct Exchange {
  GObjectPtr<SoupMessage> message;
  GObjectPtr<GInputStream> stream;
  std::unique_ptr<char[]> answer;
  DeskLink::Then then;
};

guint _timeout_seconds() {
  const char *set = g_getenv("TAVRO_SVC_TIMEOUT_S");  // for tests
  const guint64 seconds = set ? g_ascii_strtoull(set, nullptr, 10) : 0;
  return seconds > 0 && seconds < kTimeoutSeconds ? static_cast<guint>(seconds) : kTimeoutSeconds;
}

void _end(std::unique_ptr<Exchange> exchange, const DeskReply &reply) {
  exchange->then(reply);
}

void _fail(std::unique_ptr<Exchange> exchange, GError *error) {
  GErrorPtr owned(error);
  GUri *uri = exchange->message ? soup_message_get_uri(exchange->message.get()) : nullptr;
  SVC_LOGI("no answer of the desk to %s: %s", uri ? g_uri_get_path(uri) : "a call", error->message);
  _end(std::move(exchange), DeskReply{});
}

void _read_cb(GObject *stream, GAsyncResult *result, gpointer data) {
  std::unique_ptr<Exchange> exchange(static_cast<Exchange *>(data));
  GError *error = nullptr;
  gsize size = 0;
  if (!g_input_stream_read_all_finish(G_INPUT_STREAM(stream), result, &size, &error))
    return _fail(std::move(exchange), error);
  DeskReply reply;
  reply.status = static_cast<int>(soup_message_get_status(exchange->message.get()));
  reply.body = size < kLongestAnswer ? parse_json(exchange->answer.get(), size) : nlohmann::json();
  if (!reply.body.is_object()) {
    // Some other server's refusal may be no JSON; a success that is none did not come from the desk.
    if (reply.is_ok()) {
      SVC_LOGE("the desk answered something that is no JSON object");
      reply.status = 0;
    }
    reply.body = nlohmann::json::object();
  }
  _end(std::move(exchange), reply);
}

void _sent_cb(GObject *session, GAsyncResult *result, gpointer data) {
  std::unique_ptr<Exchange> exchange(static_cast<Exchange *>(data));
  GError *error = nullptr;
  exchange->stream.reset(soup_session_send_finish(SOUP_SESSION(session), result, &error));
  if (!exchange->stream) return _fail(std::move(exchange), error);
  exchange->answer.reset(new char[kLongestAnswer]);
  auto *stream = exchange->stream.get();
  auto *answer = exchange->answer.get();
  g_input_stream_read_all_async(stream, answer, kLongestAnswer, G_PRIORITY_DEFAULT, nullptr, _read_cb,
                                exchange.release());
}

// An answer that comes from the main loop, as every other one does.
void _answer_unreachable(DeskLink::Then then) {
  auto answer = +[](gpointer data) -> gboolean {
    std::unique_ptr<DeskLink::Then> owned(static_cast<DeskLink::Then *>(data));
    (*owned)(DeskReply{});
    return G_SOURCE_REMOVE;
  };
  g_idle_add(answer, new DeskLink::Then(std::move(then)));
}

std::string _enrolment_secret() {
  const char *path = g_getenv("TAVRO_DESK_ENROLMENT");
  return path ? read_secret_file(path).value_or("") : std::string();
}

}  // namespace

DeskCall desk_post(std::string path, const nlohmann::json &body) {
  return {"POST", std::move(path), {}, "application/json", json_line(body)};
}

DeskLink::DeskLink(SvcState &state) : state_(state) {
  const char *url = g_getenv("TAVRO_DESK_URL");
  url_ = url ? url : "";
  while (!url_.empty() && url_.back() == '/') url_.pop_back();
  if (url_.empty()) SVC_LOGE("TAVRO_DESK_URL names no desk: reports wait in the store");
  session_.reset(soup_session_new_with_options("timeout", _timeout_seconds(), "user-agent",
                                               "corvane.tavro-svc", "max-conns-per-host", 4, nullptr));
  soup_session_set_proxy_resolver(session_.get(), nullptr);
}

void DeskLink::call(DeskCall call, Then then) {
  if (!state_.token().empty()) return call_registered(call, true, std::move(then));
  register_phone([this, call = std::move(call), then = std::move(then)](bool is_registered) {
    if (is_registered)
      call_registered(call, false, then);
    else
      then(DeskReply{});
  });
}

void DeskLink::call_registered(const DeskCall &call, bool may_register, Then then) {
  const std::string token = state_.token();
  exchange(call, "Bearer " + token, [this, call, token, may_register, then](const DeskReply &reply) {
    if (reply.status != 401 || !may_register) return then(reply);
    // Another call may have registered again meanwhile; its token is kept.
    if (state_.token() == token) state_.forget_token();
    if (!state_.token().empty()) return call_registered(call, false, then);
    register_phone([this, call, then](bool is_registered) {
      if (is_registered)
        call_registered(call, false, then);
      else
        then(DeskReply{});
    });
  });
}

void DeskLink::register_phone(std::function<void(bool)> then) {
  waiting_for_registration_.push_back(std::move(then));
  if (waiting_for_registration_.size() > 1) return;
  exchange(desk_post("/devices", {{"phone", state_.phone()}}), "Enrolment " + _enrolment_secret(),
           [this](const DeskReply &reply) { on_registered(reply); });
}

void DeskLink::on_registered(const DeskReply &reply) {
  const std::string device = text_field(reply.body, "device"), token = text_field(reply.body, "token");
  const bool is_registered =
      reply.is_ok() && !device.empty() && !token.empty() && state_.set_device(device, token);
  if (reply.status != 0 && !is_registered)
    SVC_LOGE("the desk did not register this phone: %d %s", reply.status,
             text_field(reply.body, "error").c_str());
  for (auto &then : std::exchange(waiting_for_registration_, {})) then(is_registered);
}

void DeskLink::exchange(const DeskCall &call, const std::string &authorization, Then then) {
  auto exchange = std::make_unique<Exchange>();
  exchange->then = std::move(then);
  exchange->message.reset(soup_message_new(call.method.c_str(), (url_ + "/api/v1" + call.path).c_str()));
  if (!exchange->message) return _answer_unreachable(std::move(exchange->then));
  SoupMessage *message = exchange->message.get();
  // A redirection would carry the token to another place.
  soup_message_set_flags(message, SOUP_MESSAGE_NO_REDIRECT);
  auto *headers = soup_message_get_request_headers(message);
  soup_message_headers_replace(headers, "Authorization", authorization.c_str());
  for (const auto &[name, value] : call.headers)
    soup_message_headers_replace(headers, name.c_str(), value.c_str());
  if (!call.content_type.empty()) {
    GBytesPtr body(g_bytes_new(call.body.data(), call.body.size()));
    soup_message_set_request_body_from_bytes(message, call.content_type.c_str(), body.get());
  }
  soup_session_send_async(session_.get(), message, G_PRIORITY_DEFAULT, nullptr, _sent_cb, exchange.release());
}
