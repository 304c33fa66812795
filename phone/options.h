// What all commands of tavro-phone share: exit statuses, messages, the reading of their options.
#pragma once

#include <glib.h>

#include <string>
#include <vector>

namespace phone {

enum ExitStatus { kDone = 0, kFailed = 1, kUsage = 2 };

// One line for the person who started the program, behind its name; on standard error unless another
// descriptor was chosen, which must stay open.
void say(const std::string &text);
void say_on(int descriptor);

// Say `text` and return the status, for `return fail(...)`.
int fail(const std::string &text);
int misuse(const std::string &text);

// One command's options, read by GLib: `--help` prints and ends the program with 0. What is left behind the
// options is in `arguments`; a first `--` is dropped.
class CommandLine {
 public:
  CommandLine(std::string usage, std::string summary);
  void flag(const char *name, bool *value, const char *help);
  // A value that is given must not be empty: it would pass for one that is not.
  void text(const char *name, std::string *value, const char *help, const char *placeholder);

  // Options end at the first word that is none, so that what follows may look like one.
  void stop_at_first_word() { stops_at_first_word_ = true; }

  // False, after a message, when the options make no sense: the command then ends with kUsage.
  bool parse(int argc, char **argv);

  std::vector<std::string> arguments;

 private:
  struct Flag {
    gboolean raw;
    bool *value;
  };
  struct Text {
    char *raw;
    std::string *value;
    const char *name;
  };
  std::string usage_;
  std::string summary_;
  bool stops_at_first_word_ = false;
  std::vector<GOptionEntry> entries_;
  std::vector<Flag> flags_;
  std::vector<Text> texts_;
};

}  // namespace phone
