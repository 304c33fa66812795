#include <sys/stat.h>
#include <unistd.h>

#include <array>
#include <cerrno>
#include <cstdio>

#include "commands.h"
#include "options.h"

namespace phone {

namespace {

constexpr gulong kPollMicroseconds = 200 * 1000;

// Print what can be read from here to the end. False when nobody reads the output any more.
bool print_rest(FILE *file) {
  std::array<char, 65536> buffer;
  clearerr(file);
  while (const size_t count = std::fread(buffer.data(), 1, buffer.size(), file)) {
    if (std::fwrite(buffer.data(), 1, count, stdout) != count) return false;
  }
  return std::fflush(stdout) == 0;
}

bool is_same_file(FILE *file, const std::string &path) {
  struct stat open_file, named_file;
  return fstat(fileno(file), &open_file) == 0 && stat(path.c_str(), &named_file) == 0 &&
         open_file.st_ino == named_file.st_ino && open_file.st_dev == named_file.st_dev;
}

// The log is renamed and begun anew when it is full: then the rest of the old file comes first.
int follow(const std::string &path, TavroFile file) {
  for (;;) {
    const bool is_current = file && is_same_file(file.get(), path);
    if (file && !print_rest(file.get())) return kDone;
    if (!is_current) file.reset(std::fopen(path.c_str(), "re"));
    if (is_current || !file) g_usleep(kPollMicroseconds);
  }
}

}  // namespace

int command_log(int argc, char **argv) {
  std::string dir;
  bool is_following = false;
  CommandLine line("", "Print the platform log, oldest message first.");
  line.text("dir", &dir, kDirHelp, "DIR");
  line.flag("follow", &is_following, "Go on with what is written from now on");
  if (!line.parse(argc, argv)) return kUsage;
  if (!line.arguments.empty()) return misuse("log takes no arguments");
  Folder folder;
  if (!find_folder(dir, &folder)) return kUsage;
  const State state = read_state(folder);
  const auto usr = state.find("usr");
  const std::string path = (usr == state.end() ? folder.usr() : usr->second) + "/share/log/platform.log";
  TavroFile older(std::fopen((path + ".1").c_str(), "re"));
  TavroFile file(std::fopen(path.c_str(), "re"));
  if (!file && !is_following) return fail("no log at " + path + ": " + g_strerror(errno));
  if (older) print_rest(older.get());
  if (file) print_rest(file.get());
  return is_following ? follow(path, std::move(file)) : kDone;
}

}  // namespace phone
