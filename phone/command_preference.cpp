// The shared preference store, reached as an application would: this program runs once more inside the phone,
// and in a sandbox made for the moment when the phone does not run.
#include <app_preference.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cmath>
#include <cstdio>
#include <optional>

#include "commands.h"
#include "control.h"
#include "environment.h"
#include "options.h"
#include "sandbox.h"

namespace phone {

namespace {

constexpr const char *kInsideMark = "TAVRO_PHONE_INSIDE";

using PlainText = TavroHandle<char, free>;

struct TypeName {
  const char *name;
  preference_type_e type;
};
constexpr TypeName kTypes[] = {{"string", PREFERENCE_TYPE_STRING},
                               {"int", PREFERENCE_TYPE_INT},
                               {"double", PREFERENCE_TYPE_DOUBLE},
                               {"boolean", PREFERENCE_TYPE_BOOLEAN}};

const char *name_of(preference_type_e type) {
  for (const TypeName &known : kTypes) {
    if (known.type == type) return known.name;
  }
  return "unknown";
}

// The value as text; nothing when it cannot be read.
std::optional<std::string> value_text(const char *key, preference_type_e type) {
  int number = 0;
  double real = 0;
  bool is_true = false;
  char *text = nullptr;
  char digits[G_ASCII_DTOSTR_BUF_SIZE];
  if (type == PREFERENCE_TYPE_INT && preference_get_int(key, &number) == PREFERENCE_ERROR_NONE)
    return std::to_string(number);
  if (type == PREFERENCE_TYPE_DOUBLE && preference_get_double(key, &real) == PREFERENCE_ERROR_NONE)
    return g_ascii_dtostr(digits, sizeof digits, real);
  if (type == PREFERENCE_TYPE_BOOLEAN && preference_get_boolean(key, &is_true) == PREFERENCE_ERROR_NONE)
    return is_true ? "true" : "false";
  if (type == PREFERENCE_TYPE_STRING && preference_get_string(key, &text) == PREFERENCE_ERROR_NONE)
    return PlainText(text).get();
  return std::nullopt;
}

int get_value(const std::vector<std::string> &words) {
  preference_type_e type;
  const char *key = words[1].c_str();
  const int result = preference_get_type(key, &type);
  if (result == PREFERENCE_ERROR_NO_KEY) return fail("no such key: " + words[1]);
  const auto text = result == PREFERENCE_ERROR_NONE ? value_text(key, type) : std::nullopt;
  if (!text) return fail("the preference store cannot be read");
  std::printf("%s\n", text->c_str());
  return kDone;
}

std::optional<int> parse_int(const std::string &text) {
  gint64 number = 0;
  if (!g_ascii_string_to_signed(text.c_str(), 10, G_MININT, G_MAXINT, &number, nullptr)) return std::nullopt;
  return static_cast<int>(number);
}

std::optional<double> parse_double(const std::string &text) {
  char *end = nullptr;
  const double number = g_ascii_strtod(text.c_str(), &end);
  if (text.empty() || *end || !std::isfinite(number)) return std::nullopt;
  return number;
}

// The platform's code; nothing when the value is not of the type.
std::optional<int> set_typed(const char *key, preference_type_e type, const std::string &value) {
  switch (type) {
    case PREFERENCE_TYPE_INT:
      if (const auto number = parse_int(value)) return preference_set_int(key, *number);
      break;
    case PREFERENCE_TYPE_DOUBLE:
      if (const auto number = parse_double(value)) return preference_set_double(key, *number);
      break;
    case PREFERENCE_TYPE_BOOLEAN:
      if (value == "true" || value == "false") return preference_set_boolean(key, value == "true");
      break;
    case PREFERENCE_TYPE_STRING:
      if (g_utf8_validate(value.c_str(), -1, nullptr)) return preference_set_string(key, value.c_str());
      break;
  }
  return std::nullopt;
}

int set_value(const std::vector<std::string> &words) {
  for (const TypeName &known : kTypes) {
    if (words[2] != known.name) continue;
    const auto result = set_typed(words[1].c_str(), known.type, words[3]);
    if (!result) return misuse("no " + words[2] + ": " + words[3]);
    return *result == PREFERENCE_ERROR_NONE ? kDone : fail("the preference store cannot be written");
  }
  return misuse("TYPE is string, int, double or boolean, not " + words[2]);
}

int unset_value(const std::vector<std::string> &words) {
  const int result = preference_remove(words[1].c_str());
  if (result == PREFERENCE_ERROR_NO_KEY) return fail("no such key: " + words[1]);
  return result == PREFERENCE_ERROR_NONE ? kDone : fail("the preference store cannot be written");
}

bool print_item(const char *key, void *) {
  preference_type_e type;
  if (preference_get_type(key, &type) != PREFERENCE_ERROR_NONE) return true;
  const std::string value = value_text(key, type).value_or("");
  TavroGText one_line(g_strescape(value.c_str(), "\""));
  const bool is_string = type == PREFERENCE_TYPE_STRING;
  std::printf("%s %s %s\n", key, name_of(type),
              is_string ? ("\"" + std::string(one_line.get()) + "\"").c_str() : value.c_str());
  return true;
}

int list_values(const std::vector<std::string> &) {
  const int result = preference_foreach_item(print_item, nullptr);
  return result == PREFERENCE_ERROR_NONE ? kDone : fail("the preference store cannot be read");
}

struct Action {
  const char *name;
  size_t words;
  int (*run)(const std::vector<std::string> &words);
};
constexpr Action kActions[] = {
    {"get", 2, get_value}, {"set", 4, set_value}, {"unset", 2, unset_value}, {"list", 1, list_values}};

const Action *find_action(const std::vector<std::string> &words) {
  for (const Action &action : kActions) {
    if (!words.empty() && words[0] == action.name && words.size() == action.words) return &action;
  }
  return nullptr;
}

int run_inside(const Folder &folder, std::vector<std::string> command) {
  const State state = read_state(folder);
  if (is_running(folder) && state.count("ready")) {
    const int status =
        execute_in_phone(state.at("control"), command, STDIN_FILENO, STDOUT_FILENO, STDERR_FILENO);
    return status < 0 ? kFailed : status;
  }
  const bool is_direct = state.count("mode") && state.at("mode") == "direct";
  if (!g_file_test(folder.usr().c_str(), G_FILE_TEST_IS_DIR))
    return fail("there is no phone in " + folder.dir);
  // No bus, so that nobody's is told of the change; the next start of an application reads the store anyway.
  command.insert(command.begin() + 1, {"DBUS_SESSION_BUS_ADDRESS=unix:path=/dev/null"});
  std::vector<std::string> all = sandboxed(is_direct ? Mode::kDirect : Mode::kSandbox, folder, command);
  execvp(all[0].c_str(), exec_arguments(all).data());
  return fail("cannot run " + all[0]);
}

}  // namespace

int command_preference(int argc, char **argv) {
  std::string dir;
  CommandLine line(
      "get KEY | set KEY TYPE VALUE | unset KEY | list",
      "The preferences that the phone's applications share. TYPE is string, int, double or boolean.");
  line.stop_at_first_word();
  line.text("dir", &dir, kDirHelp, "DIR");
  if (!line.parse(argc, argv)) return kUsage;
  const Action *action = find_action(line.arguments);
  if (!action) return misuse("preference get KEY, set KEY TYPE VALUE, unset KEY or list");
  umask(077);
  if (g_getenv(kInsideMark)) return action->run(line.arguments);
  Folder folder;
  if (!find_folder(dir, &folder)) return kUsage;
  std::vector<std::string> command = {"env", std::string(kInsideMark) + "=1", own_program(), "preference",
                                      "--"};
  command.insert(command.end(), line.arguments.begin(), line.arguments.end());
  return run_inside(folder, command);
}

}  // namespace phone
