// Crash folders of a phone, and one collector whose callbacks are counted.
#pragma once

#include <fcntl.h>
#include <gmock/gmock.h>
#include <sys/stat.h>

#include <atomic>
#include <chrono>
#include <filesystem>
#include <string>
#include <thread>
#include <vector>

#include "files.h"
#include "tavro_crash_service.h"
#include "tavro_dc_private.h"

class DcWorld : public ::testing::Test {
 protected:
  // A folder that last changed at `time`, with files of these names.
  static void make_folder(const std::string &name, long time, const std::vector<std::string> &files) {
    const std::string path = TAVRO_CRASH_DUMP_FOLDER + name;
    std::filesystem::create_directories(path);
    for (const std::string &file : files) write_file(path + "/" + file, "content of " + file);
    const timespec times[] = {{time, 0}, {time, 0}};
    utimensat(AT_FDCWD, path.c_str(), times, 0);
  }

  static std::vector<std::string> names_in(const std::string &folder) {
    std::vector<std::string> names;
    if (!std::filesystem::is_directory(folder)) return names;
    for (const auto &entry : std::filesystem::directory_iterator(folder))
      names.push_back(entry.path().filename());
    return names;
  }

  void SetUp() override {
    std::filesystem::remove_all(TAVRO_CRASH_DUMP_FOLDER);
    std::filesystem::remove_all(kTavroDcArchiveFolder);
    std::filesystem::create_directories(TAVRO_CRASH_DUMP_FOLDER);
  }
};

// What a collector reported. It lives longer than the collector, whose end is a deinit or cancel.
struct DcReports {
  std::atomic<int> done{0}, error{0}, ended{0};
  std::string path, build_date, model;  // of the last done
  bool ends_itself = false;

  static DcReports &of(void *reports) { return *static_cast<DcReports *>(reports); }

  tavro_dc_report_info info() {
    tavro_dc_report_info info = {};
    info.listener.dc_done_cb = [](tavro_dc_context *handle, tavro_dc_report_info *result, void *data) {
      const auto text = [](const char *value) { return value ? value : ""; };
      of(data).path = text(result->file_path);
      of(data).build_date = text(result->build_date);
      of(data).model = text(result->model);
      if (of(data).ends_itself) tavro_dc_deinit(handle);
      ++of(data).done;
    };
    info.listener.dc_error_cb = [](auto *, auto *, void *data) { ++of(data).error; };
    info.listener.dc_deinit_cb =
        info.listener.dc_cancel_cb = [](auto *, auto *, void *data) { ++of(data).ended; };
    return info;
  }

  tavro_dc_context *create() {
    tavro_dc_context *handle = nullptr;
    const tavro_dc_report_info report = info();
    tavro_dc_init(&handle, &report, this);
    return handle;
  }

  // One whole collection.
  void collect() {
    tavro_dc_context *handle = create();
    tavro_dc_start(handle, nullptr);
    tavro_dc_deinit(handle);
    wait_for([this] { return ended > 0; });
  }

  template <typename Condition>
  static bool wait_for(Condition condition) {
    const auto end = std::chrono::steady_clock::now() + std::chrono::seconds(60);
    while (!condition() && std::chrono::steady_clock::now() < end)
      std::this_thread::sleep_for(std::chrono::milliseconds(1));
    return condition();
  }
};
