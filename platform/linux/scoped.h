// Owners for the handles of the C libraries that the platform uses: each frees its handle with the function
// that belongs to it, so that no return path has to.
#pragma once

#include <gio/gio.h>
#include <sqlite3.h>
#include <unistd.h>

#include <cstdlib>
#include <cstring>
#include <memory>

namespace platform {

template <auto Function>
struct FreeWith {
  template <typename T>
  void operator()(T *handle) const {
    Function(handle);
  }
};

template <typename T>
using ScopedObject = std::unique_ptr<T, FreeWith<g_object_unref>>;
using ScopedBus = ScopedObject<GDBusConnection>;
using ScopedMessage = ScopedObject<GDBusMessage>;
using ScopedVariant = std::unique_ptr<GVariant, FreeWith<g_variant_unref>>;
using ScopedError = std::unique_ptr<GError, FreeWith<g_error_free>>;
using ScopedGText = std::unique_ptr<char, FreeWith<g_free>>;
using ScopedKeyFile = std::unique_ptr<GKeyFile, FreeWith<g_key_file_unref>>;
using ScopedText = std::unique_ptr<char, FreeWith<free>>;
using ScopedDatabase = std::unique_ptr<sqlite3, FreeWith<sqlite3_close_v2>>;
using ScopedStatement = std::unique_ptr<sqlite3_stmt, FreeWith<sqlite3_finalize>>;

// Receives the GError of one call: `call(..., error.out())`.
class ErrorSlot {
 public:
  ErrorSlot() = default;
  ErrorSlot(const ErrorSlot &) = delete;
  ErrorSlot &operator=(const ErrorSlot &) = delete;
  ~ErrorSlot() { g_clear_error(&error_); }

  GError **out() {
    g_clear_error(&error_);
    return &error_;
  }
  const GError *get() const { return error_; }
  const char *text() const { return error_ ? error_->message : "no error"; }
  bool is(GQuark domain, int code) const { return g_error_matches(error_, domain, code); }

 private:
  GError *error_ = nullptr;
};

// A file descriptor, closed at the end.
class ScopedFd {
 public:
  explicit ScopedFd(int fd = -1) : fd_(fd) {}
  ScopedFd(const ScopedFd &) = delete;
  ScopedFd &operator=(const ScopedFd &) = delete;
  ~ScopedFd() { reset(); }

  int get() const { return fd_; }
  explicit operator bool() const { return fd_ >= 0; }
  void reset(int fd = -1) {
    if (fd_ >= 0) close(fd_);
    fd_ = fd;
  }

 private:
  int fd_;
};

// A copy for a caller who frees it with free(); null for null.
inline char *duplicate(const char *text) {
  return text ? strdup(text) : nullptr;
}

}  // namespace platform
