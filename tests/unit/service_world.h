// A phone in which the real upload service runs: the test plays the client on the bus, fills the real store
// and looks at the desk, which is the real one or one that misbehaves on demand.
#pragma once

#include <libsoup/soup.h>

#include <functional>
#include <nlohmann/json.hpp>
#include <string>
#include <vector>

#include "handles.h"
#include "store_world.h"

// A program that the test started and may kill.
class Program {
 public:
  ~Program() { kill(); }
  void start(const std::vector<std::string> &arguments, int stdout_fd = -1);
  void kill();
  bool is_running() const;

 private:
  pid_t pid_ = 0;
};

// Runs the main loop until the condition holds; false after ten seconds.
bool wait_until(const std::function<bool()> &condition);
void run_loop_for(unsigned ms);

// What a desk answers, in JSON.
void respond(SoupServerMessage *message, int status, const std::string &body);

// A desk whose answer to a report is what the test says; it registers every phone and has no news.
class FakeDesk {
 public:
  FakeDesk();
  ~FakeDesk() { soup_server_disconnect(server_.get()); }
  FakeDesk(const FakeDesk &) = delete;
  FakeDesk &operator=(const FakeDesk &) = delete;

  std::string url;
  std::function<void(SoupServerMessage *)> on_report;
  std::function<void(SoupServerMessage *)> on_file;  // unset: no answer
  int registrations = 0;
  int reports = 0;    // calls that brought one
  int files = 0;      // calls about a file
  std::string token;  // what such a call must carry

 private:
  GObjectPtr<SoupServer> server_;
};

class ServiceWorld : public StoreWorld {
 protected:
  void SetUp() override;
  void TearDown() override;

  void start_desk();
  void start_service(const std::string &desk_url = "");  // empty: the real desk
  // A launch request to the service, with extra data.
  void launch(const std::vector<std::pair<std::string, std::string>> &extra_data);
  void launch(const char *operation, int voc_id);
  // The client comes to the bus or leaves it; it is there from the start.
  void set_client_present(bool is_present);
  // A stored problem report that is to be sent.
  static int store_report(const std::vector<std::string> &paths = {}, const std::string &text = "Grey boxes");

  nlohmann::json staff(const std::string &path, const nlohmann::json &body = nullptr);
  nlohmann::json desk_report(int voc_id);
  void answer(int voc_id, int status, const std::string &reply);
  static std::string column(const char *name, int voc_id);
  bool wait_for_state(int voc_id, const std::string &state);
  bool wait_for_message(const std::string &message, int count = 1);
  int count_messages(const std::string &message) const;

  static std::string make_file(const std::string &name, const std::string &content);

  std::string desk_folder_ = "/opt/usr/desk";
  std::string desk_url_, staff_token_;
  Program desk_, service_;
  // What the client was told: "SUCCESS 1", "FAIL 1" or "UPDATED 1 reply".
  std::vector<std::string> messages_;

 private:
  static void launch_cb(GDBusConnection *, const char *, const char *, const char *, const char *,
                        GVariant *arguments, GDBusMethodInvocation *invocation, gpointer self);
  GObjectPtr<GDBusConnection> bus_;
  guint object_ = 0;
};
