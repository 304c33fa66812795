#include "svc_content.h"

#include <sys/mman.h>

#include <algorithm>
#include <vector>

#include "secret.h"
#include "tavro_image_strip.h"

namespace {

using Bytes = std::vector<unsigned char>;

struct Job {
  SvcContent content;
  bool may_be_picture;
  std::function<void(const SvcContent &)> then;
};

bool _read(int fd, int64_t size, Bytes *bytes) {
  bytes->resize(static_cast<size_t>(size));
  return pread(fd, bytes->data(), bytes->size(), 0) == size;
}

std::shared_ptr<UniqueFd> _in_memory(const Bytes &bytes) {
  auto fd = std::make_shared<UniqueFd>(memfd_create("picture", MFD_CLOEXEC));
  const bool is_whole =
      *fd && write(fd->get(), bytes.data(), bytes.size()) == static_cast<ssize_t>(bytes.size());
  return is_whole ? fd : nullptr;
}

// Why a picture cannot be sent; null when it can, or when it is none.
const char *_strip(SvcContent *content) {
  Bytes bytes, stripped;
  const int fd = content->fd->get();
  if (!_read(fd, std::min<int64_t>(content->size, kTellingBytes), &bytes)) return "it cannot be read";
  // The first bytes alone are no whole picture, but they tell whether there is one.
  if (tavro_image_strip(bytes, &stripped) == TAVRO_STRIP_NO_PICTURE) return nullptr;
  if (!_read(fd, content->size, &bytes)) return "it cannot be read";
  if (tavro_image_strip(bytes, &stripped) != TAVRO_STRIP_DONE)
    return "what it says beside its picture cannot be taken out";
  content->fd = _in_memory(stripped);
  content->size = static_cast<int64_t>(stripped.size());
  return content->fd ? nullptr : "there is no memory for it";
}

void _work(GTask *task, gpointer, gpointer data, GCancellable *) {
  auto *job = static_cast<Job *>(data);
  SvcContent &content = job->content;
  if (job->may_be_picture) content.why = _strip(&content);
  if (!content.why) {
    const auto sha256 = sha256_of_file(content.fd->get(), content.size);
    content.sha256 = sha256.value_or("");
    if (!sha256) content.why = "it cannot be read";
  }
  if (content.why) content.fd.reset();
  g_task_return_boolean(task, TRUE);
}

void _ended_cb(GObject *, GAsyncResult *, gpointer data) {
  const auto *job = static_cast<Job *>(data);
  job->then(job->content);
}

}  // namespace

void svc_make_content(std::shared_ptr<UniqueFd> fd, int64_t size, bool may_be_picture,
                      std::function<void(const SvcContent &)> then) {
  auto *job = new Job{{std::move(fd), size, "", nullptr}, may_be_picture, std::move(then)};
  GObjectPtr<GTask> task(g_task_new(nullptr, nullptr, _ended_cb, job));
  g_task_set_task_data(task.get(), job, [](gpointer memory) { delete static_cast<Job *>(memory); });
  g_task_run_in_thread(task.get(), _work);
}
