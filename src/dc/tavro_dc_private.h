// What the files of the collector share. Everything but the lists and names of folders runs on a worker.
#pragma once

#include <glib.h>
#include <minizip/zip.h>
#include <pthread.h>

#include <atomic>

#include "tavro_dc.h"
#include "tavro_memory.h"

constexpr char kTavroDcStart[] = "TAVRO_DC_START";
constexpr char kTavroDcCancel[] = "TAVRO_DC_CANCEL";
constexpr char kTavroDcDeinit[] = "TAVRO_DC_DEINIT";

constexpr char kTavroDcArchiveFolder[] = "/opt/usr/media/Orbel/";

// A message of the queue: zeroed, then its name.
struct msg_data {
  char msg_type[50];
  int len;
};
static_assert(sizeof(msg_data) == 56);

// Owners of the texts that the collector itself put into its report info.
struct tavro_dc_texts {
  TavroText model, tizen_version, build_number, build_date, platform, file_path;
};

struct tavro_dc_context {
  pthread_t thread_id;
  GAsyncQueue *pmsg_queue;
  tavro_dc_report_info report_info;
  void *userdata;
  tavro_dc_texts texts;
  std::atomic<bool> is_cancelled{false};
  bool has_ended = false;  // takes no more messages; guarded by the mutex of the live collectors
};

// One crash folder. Lists may be longer than the allocation tracker has slots, so they are GLib's memory.
struct tavro_dc_folder {
  long time;          // of its last change, in seconds
  char *folder_path;  // its name inside the crash dump folder
  tavro_dc_folder *next;
};

// Collect once and report it by dc_done_cb or dc_error_cb; by neither when it was cancelled.
void _tavro_dc_start(tavro_dc_context *context);

// 0: archived; -1: nothing could be; 1: there is no crash folder. *folder is the archived one's name, which
// the caller frees with g_free, else null.
int _tavro_dc_get_crash_dump_and_zip(char **folder);

// A file of the platform's log dump folder; null for ".". The caller frees it with g_free.
char *_tavro_dc_get_log_dump_file(const char *name);

// True once the collector whose worker calls this was cancelled; never on other threads.
bool tavro_dc_is_cancelled();

tavro_dc_folder *_tavro_dc_insert_crash_folder_list(tavro_dc_folder *list, long time, const char *name);
// Newest first. Among equal times a node that meets the head goes before it, and one placed further down goes
// behind its equals.
void _tavro_dc_sort_crash_folder_list(tavro_dc_folder **list);
void _tavro_dc_sorted_insert(tavro_dc_folder **head, tavro_dc_folder *node);
void _tavro_dc_free_folder_list(tavro_dc_folder *list);
void _tavro_dc_display_crash_folder_list(const tavro_dc_folder *list);

// What follows the last "_", or the whole name; null for null. The caller frees it with g_free.
char *_tavro_dc_split_folder_name(const char *name);

// Paths of the folder's dump, summary and log, each to be freed with g_free, or null. Only regular files
// count: a link may lead anywhere, and a pipe would block the worker.
void _tavro_dc_get_dump_files(const char *folder, char **core, char **summary, char **log);

// 0 when the archive holds at least one of the files, of which each may be null; else -1, and there is none.
int _tavro_dc_zip_files(const char *core, const char *summary, const char *log, const char *folder);

// 0, one of these, or minizip's error, which is negative, is not logged yet and leaves half an entry too.
constexpr int kTavroDcNotAdded = 1;   // the archive is as it was
constexpr int kTavroDcBrokenOff = 2;  // the archive holds half an entry and is good for nothing
int _tavro_dc_add_file_to_zip(zipFile zip, const char *path);
