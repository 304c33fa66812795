// The commands of tavro-phone. Each reads its own options from argv (argv[0] is the command) and returns the
// program's exit status.
#pragma once

#include <string>
#include <vector>

#include "folder.h"

namespace phone {

int command_start(int argc, char **argv);
int command_stop(int argc, char **argv);
int command_status(int argc, char **argv);
int command_launch(int argc, char **argv);
int command_exec(int argc, char **argv);
int command_preference(int argc, char **argv);
int command_screenshot(int argc, char **argv);
int command_log(int argc, char **argv);
int command_crash_handler(int argc, char **argv);

// What stands between the phone and the desktop; runs inside the phone until it is ended.
int command_desktop_link(int argc, char **argv);

// The state of the phone that `--dir` means. False, after a message, when it does not run.
bool find_running_phone(const std::string &dir_option, State *state);

constexpr const char *kDirHelp = "The phone's folder, else tavro-phone in $XDG_DATA_HOME";

}  // namespace phone
