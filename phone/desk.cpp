#include "desk.h"

#include <arpa/inet.h>
#include <netinet/in.h>
#include <sys/socket.h>

#include "options.h"
#include "sandbox.h"

namespace phone {

namespace {

// Bind and release `port` (0: any); the port, or 0 when it is taken.
int try_port(int port) {
  TavroFd fd(socket(AF_INET, SOCK_STREAM | SOCK_CLOEXEC, 0));
  const int reuse = 1;  // as the desk itself: a port that is only waiting for late packets is free
  setsockopt(fd.get(), SOL_SOCKET, SO_REUSEADDR, &reuse, sizeof reuse);
  sockaddr_in address = {};
  address.sin_family = AF_INET;
  address.sin_port = htons(static_cast<uint16_t>(port));
  address.sin_addr.s_addr = htonl(INADDR_LOOPBACK);
  socklen_t size = sizeof address;
  if (bind(fd.get(), reinterpret_cast<sockaddr *>(&address), size) != 0 || listen(fd.get(), 1) != 0) return 0;
  if (getsockname(fd.get(), reinterpret_cast<sockaddr *>(&address), &size) != 0) return 0;
  return ntohs(address.sin_port);
}

int read_port(const std::string &path) {
  TavroGText text;
  if (!g_file_get_contents(path.c_str(), tavro_out(text), nullptr, nullptr)) return 0;
  const gint64 port = g_ascii_strtoll(text.get(), nullptr, 10);
  return port > 0 && port <= G_MAXUINT16 ? static_cast<int>(port) : 0;
}

}  // namespace

std::optional<int> choose_desk_port(const Folder &folder) {
  const std::string path = folder.desk() + "/port";
  const int last = read_port(path);
  if (last && try_port(last)) return last;
  const int port = try_port(0);
  if (port && write_private_file(path, std::to_string(port) + "\n")) return port;
  say("no free port on the loopback for the desk");
  return std::nullopt;
}

std::vector<std::string> desk_command(const Folder &folder, int port) {
  TavroGText bin(g_path_get_dirname(own_program().c_str()));
  return {std::string(bin.get()) + "/tavro-desk", "--data", folder.desk(), "--port", std::to_string(port)};
}

std::string desk_url(int port) {
  return "http://127.0.0.1:" + std::to_string(port);
}

}  // namespace phone
