// The summary of a crash, `Key: value` lines and the stack behind them, for people and for the service
// itself: a folder that was put in by hand says in it whose crash it is. Plain functions; read_folder blocks
// for the file.
#pragma once

#include "crash_application.h"
#include "crash_folder.h"
#include "crash_record.h"

struct CrashSummary {
  Crash crash;
  CrashApplication application;
  int uncounted;     // crashes of the program before this one that have no folder
  std::string core;  // whether it was kept, and what is to be said of it
  std::string stack;
};

std::string text_of(const CrashSummary &summary);

// What the client is told of a folder that somebody else made: from its summary, else from its name and time.
CrashFolder read_folder(const std::string &name);
