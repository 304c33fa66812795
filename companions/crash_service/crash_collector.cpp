#include "crash_collector.h"

#include <app_control.h>

#include "crash_application.h"
#include "crash_log.h"
#include "tavro_crash_service.h"

namespace {

constexpr char kClient[] = "corvane.tavro-lite";
constexpr size_t kMostWaiting = 32;
constexpr size_t kMostPrograms = 200;  // that are remembered
constexpr size_t kFoldersAtOnce = 3;   // of one program within
constexpr int64_t kSpanUs = 10 * 60 * G_USEC_PER_SEC;

}  // namespace

struct CrashCollector::Work {
  Crash crash;
  int uncounted;
  CrashFolder folder;  // what came of it
};

void CrashCollector::add(const Crash &crash) {
  if (g_cancellable_is_cancelled(stop_.get()) || taken_.count(crash.id())) return;
  if (waiting_.size() >= kMostWaiting) {
    CRASH_LOGE("too many crashes at once, one of %s is not collected", printable(crash.program).c_str());
    book_.set_done(crash.id());
  } else if (!may_have_folder(crash)) {
    book_.set_done(crash.id());
  } else {
    waiting_.push_back(crash);
    taken_.insert(crash.id());
    start_next();
  }
}

bool CrashCollector::may_have_folder(const Crash &crash) {
  if (recent_.size() > kMostPrograms) recent_.clear();
  Recent &recent = recent_[crash.program];
  auto &times = recent.folders_us;
  while (!times.empty() && crash.time_us - times.front() > kSpanUs) times.pop_front();
  if (times.size() < kFoldersAtOnce) return times.push_back(crash.time_us), true;
  if (recent.uncounted++ == 0) {
    CRASH_LOGE("%s crashes again and again; for a while its crashes are only counted",
               printable(crash.program).c_str());
  }
  return false;
}

void CrashCollector::start_next() {
  while (!is_working_ && !waiting_.empty()) {
    Crash crash = waiting_.front();
    waiting_.pop_front();
    if (!book_.begin(crash.id())) {
      taken_.erase(crash.id());
      continue;
    }
    is_working_ = true;
    const int uncounted = std::exchange(recent_[crash.program].uncounted, 0);
    const TavroObject<GTask> task(g_task_new(nullptr, stop_.get(), done_cb, this));
    g_task_set_task_data(task.get(), new Work{std::move(crash), uncounted, {}},
                         [](gpointer memory) { delete static_cast<Work *>(memory); });
    g_task_run_in_thread(task.get(), work_thread);
  }
}

void CrashCollector::work_thread(GTask *task, gpointer, gpointer data, GCancellable *stop) {
  auto *work = static_cast<Work *>(data);
  work->folder = make_crash_folder(work->crash, work->uncounted, stop);
  if (!work->folder.name.empty()) keep_newest_crash_folders();
  g_task_return_boolean(task, TRUE);
}

void CrashCollector::done_cb(GObject *, GAsyncResult *result, gpointer data) {
  auto *self = static_cast<CrashCollector *>(data);
  const auto *work = static_cast<Work *>(g_task_get_task_data(G_TASK(result)));
  self->is_working_ = false;
  if (g_cancellable_is_cancelled(self->stop_.get())) return;
  if (!work->folder.name.empty()) {
    CRASH_LOGI("%s has crashed: %s", printable(work->crash.program).c_str(), work->folder.name.c_str());
    const std::string id = folder_id(work->folder.name);
    if (!self->book_.is_done(id)) tell_client(work->folder);
    self->book_.set_done(id);
  }
  self->book_.set_done(work->crash.id());
  self->taken_.erase(work->crash.id());
  self->start_next();
}

void CrashCollector::stop() {
  waiting_.clear();
  g_cancellable_cancel(stop_.get());
  while (is_working_) g_main_context_iteration(nullptr, TRUE);
}

std::string folder_id(const std::string &name) {
  const TavroGText hash(g_compute_checksum_for_string(G_CHECKSUM_SHA256, name.c_str(), -1));
  return "folder-" + std::string(hash.get(), 16);
}

void tell_client(const CrashFolder &folder) {
  app_control_h handle = nullptr;
  if (app_control_create(&handle) != APP_CONTROL_ERROR_NONE) return;
  const TavroAppControl request(handle);
  app_control_set_app_id(handle, kClient);
  app_control_set_operation(handle, TAVRO_CRASH_OPERATION);
  app_control_add_extra_data(handle, TAVRO_CRASH_APP_ID, folder.app_id.c_str());
  app_control_add_extra_data(handle, TAVRO_CRASH_APP_NAME, folder.app_name.c_str());
  app_control_add_extra_data(handle, TAVRO_CRASH_TIME, std::to_string(folder.time_ms).c_str());
  app_control_add_extra_data(handle, TAVRO_CRASH_FOLDER, folder.name.c_str());
  const int error = app_control_send_launch_request(handle, nullptr, nullptr);
  if (error != APP_CONTROL_ERROR_NONE) CRASH_LOGE("the client cannot be told of a crash: %d", error);
}
