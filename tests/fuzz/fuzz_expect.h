// How a fuzz target says that something is wrong.
#pragma once

#include <cerrno>
#include <cstdio>
#include <cstdlib>
#include <string>

[[noreturn]] inline void fail(const std::string &what) {
  std::fprintf(stderr, "%s: %s\n", program_invocation_short_name, what.c_str());
  std::abort();
}

inline void expect(bool is_so, const char *what) {
  if (!is_so) fail(what);
}
