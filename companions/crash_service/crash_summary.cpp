#include "crash_summary.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <sys/utsname.h>

#include <array>
#include <cstring>
#include <ctime>
#include <map>

#include "tavro_crash_service.h"
#include "tavro_handles.h"

namespace {

constexpr char kApplication[] = "Application";
constexpr char kName[] = "Application name";
constexpr char kProgram[] = "Program";
constexpr char kTime[] = "Time";
constexpr size_t kLargestSummary = 16 * 1024;  // bytes that are read

std::string time_text(int64_t time_us) {
  const time_t seconds = static_cast<time_t>(time_us / 1000000);
  struct tm local = {};
  localtime_r(&seconds, &local);
  std::array<char, 64> text;
  return {text.data(), strftime(text.data(), text.size(), "%Y-%m-%dT%H:%M:%S%z", &local)};
}

std::string signal_text(int number) {
  const char *name = sigabbrev_np(number);
  return std::to_string(number) + (name ? std::string(" (SIG") + name + ")" : "");
}

std::string system_text() {
  struct utsname system = {};
  uname(&system);
  const TavroGText release(g_get_os_info(G_OS_INFO_KEY_PRETTY_NAME));
  return printable((release ? std::string(release.get()) + ", " : "") + system.sysname + " " +
                   system.release + " " + system.machine);
}

std::string summary_file_in(const std::string &folder) {
  const TavroDir dir(opendir(folder.c_str()));
  while (const dirent *entry = dir ? readdir(dir.get()) : nullptr) {
    if (g_str_has_suffix(entry->d_name, ".cs")) return folder + "/" + entry->d_name;
  }
  return "";
}

std::map<std::string, std::string> read_values(const std::string &path) {
  std::map<std::string, std::string> values;
  const TavroFd file(open(path.c_str(), O_RDONLY | O_CLOEXEC | O_NOFOLLOW | O_NONBLOCK));
  std::string text(kLargestSummary, '\0');
  const ssize_t got = file ? read(file.get(), text.data(), text.size()) : 0;
  text.resize(got > 0 ? static_cast<size_t>(got) : 0);
  for (size_t line = 0, end; (end = text.find('\n', line)) != std::string::npos; line = end + 1) {
    const size_t colon = text.find(": ", line);
    if (colon < end) values.emplace(text.substr(line, colon - line), text.substr(colon + 2, end - colon - 2));
  }
  return values;
}

// "<program>_<pid>_<stamp>"; any other name is the program's.
std::string program_in(const std::string &name) {
  const size_t stamp = name.rfind('_');
  const size_t pid =
      stamp == std::string::npos || stamp == 0 ? std::string::npos : name.rfind('_', stamp - 1);
  return pid == std::string::npos || pid == 0 ? name : name.substr(0, pid);
}

int64_t change_time_ms(const std::string &path) {
  struct stat info;
  return lstat(path.c_str(), &info) == 0 ? int64_t{info.st_mtim.tv_sec} * 1000 : g_get_real_time() / 1000;
}

}  // namespace

std::string text_of(const CrashSummary &summary) {
  const Crash &crash = summary.crash;
  std::string text;
  const auto add = [&text](const char *key, const std::string &value) {
    if (!value.empty()) text += std::string(key) + ": " + value + "\n";
  };
  add(kProgram, printable(crash.program));
  add("Executable", printable(crash.executable));
  add(kApplication, summary.application.id);
  add(kName, summary.application.name);
  add("Version", summary.application.version);
  add("Process", std::to_string(crash.pid));
  add("User", std::to_string(crash.uid));
  add("Signal", signal_text(crash.signal));
  add(kTime, time_text(crash.time_us));
  add("System", system_text());
  add("Core", printable(summary.core));
  if (summary.uncounted) add("Crashes before it without a folder", std::to_string(summary.uncounted));
  const TavroGText stack(g_utf8_make_valid(summary.stack.c_str(), -1));
  return text + "\nStack:\n" + (*stack.get() ? stack.get() : "not known on this machine\n");
}

CrashFolder read_folder(const std::string &name) {
  const std::string path = TAVRO_CRASH_DUMP_FOLDER + name;
  const auto values = read_values(summary_file_in(path));
  const auto value = [&values](const char *key) {
    const auto found = values.find(key);
    return found == values.end() ? std::string() : printable(found->second);
  };
  CrashFolder folder{name, value(kApplication), value(kName), change_time_ms(path)};
  if (folder.app_id.empty()) folder.app_id = value(kProgram);
  if (folder.app_id.empty()) folder.app_id = printable(program_in(name));
  if (folder.app_name.empty()) folder.app_name = folder.app_id;
  const std::string time = value(kTime);
  const TavroHandle<GTimeZone, g_time_zone_unref> local(g_time_zone_new_local());
  const TavroHandle<GDateTime, g_date_time_unref> when(
      g_date_time_new_from_iso8601(time.c_str(), local.get()));
  if (when) folder.time_ms = g_date_time_to_unix(when.get()) * 1000;
  return folder;
}
