// The inside of a launch request, shared by the sources that build, send, receive and answer one.
#pragma once

#include <app_control.h>
#include <gio/gio.h>

#include <memory>
#include <optional>
#include <string>
#include <utility>
#include <vector>

namespace platform {

// The call on the bus that a received request came with. Clones share it; it is answered once, at the latest
// when the last of them goes.
class PendingAnswer {
 public:
  explicit PendingAnswer(GDBusMethodInvocation *invocation) : invocation_(invocation) {}
  PendingAnswer(const PendingAnswer &) = delete;
  PendingAnswer &operator=(const PendingAnswer &) = delete;
  ~PendingAnswer();

  // False when it is answered already.
  bool answer(app_control_result_e result, GVariant *extra_data);
  // Null once answered.
  const char *caller() const {
    return invocation_ ? g_dbus_method_invocation_get_sender(invocation_) : nullptr;
  }

 private:
  GDBusMethodInvocation *invocation_;  // null once answered
};

using ExtraData = std::vector<std::pair<std::string, std::string>>;

GVariant *extra_data_to_variant(const ExtraData &extra_data);
ExtraData extra_data_from_variant(GVariant *pairs);

}  // namespace platform

struct app_control_s {
  std::optional<std::string> operation, uri, mime, app_id;
  platform::ExtraData extra_data;
  std::shared_ptr<platform::PendingAnswer> pending;  // null: not a received request
};

namespace platform {

constexpr const char *kLaunchInterface = "org.tavro.AppControl1";
constexpr const char *kLaunchMethod = "Launch";
constexpr const char *kLaunchArguments = "(sssa(ss))";
constexpr const char *kLaunchReply = "(ia(ss))";

// The object path of an application; `app_id` must be a valid bus name.
std::string launch_path(const std::string &app_id);
// The arguments of Launch, floating.
GVariant *launch_arguments(const app_control_s &request);
// The request that arguments of the type kLaunchArguments describe.
app_control_s launch_request(GVariant *arguments, GDBusMethodInvocation *invocation);

// Whether a main loop of the platform runs, which sees to it that requests leave before the process ends. In
// other programs each request has left when sending it returns.
void set_loop_flushes(bool flushes);

}  // namespace platform
