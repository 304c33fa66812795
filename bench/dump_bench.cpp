// How long archiving a crash dump takes beside `zip -1`, what memory it needs, and what it does to the main
// loop meanwhile: one "name=value" a line. Runs in a phone of its own, which needs some 2 GB of disk.
#include <fcntl.h>
#include <glib.h>
#include <minizip/zip.h>
#include <spawn.h>
#include <sys/resource.h>
#include <sys/wait.h>
#include <zlib.h>

#include <algorithm>
#include <chrono>
#include <cstdint>
#include <cstdio>
#include <cstring>
#include <fstream>
#include <functional>
#include <string>
#include <vector>

#include "tavro_crash_service.h"
#include "tavro_dc.h"
#include "tavro_handles.h"
#include "tavro_log.h"
#include "tavro_memory.h"

extern char **environ;

namespace {

constexpr size_t kCoreBytes = 512u << 20;
constexpr size_t kPage = 4096;  // bytes
constexpr unsigned kTickMilliseconds = 2;
constexpr char kZipFile[] = "/opt/usr/zip.zip";

using Clock = std::chrono::steady_clock;
using GzFile = TavroHandle<gzFile_s, gzclose>;

double _milliseconds_since(Clock::time_point start) {
  return std::chrono::duration<double, std::milli>(Clock::now() - start).count();
}

double _median(std::vector<double> values) {
  std::sort(values.begin(), values.end());
  return values[values.size() / 2];
}

// ---- The dumps ----

struct generator {
  std::uint64_t state = 1;
  std::uint64_t next() {
    state = state * 6364136223846793005u + 1442695040888963407u;
    return state >> 24;
  }
};

// A page as processes have them: half are zeroes; then tables of pointers into a few mappings, text, and what
// has no pattern, as of pictures and keys.
void _make_page(generator *random, char *page) {
  std::memset(page, 0, kPage);
  const std::uint64_t kind = random->next() % 100;
  if (kind < 50) return;
  if (kind < 72) {
    for (size_t at = 0; at < kPage; at += 16) {
      const std::uint64_t words[] = {0x7f3a00000000u + random->next() % (1 << 20) * 16, random->next() % 64};
      std::memcpy(page + at, words, sizeof(words));
    }
  } else if (kind < 88) {
    static constexpr const char *kWords[] = {"widget ", "the ",   "0x%08x ", "/usr/lib/", "_ZN4", "error: ",
                                             "style=",  "value ", "text",    "\n",        ".so",  "frame "};
    for (size_t at = 0; at < kPage - 16;) {
      const char *word = kWords[random->next() % std::size(kWords)];
      std::memcpy(page + at, word, std::strlen(word));
      at += std::strlen(word);
    }
  } else {
    for (size_t at = 0; at < kPage; at += 4) {
      const std::uint64_t bits = random->next();
      std::memcpy(page + at, &bits, 4);
    }
  }
}

// The same for each run: the memory itself, or as the crash handler leaves it, compressed.
bool _make_core(const std::string &path, bool is_compressed) {
  const GzFile file(gzopen(path.c_str(), is_compressed ? "wb6" : "wbT"));
  generator random;
  std::vector<char> page(kPage);
  for (size_t made = 0; file && made < kCoreBytes; made += kPage) {
    _make_page(&random, page.data());
    if (gzwrite(file.get(), page.data(), kPage) != static_cast<int>(kPage)) return false;
  }
  return file != nullptr;
}

// ---- The collector, in a main loop that works ----

double gLongestStretch = 0;  // milliseconds between two waits of the main loop
Clock::time_point gWoken;

int _watched_poll(GPollFD *fds, guint count, int timeout) {
  gLongestStretch = std::max(gLongestStretch, _milliseconds_since(gWoken));
  const int result = g_poll(fds, count, timeout);
  gWoken = Clock::now();
  return result;
}

// What the main loop shares with the worker: the log and the table of tracked blocks.
gboolean _tick(gpointer) {
  TAVRO_LOGD("tick");
  const TavroText text(TAVRO_STRDUP("tick"));
  return G_SOURCE_CONTINUE;
}

struct collection {
  GMainLoop *loop;
  std::string archive;  // empty: failed
};

gboolean _quit(gpointer loop) {
  g_main_loop_quit(static_cast<GMainLoop *>(loop));
  return G_SOURCE_REMOVE;
}

void _done(tavro_dc_context *handle, tavro_dc_report_info *info, void *data) {
  auto *result = static_cast<collection *>(data);
  if (info->file_path) result->archive = info->file_path;
  tavro_dc_deinit(handle);
  g_idle_add(_quit, result->loop);
}

bool _collect() {
  collection result = {g_main_loop_new(nullptr, FALSE), ""};
  tavro_dc_report_info info = {};
  info.listener.dc_done_cb = info.listener.dc_error_cb = _done;
  tavro_dc_context *handle = nullptr;
  gWoken = Clock::now();
  const guint ticks = g_timeout_add(kTickMilliseconds, _tick, nullptr);
  tavro_dc_init(&handle, &info, &result);
  tavro_dc_start(handle, &info);
  g_main_loop_run(result.loop);
  g_source_remove(ticks);
  g_main_loop_unref(result.loop);
  tavro_dc_end_all();
  return !result.archive.empty();
}

// ---- Peers ----

bool _zip_1(const std::string &path) {
  unlink(kZipFile);
  std::string words[] = {"zip", "-1", "-q", "-j", kZipFile, path};
  std::vector<char *> arguments;
  for (std::string &word : words) arguments.push_back(word.data());
  arguments.push_back(nullptr);
  pid_t child = 0;
  int status = 0;
  if (posix_spawnp(&child, "zip", nullptr, nullptr, arguments.data(), environ) != 0) return false;
  if (waitpid(child, &status, 0) != child || status != 0) return false;
  // As the collector, until it is on the disk.
  const TavroFd file(open(kZipFile, O_RDONLY | O_CLOEXEC));
  return fsync(file.get()) == 0;
}

// The collector's copying with chunks of another size.
bool _copy_in_chunks(const std::string &path, size_t chunk_size) {
  const TavroFd file(open(path.c_str(), O_RDONLY | O_CLOEXEC));
  zipFile zip = zipOpen(kZipFile, APPEND_STATUS_CREATE);
  if (!file || !zip) return false;
  bool is_good =
      zipOpenNewFileInZip(zip, "core", nullptr, nullptr, 0, nullptr, 0, nullptr, Z_DEFLATED, 1) == ZIP_OK;
  std::vector<char> chunk(chunk_size);
  ssize_t count = 0;
  while (is_good && (count = read(file.get(), chunk.data(), chunk_size)) > 0)
    is_good = zipWriteInFileInZip(zip, chunk.data(), static_cast<unsigned>(count)) == ZIP_OK;
  return zipClose(zip, nullptr) == ZIP_OK && is_good && count == 0;
}

// ---- Figures ----

// Of /proc/self/status, in megabytes.
double _memory(const char *field) {
  std::ifstream status("/proc/self/status");
  for (std::string line; std::getline(status, line);)
    if (line.compare(0, std::strlen(field), field) == 0)
      return std::stod(line.substr(std::strlen(field) + 1)) / 1024;
  return 0;
}

// Of this process and the children that have ended, in milliseconds.
double _processor_time() {
  double total = 0;
  for (const auto who : {RUSAGE_SELF, RUSAGE_CHILDREN}) {
    rusage used = {};
    getrusage(who, &used);
    for (const timeval &part : {used.ru_utime, used.ru_stime})
      total += static_cast<double>(part.tv_sec) * 1e3 + static_cast<double>(part.tv_usec) / 1e3;
  }
  return total;
}

struct timings {
  std::vector<double> all, processor;  // milliseconds, one of each run

  bool add(const std::function<bool()> &work) {
    const Clock::time_point start = Clock::now();
    const double before = _processor_time();
    const bool is_good = work();
    all.push_back(_milliseconds_since(start));
    processor.push_back(_processor_time() - before);
    if (!is_good) std::fprintf(stderr, "dump_bench: the work failed\n");
    return is_good;
  }
  void print(const std::string &name) const {
    std::printf("%s_ms=%.0f\n%s_processor_ms=%.0f\n", name.c_str(), _median(all), name.c_str(),
                _median(processor));
  }
};

// In turns, so that what else the machine does hits both.
bool _compare(const std::string &name, const std::string &core, int runs) {
  timings own, peer;
  for (int run = 0; run < runs; ++run)
    if (!own.add(_collect) || !peer.add([&] { return _zip_1(core); })) return false;
  own.print(name);
  peer.print(name + "_zip");
  return true;
}

bool _compare_chunks(const std::string &core, int runs) {
  constexpr size_t kSizes[] = {4096, 16384, 65536, 1 << 20};
  timings times[std::size(kSizes)];
  for (int run = 0; run < runs; ++run)
    for (size_t i = 0; i < std::size(kSizes); ++i)
      if (!times[i].add([&] { return _copy_in_chunks(core, kSizes[i]); })) return false;
  for (size_t i = 0; i < std::size(kSizes); ++i) times[i].print("chunk_" + std::to_string(kSizes[i]));
  return true;
}

std::string _make_dump(const char *name, bool is_compressed) {
  const std::string folder = std::string(TAVRO_CRASH_DUMP_FOLDER) + name;
  const std::string path = folder + "/core.coredump.gz";
  if (g_mkdir_with_parents(folder.c_str(), 0700) != 0 || !_make_core(path, is_compressed)) return "";
  return path;
}

}  // namespace

int main(int count, char **arguments) {
  const int runs = count > 1 ? std::stoi(arguments[1]) : 3;
  const std::string core = _make_dump("bench_core", false);
  if (core.empty()) return 1;
  g_main_context_set_poll_func(nullptr, _watched_poll);
  const double before = _memory("VmRSS:");
  std::ofstream("/proc/self/clear_refs") << "5";  // the peak begins anew
  gLongestStretch = 0;
  if (!_compare("core", core, runs)) return 1;
  std::printf("memory_mb=%.1f\nlongest_stretch_ms=%.2f\n", _memory("VmHWM:") - before, gLongestStretch);
  if (!_compare_chunks(core, runs)) return 1;
  std::remove(core.c_str());
  const std::string compressed = _make_dump("bench_compressed", true);
  return !compressed.empty() && _compare("compressed", compressed, runs) ? 0 : 1;
}
