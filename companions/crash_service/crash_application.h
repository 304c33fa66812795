// Which application a crashed program is, as people know it. Reads desktop entries: blocks; any thread.
#pragma once

#include "crash_record.h"

struct CrashApplication {
  std::string id;            // the program's name for what is no application
  std::string name;          // valid UTF-8 in one line
  std::string version;       // empty when that is not known
  bool is_of_phone = false;  // one of the phone's own, which write to the platform log
};

CrashApplication application_of(const Crash &crash);

// One line of valid UTF-8, at most 200 bytes, of what somebody else named.
std::string printable(const std::string &text);
