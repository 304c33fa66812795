// tavro-core-handler PID PHONE_PID UID SIGNAL TIME DUMPABLE: the kernel starts it as root for each crash,
// with the core on its standard input, where "tavro-phone crash-handler enable" has put it. Keeps the core,
// gzip level 1, in the folder "cores" beside itself, readable by root and the crashed program's user alone.
// It trusts what the kernel says; what /proc says of the process is for people. Nobody reads its output, so
// it speaks through syslog.
#include <fcntl.h>
#include <sys/file.h>
#include <sys/resource.h>
#include <sys/stat.h>
#include <syslog.h>

#include <array>
#include <climits>
#include <cstdlib>
#include <cstring>
#include <string>

#include "core_store.h"
#include "tavro_handles.h"

namespace {

constexpr size_t kLargestEnvironment = 2 * 1024 * 1024;  // bytes
constexpr char kPhoneVariable[] = "TAVRO_PHONE_DIR=";
// The process's memory, where its environment is, may lie in a file system that never answers.
constexpr unsigned kLongestLife = 300;  // seconds

std::string read_of_process(const std::string &pid, const char *name) {
  const TavroFd file(open(("/proc/" + pid + "/" + name).c_str(), O_RDONLY | O_CLOEXEC));
  std::string text;
  std::array<char, 4096> block;
  for (ssize_t got;
       file && text.size() < kLargestEnvironment && (got = read(file.get(), block.data(), block.size())) > 0;)
    text.append(block.data(), static_cast<size_t>(got));
  return text;
}

std::string executable_of(const std::string &pid) {
  std::array<char, PATH_MAX> path;
  const ssize_t length = readlink(("/proc/" + pid + "/exe").c_str(), path.data(), path.size());
  return length > 0 ? std::string(path.data(), static_cast<size_t>(length)) : "";
}

std::string phone_of(const std::string &pid) {
  const std::string environment = read_of_process(pid, "environ");
  for (size_t entry = 0; entry < environment.size(); entry += strlen(environment.c_str() + entry) + 1) {
    if (environment.compare(entry, strlen(kPhoneVariable), kPhoneVariable) == 0)
      return environment.c_str() + entry + strlen(kPhoneVariable);
  }
  return "";
}

bool is_number(const char *text) {
  return *text && strspn(text, "0123456789") == strlen(text);
}

bool read_facts(char **argv, phone::CoreFacts *facts) {
  for (int i = 1; i <= 6; ++i) {
    if (!is_number(argv[i])) return false;
  }
  facts->pid = argv[1];
  facts->phone_pid = argv[2];
  facts->uid = static_cast<uid_t>(strtoul(argv[3], nullptr, 10));
  facts->signal = argv[4];
  facts->seconds = argv[5];
  // A program that changed its rights while it ran may hold what its user must not see.
  facts->is_for_user = strcmp(argv[6], "1") == 0;
  facts->program = read_of_process(facts->pid, "comm");
  facts->program.resize(strcspn(facts->program.c_str(), "\n"));
  facts->executable = executable_of(facts->pid);
  facts->phone = phone_of(facts->pid);
  return true;
}

std::string own_folder() {
  const std::string path = executable_of("self");
  return path.substr(0, path.rfind('/'));
}

}  // namespace

int main(int argc, char **argv) {
  openlog("tavro-core-handler", LOG_PID, LOG_USER);
  umask(077);
  setpriority(PRIO_PROCESS, 0, 10);
  signal(SIGXFSZ, SIG_IGN);
  alarm(kLongestLife);
  phone::CoreFacts facts;
  if (argc != 7 || !read_facts(argv, &facts)) {
    syslog(LOG_ERR, "not started as the kernel would");
    return 2;
  }
  return phone::store_core(own_folder() + "/cores", facts, STDIN_FILENO) ? 0 : 1;
}
