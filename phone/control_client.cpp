#include <poll.h>
#include <signal.h>
#include <sys/signalfd.h>
#include <sys/socket.h>
#include <sys/un.h>

#include <cerrno>
#include <cstring>
#include <optional>

#include "control.h"
#include "options.h"

namespace phone {

namespace {

TavroFd connect_to(const std::string &path) {
  sockaddr_un address = {};
  address.sun_family = AF_UNIX;
  if (path.empty() ||
      g_strlcpy(address.sun_path, path.c_str(), sizeof address.sun_path) >= sizeof address.sun_path)
    return TavroFd();
  TavroFd fd(socket(AF_UNIX, SOCK_SEQPACKET | SOCK_CLOEXEC, 0));
  if (connect(fd.get(), reinterpret_cast<sockaddr *>(&address), sizeof address) != 0) return TavroFd();
  return fd;
}

bool send_text(int fd, const std::string &text) {
  return send(fd, text.data(), text.size(), MSG_NOSIGNAL) == static_cast<ssize_t>(text.size());
}

// Empty at the end of the connection.
std::string receive_text(int fd) {
  char buffer[4096];
  const ssize_t size = recv(fd, buffer, sizeof buffer, 0);
  return std::string(buffer, size > 0 ? static_cast<size_t>(size) : 0);
}

std::string exec_request(const std::vector<std::string> &command) {
  TavroGText folder(g_get_current_dir());
  std::string request = std::string("exec") + '\0' + folder.get();
  for (const std::string &word : command) request += '\0' + word;
  return request;
}

bool send_with_descriptors(int fd, std::string text, const int (&descriptors)[3]) {
  iovec part = {text.data(), text.size()};
  alignas(cmsghdr) char control[CMSG_SPACE(sizeof descriptors)] = {};
  msghdr message = {};
  message.msg_iov = &part;
  message.msg_iovlen = 1;
  message.msg_control = control;
  message.msg_controllen = sizeof control;
  cmsghdr *header = CMSG_FIRSTHDR(&message);
  header->cmsg_level = SOL_SOCKET;
  header->cmsg_type = SCM_RIGHTS;
  header->cmsg_len = CMSG_LEN(sizeof descriptors);
  std::memcpy(CMSG_DATA(header), descriptors, sizeof descriptors);
  return sendmsg(fd, &message, MSG_NOSIGNAL) == static_cast<ssize_t>(text.size());
}

// A descriptor that tells of the signals which people and programs send to end a command.
TavroFd catch_signals() {
  sigset_t set;
  sigemptyset(&set);
  for (const int number : {SIGINT, SIGTERM, SIGHUP, SIGQUIT}) sigaddset(&set, number);
  sigprocmask(SIG_BLOCK, &set, nullptr);
  return TavroFd(signalfd(-1, &set, SFD_CLOEXEC));
}

// What the phone says at last: the command's status, or -1 with a message.
int read_outcome(int fd) {
  const std::string text = receive_text(fd);
  if (text.compare(0, 5, "exit ") == 0)
    return static_cast<int>(g_ascii_strtoll(text.c_str() + 5, nullptr, 10));
  say(text.compare(0, 6, "error ") == 0 ? text.substr(6) : "the phone ended before the command did");
  return -1;
}

}  // namespace

bool request_stop(const std::string &path) {
  TavroFd fd = connect_to(path);
  return fd && send_text(fd.get(), "stop");
}

bool request_status(const std::string &path, std::string *text) {
  TavroFd fd = connect_to(path);
  if (!fd || !send_text(fd.get(), "status")) return false;
  *text = receive_text(fd.get());
  return !text->empty();
}

int execute_in_phone(const std::string &path, const std::vector<std::string> &command, int input, int output,
                     int error) {
  TavroFd fd = connect_to(path);
  const std::string request = exec_request(command);
  if (request.size() > kLargestRequest) {
    say("the command's arguments are too long");
    return -1;
  }
  if (!fd || !send_with_descriptors(fd.get(), request, {input, output, error})) {
    say("the phone does not answer");
    return -1;
  }
  TavroFd signals = catch_signals();
  pollfd waits[] = {{fd.get(), POLLIN, 0}, {signals.get(), POLLIN, 0}};
  for (;;) {
    if (poll(waits, 2, -1) < 0 && errno != EINTR) return -1;
    signalfd_siginfo info;
    if ((waits[1].revents & POLLIN) && read(signals.get(), &info, sizeof info) == sizeof info)
      send_text(fd.get(), "signal " + std::to_string(info.ssi_signo));
    if (waits[0].revents) return read_outcome(fd.get());
  }
}

}  // namespace phone
