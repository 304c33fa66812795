#include "tavro_save_copy.h"

#include <Ecore.h>
#include <fcntl.h>
#include <notification.h>
#include <storage.h>
#include <sys/sendfile.h>
#include <sys/stat.h>

#include <cerrno>
#include <cstring>
#include <memory>

#include "tavro-common.h"
#include "tavro_handles.h"
#include "tavro_log.h"
#include "tavro_memory.h"

namespace {

constexpr size_t kPieceBytes = 4 * 1024 * 1024;
constexpr int kMostNames = 1000;

struct copy_job {
  std::string folder, path;
  std::string copy;  // the worker's until it has ended
};

bool _copy_bytes(int from, int to) {
  ssize_t sent = 0;
  do {
    sent = sendfile(to, from, nullptr, kPieceBytes);
  } while (sent > 0 || (sent == -1 && errno == EINTR));
  return sent == 0 && fsync(to) == 0;
}

// Null for what is no file, or cannot be read.
TavroFd _open_original(const std::string &path) {
  TavroFd file(open(path.c_str(), O_RDONLY | O_CLOEXEC | O_NONBLOCK));
  struct stat info = {};
  if (!file || fstat(file.get(), &info) != 0 || S_ISREG(info.st_mode)) return file;
  errno = EINVAL;
  return TavroFd();
}

// "name.jpg", "name (2).jpg", "name (3).jpg" …
std::string _numbered(const std::string &name, int number) {
  if (number == 1) return name;
  const size_t dot = name.rfind('.');
  const size_t end = dot == std::string::npos || dot == 0 ? name.size() : dot;
  return name.substr(0, end) + " (" + std::to_string(number) + ")" + name.substr(end);
}

// The unfinished file under the first name that is free; empty when it cannot be had.
std::string _give_name(const std::string &unfinished, const std::string &folder, const std::string &name) {
  for (int number = 1; number <= kMostNames; ++number) {
    std::string path = folder + "/" + _numbered(name, number);
    if (renameat2(AT_FDCWD, unfinished.c_str(), AT_FDCWD, path.c_str(), RENAME_NOREPLACE) == 0) return path;
    if (errno != EEXIST) break;
  }
  return {};
}

std::string _failed(const std::string &path) {
  TAVRO_LOGE("no copy of %s: %s", path.c_str(), std::strerror(errno));
  return {};
}

void _work(void *data, Ecore_Thread *) {
  auto *job = static_cast<copy_job *>(data);
  job->copy = tavro_copy_into(job->folder, job->path);
}

void _work_ended_cb(void *data, Ecore_Thread *) {
  const std::unique_ptr<copy_job> job(static_cast<copy_job *>(data));
  if (job->copy.empty()) {
    notification_status_message_post(tavro_text("IDS_OB_TPOP_COPY_FAILED"));
    return;
  }
  const std::string name = job->copy.substr(job->copy.rfind('/') + 1);
  const TavroGText message(g_strdup_printf(tavro_text("IDS_OB_TPOP_SAVED_AS_PS"), name.c_str()));
  notification_status_message_post(message.get());
}

}  // namespace

std::string tavro_copy_into(const std::string &folder, const std::string &path) {
  const TavroFd original = _open_original(path);
  if (!original) return _failed(path);
  std::string name = folder + "/.copy.XXXXXX";
  const TavroFd copy(mkostemp(name.data(), O_CLOEXEC));
  if (!copy) return _failed(path);
  TavroUnfinishedFile unfinished(name);
  if (!_copy_bytes(original.get(), copy.get())) return _failed(path);
  const std::string result = _give_name(name, folder, path.substr(path.rfind('/') + 1));
  if (result.empty()) return _failed(path);
  unfinished.keep();
  return result;
}

void tavro_save_copy(const char *path) {
  char *found = nullptr;
  if (storage_get_directory(0, STORAGE_DIRECTORY_IMAGES, &found) != STORAGE_ERROR_NONE || !found) {
    notification_status_message_post(tavro_text("IDS_OB_TPOP_COPY_FAILED"));
    return;
  }
  const TavroText folder(TAVRO_ADOPT(found));
  tavro_create_dir(folder.get());
  ecore_thread_run(_work, _work_ended_cb, _work_ended_cb, new copy_job{folder.get(), path, {}});
}
