#include "crash_stack.h"

#include "limited_process.h"
#include "tavro_handles.h"

namespace {

constexpr int kSeconds = 30;
constexpr size_t kLongestStack = 256 * 1024;  // bytes

// gdb's words before and behind the stack are not for people.
std::string from_first_thread(const std::string &text) {
  const size_t start = text.find("\nThread ");
  return start == std::string::npos ? "" : text.substr(start + 1);
}

LimitedRun tool(std::vector<std::string> command, GCancellable *stop) {
  LimitedRun run;
  run.command = std::move(command);
  run.seconds = kSeconds;
  run.stop = stop;
  return run;
}

}  // namespace

std::string read_stack(const std::string &core, const std::string &executable, GCancellable *stop) {
  const bool has_executable = g_file_test(executable.c_str(), G_FILE_TEST_IS_REGULAR);
  if (is_program_there("gdb")) {
    std::vector<std::string> command = {"gdb", "-batch", "-nx"};
    for (const char *setting :
         {"set auto-load off", "set debuginfod enabled off", "set print frame-arguments none",
          "set print thread-events off", "set width 0"})
      command.insert(command.end(), {"-iex", setting});
    command.insert(command.end(), {"-ex", "thread apply all backtrace 64", "-core=" + core});
    if (has_executable) command.push_back("-se=" + executable);
    return from_first_thread(output_of(tool(command, stop), kLongestStack));
  }
  if (!is_program_there("eu-stack")) return "";
  std::vector<std::string> command = {"eu-stack", "--core=" + core};
  if (has_executable) command.push_back("--executable=" + executable);
  return output_of(tool(command, stop), kLongestStack);
}
