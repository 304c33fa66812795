// How commands reach the phone that runs: a socket in the phone's socket folder, one request a connection,
// for processes of the same user only. Requests are single packets:
//
//   "stop"                                          the phone ends; no answer
//   "status"                                        answered by lines "NAME STATE"
//   "exec" NUL folder NUL argument NUL argument …   with three descriptors: runs inside the phone; answered
//   by
//                                                   "exit N" when it has ended
//   "signal N"                                      after "exec", on the same connection: for the command
#pragma once

#include <functional>
#include <map>
#include <memory>
#include <string>
#include <vector>

#include "environment.h"

namespace phone {

constexpr size_t kLargestRequest = 128 * 1024;

struct ControlActions {
  std::function<void()> stop;
  std::function<std::string()> status;
};

// The phone's end. Main loop only.
class ControlServer {
 public:
  // Null with a message when the socket cannot be made.
  // Commands run in `environment` as it is when they start; it must outlive the server.
  static std::unique_ptr<ControlServer> create(const std::string &path, ControlActions actions,
                                               const Environment &environment);
  ~ControlServer();

 private:
  struct Session;
  ControlServer(ControlActions actions, const Environment &environment);
  static gboolean accept_cb(gint fd, GIOCondition, gpointer self);
  static gboolean request_cb(gint fd, GIOCondition, gpointer session);
  static void ended_cb(GPid pid, gint status, gpointer session);
  void execute(Session *session, const std::string &request, const int (&descriptors)[3]);
  void close(Session *session);

  ControlActions actions_;
  const Environment &environment_;
  TavroFd listener_;
  guint listener_source_ = 0;
  std::map<Session *, std::unique_ptr<Session>> sessions_;
};

// The command's end. Each returns false when no phone answers.
bool request_stop(const std::string &path);
bool request_status(const std::string &path, std::string *answer);

// Run a command inside the phone, with these descriptors as its standard ones; signals that end this process
// are handed on. The command's exit status, 128 and its number for a signal, or -1 with a message.
int execute_in_phone(const std::string &path, const std::vector<std::string> &command, int input, int output,
                     int error);

}  // namespace phone
