// The stack of a crash, as well as this machine can tell it: gdb or eu-stack over the core, under a limit of
// time, with nobody's settings and without values of arguments, which may be secrets. Blocks; any thread.
#pragma once

#include <gio/gio.h>

#include <string>

// `core` is unpacked. Empty when the machine has no such tool or it had nothing to say.
std::string read_stack(const std::string &core, const std::string &executable, GCancellable *stop);
