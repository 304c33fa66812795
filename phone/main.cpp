// tavro-phone: starts a phone on a Linux machine, and acts on one that runs.
#include <clocale>
#include <cstdio>
#include <cstring>

#include "commands.h"
#include "options.h"
#include "supervisor.h"

namespace {

struct Command {
  const char *name;
  const char *summary;  // null: not for people
  int (*run)(int argc, char **argv);
};

constexpr Command kCommands[] = {
    {"start", "start the phone and show the client", phone::command_start},
    {"stop", "end the phone and all that it started", phone::command_stop},
    {"status", "say what runs", phone::command_status},
    {"launch", "send a launch request to an application", phone::command_launch},
    {"preference", "get, set, unset or list shared preferences", phone::command_preference},
    {"screenshot", "take a picture of the phone's display", phone::command_screenshot},
    {"log", "print the platform log", phone::command_log},
    {"exec", "run a command inside the phone", phone::command_exec},
    {"crash-handler", "let phones see this machine's crashes, or not", phone::command_crash_handler},
    {"supervise", nullptr, phone::command_supervise},
    {"desktop-link", nullptr, phone::command_desktop_link},
};

void print_help() {
  std::puts(
      "Usage: tavro-phone COMMAND [OPTION …]\n\nA phone on this machine, with its own storage, message bus "
      "and feedback desk.\n\nCommands:");
  for (const Command &command : kCommands) {
    if (command.summary) std::printf("  %-14s %s\n", command.name, command.summary);
  }
  std::puts(
      "\n\"tavro-phone COMMAND --help\" tells of a command's options.\n"
      "Exit status: 0 done, 1 failed, 2 not understood.");
}

}  // namespace

int main(int argc, char **argv) {
  std::setlocale(LC_ALL, "");
  const char *name = argc > 1 ? argv[1] : "";
  if (std::strcmp(name, "--help") == 0 || std::strcmp(name, "help") == 0) {
    print_help();
    return phone::kDone;
  }
  for (const Command &command : kCommands) {
    if (std::strcmp(name, command.name) != 0) continue;
    g_set_prgname((std::string("tavro-phone ") + name).c_str());
    return command.run(argc - 1, argv + 1);
  }
  return phone::misuse(*name ? std::string("no such command: ") + name : "a command is needed");
}
