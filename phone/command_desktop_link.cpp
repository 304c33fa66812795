#include <glib-unix.h>
#include <signal.h>

#include "commands.h"
#include "desktop_link.h"
#include "options.h"

namespace phone {

namespace {

gboolean end_cb(gpointer loop) {
  g_main_loop_quit(static_cast<GMainLoop *>(loop));
  return G_SOURCE_CONTINUE;
}

}  // namespace

int command_desktop_link(int argc, char **argv) {
  CommandLine line("", "Serve touched notifications and badges of a phone. Started by the phone itself.");
  if (!line.parse(argc, argv)) return kUsage;
  if (!platform::start_desktop_link()) return kFailed;
  GMainLoop *loop = g_main_loop_new(nullptr, FALSE);
  for (const int number : {SIGINT, SIGTERM, SIGHUP}) g_unix_signal_add(number, end_cb, loop);
  g_main_loop_run(loop);
  g_main_loop_unref(loop);
  return kDone;
}

}  // namespace phone
