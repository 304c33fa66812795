// Waiting longer after every failure: 1, 2, 4 … 30 seconds. Main loop only.
#pragma once

#include <glib.h>

#include <algorithm>
#include <functional>

class Retry {
 public:
  explicit Retry(std::function<void()> action) : action_(std::move(action)) {}
  Retry(const Retry &) = delete;
  Retry &operator=(const Retry &) = delete;
  ~Retry() { cancel(); }

  // Runs the action after the current wait; the next wait is twice as long.
  void later() {
    cancel();
    timer_ = g_timeout_add(wait_ms_, run_cb, this);
    wait_ms_ = std::min(wait_ms_ * 2, kLongestFactor * base_ms());
  }
  void cancel() {
    if (timer_) g_source_remove(timer_);
    timer_ = 0;
  }
  // Something succeeded: the next failure waits the shortest time again.
  void reset() {
    cancel();
    wait_ms_ = base_ms();
  }
  bool is_waiting() const { return timer_ != 0; }

 private:
  static constexpr guint kLongestFactor = 30;

  // TAVRO_SVC_RETRY_MS shortens the first wait for tests.
  static guint base_ms() {
    const char *set = g_getenv("TAVRO_SVC_RETRY_MS");
    const guint64 ms = set ? g_ascii_strtoull(set, nullptr, 10) : 0;
    return ms > 0 && ms <= 60000 ? static_cast<guint>(ms) : 1000;
  }
  static gboolean run_cb(gpointer data) {
    auto *self = static_cast<Retry *>(data);
    self->timer_ = 0;
    self->action_();
    return G_SOURCE_REMOVE;
  }

  std::function<void()> action_;
  guint timer_ = 0;
  guint wait_ms_ = base_ms();
};
