#include "options.h"

#include "tavro_handles.h"

namespace phone {

namespace {

constexpr size_t kMostOptions = 16;  // the entries point into vectors that must not move

int say_descriptor = STDERR_FILENO;  // set before any other thread runs

using OptionContext = TavroHandle<GOptionContext, g_option_context_free>;

}  // namespace

void say(const std::string &text) {
  const std::string line = "tavro-phone: " + text + "\n";
  // Nowhere to report it when nobody reads the line any more.
  if (write(say_descriptor, line.data(), line.size()) < 0) return;
}

void say_on(int descriptor) {
  say_descriptor = descriptor;
}

int fail(const std::string &text) {
  say(text);
  return kFailed;
}

int misuse(const std::string &text) {
  say(text + " (see --help)");
  return kUsage;
}

CommandLine::CommandLine(std::string usage, std::string summary)
    : usage_(std::move(usage)), summary_(std::move(summary)) {
  flags_.reserve(kMostOptions);
  texts_.reserve(kMostOptions);
}

void CommandLine::flag(const char *name, bool *value, const char *help) {
  flags_.push_back({FALSE, value});
  entries_.push_back({name, 0, 0, G_OPTION_ARG_NONE, &flags_.back().raw, help, nullptr});
}

void CommandLine::text(const char *name, std::string *value, const char *help, const char *placeholder) {
  texts_.push_back({nullptr, value, name});
  // As file names, so that bytes reach us as they were typed, whatever the locale.
  entries_.push_back({name, 0, 0, G_OPTION_ARG_FILENAME, &texts_.back().raw, help, placeholder});
}

bool CommandLine::parse(int argc, char **argv) {
  char **rest = nullptr;
  std::vector<GOptionEntry> entries = entries_;
  entries.push_back({G_OPTION_REMAINING, 0, 0, G_OPTION_ARG_FILENAME_ARRAY, &rest, nullptr, nullptr});
  entries.push_back({});
  OptionContext context(g_option_context_new(usage_.c_str()));
  g_option_context_set_summary(context.get(), summary_.c_str());
  g_option_context_set_strict_posix(context.get(), stops_at_first_word_);
  g_option_context_add_main_entries(context.get(), entries.data(), nullptr);
  TavroError error;
  const bool is_parsed = g_option_context_parse(context.get(), &argc, &argv, tavro_out(error));
  TavroStrv remaining(rest);
  for (char **item = rest; item && *item; ++item) arguments.emplace_back(*item);
  for (const Flag &flag : flags_) *flag.value = flag.raw;
  const char *empty = nullptr;
  for (const Text &text : texts_) {
    if (text.raw) *text.value = TavroGText(text.raw).get();
    if (text.raw && text.value->empty()) empty = text.name;
  }
  if (!is_parsed) return misuse(error->message), false;
  if (empty) return misuse(std::string("--") + empty + " must not be empty"), false;
  return true;
}

}  // namespace phone
