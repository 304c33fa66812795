#include "process.h"

#include <cstring>

#include "tavro_handles.h"

namespace phone {

namespace {

// Field `index` of /proc/PID/stat, counted from the state, which is 0: the name before it may hold anything.
std::string stat_field(int pid, int index) {
  TavroGText text;
  const std::string path = "/proc/" + std::to_string(pid) + "/stat";
  if (!g_file_get_contents(path.c_str(), tavro_out(text), nullptr, nullptr)) return "";
  const char *name_end = std::strrchr(text.get(), ')');
  if (!name_end || name_end[1] != ' ') return "";
  TavroStrv fields(g_strsplit(name_end + 2, " ", -1));
  return index < static_cast<int>(g_strv_length(fields.get())) ? fields.get()[index] : "";
}

}  // namespace

int parent_of(int pid) {
  return static_cast<int>(g_ascii_strtoll(stat_field(pid, 1).c_str(), nullptr, 10));
}

std::string process_start_time(int pid) {
  constexpr int kStateField = 0, kStartTimeField = 19;
  // A dead process that nobody has waited for yet is still listed.
  const std::string state = stat_field(pid, kStateField);
  return state == "Z" || state == "X" ? "" : stat_field(pid, kStartTimeField);
}

bool carries_environment(int pid, const std::string &entry) {
  TavroGText text;
  gsize length = 0;
  const std::string path = "/proc/" + std::to_string(pid) + "/environ";
  if (!g_file_get_contents(path.c_str(), tavro_out(text), &length, nullptr)) return false;
  const std::string environment = '\0' + std::string(text.get(), length);
  return environment.find('\0' + entry + '\0') != std::string::npos;
}

}  // namespace phone
