// How much memory the store's operations need beside a store of 100, 10,000 and 100,000 reports: one line for
// each operation, its name and the most bytes of heap that it held at once in each store, separated by tabs.
// Every allocation of the process counts, SQLite's and GLib's too. Runs in a phone of its own, with
// G_SLICE=always-malloc so that GLib's list nodes are seen.
#include <malloc.h>

#include <atomic>
#include <cerrno>
#include <cstdint>
#include <cstdio>

#include "store_sizes.h"
#include "tavro_dbmgr_catalogue.h"
#include "tavro_memory.h"
#include "tavro_type.h"

// ---- Counting: these take the place of the C library's own, for every library of the process ----

namespace {

std::atomic<std::int64_t> gHeldBytes{0};
std::atomic<std::int64_t> gPeakBytes{0};

void *_count(void *block) {
  if (!block) return nullptr;
  const std::int64_t held = gHeldBytes += static_cast<std::int64_t>(malloc_usable_size(block));
  if (held > gPeakBytes) gPeakBytes = held;
  return block;
}

void _discount(void *block) {
  if (block) gHeldBytes -= static_cast<std::int64_t>(malloc_usable_size(block));
}

}  // namespace

extern "C" {
void *__libc_malloc(std::size_t size);
void *__libc_calloc(std::size_t count, std::size_t size);
void *__libc_realloc(void *block, std::size_t size);
void *__libc_memalign(std::size_t alignment, std::size_t size);
void __libc_free(void *block);

void *malloc(std::size_t size) {
  return _count(__libc_malloc(size));
}
void *calloc(std::size_t count, std::size_t size) {
  return _count(__libc_calloc(count, size));
}
void *realloc(void *block, std::size_t size) {
  const std::int64_t before = block ? static_cast<std::int64_t>(malloc_usable_size(block)) : 0;
  void *resized = __libc_realloc(block, size);
  if (resized || size == 0) gHeldBytes -= before;
  return _count(resized);
}
void *aligned_alloc(std::size_t alignment, std::size_t size) {
  return _count(__libc_memalign(alignment, size));
}
int posix_memalign(void **block, std::size_t alignment, std::size_t size) {
  *block = aligned_alloc(alignment, size);
  return *block ? 0 : ENOMEM;
}
void free(void *block) {
  _discount(block);
  __libc_free(block);
}
}

namespace {

namespace fs = std::filesystem;

constexpr int kSizes[] = {100, 10000, 100000};
constexpr int kSmallest = kSizes[0];
constexpr int kToSend = 3;  // reports that wait to be sent, in a store of any size

void _save_problem() {
  const std::string description = bench_description();
  tavro_dbmgr_bug_report_info report = {};
  const TavroText text(TAVRO_STRDUP(description.c_str()));
  const TavroText user(TAVRO_STRDUP(kBenchUser));
  char app[] = "Gallery", path[] = "/opt/usr/media/DCIM/picture.jpg", type[] = "jpg";
  tavro_dbmgr_attachment_info attachment = {0, path, 123456, type, 0};
  report.description = text.get();
  report.user_name = user.get();
  report.app_name = app;
  for (int i = 0; i < 3; i++) report.attachments = g_slist_prepend(report.attachments, &attachment);
  if (tavro_dbmgr_update_bug_report(&report) < 1) std::abort();
  g_slist_free(report.attachments);
  TAVRO_FREE(report.type);
}

void _read_history() {
  GSList *history = tavro_dbmgr_get_vocs_for_history(kBenchUser);
  if (g_slist_length(history) != 100) std::abort();
  g_slist_free_full(history,
                    [](gpointer voc) { tavro_dbmgr_free_voc_data(static_cast<svc_voc_data *>(voc)); });
}

void _list_unsent() {
  GSList *ids = tavro_dbmgr_get_vocs_to_send();
  if (g_slist_length(ids) != kToSend) std::abort();
  g_slist_free(ids);
}

void _release(char *text) {
  TAVRO_FREE(text);
}

void _list_application() {
  char package[] = "org.example", app[] = "org.example.app", name[] = "Example", icon[] = "/icon.png";
  const tavro_pkg_info record = {1, package, app, name, icon};
  tavro_dbmgr_update_app_list(&record);
}

void _read_applications() {
  g_slist_free_full(tavro_dbmgr_get_downloaded_app_list(),
                    [](gpointer app) { tavro_db_free_app_info(static_cast<tavro_pkg_info *>(app)); });
}

void _receive_programme() {
  char name[] = "Example";
  tavro_dbmgr_beta_details details = {};
  details.betaId = 1;
  details.betaName = name;
  if (tavro_dbmgr_update_beta_details(&details) == -1) std::abort();
}

void _read_banners() {
  GSList *banners = nullptr;
  if (tavro_dbmgr_get_banner_list(&banners) == -1) std::abort();
  tavro_dbmgr_free_banner_list(banners);
}

struct operation {
  const char *name;
  void (*run)();
};

// One of each kind; those that delete many reports come last, each on a store of its own.
const operation kOperations[] = {
    {"history", _read_history},
    {"report by id", [] { tavro_dbmgr_free_voc_data(tavro_dbmgr_get_voc_by_id(50)); }},
    {"report by server id", [] { tavro_dbmgr_free_voc_data(tavro_dbmgr_get_voc_by_server_id(50)); }},
    {"server id known", [] { tavro_dbmgr_is_voc_present(50); }},
    {"count of a user", [] { tavro_dbmgr_get_voc_count(kBenchUser); }},
    {"count of unread answers", [] { tavro_dbmgr_get_unread_push_notification_count(kBenchUser); }},
    {"reports to send", _list_unsent},
    {"dump uploaded", [] { tavro_dbmgr_check_if_dump_file_is_uploaded("crash.zip"); }},
    {"description", [] { _release(tavro_dbmgr_get_voc_description_by_id(50)); }},
    {"title", [] { _release(tavro_dbmgr_get_voc_title_description_by_id(50)); }},
    {"device data file", [] { _release(tavro_dbmgr_get_device_data_file_by_id(50)); }},
    {"retry count", [] { tavro_dbmgr_get_voc_retry_count(50); }},
    {"save with three attachments", _save_problem},
    {"server answer", [] { _tavro_dbmgr_update_push_status_comments("50", "3", "We look at it"); }},
    {"answer read", [] { tavro_dbmgr_update_read_push_notifications(50, 1); }},
    {"sending state", [] { tavro_dbmgr_update_sending_state(50, TAVRO_STATUS_SENDING_FAILED_NO_NETWORK); }},
    {"accepted by the server", [] { tavro_dbmgr_set_voc_data_submitted_to_server(50, 50, 12); }},
    {"application listed", _list_application},
    {"listed applications", _read_applications},
    {"crash time", [] { tavro_dbmgr_set_app_crash_time("org.example.app"); }},
    {"beta programme received", _receive_programme},
    {"beta programme's name", [] { _release(tavro_dbmgr_get_beta_name(1)); }},
    {"banners", _read_banners},
    {"dump renamed", [] { tavro_dbmgr_update_dump_file_bug_report("old.zip", "new.zip"); }},
    {"no network for what is being sent", [] { tavro_dbmgr_set_voc_network_status(kBenchUser); }},
    {"delete by id", [] { tavro_dbmgr_destroy_vocs_by_id(50); }},
    {"delete attachments of a file",
     [] { tavro_dbmgr_destroy_attachments_by_filename("/opt/usr/media/DCIM/picture_9.jpg"); }},
};
const operation kDeletions[] = {
    {"delete every problem", tavro_dbmgr_destroy_bug_reports},
    {"delete everything", tavro_dbmgr_destroy_vocs},
};

void _use_copy(int reports) {
  const std::string &store = bench_store(reports);
  fs::remove(TAVRO_DBMGR_FILE);
  fs::copy_file(store, TAVRO_DBMGR_FILE);
  for (int id = 1; id <= kToSend; id++) tavro_dbmgr_update_sending_state(id, TAVRO_STATUS_SENDING);
}

std::int64_t _peak(const operation &measured) {
  const std::int64_t before = gHeldBytes;
  gPeakBytes = before;
  measured.run();
  return gPeakBytes - before;
}

std::map<std::string, std::int64_t> _measure(int reports) {
  std::map<std::string, std::int64_t> peaks;
  _use_copy(reports);
  for (const operation &each : kOperations) peaks[each.name] = _peak(each);
  for (const operation &each : kDeletions) {
    _use_copy(reports);
    peaks[each.name] = _peak(each);
  }
  return peaks;
}

}  // namespace

int main() {
  tavro_mem_check_init();
  if (tavro_dbmgr_init_semaphore() != 0) return 1;
  _measure(kSmallest);  // what libraries allocate once and keep
  std::map<std::string, std::int64_t> peaks[std::size(kSizes)];
  for (std::size_t i = 0; i < std::size(kSizes); i++) peaks[i] = _measure(kSizes[i]);
  for (const auto &[name, unused] : peaks[0]) {
    std::printf("%s", name.c_str());
    for (auto &of_size : peaks) std::printf("\t%lld", static_cast<long long>(of_size[name]));
    std::printf("\n");
  }
  return 0;
}
