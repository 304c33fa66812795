// What thousands of launch requests leave behind in the running client: memory and open files after them,
// less what there was after as many others that warmed it up. Runs inside a phone; the first request starts
// the client.
//
//   launch_growth WARM_UP REQUESTS
#include <gio/gio.h>

#include <cstdio>
#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <string>
#include <utility>
#include <vector>

#include "tavro_handles.h"

namespace {

constexpr char kClient[] = "corvane.tavro-lite";

struct request {
  const char *operation;
  std::vector<std::pair<const char *, const char *>> extra_data;
};

// What the phone's programs send a running client most, a screen refresh, and values that make no sense.
const request kRequests[] = {
    {"http://tizen.org/appcontrol/operation/default", {}},
    {"TAVRO_UPDATE_HISTORY",
     {{"TAVRO_SERVER_UPLOAD_STATUS", "none"}, {"TAVRO_SERVER_PUSH_NOTI_VOC_ID", "1"}}},
    {"TAVRO_UPDATE_HISTORY",
     {{"TAVRO_SERVER_PUSH_NOTI_STATUS", "TAVRO_SERVER_PUSH_NOTI_UPDATED"},
      {"TAVRO_SERVER_PUSH_NOTI_VOC_ID", "424242"},
      {"TAVRO_SERVER_PUSH_NOTI_VOC_COMMENTS", "an answer"}}},
    {"TAVRO_BANNER_INFO", {}},
    {"http://tizen.org/appcontrol/operation/default",
     {{"TAVRO_NOTIFICATION_EVENT", "TAVRO_NOTIFICATION_CLICKED"},
      {"TAVRO_NOTIFICATION_TYPE", "TAVRO_NOTIFICATION_VOC"}}},
    {"NOBODY_KNOWS_THIS", {{"TAVRO_NOTIFICATION_EVENT", "neither"}}},
};

bool _send(GDBusConnection *bus, const request &one) {
  GVariantBuilder pairs;
  g_variant_builder_init(&pairs, G_VARIANT_TYPE("a(ss)"));
  for (const auto &[key, value] : one.extra_data) g_variant_builder_add(&pairs, "(ss)", key, value);
  const TavroVariant reply(
      g_dbus_connection_call_sync(bus, kClient, "/corvane/tavro_lite", "org.tavro.AppControl1", "Launch",
                                  g_variant_new("(sssa(ss))", one.operation, "", "", &pairs), nullptr,
                                  G_DBUS_CALL_FLAGS_NONE, G_MAXINT, nullptr, nullptr));
  return reply != nullptr;
}

bool _send_many(GDBusConnection *bus, int count) {
  for (int i = 0; i < count; ++i)
    if (!_send(bus, kRequests[static_cast<size_t>(i) % std::size(kRequests)])) return false;
  return true;
}

std::string _process_folder(GDBusConnection *bus) {
  const TavroVariant reply(g_dbus_connection_call_sync(bus, "org.freedesktop.DBus", "/org/freedesktop/DBus",
                                                       "org.freedesktop.DBus", "GetConnectionUnixProcessID",
                                                       g_variant_new("(s)", kClient), G_VARIANT_TYPE("(u)"),
                                                       G_DBUS_CALL_FLAGS_NONE, -1, nullptr, nullptr));
  guint32 pid = 0;
  if (reply) g_variant_get(reply.get(), "(u)", &pid);
  return "/proc/" + std::to_string(pid);
}

struct usage {
  long kilobytes = 0;  // of memory that is the process's own
  long files = 0;
};

usage _usage(const std::string &process) {
  usage now;
  std::ifstream status(process + "/status");
  for (std::string line; std::getline(status, line);)
    if (line.compare(0, 8, "RssAnon:") == 0) now.kilobytes = std::atol(line.c_str() + 8);
  for (const auto &entry : std::filesystem::directory_iterator(process + "/fd")) {
    static_cast<void>(entry);
    now.files++;
  }
  return now;
}

}  // namespace

int main(int argc, char **argv) {
  if (argc != 3) {
    std::fprintf(stderr, "usage: launch_growth WARM_UP REQUESTS\n");
    return 2;
  }
  const TavroObject<GDBusConnection> bus(g_bus_get_sync(G_BUS_TYPE_SESSION, nullptr, nullptr));
  if (!bus || !_send_many(bus.get(), std::atoi(argv[1]))) return 1;
  const std::string process = _process_folder(bus.get());
  const usage before = _usage(process);
  if (!_send_many(bus.get(), std::atoi(argv[2]))) return 1;
  if (_process_folder(bus.get()) != process) {
    std::fprintf(stderr, "launch_growth: the client ended meanwhile\n");
    return 1;
  }
  const usage after = _usage(process);
  std::printf("launch_growth_kb=%ld launch_growth_files=%ld launch_kb=%ld launch_files=%ld\n",
              after.kilobytes - before.kilobytes, after.files - before.files, after.kilobytes, after.files);
  return 0;
}
