// What the kernel says about a process.
#pragma once

#include <string>

namespace phone {

// 0 when there is no such process.
int parent_of(int pid);

// When it started, in the kernel's ticks since boot: with the id it names one process for good. Empty when
// there is no such process.
std::string process_start_time(int pid);

// Whether its environment holds `entry` ("KEY=value"); false for a process of another user.
bool carries_environment(int pid, const std::string &entry);

}  // namespace phone
