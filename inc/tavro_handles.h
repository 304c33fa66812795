// Scoped owners for the handles of C libraries: each closes or frees what it holds when it goes out of scope.
// A function with an out parameter is given tavro_out(owner):
//
//   TavroError error;
//   if (!g_key_file_load_from_file(file.get(), path, G_KEY_FILE_NONE, tavro_out(error))) ...error->message...
#pragma once

#include <app_control.h>
#include <dirent.h>
#include <gio/gio.h>
#include <sqlite3.h>
#include <unistd.h>

#include <cerrno>
#include <cstdio>
#include <memory>
#include <string>
#include <utility>

// Deleter that calls one function of a C library, whatever it returns.
template <auto Function>
struct TavroCall {
  template <typename T>
  void operator()(T *handle) const {
    Function(handle);
  }
};

template <typename T, auto Function>
using TavroHandle = std::unique_ptr<T, TavroCall<Function>>;

using TavroDb = TavroHandle<sqlite3, sqlite3_close>;
using TavroStmt = TavroHandle<sqlite3_stmt, sqlite3_finalize>;
using TavroSqlText = TavroHandle<char, sqlite3_free>;
using TavroError = TavroHandle<GError, g_error_free>;
using TavroVariant = TavroHandle<GVariant, g_variant_unref>;
using TavroKeyFile = TavroHandle<GKeyFile, g_key_file_unref>;
using TavroStrv = TavroHandle<char *, g_strfreev>;
using TavroFile = TavroHandle<FILE, std::fclose>;
using TavroDir = TavroHandle<DIR, closedir>;
using TavroAppControl = TavroHandle<std::remove_pointer_t<app_control_h>, app_control_destroy>;

// A text of GLib that lives no longer than the function which asked for it. What is kept is a TavroText.
using TavroGText = TavroHandle<char, g_free>;

// One reference to a GObject.
template <typename T>
using TavroObject = std::unique_ptr<T, TavroCall<g_object_unref>>;

// Out parameter of an owner: what the function wrote becomes the owner's at the end of the full expression.
template <typename Owner>
class TavroOut {
 public:
  explicit TavroOut(Owner &owner) : owner_(owner) {}
  TavroOut(const TavroOut &) = delete;
  TavroOut &operator=(const TavroOut &) = delete;
  ~TavroOut() { owner_.reset(raw_); }
  operator typename Owner::pointer *() { return &raw_; }

 private:
  Owner &owner_;
  typename Owner::pointer raw_ = nullptr;
};

template <typename Owner>
TavroOut<Owner> tavro_out(Owner &owner) {
  return TavroOut<Owner>(owner);
}

// Keeps errno as it was: what closes and removes behind a failure must not hide its reason.
class TavroKeptErrno {
 public:
  TavroKeptErrno() = default;
  TavroKeptErrno(const TavroKeptErrno &) = delete;
  TavroKeptErrno &operator=(const TavroKeptErrno &) = delete;
  ~TavroKeptErrno() { errno = reason_; }

 private:
  const int reason_ = errno;
};

// A file descriptor; -1 when it holds none. Its end leaves errno alone.
class TavroFd {
 public:
  explicit TavroFd(int fd = -1) : fd_(fd) {}
  TavroFd(TavroFd &&other) noexcept : fd_(std::exchange(other.fd_, -1)) {}
  TavroFd &operator=(TavroFd &&other) noexcept {
    std::swap(fd_, other.fd_);
    return *this;
  }
  ~TavroFd() {
    const TavroKeptErrno kept;
    if (fd_ >= 0) close(fd_);
  }
  int get() const { return fd_; }
  int release() { return std::exchange(fd_, -1); }
  explicit operator bool() const { return fd_ >= 0; }

 private:
  int fd_;
};

// Removes a half-made file unless keep() was called once it had its final name. Its end leaves errno alone.
class TavroUnfinishedFile {
 public:
  explicit TavroUnfinishedFile(std::string path) : path_(std::move(path)) {}
  TavroUnfinishedFile(const TavroUnfinishedFile &) = delete;
  TavroUnfinishedFile &operator=(const TavroUnfinishedFile &) = delete;
  ~TavroUnfinishedFile() {
    const TavroKeptErrno kept;
    if (!path_.empty()) unlink(path_.c_str());
  }
  void keep() { path_.clear(); }

 private:
  std::string path_;
};
