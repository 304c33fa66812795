// A helper program (a decompressor, a debugger, the journal's reader) under a limit of time: its output is
// handed over as it comes, and it is killed when the time is over, when it was cancelled or when nobody wants
// more. It gets an empty environment but for PATH, so that nobody's settings steer it, and leaves no core.
// Blocks; any thread.
#pragma once

#include <gio/gio.h>

#include <functional>
#include <string>
#include <vector>

struct LimitedRun {
  std::vector<std::string> command;
  int seconds = 10;
  int input = -1;  // handed to its standard input; not closed. -1: nothing
  GCancellable *stop = nullptr;
  // False: enough was read.
  std::function<bool(const char *bytes, size_t count)> take;
};

// True when it ran to its end with status 0, or nobody wanted more. A program that is not installed is no
// error that is logged.
bool run_limited(const LimitedRun &run);
bool is_program_there(const char *name);

// What it prints, at most `most` bytes.
std::string output_of(LimitedRun run, size_t most);
