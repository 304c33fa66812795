// The command that makes the machine keep crashes where phones find them, and takes that back.
#include "commands.h"
#include "crash_handler.h"
#include "options.h"

namespace phone {

int command_crash_handler(int argc, char **argv) {
  std::string root;
  CommandLine line(
      "enable|disable|status",
      "Let phones see the crashes of this machine's programs, where nothing else keeps them. Only \"enable\" "
      "and \"disable\" change something, say what, and want root.");
  line.text("root", &root, "Act on another root file system", "DIR");
  if (!line.parse(argc, argv)) return kUsage;
  if (line.arguments.size() != 1) return misuse("enable, disable or status?");
  CrashHandler handler(root);
  const std::string &action = line.arguments[0];
  if (action == "enable") return handler.enable();
  if (action == "disable") return handler.disable();
  if (action == "status") return handler.status();
  return misuse("no such action: " + action);
}

}  // namespace phone
