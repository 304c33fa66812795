// A world for the client's core: a store, preferences and a private bus on which the programs that the client
// talks to are played by one listener; screens are replaced by a record of what was asked of them.
#pragma once

#include <app_control.h>
#include <app_preference.h>
#include <gtest/gtest.h>

#include <initializer_list>
#include <mutex>
#include <string>
#include <utility>
#include <vector>

#include "tavro-main.h"
#include "tavro_app_control_handle.h"
#include "tavro_handles.h"

using Extras = std::initializer_list<std::pair<const char *, std::string>>;

// Plays upload service, crash service, application store and notification service, on a connection of its
// own.
class Listener {
 public:
  static Listener &get();
  // What arrived since the last call, in order: "<path> <operation> <uri> key=value …" for launch requests,
  // "Notify <title>|<text>" and "<member> <path> <body>" for others. Waits for everything the client sent;
  // lines that hold an ignored text are left out.
  std::vector<std::string> take(std::vector<std::string> ignored = {});
  // The same without the requests that every launch request causes.
  std::vector<std::string> take_answers();
  // The crash service leaves the bus, or comes back; it is there from the start.
  void set_crash_service(bool is_present);

 private:
  Listener();
  static GDBusMessage *filter(GDBusConnection *bus, GDBusMessage *message, gboolean is_incoming,
                              gpointer self);
  void note(GDBusMessage *message);
  bool holds(const std::string &text);

  TavroObject<GDBusConnection> bus_;
  std::mutex mutex_;                // the filter runs on the connection's own thread
  std::vector<std::string> lines_;  // guarded by mutex_
};

// What the client's core asked of the screens and the shell, in order.
extern std::vector<std::string> ui_calls;

class ClientTest : public ::testing::Test {
 protected:
  void SetUp() override;
  void TearDown() override;

  // Hand a launch request to the client as the platform does.
  void launch(const char *operation, Extras extras = {});
  void sign_in() { preference_set_string("tavro_username", "anna"); }
  // The service has heard of version 9.9; `change` is "major" or "minor".
  void offer_version(const char *change);
  // First value of a SELECT on the store, and of a column of one report.
  static std::string query(const std::string &sql);
  static std::string column(int voc_id, const char *name);
  static int row_count(const std::string &table) { return std::stoi(query("count(*) FROM " + table)); }

  appdata ad = {};
};

TavroRequest make_request(const char *operation, Extras extras);

// A report as the compose screen would store it; the new id.
int store_report(const char *text, int status, const char *syslog_path = nullptr);
