#include "folder.h"

#include <fcntl.h>
#include <sys/file.h>
#include <sys/stat.h>

#include <cerrno>
#include <cstring>
#include <filesystem>

#include "options.h"
#include "process.h"

namespace phone {

namespace {

constexpr mode_t kPrivateFolderMode = 0700;
constexpr mode_t kPrivateFileMode = 0600;
// A socket's path takes 107 bytes; the longest name in the folder is at-spi's "/at-spi/bus_12345".
constexpr size_t kLongestSocketFolder = 107 - 24;

bool make_private(const std::string &path) {
  if (g_mkdir_with_parents(path.c_str(), kPrivateFolderMode) == 0) return true;
  say("cannot make " + path + ": " + g_strerror(errno));
  return false;
}

bool is_ours(const std::string &path) {
  struct stat info;
  return lstat(path.c_str(), &info) == 0 && S_ISDIR(info.st_mode) && info.st_uid == geteuid() &&
         (info.st_mode & 077) == 0;
}

std::string folder_hash(const Folder &folder) {
  TavroGText hash(g_compute_checksum_for_string(G_CHECKSUM_SHA256, folder.dir.c_str(), -1));
  return std::string(hash.get(), 12);
}

}  // namespace

bool find_folder(const std::string &dir_option, Folder *folder) {
  const std::string wanted =
      dir_option.empty() ? std::string(g_get_user_data_dir()) + "/tavro-phone" : dir_option;
  if (wanted.find('\n') != std::string::npos) {
    say("the phone's folder must not have a line break in its name");
    return false;
  }
  TavroGText absolute(g_canonicalize_filename(wanted.c_str(), nullptr));
  // One folder is one phone, by whatever links it is reached.
  TavroHandle<char, free> real(realpath(absolute.get(), nullptr));
  folder->dir = real ? real.get() : absolute.get();
  return true;
}

bool create_folder(const Folder &folder) {
  for (const char *part : {"", "/run", "/usr", "/desk", "/config", "/cache"}) {
    if (!make_private(folder.dir + part)) return false;
  }
  return true;
}

bool create_storage(const std::string &usr) {
  for (const char *part : {"/apps/corvane.tavro-lite/shared/data", "/apps/corvane.tavro-svc/data",
                           "/media/QRT_debug", "/dbspace", "/share/log"}) {
    if (!make_private(usr + part)) return false;
  }
  return true;
}

bool write_private_file(const std::string &path, const std::string &contents) {
  TavroError error;
  if (g_file_set_contents_full(path.c_str(), contents.data(), static_cast<gssize>(contents.size()),
                               G_FILE_SET_CONTENTS_CONSISTENT, kPrivateFileMode, tavro_out(error)))
    return true;
  say(error->message);
  return false;
}

std::optional<TavroFd> lock_folder(const Folder &folder) {
  const std::string path = folder.run("lock");
  TavroFd fd(open(path.c_str(), O_RDWR | O_CREAT | O_CLOEXEC, kPrivateFileMode));
  if (fd && flock(fd.get(), LOCK_EX | LOCK_NB) == 0) return fd;
  if (fd && errno == EWOULDBLOCK) return TavroFd();
  say("cannot lock " + path + ": " + g_strerror(errno));
  return std::nullopt;
}

bool is_running(const Folder &folder) {
  TavroFd fd(open(folder.run("lock").c_str(), O_RDONLY | O_CLOEXEC));
  return fd && flock(fd.get(), LOCK_SH | LOCK_NB) != 0 && errno == EWOULDBLOCK;
}

State read_state(const Folder &folder) {
  State state;
  TavroGText text;
  if (!g_file_get_contents(folder.run("state").c_str(), tavro_out(text), nullptr, nullptr)) return state;
  TavroStrv lines(g_strsplit(text.get(), "\n", -1));
  for (char **line = lines.get(); *line; ++line) {
    if (const char *equals = std::strchr(*line, '='))
      state[std::string(*line, static_cast<size_t>(equals - *line))] = equals + 1;
  }
  return state;
}

bool write_state(const Folder &folder, const State &state) {
  std::string text;
  for (const auto &[key, value] : state) text += key + "=" + value + "\n";
  return write_private_file(folder.run("state"), text);
}

void withdraw_ready(const Folder &folder) {
  State state = read_state(folder);
  if (state.erase("ready")) write_state(folder, state);
}

int monitor_pid(const State &state) {
  const auto pid_text = state.find("pid");
  const auto start = state.find("pid_start");
  if (pid_text == state.end() || start == state.end()) return 0;
  const int pid = static_cast<int>(g_ascii_strtoll(pid_text->second.c_str(), nullptr, 10));
  return pid > 1 && !start->second.empty() && process_start_time(pid) == start->second ? pid : 0;
}

std::string public_lines(const State &state) {
  std::string text;
  for (const char *key : {"dir", "bus", "display", "desk", "desk_token", "mode", "ready"}) {
    const auto found = state.find(key);
    if (found != state.end()) text += found->first + "=" + found->second + "\n";
  }
  return text;
}

std::string make_socket_folder(const Folder &folder) {
  const char *runtime = g_getenv("XDG_RUNTIME_DIR");
  const std::string name = "tavro-phone-" + folder_hash(folder);
  std::string candidates[] = {runtime && *runtime ? std::string(runtime) + "/" + name : "", folder.run("bus"),
                              "/tmp/tavro-phone-" + std::to_string(geteuid()) + "-" + folder_hash(folder)};
  for (const std::string &path : candidates) {
    if (path.empty() || path.size() > kLongestSocketFolder) continue;
    if (g_mkdir_with_parents(path.c_str(), kPrivateFolderMode) != 0 || !is_ours(path)) continue;
    remove_tree(path);  // sockets of a phone that was killed
    if (g_mkdir_with_parents(path.c_str(), kPrivateFolderMode) == 0) return path;
  }
  say("no folder of our own for the phone's sockets; last tried " + candidates[2]);
  return "";
}

void remove_tree(const std::string &path) {
  std::error_code ignored;
  std::filesystem::remove_all(path, ignored);
}

}  // namespace phone
