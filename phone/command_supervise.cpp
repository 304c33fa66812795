// The command line of the inner half: how the outer half writes it, and how it is read again.
#include <fcntl.h>

#include <string>
#include <utility>
#include <vector>

#include "options.h"
#include "process.h"
#include "supervisor.h"

namespace phone {

std::vector<std::string> supervise_command(const StartOptions &options) {
  std::vector<std::string> command = {
      own_program(), "supervise",
      "--dir",       options.folder.dir,
      "--size",      std::to_string(options.size.width) + "x" + std::to_string(options.size.height)};
  if (!options.desk_url.empty()) command.insert(command.end(), {"--desk", options.desk_url});
  if (options.mode == Mode::kDirect) command.push_back("--direct");
  if (options.is_headless) command.push_back("--headless");
  if (options.is_detached) command.push_back("--detach");
  if (options.is_accessible) command.push_back("--accessible");
  if (!options.has_client) command.push_back("--no-client");
  return command;
}

int command_supervise(int argc, char **argv) {
  StartOptions options;
  std::string size;
  bool is_direct = false;
  bool has_no_client = false;
  CommandLine line("", "Run the inner half of a phone. Used by \"start\".");
  line.text("dir", &options.folder.dir, "The phone's folder", "DIR");
  line.text("desk", &options.desk_url, "Address of the desk", "URL");
  line.text("size", &size, "Size of the virtual display", "WxH");
  line.flag("direct", &is_direct, "Run in place");
  line.flag("headless", &options.is_headless, "Use a virtual display");
  line.flag("detach", &options.is_detached, "Leave the terminal");
  line.flag("accessible", &options.is_accessible, "Publish windows to screen readers");
  line.flag("no-client", &has_no_client, "Do not show the client");
  if (!line.parse(argc, argv) || options.folder.dir.empty() || !parse_size(size, &options.size))
    return kUsage;
  options.mode = is_direct ? Mode::kDirect : Mode::kSandbox;
  options.has_client = !has_no_client;
  for (const int fd : {kLifeLine, kLockHandle, kTerminal}) fcntl(fd, F_SETFD, FD_CLOEXEC);
  say_on(kTerminal);
  return Supervisor(std::move(options)).run();
}

}  // namespace phone
