// The folder of cores that tavro-core-handler fills: core.<program>.<uid>.<pid>.<time>.gz, each readable by
// root and by the user whose program it was, with what is known of the crash as extended attributes. A core
// is under its name when it is whole. At most 16 cores or 1 GB are kept, the oldest of the user who has the
// most go first; a disk is not filled beyond its last 256 MB. Several handlers may run at once, one of each
// user packs; none takes longer than two minutes.
#pragma once

#include <sys/types.h>

#include <string>

namespace phone {

struct CoreFacts {
  std::string pid, phone_pid, signal, seconds;  // numbers
  uid_t uid = 0;
  bool is_for_user = false;  // else root alone may read it
  std::string program, executable, phone;
};

// Keeps what `input` holds; a core that cannot be kept leaves an empty file, which still tells of the crash.
// False after a line in syslog.
bool store_core(const std::string &folder, const CoreFacts &facts, int input);

}  // namespace phone
