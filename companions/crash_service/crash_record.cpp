#include "crash_record.h"

#include <fcntl.h>
#include <pwd.h>
#include <sys/stat.h>
#include <sys/xattr.h>

#include <array>
#include <nlohmann/json.hpp>

#include "tavro_cores.h"
#include "tavro_handles.h"

namespace {

using Json = nlohmann::json;

constexpr size_t kLongestText = 4096;         // bytes of a path or a name
constexpr size_t kLongestStack = 256 * 1024;  // bytes
constexpr char kDeleted[] = " (deleted)";     // the kernel's mark on an executable that was replaced
constexpr char kPhoneVariable[] = "TAVRO_PHONE_DIR=";

std::optional<int64_t> number_in(const std::string &text) {
  gint64 number = 0;
  if (!g_ascii_string_to_signed(text.c_str(), 10, 0, G_MAXINT64, &number, nullptr)) return std::nullopt;
  return number;
}

std::string attribute(int fd, const char *name) {
  std::array<char, kLongestText> value;
  const ssize_t length = fgetxattr(fd, name, value.data(), value.size());
  return length > 0 ? std::string(value.data(), static_cast<size_t>(length)) : "";
}

std::string field(const Json &record, const char *name) {
  const auto found = record.find(name);
  if (found == record.end()) return "";
  // A field that was given twice is a list of texts, one that is no text a list of bytes.
  const Json &value =
      found->is_array() && !found->empty() && found->front().is_string() ? found->front() : *found;
  if (value.is_string()) return value.get<std::string>();
  std::string bytes;
  if (value.is_array()) {
    for (const Json &byte : value) {
      if (!byte.is_number_unsigned() || byte.get<unsigned>() > 255) return "";
      bytes += static_cast<char>(byte.get<unsigned>());
    }
  }
  return bytes;
}

void set_names(Crash *crash, const std::string &process, std::string executable) {
  if (g_str_has_suffix(executable.c_str(), kDeleted)) executable.resize(executable.size() - strlen(kDeleted));
  crash->executable = executable;
  crash->program = executable.substr(executable.rfind('/') + 1);
  if (crash->program.empty()) crash->program = process;
}

bool set_numbers(Crash *crash, const std::string &pid, const std::string &uid, const std::string &signal,
                 const std::string &time) {
  const auto pid_number = number_in(pid), uid_number = number_in(uid), time_number = number_in(time);
  if (!pid_number || !uid_number || !time_number) return false;
  crash->pid = *pid_number;
  crash->uid = *uid_number;
  crash->time_us = *time_number;
  crash->signal = static_cast<int>(number_in(signal).value_or(0) & 0x7f);
  return true;
}

// What a journal's field with trusted origin says: the record was written by the system, by systemd-coredump
// under its own user, or under the user whose program crashed.
bool is_credible(const Json &record, int64_t crash_uid) {
  const auto writer = number_in(field(record, "_UID"));
  if (!writer) return false;
  if (*writer == 0 || *writer == crash_uid) return true;
  const passwd *system = getpwnam("systemd-coredump");
  return system && *writer == static_cast<int64_t>(system->pw_uid);
}

std::string phone_in(const std::string &environment) {
  const std::string lines = "\n" + environment;
  const size_t start = lines.find(std::string("\n") + kPhoneVariable);
  if (start == std::string::npos) return "";
  const size_t value = start + 1 + strlen(kPhoneVariable);
  return lines.substr(value, lines.find('\n', value) - value);
}

// "NSpid:" lists the process's number in each namespace, the innermost last.
int64_t innermost_pid(const std::string &status) {
  const size_t line = status.find("NSpid:");
  if (line == std::string::npos) return 0;
  const std::string numbers = status.substr(line, status.find('\n', line) - line);
  return number_in(numbers.substr(numbers.find_last_of("\t ") + 1)).value_or(0);
}

bool is_core_of(const std::string &path, const Crash &crash) {
  const auto said = crash_of_core(path);
  return said && said->id() == crash.id() && said->uid == crash.uid;
}

}  // namespace

std::optional<Crash> crash_of_open_core(int fd, const std::string &path) {
  struct stat info;
  if (fstat(fd, &info) != 0 || !S_ISREG(info.st_mode)) return std::nullopt;
  Crash crash;
  if (!set_numbers(&crash, attribute(fd, TAVRO_CORE_PID), attribute(fd, TAVRO_CORE_UID),
                   attribute(fd, TAVRO_CORE_SIGNAL), attribute(fd, TAVRO_CORE_TIME)))
    return std::nullopt;
  set_names(&crash, attribute(fd, TAVRO_CORE_PROGRAM), attribute(fd, TAVRO_CORE_EXECUTABLE));
  crash.phone = attribute(fd, TAVRO_CORE_PHONE);
  crash.phone_pid = number_in(attribute(fd, TAVRO_CORE_PHONE_PID)).value_or(0);
  crash.note = attribute(fd, TAVRO_CORE_NOTE);
  if (info.st_size > 0) crash.core = path;
  return crash;
}

std::optional<Crash> crash_of_core(const std::string &path) {
  const TavroFd fd(open(path.c_str(), O_RDONLY | O_CLOEXEC | O_NOFOLLOW | O_NONBLOCK));
  return fd ? crash_of_open_core(fd.get(), path) : std::nullopt;
}

std::optional<Crash> crash_of_record(const std::string &line) {
  const Json record = Json::parse(line, nullptr, false);
  Crash crash;
  if (!record.is_object() ||
      !set_numbers(&crash, field(record, "COREDUMP_PID"), field(record, "COREDUMP_UID"),
                   field(record, "COREDUMP_SIGNAL"), field(record, "COREDUMP_TIMESTAMP")) ||
      !is_credible(record, crash.uid))
    return std::nullopt;
  set_names(&crash, field(record, "COREDUMP_COMM").substr(0, kLongestText),
            field(record, "COREDUMP_EXE").substr(0, kLongestText));
  const std::string message = field(record, "MESSAGE");
  const size_t stack = message.find("Stack trace");
  if (stack != std::string::npos) crash.stack = message.substr(stack, kLongestStack);
  crash.phone = phone_in(field(record, "COREDUMP_ENVIRON"));
  crash.phone_pid = innermost_pid(field(record, "COREDUMP_PROC_STATUS"));
  const std::string core = field(record, "COREDUMP_FILENAME");
  if (!core.empty() && is_core_of(core, crash)) crash.core = core;
  if (field(record, "COREDUMP_TRUNCATED") == "1") crash.note = "cut by the machine's limit";
  crash.is_from_journal = true;
  return crash;
}
