// Owners for handles of C libraries: each is released by its deleter, never by hand.
#pragma once

#include <gio/gio.h>
#include <sqlite3.h>
#include <unistd.h>

#include <memory>
#include <utility>

struct GObjectDeleter {
  void operator()(gpointer object) const { g_object_unref(object); }
};
template <class T>
using GObjectPtr = std::unique_ptr<T, GObjectDeleter>;

// A second owner for an object that somebody else holds too.
template <class T>
GObjectPtr<T> share(T *object) {
  return GObjectPtr<T>(static_cast<T *>(g_object_ref(object)));
}

struct GFreeDeleter {
  void operator()(gpointer memory) const { g_free(memory); }
};
using GCharPtr = std::unique_ptr<char, GFreeDeleter>;

struct GErrorDeleter {
  void operator()(GError *error) const { g_error_free(error); }
};
using GErrorPtr = std::unique_ptr<GError, GErrorDeleter>;

struct GBytesDeleter {
  void operator()(GBytes *bytes) const { g_bytes_unref(bytes); }
};
using GBytesPtr = std::unique_ptr<GBytes, GBytesDeleter>;

struct GChecksumDeleter {
  void operator()(GChecksum *checksum) const { g_checksum_free(checksum); }
};
using GChecksumPtr = std::unique_ptr<GChecksum, GChecksumDeleter>;

struct GMainLoopDeleter {
  void operator()(GMainLoop *loop) const { g_main_loop_unref(loop); }
};
using GMainLoopPtr = std::unique_ptr<GMainLoop, GMainLoopDeleter>;

struct GHashTableDeleter {
  void operator()(GHashTable *table) const { g_hash_table_unref(table); }
};
using GHashTablePtr = std::unique_ptr<GHashTable, GHashTableDeleter>;

struct SqliteDeleter {
  void operator()(sqlite3 *connection) const { sqlite3_close(connection); }
};
using SqlitePtr = std::unique_ptr<sqlite3, SqliteDeleter>;

struct SqliteStatementDeleter {
  void operator()(sqlite3_stmt *statement) const { sqlite3_finalize(statement); }
};
using SqliteStatementPtr = std::unique_ptr<sqlite3_stmt, SqliteStatementDeleter>;

// An open file descriptor; -1 means none.
class UniqueFd {
 public:
  explicit UniqueFd(int fd = -1) : fd_(fd) {}
  UniqueFd(UniqueFd &&other) noexcept : fd_(std::exchange(other.fd_, -1)) {}
  UniqueFd &operator=(UniqueFd &&other) noexcept {
    std::swap(fd_, other.fd_);
    return *this;
  }
  ~UniqueFd() {
    if (fd_ >= 0) close(fd_);
  }
  int get() const { return fd_; }
  explicit operator bool() const { return fd_ >= 0; }

 private:
  int fd_;
};
