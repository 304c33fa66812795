// A copy of a picture or video that belongs to a report, put where the person finds it: the phone's folder of
// pictures. The copying runs on a worker; called and telling its end (a toast with the copy's name, or why
// there is none) on the main loop.
//
// On disk: one file (0600) under the original's name, or "name (2).jpg" and so on where that is taken:
// nothing is ever overwritten, and there is no half a copy under a final name.
#pragma once

#include <string>

void tavro_save_copy(const char *path);

// The copying itself, on any thread. The path of the copy in `folder`; empty, with a log line, when it
// failed.
std::string tavro_copy_into(const std::string &folder, const std::string &path);
