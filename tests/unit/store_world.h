// A store on a fresh phone, and a look at it that does not go through the store's own code.
#pragma once

#include <gmock/gmock.h>
#include <signal.h>
#include <sqlite3.h>
#include <sys/prctl.h>
#include <sys/sem.h>
#include <sys/stat.h>
#include <sys/wait.h>
#include <unistd.h>

#include <functional>
#include <string>
#include <vector>

#include "files.h"
#include "store_access.h"
#include "tavro_dbmgr.h"
#include "tavro_handles.h"
#include "tavro_memory.h"
#include "tavro_type.h"

// Runs `work` in a process of its own, which ends with the test; the result is its exit status.
inline pid_t start_process(const std::function<int()> &work) {
  const pid_t pid = fork();
  if (pid != 0) return pid;
  prctl(PR_SET_PDEATHSIG, SIGKILL);
  _exit(work());
}

// The same, and comes back when `prepare` is done there; then the process waits to be killed.
inline pid_t start_process_that_stays(const std::function<void()> &prepare) {
  int ready[2];
  EXPECT_EQ(pipe(ready), 0);
  const pid_t pid = start_process([&] {
    prepare();
    if (write(ready[1], "x", 1) == 1) pause();
    return 0;
  });
  close(ready[1]);
  char byte;
  EXPECT_EQ(read(ready[0], &byte, 1), 1);
  close(ready[0]);
  return pid;
}

// The exit status, -1 for a process that was killed.
inline int end_of(pid_t pid) {
  int status = 0;
  waitpid(pid, &status, 0);
  return WIFEXITED(status) ? WEXITSTATUS(status) : -1;
}

class StoreWorld : public ::testing::Test {
 protected:
  void SetUp() override {
    umask(022);  // what is private must be so by itself
    tavro_mem_check_init();
    std::filesystem::remove_all(TAVRO_DBMGR_FOLDER);
    ASSERT_EQ(tavro_dbmgr_init_semaphore(), 0);
    ASSERT_EQ(tavro_dbmgr_ensure_schema(), TAVRO_STORE_READY);
  }

  void TearDown() override {
    for (const tavro_meminfo_s &slot : gMemDb)
      if (slot.slotfree) ADD_FAILURE() << "block held from " << slot.fileName << ":" << slot.lineNo;
  }

  static int lock_value() { return semctl(dbmgr_semid, 0, GETVAL); }
  static std::string log() {
    const std::string path = "/opt/usr/share/log/platform.log";
    return file_contents(path + ".1") + file_contents(path);
  }

  static std::string taken(char *text) {
    const TavroText owner(text);
    return text ? text : "NULL";
  }

  // How many reports, attachments and second parts of reports there are.
  static std::string rows() {
    return value(
        "SELECT (SELECT count(*) FROM TABLE_VOC) || '/' || (SELECT count(*) FROM ATTACHMENT) || '/' || "
        "(SELECT count(*) FROM TABLE_VOC_EXTENDED)");
  }
};

struct VocDeleter {
  void operator()(svc_voc_data *voc) const { tavro_dbmgr_free_voc_data(voc); }
  void operator()(tavro_dbmgr_bug_report_info *report) const { tavro_dbmgr_free_bug_report_data(report); }
  void operator()(tavro_dbmgr_suggestion_info *report) const { tavro_dbmgr_free_suggestion_data(report); }
};
using Voc = std::unique_ptr<svc_voc_data, VocDeleter>;
using Problem = std::unique_ptr<tavro_dbmgr_bug_report_info, VocDeleter>;
using Idea = std::unique_ptr<tavro_dbmgr_suggestion_info, VocDeleter>;

inline GSList *attachment_list(const std::vector<std::string> &paths) {
  GSList *list = nullptr;
  for (const std::string &path : paths) {
    auto *attachment = TAVRO_ZALLOC(tavro_dbmgr_attachment_info);
    attachment->file_path = TAVRO_STRDUP(path.c_str());
    attachment->file_type = TAVRO_STRDUP("jpg");
    attachment->file_size = 1234.75;
    list = g_slist_append(list, attachment);
  }
  return list;
}

// A problem report of `user` whose texts all are `text`.
inline Problem problem_report(const char *user, const char *text,
                              const std::vector<std::string> &paths = {}) {
  Problem report(TAVRO_ZALLOC(tavro_dbmgr_bug_report_info));
  for (char **member : {&report->description, &report->title_description, &report->app_name,
                        &report->app_icon, &report->severity, &report->dump_file, &report->dump_name,
                        &report->syslog_file, &report->device_data_filepath})
    *member = TAVRO_STRDUP(text);
  report->user_name = TAVRO_STRDUP(user);
  report->submitted = TAVRO_STATUS_SENDING;
  report->attachments = attachment_list(paths);
  return report;
}

inline int save_problem(const char *user, const char *text, const std::vector<std::string> &paths = {}) {
  return tavro_dbmgr_update_bug_report(problem_report(user, text, paths).get());
}
