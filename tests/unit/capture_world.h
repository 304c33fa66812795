// A client in a capture, whose capture manager the test plays over the bus; what the windows are asked for is
// recorded.
#pragma once

#include <app_preference.h>
#include <gtest/gtest.h>

#include <chrono>
#include <deque>
#include <filesystem>
#include <fstream>
#include <mutex>
#include <regex>
#include <string>
#include <thread>
#include <utility>
#include <vector>

#include "bus_connection.h"
#include "tavro_appdata.h"
#include "tavro_capture.h"
#include "tavro_dbmgr.h"
#include "tavro_deleted_files.h"
#include "tavro_drafts.h"
#include "tavro_handles.h"
#include "tavro_memory.h"
#include "tavro_preferences.h"

using Lines = std::vector<std::string>;

// What a reply carries; a request that finds none waits for ever.
struct Answer {
  int result;
  const char *handle;
};

inline Lines window_calls;
inline Lines toasts;
inline std::string shown_time;
inline bool is_video_refused = false;

#define NOTE(line) [](appdata *) { window_calls.push_back(line); }
inline const tavro_capture_windows kRecordingWindows = {
    [](appdata *) { return true; },
    [](appdata *) {},
    NOTE("no control"),
    NOTE("recording"),
    NOTE("paused"),
    NOTE("resumed"),
    [](appdata *) {},
    NOTE("may stop"),
    NOTE("no time"),
    [](appdata *, bool) {},
    [](appdata *) { return shown_time.empty() ? nullptr : shown_time.c_str(); },
    [](appdata *, const char *text) { shown_time = text; },
    [](appdata *, bool) {},
    NOTE("back"),
    NOTE("failure"),
    [](appdata *, const char *) { window_calls.push_back("picture"); },
    [](appdata *, const char *) {
      window_calls.push_back("video");
      return !is_video_refused;
    },
};

class CaptureWorld : public testing::Test {
 protected:
  static void SetUpTestSuite() {
    setenv("XDG_DATA_HOME", (std::string(getenv("TMPDIR")) + "/data").c_str(), 1);
    ecore_init();
    bus_.reset(connect_to_bus());
    g_dbus_connection_add_filter(bus_.get(), filter, nullptr, nullptr);
    install("1.0.14");
    run_manager(true);
    ASSERT_EQ(tavro_dbmgr_init_semaphore(), 0);
    ASSERT_EQ(tavro_dbmgr_ensure_schema(), TAVRO_STORE_READY);
  }

  void SetUp() override {
    tavro_initialize_application_data(&ad);
    ad.problem_view = TAVRO_ZALLOC(problem_view_win);
    ad.type = PROBLEM;
    ad.cType = VIDEO;
    tavro_capture_set_windows(&kRecordingWindows);
    window_calls.clear();
    toasts.clear();
    shown_time = "01:00";
    lines_.clear();
    answers_.clear();
    preference_remove(TAVRO_PREF_QUALITY);
    install("1.0.14");
  }
  void TearDown() override { tavro_dealloc_memory(&ad); }

  static void install(const std::string &version) {
    const std::string folder = std::string(getenv("XDG_DATA_HOME")) + "/applications";
    std::filesystem::create_directories(folder);
    std::ofstream(folder + "/" TAVRO_CPMGR_ID ".desktop")
        << "[Desktop Entry]\nType=Application\nName=Recorder\nExec=/bin/true\nX-Tavro-Version=" << version
        << "\n";
  }
  static void run_manager(bool is_running) { set_name_owned(bus_.get(), TAVRO_CPMGR_ID, is_running); }
  void answer(std::initializer_list<Answer> answers) {
    const std::lock_guard<std::mutex> lock(mutex_);
    answers_ = answers;
  }

  // The messages so far; each has been answered and the answer taken. Names of files are shortened.
  Lines messages(size_t count) {
    const auto deadline = std::chrono::steady_clock::now() + std::chrono::seconds(5);
    auto quiet_since = std::chrono::steady_clock::now();
    size_t seen = 0;
    while (std::chrono::steady_clock::now() < deadline) {
      const bool has_worked = g_main_context_iteration(nullptr, FALSE);
      std::this_thread::sleep_for(std::chrono::milliseconds(1));
      const std::lock_guard<std::mutex> lock(mutex_);
      const auto now = std::chrono::steady_clock::now();
      if (has_worked || std::exchange(seen, lines_.size()) != lines_.size()) quiet_since = now;
      if (seen >= count && now - quiet_since > std::chrono::milliseconds(50)) break;
    }
    const std::lock_guard<std::mutex> lock(mutex_);
    Lines taken = std::exchange(lines_, {});
    for (std::string &line : taken)
      line = std::regex_replace(line, std::regex("/opt/usr/media/VantorCommunity/VantorCommunity_[0-9]{14}"),
                                "FILE");
    return taken;
  }
  void start() {
    answer({{0, "17"}, {0, "17"}});
    send_cpmgr_init(&ad);
    messages(1);
    record();
    messages(1);
    window_calls.clear();
  }
  // The recording is stopped, and the manager is done with it.
  void stop() {
    answer({{0, nullptr}});
    record_btn_clicked_cb(&ad, nullptr, nullptr);
    messages(1);
  }
  void open_another_report() {
    tavro_free_compose_view(&ad);
    ad.problem_view = TAVRO_ZALLOC(problem_view_win);
  }
  // The reply to a request of a session that is over, which asked with this.
  void reply_late(const char *key, const char *asked, app_control_h reply = nullptr) {
    TavroAppControl request;
    app_control_create(tavro_out(request));
    app_control_add_extra_data(request.get(), key, asked);
    tavro_cpmgr_cb(request.get(), reply, reply ? APP_CONTROL_RESULT_SUCCEEDED : APP_CONTROL_RESULT_FAILED,
                   &ad);
  }
  void record() {
    video_btn_clicked_cb(&ad, nullptr, nullptr);
    tavro_capture_panel_is_off(&ad);
  }
  void tick(int count) {
    for (int i = 0; i < count; ++i) timer_func(&ad);
  }
  void display(display_state_e state) {
    on_device_changed_cb(DEVICE_CALLBACK_DISPLAY_STATE,
                         reinterpret_cast<void *>(static_cast<intptr_t>(state)), &ad);
  }
  // Of a recording, a second of it whole; or nothing that can be played.
  std::string make_file(bool is_playable = true) const {
    const std::string boxes("\0\0\0\x08moov\0\0\0\x08moof", 16);
    std::ofstream(ad.problem_view->filename) << (is_playable ? boxes : "a file");
    return ad.problem_view->filename;
  }
  // The client is started again.
  static bool stays(const std::string &file) {
    tavro_deleted_files_remove();
    return std::filesystem::exists(file);
  }

  appdata ad{};

 private:
  static GDBusMessage *filter(GDBusConnection *bus, GDBusMessage *message, gboolean is_incoming, gpointer) {
    if (!is_incoming || g_strcmp0(g_dbus_message_get_member(message), "Launch") != 0) return message;
    GVariantIter *pairs;
    const char *key, *value;
    std::string line;
    g_variant_get(g_dbus_message_get_body(message), "(&s&s&sa(ss))", nullptr, nullptr, nullptr, &pairs);
    while (g_variant_iter_next(pairs, "(&s&s)", &key, &value)) line += std::string(key) + "=" + value + " ";
    g_variant_iter_free(pairs);
    const bool wants_reply = !(g_dbus_message_get_flags(message) & G_DBUS_MESSAGE_FLAGS_NO_REPLY_EXPECTED);
    const std::lock_guard<std::mutex> lock(mutex_);
    lines_.push_back(line + (wants_reply ? "" : "no reply"));
    if (wants_reply && !answers_.empty()) {
      GVariantBuilder extras;
      g_variant_builder_init(&extras, G_VARIANT_TYPE("a(ss)"));
      if (answers_.front().handle) g_variant_builder_add(&extras, "(ss)", "handle", answers_.front().handle);
      const TavroObject<GDBusMessage> reply(g_dbus_message_new_method_reply(message));
      g_dbus_message_set_body(reply.get(), g_variant_new("(ia(ss))", answers_.front().result, &extras));
      g_dbus_connection_send_message(bus, reply.get(), G_DBUS_SEND_MESSAGE_FLAGS_NONE, nullptr, nullptr);
      answers_.pop_front();
    }
    g_object_unref(message);
    return nullptr;
  }

  static inline TavroObject<GDBusConnection> bus_;
  static inline std::mutex mutex_;
  static inline Lines lines_;  // this and the answers are guarded by mutex_
  static inline std::deque<Answer> answers_;
};
