// The outer half of a running phone: the process that the person started. It starts the inner half
// (supervisor.h), prints what that says when it is ready, hands Ctrl-C on as an orderly end, and cleans up
// behind it. Should it be killed, the inner half ends too.
#pragma once

#include "supervisor.h"

namespace phone {

// Run the phone to its end. `lock` is the phone's lock; `ready_fd` is written to once when the phone is
// ready, -1 when nobody waits for it.
ExitStatus run_monitor(const StartOptions &options, const TavroFd &lock, int ready_fd);

}  // namespace phone
