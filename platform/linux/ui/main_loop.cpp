#include "main_loop.h"

#include <Ecore.h>
#include <glib.h>
#include <sys/select.h>

#include <algorithm>
#include <cerrno>
#include <vector>

namespace {

std::vector<GPollFD> poll_fds;

// Ask GLib what it waits for; the vector grows until all fits. Returns the number of descriptors.
int query_glib(GMainContext *context, int priority, int *timeout_ms) {
  while (true) {
    const int wanted = g_main_context_query(context, priority, timeout_ms, poll_fds.data(),
                                            static_cast<int>(poll_fds.size()));
    if (wanted <= static_cast<int>(poll_fds.size())) return wanted;
    poll_fds.resize(static_cast<size_t>(wanted));
  }
}

// Descriptors that ecore watches too stay in its sets afterwards; the others are ours to remove.
struct Borrowed {
  int fd;
  bool in_read, in_write, in_error;
};

std::vector<Borrowed> borrowed;

void add_glib_fds(int count, int *highest, fd_set *read_set, fd_set *write_set, fd_set *error_set) {
  borrowed.clear();
  for (int i = 0; i < count; ++i) {
    GPollFD &wanted = poll_fds[static_cast<size_t>(i)];
    wanted.revents = 0;
    if (wanted.fd < 0 || wanted.fd >= FD_SETSIZE) continue;
    borrowed.push_back({wanted.fd, FD_ISSET(wanted.fd, read_set) != 0, FD_ISSET(wanted.fd, write_set) != 0,
                        FD_ISSET(wanted.fd, error_set) != 0});
    if (wanted.events & (G_IO_IN | G_IO_HUP)) FD_SET(wanted.fd, read_set);
    if (wanted.events & G_IO_OUT) FD_SET(wanted.fd, write_set);
    if (wanted.events & (G_IO_PRI | G_IO_ERR)) FD_SET(wanted.fd, error_set);
    *highest = std::max(*highest, wanted.fd + 1);
  }
}

void collect_glib_events(int count, int ready, const fd_set *read_set, const fd_set *write_set,
                         const fd_set *error_set) {
  for (int i = 0; i < count && ready > 0; ++i) {
    GPollFD &wanted = poll_fds[static_cast<size_t>(i)];
    if (wanted.fd < 0 || wanted.fd >= FD_SETSIZE) continue;
    int events = 0;
    if (FD_ISSET(wanted.fd, read_set)) events |= G_IO_IN;
    if (FD_ISSET(wanted.fd, write_set)) events |= G_IO_OUT;
    if (FD_ISSET(wanted.fd, error_set)) events |= G_IO_PRI | G_IO_ERR;
    wanted.revents = static_cast<gushort>(events & (wanted.events | G_IO_ERR | G_IO_HUP));
  }
}

// Backwards: of a descriptor that GLib names twice, the first entry has what ecore had asked for.
int remove_glib_fds(int ready, fd_set *read_set, fd_set *write_set, fd_set *error_set) {
  const auto restore = [&ready](int fd, bool belongs, fd_set *set) {
    if (belongs || !FD_ISSET(fd, set)) return;
    FD_CLR(fd, set);
    if (ready > 0) --ready;
  };
  for (auto entry = borrowed.rbegin(); entry != borrowed.rend(); ++entry) {
    restore(entry->fd, entry->in_read, read_set);
    restore(entry->fd, entry->in_write, write_set);
    restore(entry->fd, entry->in_error, error_set);
  }
  return ready;
}

// Stands in for ecore's select(): waits for both loops, serves GLib's part, gives ecore its own.
int merged_select(int highest, fd_set *read_set, fd_set *write_set, fd_set *error_set, timeval *timeout) {
  GMainContext *context = g_main_context_default();
  if (!g_main_context_acquire(context)) return select(highest, read_set, write_set, error_set, timeout);
  int priority = 0, glib_timeout_ms = -1;
  g_main_context_prepare(context, &priority);
  const int count = query_glib(context, priority, &glib_timeout_ms);
  timeval glib_wait = {glib_timeout_ms / 1000, (glib_timeout_ms % 1000) * 1000};
  timeval *wait = timeout;
  if (glib_timeout_ms >= 0 && (!timeout || timercmp(&glib_wait, timeout, <))) wait = &glib_wait;

  add_glib_fds(count, &highest, read_set, write_set, error_set);
  int ready = select(highest, read_set, write_set, error_set, wait);
  const int saved_errno = errno;
  collect_glib_events(count, ready, read_set, write_set, error_set);
  if (ready > 0) ready = remove_glib_fds(ready, read_set, write_set, error_set);
  // Dispatching may run a nested loop, which uses the vectors again: nothing below reads them.
  if (g_main_context_check(context, priority, poll_fds.data(), count)) g_main_context_dispatch(context);
  g_main_context_release(context);
  errno = saved_errno;
  return ready;
}

}  // namespace

namespace platform {

void merge_glib_into_ecore() {
  ecore_main_loop_select_func_set(merged_select);
}

void separate_glib_from_ecore() {
  ecore_main_loop_select_func_set(select);
}

}  // namespace platform
