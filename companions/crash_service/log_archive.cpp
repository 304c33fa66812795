#include "log_archive.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <zip.h>

#include <array>
#include <cerrno>
#include <cstdio>
#include <cstring>
#include <ctime>
#include <string>
#include <type_traits>

#include "crash_log.h"
#include "tavro_crash_service.h"
#include "tavro_handles.h"

namespace {

constexpr char kPrefix[] = "SystemLog_";
constexpr char kEntry[] = "system.log";
constexpr char kUnfinished[] = ".SystemLog.part";

struct ZipCloser {
  void operator()(void *zip) const { zipClose(zip, nullptr); }
};
using Zip = std::unique_ptr<void, ZipCloser>;

struct tm local_time() {
  const time_t now = std::time(nullptr);
  struct tm local;
  localtime_r(&now, &local);
  return local;
}

bool add_log(zipFile zip, const std::string &log) {
  const struct tm now = local_time();
  // Unsigned in some versions of minizip, signed in others.
  const auto put = [](auto &field, int value) {
    field = static_cast<std::remove_reference_t<decltype(field)>>(value);
  };
  zip_fileinfo info = {};
  put(info.tmz_date.tm_year, now.tm_year + 1900);
  put(info.tmz_date.tm_mon, now.tm_mon);
  put(info.tmz_date.tm_mday, now.tm_mday);
  put(info.tmz_date.tm_hour, now.tm_hour);
  put(info.tmz_date.tm_min, now.tm_min);
  put(info.tmz_date.tm_sec, now.tm_sec);
  return zipOpenNewFileInZip(zip, kEntry, &info, nullptr, 0, nullptr, 0, nullptr, Z_DEFLATED,
                             Z_DEFAULT_COMPRESSION) == ZIP_OK &&
         zipWriteInFileInZip(zip, log.data(), static_cast<unsigned>(log.size())) == ZIP_OK &&
         zipCloseFileInZip(zip) == ZIP_OK;
}

bool write_zip(const std::string &path, const std::string &log) {
  Zip zip(zipOpen(path.c_str(), APPEND_STATUS_CREATE));
  if (!zip || !add_log(zip.get(), log)) return false;
  return zipClose(zip.release(), nullptr) == ZIP_OK;
}

// Logs of the same second are numbered.
std::string unused_name() {
  const struct tm now = local_time();
  std::array<char, 64> stamp;
  strftime(stamp.data(), stamp.size(), "%Y%m%d_%H%M%S", &now);
  const std::string base = std::string(kPrefix) + stamp.data();
  std::string name = base + ".zip";
  struct stat info;
  for (int number = 2; lstat((TAVRO_LOG_DUMP_FOLDER + name).c_str(), &info) == 0; ++number) {
    name = base + "_" + std::to_string(number) + ".zip";
  }
  return name;
}

std::string failure(const char *what, std::string *reason) {
  // The archive's library reports some failures without their cause.
  *reason = std::string(what) + (errno ? std::string(": ") + std::strerror(errno) : "");
  return {};
}

bool sync_folder() {
  const TavroFd folder(open(TAVRO_LOG_DUMP_FOLDER, O_RDONLY | O_DIRECTORY | O_CLOEXEC));
  return folder && fsync(folder.get()) == 0;
}

}  // namespace

std::string write_log_archive(const std::string &log, std::string *reason) {
  if (log.empty()) return *reason = "there is no log of the last hour", "";
  if (g_mkdir_with_parents(TAVRO_LOG_DUMP_FOLDER, 0700) != 0) return failure("no log folder", reason);
  // One name for what is not finished: what a killed service left is written over.
  const std::string path = std::string(TAVRO_LOG_DUMP_FOLDER) + kUnfinished;
  const TavroFd file(open(path.c_str(), O_WRONLY | O_CREAT | O_TRUNC | O_CLOEXEC | O_NOFOLLOW, 0600));
  if (!file) return failure("no file for the log", reason);
  TavroUnfinishedFile unfinished(path);
  errno = 0;
  if (!write_zip(path, log) || fsync(file.get()) != 0) return failure("the log was not written", reason);
  const std::string name = unused_name();
  if (rename(path.c_str(), (TAVRO_LOG_DUMP_FOLDER + name).c_str()) != 0)
    return failure("the log got no name", reason);
  unfinished.keep();
  if (!sync_folder()) CRASH_LOGE("%s: %s", TAVRO_LOG_DUMP_FOLDER, std::strerror(errno));
  return name;
}
