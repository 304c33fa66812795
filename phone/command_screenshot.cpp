#include <fcntl.h>
#include <sys/mman.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>

#include "commands.h"
#include "control.h"
#include "message_bus.h"
#include "options.h"

namespace phone {

namespace {

// The number of the first window that the client's class names in xwininfo's tree, else "root".
std::string client_window(const std::string &tree) {
  TavroStrv lines(g_strsplit(tree.c_str(), "\n", -1));
  for (char **line = lines.get(); *line; ++line) {
    const std::string text = g_strstrip(*line);
    if (text.compare(0, 2, "0x") == 0 && text.find(std::string("(\"") + kClientId) != std::string::npos)
      return text.substr(0, text.find(' '));
  }
  return "root";
}

// A virtual display shows nothing but the phone; of a desktop only the client's window is taken.
std::string window_to_take(const State &state) {
  const auto is_virtual = state.find("virtual_display");
  if (is_virtual != state.end() && is_virtual->second == "1") return "root";
  TavroFd output(memfd_create("tree", MFD_CLOEXEC));
  if (execute_in_phone(state.at("control"), {"xwininfo", "-root", "-tree"}, STDIN_FILENO, output.get(),
                       STDERR_FILENO) != 0)
    return "root";
  std::string tree(static_cast<size_t>(lseek(output.get(), 0, SEEK_END)), '\0');
  const ssize_t size = pread(output.get(), tree.data(), tree.size(), 0);
  return client_window(tree.substr(0, size > 0 ? static_cast<size_t>(size) : 0));
}

}  // namespace

int command_screenshot(int argc, char **argv) {
  std::string dir;
  CommandLine line("FILE.png", "Take a picture of the phone's display.");
  line.text("dir", &dir, kDirHelp, "DIR");
  if (!line.parse(argc, argv)) return kUsage;
  if (line.arguments.size() != 1) return misuse("one file name is needed");
  State state;
  if (!find_running_phone(dir, &state)) return kFailed;
  const std::string path = line.arguments[0];
  std::string unfinished_path = path + ".XXXXXX";
  TavroFd file(mkostemp(unfinished_path.data(), O_CLOEXEC));
  if (!file) return fail("cannot write " + path + ": " + g_strerror(errno));
  TavroUnfinishedFile unfinished(unfinished_path);
  // The picture goes through the descriptor: the file's folder may not exist inside the phone.
  const std::vector<std::string> command = {"import", "-silent", "-window", window_to_take(state), "png:-"};
  if (execute_in_phone(state["control"], command, STDIN_FILENO, file.get(), STDERR_FILENO) != 0)
    return fail("no picture could be taken");
  if (rename(unfinished_path.c_str(), path.c_str()) != 0)
    return fail("cannot write " + path + ": " + g_strerror(errno));
  unfinished.keep();
  return kDone;
}

}  // namespace phone
