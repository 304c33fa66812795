#include <glib-unix.h>
#include <signal.h>
#include <sys/socket.h>
#include <sys/un.h>
#include <sys/wait.h>

#include <algorithm>
#include <cerrno>
#include <cstring>
#include <iterator>

#include "control.h"
#include "options.h"
#include "program.h"
#include "sandbox.h"

namespace phone {

struct ControlServer::Session {
  ControlServer *server;
  TavroFd fd;
  guint request_source = 0;
  guint ended_source = 0;
  GPid pid = 0;
};

namespace {

bool is_same_user(int fd) {
  ucred peer = {};
  socklen_t size = sizeof peer;
  return getsockopt(fd, SOL_SOCKET, SO_PEERCRED, &peer, &size) == 0 && peer.uid == geteuid();
}

// Takes over the descriptors of one part of a packet: the free places are filled, the surplus is closed.
void take_descriptors(const cmsghdr *part, int (&descriptors)[3]) {
  const size_t count = (part->cmsg_len - CMSG_LEN(0)) / sizeof(int);
  for (size_t i = 0; i < count; ++i) {
    int fd = -1;
    std::memcpy(&fd, CMSG_DATA(part) + i * sizeof fd, sizeof fd);
    int *const place = std::find(std::begin(descriptors), std::end(descriptors), -1);
    if (place != std::end(descriptors))
      *place = fd;
    else
      close(fd);
  }
}

// One packet and the descriptors that came with it; unused places stay -1. False at the end of the
// connection.
bool receive(int fd, std::string *packet, int (&descriptors)[3]) {
  packet->resize(kLargestRequest);
  iovec part = {packet->data(), packet->size()};
  // Its padding has room for one descriptor more than was asked for.
  alignas(cmsghdr) char control[CMSG_SPACE(sizeof descriptors)];
  msghdr message = {};
  message.msg_iov = &part;
  message.msg_iovlen = 1;
  message.msg_control = control;
  message.msg_controllen = sizeof control;
  const ssize_t size = recvmsg(fd, &message, MSG_CMSG_CLOEXEC | MSG_DONTWAIT);
  if (size < 0) return errno == EAGAIN || errno == EINTR;
  for (cmsghdr *part_of = CMSG_FIRSTHDR(&message); part_of; part_of = CMSG_NXTHDR(&message, part_of)) {
    if (part_of->cmsg_level == SOL_SOCKET && part_of->cmsg_type == SCM_RIGHTS)
      take_descriptors(part_of, descriptors);
  }
  packet->resize(static_cast<size_t>(size));
  return size > 0;
}

std::vector<std::string> split(const std::string &text) {
  std::vector<std::string> words;
  for (size_t start = 0; start <= text.size();) {
    const size_t end = std::min(text.find('\0', start), text.size());
    words.push_back(text.substr(start, end - start));
    start = end + 1;
  }
  return words;
}

void answer(int fd, const std::string &text) {
  // The other side may be gone; then nobody waits for the answer.
  send(fd, text.data(), text.size(), MSG_NOSIGNAL | MSG_DONTWAIT);
}

}  // namespace

std::unique_ptr<ControlServer> ControlServer::create(const std::string &path, ControlActions actions,
                                                     const Environment &environment) {
  std::unique_ptr<ControlServer> server(new ControlServer(std::move(actions), environment));
  sockaddr_un address = {};
  address.sun_family = AF_UNIX;
  g_strlcpy(address.sun_path, path.c_str(), sizeof address.sun_path);
  unlink(path.c_str());
  server->listener_ = TavroFd(socket(AF_UNIX, SOCK_SEQPACKET | SOCK_CLOEXEC | SOCK_NONBLOCK, 0));
  const int fd = server->listener_.get();
  if (bind(fd, reinterpret_cast<sockaddr *>(&address), sizeof address) != 0 || listen(fd, 16) != 0) {
    say("cannot listen at " + path + ": " + g_strerror(errno));
    return nullptr;
  }
  server->listener_source_ = g_unix_fd_add(fd, G_IO_IN, accept_cb, server.get());
  return server;
}

ControlServer::ControlServer(ControlActions actions, const Environment &environment)
    : actions_(std::move(actions)), environment_(environment) {}

ControlServer::~ControlServer() {
  while (!sessions_.empty()) close(sessions_.begin()->first);
  if (listener_source_) g_source_remove(listener_source_);
}

gboolean ControlServer::accept_cb(gint fd, GIOCondition, gpointer self) {
  auto *server = static_cast<ControlServer *>(self);
  TavroFd connection(accept4(fd, nullptr, nullptr, SOCK_CLOEXEC | SOCK_NONBLOCK));
  if (!connection || !is_same_user(connection.get())) return G_SOURCE_CONTINUE;
  auto session = std::make_unique<Session>();
  session->server = server;
  session->fd = std::move(connection);
  session->request_source = g_unix_fd_add(session->fd.get(), static_cast<GIOCondition>(G_IO_IN | G_IO_HUP),
                                          request_cb, session.get());
  Session *key = session.get();
  server->sessions_[key] = std::move(session);
  return G_SOURCE_CONTINUE;
}

gboolean ControlServer::request_cb(gint fd, GIOCondition, gpointer data) {
  auto *session = static_cast<Session *>(data);
  ControlServer *server = session->server;
  std::string request;
  int received[3] = {-1, -1, -1};
  const bool is_open = receive(fd, &request, received);
  const TavroFd owners[3] = {TavroFd(received[0]), TavroFd(received[1]), TavroFd(received[2])};
  if (!is_open) {
    server->close(session);
    return G_SOURCE_CONTINUE;
  }
  if (request == "stop") {
    server->actions_.stop();
  } else if (request == "status") {
    answer(fd, server->actions_.status());
  } else if (request.compare(0, 5, std::string("exec\0", 5)) == 0 && received[2] >= 0 && !session->pid) {
    server->execute(session, request, received);
  } else if (request.compare(0, 7, "signal ") == 0 && session->pid > 0) {
    kill(-session->pid, static_cast<int>(g_ascii_strtoll(request.c_str() + 7, nullptr, 10)));
  }
  return G_SOURCE_CONTINUE;
}

void ControlServer::execute(Session *session, const std::string &request, const int (&descriptors)[3]) {
  std::vector<std::string> words = split(request);
  if (words.size() < 3) {
    answer(session->fd.get(), "error no command");
    return;
  }
  const std::string folder = g_file_test(words[1].c_str(), G_FILE_TEST_IS_DIR) ? words[1] : "/";
  words.erase(words.begin(), words.begin() + 2);
  TavroStrv variables = environment_.to_strv();
  TavroError error;
  const auto flags = static_cast<GSpawnFlags>(G_SPAWN_SEARCH_PATH | G_SPAWN_DO_NOT_REAP_CHILD);
  if (!g_spawn_async_with_fds(folder.c_str(), exec_arguments(words).data(), variables.get(), flags,
                              tie_to_parent, GINT_TO_POINTER(getpid()), &session->pid, descriptors[0],
                              descriptors[1], descriptors[2], tavro_out(error))) {
    session->pid = 0;
    answer(session->fd.get(), std::string("error ") + error->message);
    return;
  }
  session->ended_source = g_child_watch_add(session->pid, ended_cb, session);
}

void ControlServer::ended_cb(GPid, gint status, gpointer data) {
  auto *session = static_cast<Session *>(data);
  session->pid = 0;
  session->ended_source = 0;
  const int code = WIFSIGNALED(status) ? 128 + WTERMSIG(status) : WEXITSTATUS(status);
  answer(session->fd.get(), "exit " + std::to_string(code));
}

// The connection is over; a command that still runs loses the one it ran for.
void ControlServer::close(Session *session) {
  g_source_remove(session->request_source);
  if (session->ended_source) g_source_remove(session->ended_source);
  if (session->pid > 0) {
    kill(-session->pid, SIGHUP);
    // Collected later, so that a command which takes its time to end does not hold up the phone.
    g_child_watch_add(
        session->pid, [](GPid pid, gint, gpointer) { g_spawn_close_pid(pid); }, nullptr);
  }
  sessions_.erase(session);
}

}  // namespace phone
