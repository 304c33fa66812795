// tavro-desk: the feedback desk. Prints where it listens and the staff token, then serves until it is ended.
#include <glib-unix.h>
#include <sys/stat.h>

#include <cstdio>
#include <cstdlib>

#include "desk.h"
#include "secret.h"

namespace {

struct Options {
  std::string folder;
  std::string host = "127.0.0.1";
  int port = 0;
};

constexpr int kUsageFault = 2;

// False, with a message, for a command line that is not understood.
bool _read_options(int argc, char **argv, Options &options) {
  char *folder = nullptr, *host = nullptr;
  const GOptionEntry entries[] = {
      {"data", 'd', 0, G_OPTION_ARG_FILENAME, &folder, "Folder of the desk's data", "DIR"},
      {"port", 'p', 0, G_OPTION_ARG_INT, &options.port, "Port to listen on (0: any)", "N"},
      {"host", 0, 0, G_OPTION_ARG_STRING, &host, "Address to listen on (127.0.0.1)", "ADDRESS"},
      {nullptr, 0, 0, G_OPTION_ARG_NONE, nullptr, nullptr, nullptr}};
  GOptionContext *context = g_option_context_new("- receive, show and answer feedback");
  g_option_context_add_main_entries(context, entries, nullptr);
  GError *error = nullptr;
  const bool is_parsed = g_option_context_parse(context, &argc, &argv, &error) && argc == 1;
  g_option_context_free(context);
  GErrorPtr owned(error);
  GCharPtr owned_folder(folder), owned_host(host);
  if (folder) options.folder = folder;
  if (host) options.host = host;
  if (is_parsed && !options.folder.empty() && options.port >= 0 && options.port <= 65535) return true;
  fprintf(stderr, "tavro-desk: %s; see --help\n", error ? error->message : "--data DIR is needed");
  return false;
}

bool _open_desk(Desk &desk, const std::string &folder) {
  if (g_mkdir_with_parents(folder.c_str(), 0700) != 0) {
    g_warning("%s cannot be made: %s", folder.c_str(), g_strerror(errno));
    return false;
  }
  const auto staff_token = keep_secret_file(folder + "/staff_token");
  const auto enrolment = keep_secret_file(folder + "/enrolment");
  if (!staff_token || !enrolment || !desk.store.open(folder) || !desk.files.open(folder)) return false;
  desk.staff_token = *staff_token;
  desk.enrolment_secret = *enrolment;
  return true;
}

// The address that the server listens on, or nothing.
std::string _listen(SoupServer *server, const Options &options) {
  GObjectPtr<GSocketAddress> address(
      g_inet_socket_address_new_from_string(options.host.c_str(), static_cast<guint>(options.port)));
  GError *error = nullptr;
  if (!address ||
      !soup_server_listen(server, address.get(), static_cast<SoupServerListenOptions>(0), &error)) {
    GErrorPtr owned(error);
    fprintf(stderr, "tavro-desk: cannot listen on %s port %d: %s\n", options.host.c_str(), options.port,
            error ? error->message : "no such address");
    return {};
  }
  GSList *uris = soup_server_get_uris(server);
  auto *uri = static_cast<GUri *>(uris->data);
  const bool is_v6 = options.host.find(':') != std::string::npos;
  const std::string host = is_v6 ? "[" + options.host + "]" : options.host;
  const std::string url = "http://" + host + ":" + std::to_string(g_uri_get_port(uri));
  g_slist_free_full(uris, [](gpointer memory) { g_uri_unref(static_cast<GUri *>(memory)); });
  return url;
}

gboolean _quit_cb(gpointer loop) {
  g_main_loop_quit(static_cast<GMainLoop *>(loop));
  return G_SOURCE_CONTINUE;
}

}  // namespace

int main(int argc, char **argv) {
  umask(077);
  Options options;
  if (!_read_options(argc, argv, options)) return kUsageFault;
  Desk desk;
  if (!_open_desk(desk, options.folder)) return EXIT_FAILURE;
  GObjectPtr<SoupServer> server(
      static_cast<SoupServer *>(g_object_new(SOUP_TYPE_SERVER, "server-header", "tavro-desk", nullptr)));
  desk_serve(server.get(), desk);
  const std::string url = _listen(server.get(), options);
  if (url.empty()) return EXIT_FAILURE;

  GMainLoopPtr loop(g_main_loop_new(nullptr, FALSE));
  g_unix_signal_add(SIGTERM, _quit_cb, loop.get());
  g_unix_signal_add(SIGINT, _quit_cb, loop.get());
  printf("desk=%s\ndesk_token=%s\n", url.c_str(), desk.staff_token.c_str());
  fflush(stdout);
  g_main_loop_run(loop.get());
  soup_server_disconnect(server.get());
  return EXIT_SUCCESS;
}
