// The phone's own view of the machine: everything as it is, but the phone's storage at /opt/usr, a System V
// IPC namespace of its own and its own processes. Where no sandbox can be had the phone runs in place.
#pragma once

#include <optional>
#include <string>
#include <vector>

#include "folder.h"

namespace phone {

enum class Mode { kSandbox, kDirect };

// Path of this program, links resolved.
std::string own_program();

// Which mode this machine allows. In direct mode one line is said, with the reason; nothing when neither is
// possible, after a message that names what to install or allow.
std::optional<Mode> choose_mode(const Folder &folder);

// `command` as it must be executed to run in the phone's view of the machine.
std::vector<std::string> sandboxed(Mode mode, const Folder &folder, std::vector<std::string> command);

// Null-terminated pointers into `command` for an exec function.
std::vector<char *> exec_arguments(std::vector<std::string> &command);

// What processes of the phone in `folder` are left from a run is killed: they carry the folder in their
// environment. In direct mode nothing else ends them; those of a sandbox are dying, which takes a moment.
// Waits for their end, two seconds at most. This process and its ancestors are spared.
void kill_remains(const Folder &folder);

}  // namespace phone
