// The phone folder: where one phone keeps its storage and what tells others that it runs.
//
//   usr/     the phone's /opt/usr (in direct mode /opt/usr itself is used instead)
//   desk/    the data of the phone's own feedback desk
//   config/, cache/   what toolkits keep for the phone's programs, apart from the user's own
//   run/     lock, state, output.log, and what is generated anew at each start
//
// Everything is the user's alone. The lock is held by the processes that run the phone and ends with them, so
// a state file without it is only a memory of the last run.
#pragma once

#include <map>
#include <optional>
#include <string>

#include "tavro_handles.h"

namespace phone {

// Lines `key=value` that describe a running phone: dir, mode, usr, bus, control, display, desk, desk_token,
// pid, pid_start, and ready=1 once all of it works. No value holds a line break.
using State = std::map<std::string, std::string>;

struct Folder {
  std::string dir;  // absolute

  std::string run(const std::string &name) const { return dir + "/run/" + name; }
  std::string usr() const { return dir + "/usr"; }
  std::string desk() const { return dir + "/desk"; }
};

constexpr const char *kStorageRoot = "/opt/usr";

// The folder that `--dir` names, else $XDG_DATA_HOME/tavro-phone. False with a message when it cannot be one.
bool find_folder(const std::string &dir_option, Folder *folder);

// Make what is missing of the phone folder. False with a message.
bool create_folder(const Folder &folder);

// Make the folders that applications expect below `usr`. False with a message.
bool create_storage(const std::string &usr);

// Write a file of the phone's own, readable by its owner alone. False with a message.
bool write_private_file(const std::string &path, const std::string &contents);

// The phone's lock; an empty handle when another process holds it, nothing, after a message, when it cannot
// be had at all.
std::optional<TavroFd> lock_folder(const Folder &folder);
bool is_running(const Folder &folder);

State read_state(const Folder &folder);
bool write_state(const Folder &folder, const State &state);

// A phone that begins to end takes back that it is ready before anything of it is gone.
void withdraw_ready(const Folder &folder);

// The process that holds the phone, 0 when the recorded one is gone and its number belongs to another.
int monitor_pid(const State &state);

// The lines of a state that are for people and scripts, in their fixed order.
std::string public_lines(const State &state);

// A folder for sockets whose paths stay short enough for the kernel: below $XDG_RUNTIME_DIR, else run/, else
// one of the user's own in /tmp. Made here; empty with a message when none can be had.
std::string make_socket_folder(const Folder &folder);

// Remove a folder with what is in it, as far as that is possible. Links are not followed.
void remove_tree(const std::string &path);

}  // namespace phone
