#include "crash_jobs.h"

#include <app_control.h>

#include <filesystem>
#include <utility>

#include "crash_log.h"
#include "log_archive.h"
#include "log_sources.h"
#include "tavro_crash_service.h"

namespace {

constexpr char kClient[] = "corvane.tavro-lite";
constexpr guint kJournalSeconds = 10;  // well below what the client waits for its log

// A log that nobody is told of.
void delete_unclaimed(const std::string &file) {
  if (!file.empty()) unlink((TAVRO_LOG_DUMP_FOLDER + file).c_str());
}

void answer(const std::string &file, const std::string &reason) {
  app_control_h handle = nullptr;
  if (app_control_create(&handle) != APP_CONTROL_ERROR_NONE) return;
  const TavroAppControl request(handle);
  app_control_set_app_id(handle, kClient);
  app_control_set_operation(handle, TAVRO_DUMP_LOG_OPERATION);
  if (file.empty())
    app_control_add_extra_data(handle, TAVRO_DUMP_LOG_ERROR, reason.c_str());
  else
    app_control_add_extra_data(handle, TAVRO_DUMP_LOG_FILE, file.c_str());
  const int error = app_control_send_launch_request(handle, nullptr, nullptr);
  if (error == APP_CONTROL_ERROR_NONE) return;
  CRASH_LOGE("the client cannot be told of its log: %d", error);
  delete_unclaimed(file);
}

void delete_crash_folders() {
  std::error_code error;
  int count = 0;
  for (std::filesystem::directory_iterator entry(TAVRO_CRASH_DUMP_FOLDER, error), end; !error && entry != end;
       entry.increment(error)) {
    std::error_code failed;
    std::filesystem::remove_all(entry->path(), failed);
    if (failed) CRASH_LOGE("%s: %s", entry->path().c_str(), failed.message().c_str());
    count += !failed;
  }
  CRASH_LOGI("%d crash folders deleted", count);
}

}  // namespace

struct CrashJobs::Work {
  Kind kind;
  GCancellable *journal_stop;
  std::string file, reason;  // what came of it
};

void CrashJobs::add(Kind kind) {
  if (is_stopped_) return;
  waiting_.push_back(kind);
  start_next();
}

void CrashJobs::stop() {
  is_stopped_ = true;
  waiting_.clear();
  if (journal_stop_) g_cancellable_cancel(journal_stop_.get());
  while (is_working_) g_main_context_iteration(nullptr, TRUE);
}

void CrashJobs::start_next() {
  if (is_working_ || waiting_.empty()) return;
  is_working_ = true;
  journal_stop_.reset(g_cancellable_new());
  limit_source_ = g_timeout_add_seconds(kJournalSeconds, limit_cb, this);
  auto *work = new Work{waiting_.front(), journal_stop_.get(), {}, {}};
  waiting_.pop_front();
  const TavroObject<GTask> task(g_task_new(nullptr, nullptr, done_cb, this));
  g_task_set_task_data(task.get(), work, [](gpointer memory) { delete static_cast<Work *>(memory); });
  g_task_run_in_thread(task.get(), work_thread);
}

void CrashJobs::work_thread(GTask *task, gpointer, gpointer data, GCancellable *) {
  auto *work = static_cast<Work *>(data);
  if (work->kind == Kind::kDeleteDump) {
    delete_crash_folders();
  } else {
    work->file = write_log_archive(collect_log(work->journal_stop), &work->reason);
  }
  g_task_return_boolean(task, TRUE);
}

void CrashJobs::done_cb(GObject *, GAsyncResult *result, gpointer data) {
  auto *self = static_cast<CrashJobs *>(data);
  const auto *work = static_cast<Work *>(g_task_get_task_data(G_TASK(result)));
  if (self->limit_source_) g_source_remove(std::exchange(self->limit_source_, 0));
  self->is_working_ = false;
  if (self->is_stopped_) return delete_unclaimed(work->file);
  if (work->kind == Kind::kDumpLog) {
    if (work->file.empty())
      CRASH_LOGE("%s", work->reason.c_str());
    else
      CRASH_LOGI("the system log is in %s", work->file.c_str());
    answer(work->file, work->reason);
  }
  self->start_next();
}

gboolean CrashJobs::limit_cb(gpointer data) {
  auto *self = static_cast<CrashJobs *>(data);
  self->limit_source_ = 0;
  g_cancellable_cancel(self->journal_stop_.get());
  return G_SOURCE_REMOVE;
}
