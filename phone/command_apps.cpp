// The commands that act inside a running phone: launch, exec.
#include <unistd.h>

#include <cstdio>

#include "applications.h"
#include "commands.h"
#include "control.h"
#include "message_bus.h"
#include "options.h"

namespace phone {

namespace {

bool is_text(const std::string &text) {
  return g_utf8_validate(text.data(), static_cast<gssize>(text.size()), nullptr);
}

// KEY=VALUE words into extra data. False after a message.
bool read_extra_data(const std::vector<std::string> &words, LaunchRequest *request) {
  for (const std::string &word : words) {
    const size_t equals = word.find('=');
    if (equals == std::string::npos || equals == 0) return misuse("not KEY=VALUE: " + word), false;
    request->extra_data.emplace_back(word.substr(0, equals), word.substr(equals + 1));
  }
  return true;
}

bool read_request(int argc, char **argv, std::string *dir, bool *wants_reply, LaunchRequest *request) {
  for (int i = 0; i < argc; ++i) {
    if (!is_text(argv[i])) return misuse("a launch request carries UTF-8 text only"), false;
  }
  CommandLine line(
      "APPID [KEY=VALUE …]",
      "Send one launch request, as any application of the phone would. A KEY that is "
      "repeated carries all its values. With --reply prints result=N and the reply's KEY=VALUE lines.");
  line.text("dir", dir, kDirHelp, "DIR");
  line.text("operation", &request->operation, "The request's operation", "OP");
  line.text("uri", &request->uri, "The request's address", "URI");
  line.text("mime", &request->mime, "The request's type", "TYPE");
  line.flag("reply", wants_reply, "Wait for the reply and print it");
  if (!line.parse(argc, argv)) return false;
  std::vector<std::string> words = line.arguments;
  if (words.empty()) return misuse("which application?"), false;
  request->app_id = words[0];
  words.erase(words.begin());
  if (!is_application_id(request->app_id)) return misuse("no application id: " + request->app_id), false;
  return read_extra_data(words, request);
}

void print_reply(GVariant *reply) {
  gint32 result = 0;
  GVariantIter *raw = nullptr;
  g_variant_get(reply, "(ia(ss))", &result, &raw);
  TavroHandle<GVariantIter, g_variant_iter_free> pairs(raw);
  std::printf("result=%d\n", result);
  const char *key = nullptr, *value = nullptr;
  while (g_variant_iter_next(pairs.get(), "(&s&s)", &key, &value)) std::printf("%s=%s\n", key, value);
}

}  // namespace

int command_launch(int argc, char **argv) {
  std::string dir, reason;
  bool wants_reply = false;
  LaunchRequest request;
  if (!read_request(argc, argv, &dir, &wants_reply, &request)) return kUsage;
  State state;
  if (!find_running_phone(dir, &state)) return kFailed;
  TavroObject<GDBusConnection> bus = connect_to_bus(state["bus"], &reason);
  if (!bus) return fail("the phone's bus does not answer: " + reason);
  if (!wants_reply)
    return send_launch_request(bus.get(), request, &reason) ? kDone : fail(request.app_id + ": " + reason);
  TavroVariant reply = send_and_wait(bus.get(), request, &reason);
  if (!reply) return fail(request.app_id + ": " + reason);
  print_reply(reply.get());
  return kDone;
}

int command_exec(int argc, char **argv) {
  std::string dir;
  CommandLine line("-- CMD [ARGUMENT …]",
                   "Run a command inside the phone: same files, bus and display. The exit "
                   "status is the command's, 1 when it could not be run.");
  line.stop_at_first_word();
  line.text("dir", &dir, kDirHelp, "DIR");
  if (!line.parse(argc, argv)) return kUsage;
  if (line.arguments.empty()) return misuse("which command?");
  State state;
  if (!find_running_phone(dir, &state)) return kFailed;
  const int status =
      execute_in_phone(state["control"], line.arguments, STDIN_FILENO, STDOUT_FILENO, STDERR_FILENO);
  return status < 0 ? kFailed : status;
}

}  // namespace phone
