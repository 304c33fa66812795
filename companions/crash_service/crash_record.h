// One crash as a source tells it: a record of systemd-coredump in the journal, or a core with its extended
// attributes. Plain values; the readers block for a file's attributes at most and may be called on any
// thread.
#pragma once

#include <cstdint>
#include <optional>
#include <string>

struct Crash {
  int64_t pid = 0;        // as the machine counts
  int64_t phone_pid = 0;  // as the platform log counts; 0 when that is not known
  int64_t uid = -1;
  int signal = 0;
  int64_t time_us = 0;  // since the epoch
  std::string program;  // file name of the executable, else what the process called itself
  std::string executable;
  std::string core;   // path, empty when there is none
  std::string note;   // why the core is not whole, empty when it is
  std::string stack;  // as the source has symbolised it, or empty
  std::string phone;  // folder of the phone that it ran in, or empty
  bool is_from_journal = false;

  // The same for the same crash from every source.
  std::string id() const { return std::to_string(pid) + "." + std::to_string(time_us); }
};

// The crash whose core this is; nothing for a file that is no core with attributes.
std::optional<Crash> crash_of_core(const std::string &path);
std::optional<Crash> crash_of_open_core(int fd, const std::string &path);

// The crash that one line of `journalctl -o json` tells of; nothing when the line is no such record or does
// not come from the crashed program's user or the system. Its core counts only when it says itself that it
// belongs to this crash: anyone may write to the journal.
std::optional<Crash> crash_of_record(const std::string &line);
