// Cold start: from the start of a process to its first painted frame, the client beside an empty window, turn
// by turn. Runs inside a phone whose client does not run.
//
//   cold_start RUNS CLIENT EMPTY_WINDOW
#include <fcntl.h>
#include <poll.h>
#include <signal.h>
#include <sys/wait.h>
#include <unistd.h>

#include <algorithm>
#include <chrono>
#include <cstdio>
#include <cstdlib>
#include <string>
#include <vector>

namespace {

constexpr int kLongestStartMilliseconds = 10000;

[[noreturn]] void _become(const char *program, int descriptor) {
  setenv("TAVRO_FIRST_FRAME_FD", std::to_string(descriptor).c_str(), 1);
  execl(program, program, static_cast<char *>(nullptr));
  _exit(127);
}

void _end(pid_t pid) {
  kill(pid, SIGTERM);
  waitpid(pid, nullptr, 0);
}

// Milliseconds to the first frame; negative when there was none.
double _start_once(const char *program) {
  int ends[2];
  if (pipe(ends) != 0) return -1;
  fcntl(ends[0], F_SETFD, FD_CLOEXEC);
  const auto begin = std::chrono::steady_clock::now();
  const pid_t pid = fork();
  if (pid == 0) _become(program, ends[1]);
  close(ends[1]);
  pollfd wait_for{ends[0], POLLIN, 0};
  char done = 0;
  const bool is_painted = poll(&wait_for, 1, kLongestStartMilliseconds) == 1 && read(ends[0], &done, 1) == 1;
  const std::chrono::duration<double, std::milli> taken = std::chrono::steady_clock::now() - begin;
  close(ends[0]);
  _end(pid);
  return is_painted ? taken.count() : -1;
}

double _median(std::vector<double> values) {
  std::sort(values.begin(), values.end());
  return values[values.size() / 2];
}

}  // namespace

int main(int argc, char **argv) {
  if (argc != 4) {
    std::fprintf(stderr, "usage: cold_start RUNS CLIENT EMPTY_WINDOW\n");
    return 2;
  }
  std::vector<double> client, empty;
  for (int run = 0; run < std::max(1, std::atoi(argv[1])); ++run) {
    client.push_back(_start_once(argv[2]));
    empty.push_back(_start_once(argv[3]));
    if (client.back() < 0 || empty.back() < 0) {
      std::fprintf(stderr, "cold_start: no frame was painted\n");
      return 1;
    }
  }
  std::printf("cold_start client_ms=%.1f empty_window_ms=%.1f ratio=%.2f runs=%zu\n", _median(client),
              _median(empty), _median(client) / _median(empty), client.size());
  return 0;
}
