#include "sandbox.h"

#include <signal.h>
#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>

#include "options.h"
#include "process.h"

namespace phone {

namespace {

constexpr int kKillTries = 200;
constexpr gulong kKillPollMicroseconds = 10 * 1000;

bool starts_with(const std::string &text, const std::string &prefix) {
  return text.compare(0, prefix.size(), prefix) == 0;
}

// The folder that holds bin/ and apps/.
std::string program_root() {
  TavroGText bin(g_path_get_dirname(own_program().c_str()));
  TavroGText root(g_path_get_dirname(bin.get()));
  return root.get();
}

// Empty when the sandbox works, else the reason.
std::string probe_sandbox(const Folder &folder) {
  if (g_getenv("TAVRO_PHONE_NO_SANDBOX")) return "TAVRO_PHONE_NO_SANDBOX is set";
  std::vector<std::string> command = sandboxed(Mode::kSandbox, folder, {"true"});
  TavroGText output;
  TavroError error;
  int status = 0;
  if (!g_spawn_sync(nullptr, exec_arguments(command).data(), nullptr,
                    static_cast<GSpawnFlags>(G_SPAWN_SEARCH_PATH | G_SPAWN_STDOUT_TO_DEV_NULL), nullptr,
                    nullptr, nullptr, tavro_out(output), &status, tavro_out(error)))
    return "bubblewrap is not installed (package bubblewrap)";
  if (status == 0) return "";
  const std::string said = g_strstrip(output.get());
  return "no sandbox can be made here: " + (said.empty() ? "bwrap failed" : said.substr(0, said.find('\n')));
}

// Whether there was one; a dead one that nobody has waited for does not count.
bool kill_all(const Folder &folder, const std::vector<int> &spared) {
  bool is_any_left = false;
  TavroDir proc(opendir("/proc"));
  while (const dirent *entry = proc ? readdir(proc.get()) : nullptr) {
    const int pid = static_cast<int>(g_ascii_strtoll(entry->d_name, nullptr, 10));
    if (pid <= 1 || std::find(spared.begin(), spared.end(), pid) != spared.end()) continue;
    if (!carries_environment(pid, "TAVRO_PHONE_DIR=" + folder.dir)) continue;
    kill(pid, SIGKILL);
    is_any_left = true;
  }
  return is_any_left;
}

bool can_use_storage_root() {
  g_mkdir_with_parents(kStorageRoot, 0700);
  return access(kStorageRoot, R_OK | W_OK | X_OK) == 0;
}

}  // namespace

std::string own_program() {
  TavroError error;
  TavroGText path(g_file_read_link("/proc/self/exe", tavro_out(error)));
  return path ? path.get() : "tavro-phone";
}

std::optional<Mode> choose_mode(const Folder &folder) {
  const std::string reason = probe_sandbox(folder);
  if (reason.empty()) return Mode::kSandbox;
  if (can_use_storage_root()) {
    say(reason + "; the phone runs in place and keeps its files in " + kStorageRoot);
    return Mode::kDirect;
  }
  say(reason + ", and " + kStorageRoot +
      " cannot be written: install bubblewrap and allow user namespaces, or make that folder yours");
  return std::nullopt;
}

std::vector<std::string> sandboxed(Mode mode, const Folder &folder, std::vector<std::string> command) {
  if (mode == Mode::kDirect) return command;
  std::vector<std::string> all = {
      "bwrap",      "--dev-bind", "/",      "/",     "--tmpfs",       "/opt",          "--bind",
      folder.usr(), kStorageRoot, "--proc", "/proc", "--unshare-ipc", "--unshare-pid", "--die-with-parent"};
  // What lies below /opt on this machine and belongs to the phone stays visible.
  for (const std::string &path : {program_root(), folder.dir}) {
    if (starts_with(path, "/opt/")) all.insert(all.end(), {"--bind", path, path});
  }
  all.push_back("--");
  all.insert(all.end(), command.begin(), command.end());
  return all;
}

std::vector<char *> exec_arguments(std::vector<std::string> &command) {
  std::vector<char *> pointers;
  for (std::string &word : command) pointers.push_back(word.data());
  pointers.push_back(nullptr);
  return pointers;
}

void kill_remains(const Folder &folder) {
  std::vector<int> spared;
  for (int pid = getpid(); pid > 1; pid = parent_of(pid)) spared.push_back(pid);
  for (int tries = 0; kill_all(folder, spared) && tries < kKillTries; ++tries)
    g_usleep(kKillPollMicroseconds);
}

}  // namespace phone
